// SPDX-License-Identifier: MIT
#include "platform/identity/task_identity.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>

#include "platform/base/small_file.h"
#include "platform/base/unique_fd.h"
#include "platform/identity/sandbox_labels.h"

namespace brivo {

namespace {

constexpr std::size_t kLargestLabel = 4096;
constexpr std::size_t kLargestFlatpakInfo = 65'536;
constexpr const char* kFlatpakInfo = ".flatpak-info";

std::optional<std::string> readFileIn(int folder, const char* name, std::size_t limit) {
  const UniqueFd fd(::openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  return readSmallFile(fd.get(), limit);
}

bool isSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

bool isOurRoot(int root) {
  struct stat ours {};
  struct stat theirs {};
  return ::stat("/", &ours) == 0 && ::fstat(root, &theirs) == 0 && isSameFile(ours, theirs);
}

/// The root that a sandbox made for the process and left its description at. At our own root that would say
/// nothing of the process. Whatever lies there counts, for nobody but a sandbox puts anything of that name
/// there.
UniqueFd flatpakRoot(int process) {
  UniqueFd root(::openat(process, "root", O_PATH | O_DIRECTORY | O_CLOEXEC));
  struct stat info {};
  if (!root || isOurRoot(root.get())) return UniqueFd();
  if (::fstatat(root.get(), kFlatpakInfo, &info, AT_SYMLINK_NOFOLLOW) != 0 && errno == ENOENT)
    return UniqueFd();
  return root;
}

std::optional<std::string> flatpakApplication(int root) {
  const auto info = readFileIn(root, kFlatpakInfo, kLargestFlatpakInfo);
  return info ? applicationInFlatpakInfo(*info) : std::nullopt;
}

std::optional<std::string> snapName(int process) {
  const auto label = readFileIn(process, "attr/current", kLargestLabel);
  return label ? snapInSecurityLabel(*label) : std::nullopt;
}

/// Where the executable lies. None when that is not where we find it: it was removed or replaced since it was
/// started (then the kernel adds " (deleted)"), or its path is one of another mount namespace.
std::optional<std::string> executablePath(int process, const struct stat& program) {
  char link[PATH_MAX];
  const ssize_t size = ::readlinkat(process, "exe", link, sizeof link);
  if (size <= 0 || size == sizeof link || link[0] != '/') return std::nullopt;
  std::string path(link, static_cast<std::size_t>(size));
  struct stat found {};
  if (::lstat(path.c_str(), &found) != 0 || !isSameFile(found, program)) return std::nullopt;
  return path;
}

}  // namespace

std::optional<std::string> TaskIdentity::codeSigningIdentifier(const AuditToken& token) const {
  const auto pid = token.currentProcessIdentifier();
  if (!pid) return std::nullopt;
  const std::string folder = "/proc/" + std::to_string(*pid);
  const UniqueFd process(::open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  auto identifier = process ? identifierOf(process.get()) : std::nullopt;
  // Still alive now: then the identifier of the process was its own all the time.
  if (!token.isAlive()) return std::nullopt;
  return identifier;
}

std::optional<std::string> TaskIdentity::identifierOf(int process) const {
  if (const UniqueFd root = flatpakRoot(process)) return flatpakApplication(root.get());
  if (auto snap = snapName(process)) return snap;
  struct stat program {};
  if (::fstatat(process, "exe", &program, 0) != 0) return std::nullopt;
  if (auto application = applications_.identifierOfProgram(program.st_dev, program.st_ino))
    return application;
  return executablePath(process, program);
}

}  // namespace brivo
