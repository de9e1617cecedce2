// SPDX-License-Identifier: MIT
// What the service and a decoding worker say to each other.
#pragma once

#include <cstdint>
#include <type_traits>

namespace brivo {

// Records in the machine's own byte order, one a message, on a SOCK_SEQPACKET socket. Both sides come from
// one build. The worker says hello once; then each request of the service is followed by one reply. With a
// request come two descriptors: the file to read, and an empty memory file for the result. The worker lets
// that grow as soon as it has taken the request, so that one knows of a dead worker whether it had, and lets
// go of it before it replies.

/// The descriptor that is the worker's end of the socket.
inline constexpr int kWorkerSocket = 3;
/// A result is never larger, in bytes.
inline constexpr std::uint64_t kMostResultBytes = std::uint64_t{512} << 20;

/// What a worker is asked for, and what the bytes of its result are.
enum class WorkerOperation : std::uint32_t {
  thumbnail,         ///< a JPEG
  imageWidths,       ///< a std::uint32_t for each image
  image,             ///< rows of pixels
  movieDescription,  ///< as encodeMovieDescription() has it
  movieFrame,        ///< a JPEG
};

enum class WorkerStatus : std::uint32_t {
  done,
  nothing,  ///< the file does not hold what was asked for, or cannot be decoded
};

/// Says that the worker is confined and waits for requests.
struct WorkerHello {
  std::uint32_t landlockAbi = 0;    ///< 0: the kernel has no Landlock
  std::uint32_t memoryLimited = 0;  ///< 1: the worker's memory has a limit
};

struct WorkerRequest {
  WorkerOperation operation = WorkerOperation::thumbnail;
  // As in ThumbnailRequest.
  std::uint32_t maximumPixelSize = 0;
  std::uint32_t source = 0;
  std::uint32_t hasImageTallerThan = 0;  ///< 1: the next counts
  std::uint32_t imageTallerThan = 0;
  std::uint32_t imageIndex = 0;  ///< of WorkerOperation::image
  // Of WorkerOperation::movieFrame, as in MaximumSize.
  std::uint32_t maximumWidth = 0;
  std::uint32_t maximumHeight = 0;
};

struct WorkerReply {
  WorkerStatus status = WorkerStatus::nothing;
  // Of WorkerOperation::image, as in Image.
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint32_t bytesPerPixel = 0;
  std::uint64_t byteCount = 0;  ///< of the result, from the start of the memory file
};

static_assert(std::has_unique_object_representations_v<WorkerHello> &&
                  std::has_unique_object_representations_v<WorkerRequest> &&
                  std::has_unique_object_representations_v<WorkerReply>,
              "padding would carry memory of one process to the other");

}  // namespace brivo
