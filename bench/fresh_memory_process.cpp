// SPDX-License-Identifier: MIT
#include "fresh_memory_process.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/sendfile.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <deque>
#include <span>
#include <stdexcept>
#include <string_view>

#include "descriptor_message.h"
#include "platform/base/mapping.h"

#ifndef F_SEAL_FUTURE_WRITE
#define F_SEAL_FUTURE_WRITE 0x0010
#endif

namespace brivo::bench {

namespace {

struct Part {
  std::uint64_t offset;
  std::uint64_t length;
};

constexpr std::string_view kAnswer = ".";

void check(bool isDone) {
  if (!isDone) throw std::runtime_error("cannot make or fill memory");
}

void fillByMapping(int memory, int file, const Part& part) {
  const Mapping mapping = Mapping::sharedWritable(memory, part.length);
  check(::pread(file, mapping.bytes().data(), part.length, static_cast<off_t>(part.offset)) ==
        static_cast<ssize_t>(part.length));
}

void fillBySendfile(int memory, int file, const Part& part) {
  auto offset = static_cast<off_t>(part.offset);
  for (std::uint64_t left = part.length; left > 0;) {
    const ssize_t sent = ::sendfile(memory, file, &offset, left);
    check(sent > 0);
    left -= static_cast<std::uint64_t>(sent);
  }
}

UniqueFd freshMemory(int file, const Part& part, Filling filling) {
  UniqueFd memory(::memfd_create("bench-part", MFD_CLOEXEC | MFD_ALLOW_SEALING));
  check(::ftruncate(memory.get(), static_cast<off_t>(part.length)) == 0);
  (filling == Filling::byMapping ? fillByMapping : fillBySendfile)(memory.get(), file, part);
  // The seals of the service.
  constexpr int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_FUTURE_WRITE | F_SEAL_SEAL;
  check(::fcntl(memory.get(), F_ADD_SEALS, seals) == 0);
  return memory;
}

void serveParts(int socket, const std::string& path, Filling filling) {
  const UniqueFd file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
  Part part{};
  while (::recv(socket, &part, sizeof part, MSG_WAITALL) == sizeof part) {
    sendWithDescriptor(socket, kAnswer, freshMemory(file.get(), part, filling).get());
  }
}

}  // namespace

FreshMemoryProcess::FreshMemoryProcess(const std::string& path, Filling filling)
    : process_([&](int socket) { serveParts(socket, path, filling); }) {}

UniqueFd FreshMemoryProcess::part(std::uint64_t offset, std::uint64_t length) {
  const Part part{offset, length};
  ::send(process_.socket(), &part, sizeof part, MSG_NOSIGNAL);
  std::array<char, kAnswer.size()> answer{};
  std::deque<UniqueFd> memory;
  if (receiveWithDescriptors(process_.socket(), answer, memory) <= 0 || memory.empty()) {
    throw std::runtime_error("the process with fresh memory has ended");
  }
  return std::move(memory.front());
}

}  // namespace brivo::bench
