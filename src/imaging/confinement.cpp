// SPDX-License-Identifier: MIT
#include "imaging/confinement.h"

#include <sys/prctl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <optional>

#include "imaging/landlock.h"
#include "imaging/system_calls.h"
#include "platform/decoding/sanitized_build.h"
#include "platform/decoding/worker_protocol.h"

namespace brivo::imaging {

namespace {

constexpr std::uint64_t kMostMemory = std::uint64_t{3} << 30;
/// Standard descriptors, the socket, the two of a request, and some that a library may keep open.
constexpr rlim_t kMostDescriptors = 16;

struct Limit {
  decltype(RLIMIT_AS) resource;
  rlim_t value;
};

std::uint64_t memoryLimit() {
  const std::uint64_t pages = static_cast<std::uint64_t>(std::max(0L, ::sysconf(_SC_PHYS_PAGES)));
  const std::uint64_t pageSize = static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE));
  return pages == 0 ? kMostMemory : std::min(kMostMemory, pages * pageSize / 2);
}

/// A hard limit that is lower already stays.
bool lower(const Limit& limit) {
  rlimit now{};
  if (::getrlimit(limit.resource, &now) != 0) return false;
  now.rlim_max = std::min(now.rlim_max, limit.value);
  now.rlim_cur = now.rlim_max;
  return ::setrlimit(limit.resource, &now) == 0;
}

bool limitResources() {
  // A write beyond the limit of file size shall fail, no more.
  std::signal(SIGXFSZ, SIG_IGN);
  const Limit limits[] = {{RLIMIT_CORE, 0},
                          {RLIMIT_NPROC, 0},
                          {RLIMIT_NOFILE, kMostDescriptors},
                          {RLIMIT_FSIZE, kMostResultBytes}};
  if (!std::ranges::all_of(limits, lower)) return false;
  return kSanitizedBuild || lower({RLIMIT_AS, memoryLimit()});
}

/// No set-user-id program, no look into this process from others of the user, no life beyond the service's.
bool setProcessAttributes() {
  return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 && ::prctl(PR_SET_DUMPABLE, 0, 0, 0, 0) == 0 &&
         ::prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0) == 0;
}

}  // namespace

Result<Protections> confine() {
  if (!limitResources()) return SystemError{"limit resources", errno};
  if (!setProcessAttributes()) return SystemError{"give up privileges", errno};
  const auto landlockAbi = giveUpFileSystem();
  if (!landlockAbi) return landlockAbi.error();
  if (const auto error = restrictSystemCalls()) return *error;
  return Protections{*landlockAbi, !kSanitizedBuild};
}

}  // namespace brivo::imaging
