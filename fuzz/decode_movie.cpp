// SPDX-License-Identifier: MIT
#include <sys/mman.h>
#include <unistd.h>

#include <span>

#include "check.h"
#include "imaging/allocation_limit.h"
#include "imaging/local_movie_reader.h"
#include "platform/images/image_reader.h"

namespace {

constexpr std::uint32_t kMaximum = 160;
/// Large pictures and indexes take time and memory, and nothing new is learned from them. In the worker, too,
/// memory has a limit.
constexpr std::size_t kMostMemory = 16'777'216;

brivo::UniqueFd memoryFileWith(const std::uint8_t* data, std::size_t size) {
  brivo::UniqueFd file(::memfd_create("movie", MFD_CLOEXEC));
  check(file && ::pwrite(file.get(), data, size, 0) == static_cast<ssize_t>(size));
  return file;
}

void checkJpeg(const brivo::Data& jpeg) {
  const auto properties = brivo::images::copyImageProperties(brivo::images::MemorySource(jpeg.bytes()));
  check(properties.has_value());
  check(properties->size.width != 0 && properties->size.width <= kMaximum);
  check(properties->size.height != 0 && properties->size.height <= kMaximum);
}

}  // namespace

// Movies: what is told of one can be told to another process, and a first frame is within its bounds.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const brivo::imaging::AllocationLimit limit(kMostMemory);
  const brivo::UniqueFd file = memoryFileWith(data, size);
  brivo::LocalMovieReader reader;
  if (const auto movie = reader.describe(file))
    check(brivo::decodeMovieDescription(brivo::encodeMovieDescription(*movie)).has_value());
  if (const auto frame = reader.firstFrame(file, {kMaximum, kMaximum})) checkJpeg(*frame);
  return 0;
}
