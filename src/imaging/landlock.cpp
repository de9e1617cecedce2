// SPDX-License-Identifier: MIT
#include "imaging/landlock.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdint>

#include "platform/base/unique_fd.h"

namespace brivo::imaging {

namespace {

/// struct landlock_ruleset_attr as of version 6; the headers of the build may be older than the kernel.
struct RulesetAttributes {
  std::uint64_t fileSystem = 0;
  std::uint64_t network = 0;  ///< since version 4
  std::uint64_t scoped = 0;   ///< since version 6
};
constexpr std::uint32_t kAskForVersion = 1;  // LANDLOCK_CREATE_RULESET_VERSION

/// So many rights, from the first on.
constexpr std::uint64_t rights(int count) { return (std::uint64_t{1} << count) - 1; }

constexpr std::uint64_t fileSystemRights(int version) {
  if (version >= 5) return rights(16);  // devices' ioctl(2)
  if (version >= 3) return rights(15);  // truncation
  return rights(version == 2 ? 14 : 13);
}

constexpr std::size_t sizeOfAttributes(int version) {
  if (version >= 6) return sizeof(RulesetAttributes);
  return version >= 4 ? offsetof(RulesetAttributes, scoped) : offsetof(RulesetAttributes, network);
}

RulesetAttributes everyRight(int version) {
  return {fileSystemRights(version), version >= 4 ? rights(2) : 0, version >= 6 ? rights(2) : 0};
}

int createRuleset(const RulesetAttributes* attributes, std::size_t size, std::uint32_t flags) {
  return static_cast<int>(::syscall(SYS_landlock_create_ruleset, attributes, size, flags));
}

}  // namespace

Result<int> giveUpFileSystem() {
  const int version = createRuleset(nullptr, 0, kAskForVersion);
  if (version <= 0) return 0;
  const RulesetAttributes attributes = everyRight(version);
  const UniqueFd ruleset(createRuleset(&attributes, sizeOfAttributes(version), 0));
  if (!ruleset || ::syscall(SYS_landlock_restrict_self, ruleset.get(), 0) != 0) {
    return SystemError{"restrict with Landlock", errno};
  }
  return version;
}

}  // namespace brivo::imaging
