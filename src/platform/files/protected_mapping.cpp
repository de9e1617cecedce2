// SPDX-License-Identifier: MIT
#include "platform/files/protected_mapping.h"

#include <sys/mman.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <limits>
#include <mutex>
#include <optional>

namespace brivo {

namespace {

/// What the handler of SIGBUS may touch: lock-free atomics of static storage, and mmap(2).
struct Range {
  /// Odd while the range changes hands. The range in which a fault happens does not, so the handler passes
  /// over those that do.
  std::atomic<unsigned> version = 0;
  std::atomic<std::uintptr_t> begin = 0;  // 0: free
  std::atomic<std::uintptr_t> end = 0;
  std::atomic<bool> faulted = false;

  void set(std::uintptr_t newBegin, std::uintptr_t newEnd) {
    ++version;
    begin = newBegin;
    end = newEnd;
    faulted = false;
    ++version;
  }

  /// Where the range ends, when it holds `address`; 0 when it does not.
  std::uintptr_t endOfRangeWith(std::uintptr_t address) const {
    const unsigned before = version;
    const std::uintptr_t first = begin;
    const std::uintptr_t last = end;
    const bool stable = before % 2 == 0 && version == before;
    return stable && first != 0 && address >= first && address < last ? last : 0;
  }
};
static_assert(std::atomic<std::uintptr_t>::is_always_lock_free && std::atomic<bool>::is_always_lock_free);

std::array<Range, ProtectedMapping::kMost> ranges;
std::mutex registering;
std::uintptr_t pageSize = 0;
struct sigaction previous {};

/// Puts zero pages under the rest of the mapping in which `fault` lies; false when there is none.
bool replaceRest(void* fault) {
  const auto address = reinterpret_cast<std::uintptr_t>(fault);
  for (Range& range : ranges) {
    const std::uintptr_t end = range.endOfRangeWith(address);
    if (end == 0) continue;
    const std::uintptr_t intoPage = address % pageSize;
    range.faulted = true;
    return ::mmap(static_cast<std::byte*>(fault) - intoPage, end - address + intoPage, PROT_READ,
                  MAP_FIXED | MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0) != MAP_FAILED;
  }
  return false;
}

void onBusError(int signal, siginfo_t* info, void*) {
  const int savedErrno = errno;
  // Not ours: it faults again on return, and then meets whoever was here before.
  if (info->si_code != BUS_ADRERR || !replaceRest(info->si_addr)) ::sigaction(signal, &previous, nullptr);
  errno = savedErrno;
}

void installHandler() {
  static std::once_flag once;
  std::call_once(once, [] {
    pageSize = static_cast<std::uintptr_t>(::sysconf(_SC_PAGESIZE));
    struct sigaction action {};
    action.sa_sigaction = onBusError;
    action.sa_flags = SA_SIGINFO | SA_ONSTACK | SA_NODEFER;
    ::sigaction(SIGBUS, &action, &previous);
  });
}

std::optional<std::size_t> registered(std::span<const std::byte> pages) {
  const std::lock_guard lock(registering);
  for (std::size_t slot = 0; slot < ranges.size(); ++slot) {
    if (ranges[slot].begin != 0) continue;
    const auto begin = reinterpret_cast<std::uintptr_t>(pages.data());
    ranges[slot].set(begin, begin + pages.size());
    return slot;
  }
  return std::nullopt;
}

}  // namespace

std::unique_ptr<ProtectedMapping> ProtectedMapping::map(int fd, std::size_t length, std::uint64_t offset) {
  installHandler();
  const std::size_t skipped = offset % pageSize;
  if (length > std::numeric_limits<std::size_t>::max() - 2 * pageSize) {
    errno = ENOMEM;
    return nullptr;
  }
  const std::size_t pages = (skipped + length + pageSize - 1) / pageSize;
  Mapping mapping = Mapping::sharedReadable(fd, length == 0 ? 0 : pages * pageSize, offset - skipped);
  if (!mapping) return nullptr;
  const auto slot = registered(mapping.bytes());
  if (!slot) {
    errno = EMFILE;
    return nullptr;
  }
  return std::unique_ptr<ProtectedMapping>(new ProtectedMapping(std::move(mapping), skipped, length, *slot));
}

ProtectedMapping::ProtectedMapping(Mapping mapping, std::size_t skipped, std::size_t length, std::size_t slot)
    : mapping_(std::move(mapping)), bytes_(mapping_.bytes().subspan(skipped, length)), slot_(slot) {}

ProtectedMapping::~ProtectedMapping() {
  const std::lock_guard lock(registering);
  ranges[slot_].set(0, 0);  // before the pages go, and others come in their place
}

bool ProtectedMapping::faulted() const { return ranges[slot_].faulted; }

}  // namespace brivo
