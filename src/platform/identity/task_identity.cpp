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

/// Whether a sandbox made this root for the process and left its description there. At our own root that
/// would say nothing of the process. Whatever lies there counts, for nobody but a sandbox puts anything of
/// that name there.
bool isFlatpakRoot(int root) {
  struct stat info {};
  return !isOurRoot(root) &&
         (::fstatat(root, kFlatpakInfo, &info, AT_SYMLINK_NOFOLLOW) == 0 || errno != ENOENT);
}

std::optional<std::string> flatpakApplication(int root) {
  const auto info = readFileIn(root, kFlatpakInfo, kLargestFlatpakInfo);
  return info ? applicationInFlatpakInfo(*info) : std::nullopt;
}

/// Of a file in /proc that names a label: the kernel has none to tell, or tells nobody like us about any
/// process.
bool meansNoLabel(int error) {
  return error == ENOENT || error == EINVAL || error == EOPNOTSUPP || error == EACCES || error == EPERM;
}

/// Empty where processes have no labels; none when it cannot be told.
std::optional<std::string> securityLabel(int process) {
  const UniqueFd fd(::openat(process, "attr/current", O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (!fd) return meansNoLabel(errno) ? std::optional<std::string>("") : std::nullopt;
  errno = 0;
  auto label = readSmallFile(fd.get(), kLargestLabel);
  return !label && meansNoLabel(errno) ? "" : label;
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
  const UniqueFd root(::openat(process, "root", O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (root && isFlatpakRoot(root.get())) return flatpakApplication(root.get());
  const auto label = securityLabel(process);
  if (!label) return std::nullopt;
  if (auto snap = snapInSecurityLabel(*label)) return snap;
  // The program of a process in a sandbox says nothing, so it counts only where there is surely none. Who may
  // not look at the root may not look at the program either, but a process can change that in between.
  return root ? identifierOfProgram(process) : std::nullopt;
}

std::optional<std::string> TaskIdentity::identifierOfProgram(int process) const {
  struct stat program {};
  if (::fstatat(process, "exe", &program, 0) != 0) return std::nullopt;
  if (auto application = applications_.identifierOfProgram(program.st_dev, program.st_ino))
    return application;
  return executablePath(process, program);
}

}  // namespace brivo
