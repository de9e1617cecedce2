// SPDX-License-Identifier: MIT
// Preloaded into a program (LD_PRELOAD), makes its reads of chosen files fail, come short or stall: those
// with pread(2), which is how brivod reads what is on a card.
//
// BRIVOD_FAULTY_READS names a text file of orders, which is looked at anew for every such read. One order a
// line; a line that is none is skipped, and without the file or the variable all reads are as ever:
//
//     KIND POSITION NAME
//
// NAME is how the path of the file to be read ends, and may have spaces. POSITION counts bytes from the
// beginning of that file. An order concerns the reads that ask for the byte at POSITION or a later one; of
// several, the first in the file decides:
//
//     fail    EIO, also where bytes before POSITION were asked for
//     short   what lies before POSITION; EIO where nothing does
//     end     what lies before POSITION; 0 bytes where nothing does, as at the end of a file
//     split   what lies before POSITION; reads that begin there or later are as ever
//     stall   waits until no order to stall concerns it, and goes by the others then
//
// A read that waits makes an empty file as a sign, named like the orders with ".stalled" behind.
//
// Thread-safe. Allocates nothing and calls little: it may run inside a sanitizer's own read function.
#include <dlfcn.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <optional>
#include <string_view>

namespace {

using ReadFunction = ssize_t (*)(int, void*, std::size_t, off_t);
using PathBuffer = std::array<char, PATH_MAX>;
using OrdersBuffer = std::array<char, 4096>;  // further orders are not seen

enum class Kind { fail, shortened, end, split, stall };

struct Order {
  Kind kind;
  std::uint64_t position;
  std::string_view name;
};

struct Request {
  int fd;
  void* buffer;
  std::size_t count;
  off_t offset;

  std::uint64_t begin() const { return static_cast<std::uint64_t>(offset); }
  bool asksFor(std::uint64_t position) const { return count > 0 && begin() + count > position; }
};

std::string_view pathOf(int fd, PathBuffer& buffer) {
  std::array<char, 32> link{"/proc/self/fd/"};
  std::to_chars(link.data() + std::strlen(link.data()), link.data() + link.size() - 1, fd);
  const ssize_t length = ::readlink(link.data(), buffer.data(), buffer.size());
  return length > 0 ? std::string_view(buffer.data(), static_cast<std::size_t>(length)) : std::string_view();
}

/// Empty when there is no such file.
std::string_view contentsOf(const char* path, OrdersBuffer& buffer) {
  const int fd = ::open(path, O_RDONLY | O_CLOEXEC);
  if (fd < 0) return {};
  std::size_t size = 0;
  ssize_t count = 0;
  while ((count = ::read(fd, buffer.data() + size, buffer.size() - size)) > 0) {
    size += static_cast<std::size_t>(count);
  }
  ::close(fd);
  return {buffer.data(), size};
}

/// What stands before `end`, which goes with it; all of `text` when `end` does not occur.
std::string_view takeUntil(char end, std::string_view& text) {
  const std::size_t length = std::min(text.find(end), text.size());
  const std::string_view taken = text.substr(0, length);
  text.remove_prefix(std::min(length + 1, text.size()));
  return taken;
}

std::optional<Kind> kindCalled(std::string_view name) {
  if (name == "fail") return Kind::fail;
  if (name == "short") return Kind::shortened;
  if (name == "end") return Kind::end;
  if (name == "split") return Kind::split;
  if (name == "stall") return Kind::stall;
  return std::nullopt;
}

std::optional<Order> orderIn(std::string_view line) {
  const auto kind = kindCalled(takeUntil(' ', line));
  const std::string_view number = takeUntil(' ', line);
  Order order{kind.value_or(Kind::fail), 0, line};
  const auto [end, error] = std::from_chars(number.data(), number.data() + number.size(), order.position);
  const bool good = kind && error == std::errc() && end == number.data() + number.size() && !line.empty();
  return good ? std::optional(order) : std::nullopt;
}

std::optional<Order> orderFor(const Request& request, std::string_view path, std::string_view orders) {
  while (!orders.empty()) {
    const auto order = orderIn(takeUntil('\n', orders));
    if (order && path.ends_with(order->name) && request.asksFor(order->position)) return order;
  }
  return std::nullopt;
}

void showStall(const char* orders) {
  PathBuffer sign;
  const std::string_view suffix = ".stalled";
  const std::size_t length = std::strlen(orders);
  if (length + suffix.size() >= sign.size()) return;
  std::memcpy(sign.data(), orders, length);
  std::memcpy(sign.data() + length, suffix.data(), suffix.size());
  sign[length + suffix.size()] = '\0';
  const int fd = ::open(sign.data(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  if (fd >= 0) ::close(fd);
}

/// The order for this read, once none says that it has to wait.
std::optional<Order> orderAfterStalls(const Request& request, std::string_view path, const char* orders) {
  constexpr timespec betweenLooks{0, 1'000'000};
  bool shown = false;
  while (true) {
    OrdersBuffer buffer;  // not cleared: only what was read is looked at
    const auto order = orderFor(request, path, contentsOf(orders, buffer));
    if (!order || order->kind != Kind::stall) return order;
    if (!shown) showStall(orders);
    shown = true;
    ::nanosleep(&betweenLooks, nullptr);
  }
}

ssize_t failed() {
  errno = EIO;
  return -1;
}

ssize_t readAs(const Order& order, const Request& request, ReadFunction read) {
  if (order.kind == Kind::fail) return failed();
  if (request.begin() < order.position) {
    return read(request.fd, request.buffer, order.position - request.begin(), request.offset);
  }
  if (order.kind == Kind::shortened) return failed();
  if (order.kind == Kind::end) return 0;
  return read(request.fd, request.buffer, request.count, request.offset);
}

ssize_t faultyRead(const Request& request, ReadFunction read) {
  const char* orders = std::getenv("BRIVOD_FAULTY_READS");
  const int before = errno;
  PathBuffer path;
  const auto order = orders ? orderAfterStalls(request, pathOf(request.fd, path), orders) : std::nullopt;
  errno = before;
  return order ? readAs(*order, request, read)
               : read(request.fd, request.buffer, request.count, request.offset);
}

ReadFunction next(const char* name) { return reinterpret_cast<ReadFunction>(::dlsym(RTLD_NEXT, name)); }

}  // namespace

extern "C" {

[[gnu::visibility("default")]] ssize_t pread(int fd, void* buffer, std::size_t count, off_t offset) {
  static const ReadFunction read = next("pread");
  return faultyRead({fd, buffer, count, offset}, read);
}

[[gnu::visibility("default")]] ssize_t pread64(int fd, void* buffer, std::size_t count, off64_t offset) {
  static const ReadFunction read = next("pread64");
  return faultyRead({fd, buffer, count, offset}, read);
}
}
