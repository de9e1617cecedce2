// SPDX-License-Identifier: MIT
// A worker program whose decoder does what the file says, in words: "probe NAME" (see probes.h), one of the
// commands below, or anything else, which is what it gives back.
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>

#include "imaging/probes.h"
#include "imaging/worker.h"
#include "platform/decoding/worker_protocol.h"

namespace {

using namespace brivo;

const pid_t kProcess = ::getpid();  // asked before it is forbidden
const pid_t kParent = ::getppid();

std::string contentOf(const UniqueFd& file) {
  std::string text(4096, '\0');
  ssize_t size = ::pread(file.get(), text.data(), text.size(), 0);
  if (size < 0 && errno == ESPIPE) size = ::read(file.get(), text.data(), text.size());
  text.resize(static_cast<std::size_t>(std::max<ssize_t>(0, size)));
  return text;
}

/// The memory file of the request, as one finds it that was not told of it: the last descriptor that is a
/// file.
int resultDescriptor() {
  struct stat status {};
  int found = -1;
  for (int fd = kWorkerSocket + 1; fd < 16; ++fd) {
    if (::fstat(fd, &status) == 0 && S_ISREG(status.st_mode)) found = fd;
  }
  return found;
}

void say(const void* bytes, std::size_t size) {
  iovec part{const_cast<void*>(bytes), size};
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  ::sendmsg(kWorkerSocket, &message, MSG_NOSIGNAL);
}

std::string hang() {
  std::atomic<int> never = 0;
  never.wait(0);
  return "woken";
}

/// Reads the first byte of a mapping.
std::string touch(int protection, int flags, int fd) {
  const void* const page = ::mmap(nullptr, 4096, protection, flags, fd, 0);
  if (page == MAP_FAILED) return "not mapped";
  return std::string(1, *static_cast<const volatile char*>(page));
}

std::string crash() { return touch(PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1); }

/// What a file does that lost its end while it was mapped (SIGBUS): the result is still empty.
std::string touchBeyondTheEnd() { return touch(PROT_READ, MAP_SHARED, resultDescriptor()); }

std::string allocateWithoutEnd() {
  constexpr std::size_t piece = std::size_t{64} << 20;
  std::vector<std::unique_ptr<char[]>> memory;
  while (true) memory.push_back(std::make_unique_for_overwrite<char[]>(piece));
}

std::string sayGarbage() {
  say("garbage", 7);
  return "more";
}

std::string replyTwice() {
  WorkerReply reply;
  say(&reply, sizeof reply);
  return "the second";
}

std::string claimMore() {
  ::pwrite(resultDescriptor(), "0123456789", 10, 0);
  WorkerReply reply;
  reply.status = WorkerStatus::done;
  reply.byteCount = 11;
  say(&reply, sizeof reply);
  return hang();
}

std::string sayUnknownStatus() {
  WorkerReply reply;
  reply.status = static_cast<WorkerStatus>(77);
  say(&reply, sizeof reply);
  return hang();
}

std::string keepMapping() {
  const int result = resultDescriptor();
  ::ftruncate(result, 4096);
  const void* mapped = ::mmap(nullptr, 4096, PROT_READ | PROT_WRITE, MAP_SHARED, result, 0);
  return mapped == MAP_FAILED ? "not mapped" : "mapped";
}

std::string writeBeyondTheLimit() {
  if (::pwrite(resultDescriptor(), "x", 1, static_cast<off_t>(kMostResultBytes)) == 1) return "written";
  return ::strerrorname_np(errno);
}

std::string growBeyondTheLimit() {
  if (::ftruncate(resultDescriptor(), static_cast<off_t>(kMostResultBytes) + 1) == 0) return "grown";
  return ::strerrorname_np(errno);
}

std::string work() {
  const auto end = std::chrono::steady_clock::now() + std::chrono::microseconds(300);
  while (std::chrono::steady_clock::now() < end) {
  }
  return "worked";
}

std::string killTheService() {
  ::kill(kParent, SIGKILL);
  return "killed";
}

using Command = std::function<std::string()>;
const std::map<std::string, Command, std::less<>> kCommands{
    {"hang", hang},
    {"crash", crash},
    {"touch beyond the end", touchBeyondTheEnd},
    {"exit",
     [] {
       std::_Exit(0);
       return std::string();
     }},
    {"abort",
     [] {
       std::abort();
       return std::string();
     }},
    {"allocate without end", allocateWithoutEnd},
    {"throw", []() -> std::string { throw std::runtime_error("no picture"); }},
    {"say garbage", sayGarbage},
    {"reply twice", replyTwice},
    {"claim more", claimMore},
    {"say an unknown status", sayUnknownStatus},
    {"keep a mapping", keepMapping},
    {"write beyond the limit", writeBeyondTheLimit},
    {"grow beyond the limit", growBeyondTheLimit},
    {"work", work},
    {"kill the service", killTheService},
    {"process", [] { return std::to_string(kProcess); }},
};

std::string answerTo(const std::string& text, const UniqueFd& file) {
  constexpr std::string_view probing = "probe ";
  if (text.starts_with(probing))
    return test::probe(std::string_view(text).substr(probing.size()), file.get());
  const auto command = kCommands.find(text);
  return command == kCommands.end() ? text : command->second();
}

/// Zeros that take no memory while they are only looked at.
Data zeros(std::size_t size) {
  void* const start = ::mmap(nullptr, size, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
  if (start == MAP_FAILED) return Data();
  return Data({static_cast<const std::byte*>(start), size},
              std::shared_ptr<const void>(start, [size](void* memory) { ::munmap(memory, size); }));
}

class ProbingDecoder final : public ImageDecoder {
 public:
  std::optional<Data> thumbnail(const UniqueFd& file, const ThumbnailRequest& request) override {
    const std::string text = contentOf(file);
    if (text.empty()) return std::nullopt;
    if (text == "request") return Data::copyOf(inWords(request));
    if (text == "more than the limit") return zeros(kMostResultBytes + 1);
    return Data::copyOf(answerTo(text, file));
  }

  std::vector<std::uint32_t> imageWidths(const UniqueFd& file) override {
    return contentOf(file) == "two images" ? std::vector<std::uint32_t>{6000, 160}
                                           : std::vector<std::uint32_t>();
  }

  /// One of 3 by 2 pixels; "incomplete" lacks a byte.
  std::optional<Image> image(const UniqueFd& file, std::uint32_t index) override {
    if (index > 1) return std::nullopt;
    const std::size_t missing = contentOf(file) == "incomplete" ? 1 : 0;
    return Image{3, 2, 4, Data::copyOf(std::string(24 - missing, static_cast<char>('a' + index)))};
  }

 private:
  static std::string inWords(const ThumbnailRequest& request) {
    return std::to_string(request.maximumPixelSize) + " " + std::to_string(static_cast<int>(request.source)) +
           " " + (request.imageTallerThan ? std::to_string(*request.imageTallerThan) : "any");
  }
};

/// Movies whose only metadata is the answer, as is the first frame of those with a command.
class ProbingMovieReader final : public MovieReader {
 public:
  std::optional<MovieDescription> describe(const UniqueFd& file) override {
    const std::string text = contentOf(file);
    if (text.empty()) return std::nullopt;
    MovieDescription movie;
    movie.metadata.push_back({"make", answerTo(text, file)});
    return movie;
  }

  std::optional<Data> firstFrame(const UniqueFd& file, MaximumSize maximum) override {
    const std::string text = contentOf(file);
    if (text.empty()) return std::nullopt;
    if (kCommands.contains(text)) return Data::copyOf(answerTo(text, file));
    return Data::copyOf(std::to_string(maximum.width) + " by " + std::to_string(maximum.height));
  }
};

}  // namespace

int main() {
  ProbingDecoder decoder;
  ProbingMovieReader movies;
  std::_Exit(imaging::runWorker(UniqueFd(kWorkerSocket), decoder, movies));
}
