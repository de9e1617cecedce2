// SPDX-License-Identifier: MIT
#include "imaging/worker.h"

#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <optional>
#include <span>

#include "imaging/confinement.h"
#include "platform/decoding/worker_protocol.h"

namespace brivo::imaging {

namespace {

/// A request and what came with it.
struct Job {
  WorkerRequest request;
  UniqueFd file;
  UniqueFd result;
};

/// Who does what the service asks for.
struct Readers {
  ImageDecoder& decoder;
  MovieReader& movies;
};

enum class Arrival { job, hangUp, fault };

template <class Record>
bool send(const UniqueFd& socket, const Record& record) {
  Record copy = record;
  iovec part{&copy, sizeof copy};
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  return ::sendmsg(socket.get(), &message, MSG_NOSIGNAL) == ssize_t{sizeof copy};
}

/// Takes the two descriptors out of the message, if that is what it carries.
bool takeDescriptors(msghdr& message, Job& job) {
  std::array<int, 2> descriptors{-1, -1};
  const cmsghdr* header = CMSG_FIRSTHDR(&message);
  if (header == nullptr || header->cmsg_level != SOL_SOCKET || header->cmsg_type != SCM_RIGHTS ||
      header->cmsg_len != CMSG_LEN(sizeof descriptors)) {
    return false;
  }
  std::memcpy(descriptors.data(), CMSG_DATA(header), sizeof descriptors);
  job.file.reset(descriptors[0]);
  job.result.reset(descriptors[1]);
  return true;
}

Arrival receive(const UniqueFd& socket, Job& job) {
  iovec part{&job.request, sizeof job.request};
  alignas(cmsghdr) std::array<std::byte, CMSG_SPACE(2 * sizeof(int))> control{};
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control.data();
  message.msg_controllen = control.size();
  ssize_t size = -1;
  do {
    size = ::recvmsg(socket.get(), &message, MSG_CMSG_CLOEXEC);
  } while (size < 0 && errno == EINTR);
  if (size == 0) return Arrival::hangUp;
  const bool whole =
      size == ssize_t{sizeof job.request} && (message.msg_flags & (MSG_TRUNC | MSG_CTRUNC)) == 0;
  return whole && takeDescriptors(message, job) ? Arrival::job : Arrival::fault;
}

bool write(const UniqueFd& result, std::span<const std::byte> bytes) {
  std::size_t done = 0;
  while (done < bytes.size()) {
    const auto rest = bytes.subspan(done);
    const ssize_t count = ::pwrite(result.get(), rest.data(), rest.size(), static_cast<off_t>(done));
    if (count <= 0) return false;
    done += static_cast<std::size_t>(count);
  }
  return true;
}

/// The reply for a result that is `bytes`.
WorkerReply replyWith(const UniqueFd& result, std::span<const std::byte> bytes) {
  WorkerReply reply;
  if (bytes.size() > kMostResultBytes || !write(result, bytes)) return reply;
  reply.status = WorkerStatus::done;
  reply.byteCount = bytes.size();
  return reply;
}

ThumbnailRequest thumbnailRequest(const WorkerRequest& request) {
  ThumbnailRequest wanted;
  wanted.maximumPixelSize = request.maximumPixelSize;
  wanted.source = static_cast<ThumbnailSource>(request.source);
  if (request.hasImageTallerThan != 0) wanted.imageTallerThan = request.imageTallerThan;
  return wanted;
}

WorkerReply thumbnail(const Job& job, ImageDecoder& decoder) {
  const auto jpeg = decoder.thumbnail(job.file, thumbnailRequest(job.request));
  return jpeg ? replyWith(job.result, jpeg->bytes()) : WorkerReply{};
}

WorkerReply imageWidths(const Job& job, ImageDecoder& decoder) {
  const auto widths = decoder.imageWidths(job.file);
  return replyWith(job.result, std::as_bytes(std::span(widths)));
}

WorkerReply image(const Job& job, ImageDecoder& decoder) {
  const auto image = decoder.image(job.file, job.request.imageIndex);
  if (!image) return {};
  WorkerReply reply = replyWith(job.result, image->pixels.bytes());
  reply.width = image->width;
  reply.height = image->height;
  reply.bytesPerPixel = image->bytesPerPixel;
  return reply;
}

WorkerReply movieDescription(const Job& job, MovieReader& movies) {
  const auto movie = movies.describe(job.file);
  return movie ? replyWith(job.result, encodeMovieDescription(*movie)) : WorkerReply{};
}

WorkerReply movieFrame(const Job& job, MovieReader& movies) {
  const auto jpeg = movies.firstFrame(job.file, {job.request.maximumWidth, job.request.maximumHeight});
  return jpeg ? replyWith(job.result, jpeg->bytes()) : WorkerReply{};
}

WorkerReply perform(const Job& job, const Readers& readers) {
  auto& [decoder, movies] = readers;
  switch (job.request.operation) {
    case WorkerOperation::thumbnail:
      return thumbnail(job, decoder);
    case WorkerOperation::imageWidths:
      return imageWidths(job, decoder);
    case WorkerOperation::image:
      return image(job, decoder);
    case WorkerOperation::movieDescription:
      return movieDescription(job, movies);
    case WorkerOperation::movieFrame:
      return movieFrame(job, movies);
  }
  return {};
}

WorkerReply serve(const Job& job, const Readers& readers) {
  if (::ftruncate(job.result.get(), 1) != 0) return {};  // says that the request is taken
  try {
    return perform(job, readers);
  } catch (const std::exception&) {  // memory ran out, or a library's own way to say that it cannot
    return {};
  }
}

/// Receives a request and replies to it, when nothing of it is left here.
Arrival serveNext(const UniqueFd& socket, const Readers& readers) {
  WorkerReply reply;
  {
    Job job;
    const Arrival arrival = receive(socket, job);
    if (arrival != Arrival::job) return arrival;
    reply = serve(job, readers);
  }
  return send(socket, reply) ? Arrival::job : Arrival::hangUp;
}

}  // namespace

int runWorker(UniqueFd socket, ImageDecoder& decoder, MovieReader& movies) {
  const auto protections = confine();
  if (!protections) {
    std::fprintf(stderr, "brivod-imaging: cannot %s\n", protections.error().text().c_str());
    return 1;
  }
  WorkerHello hello;
  hello.landlockAbi = static_cast<std::uint32_t>(protections->landlockAbi);
  hello.memoryLimited = protections->memoryLimited ? 1 : 0;
  Arrival last = send(socket, hello) ? Arrival::job : Arrival::hangUp;
  while (last == Arrival::job) last = serveNext(socket, {decoder, movies});
  return last == Arrival::fault ? 1 : 0;
}

}  // namespace brivo::imaging
