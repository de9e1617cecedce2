// SPDX-License-Identifier: MIT
#include "platform/identity/task_identity.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <climits>

#include "platform/base/unique_fd.h"
#include "platform/identity/sandbox_labels.h"

namespace brivo {

namespace {

/// At most a page or so: everything that is read here is short.
std::string readShortFile(int folder, const char* name) {
  const UniqueFd fd(::openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  struct stat status {};
  if (!fd || ::fstat(fd.get(), &status) != 0 || !S_ISREG(status.st_mode)) return {};
  std::string text(8192, '\0');
  const ssize_t size = ::read(fd.get(), text.data(), text.size());
  text.resize(size > 0 ? static_cast<std::size_t>(size) : 0);
  return text;
}

bool isOurRoot(int root) {
  struct stat ours {};
  struct stat theirs {};
  return ::stat("/", &ours) == 0 && ::fstat(root, &theirs) == 0 && ours.st_dev == theirs.st_dev &&
         ours.st_ino == theirs.st_ino;
}

/// The file lies at the root that the sandbox made for the process; at our own root it would say nothing of
/// it.
std::optional<std::string> flatpakApplication(int process) {
  const UniqueFd root(::openat(process, "root", O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!root || isOurRoot(root.get())) return std::nullopt;
  return applicationInFlatpakInfo(readShortFile(root.get(), ".flatpak-info"));
}

std::optional<std::string> executablePath(int process) {
  char path[PATH_MAX];
  const ssize_t size = ::readlinkat(process, "exe", path, sizeof path);
  if (size <= 0 || path[0] != '/') return std::nullopt;
  return std::string(path, static_cast<std::size_t>(size));
}

}  // namespace

std::optional<std::string> TaskIdentity::codeSigningIdentifier(const AuditToken& token) const {
  if (token.pidfd() < 0) return std::nullopt;
  const UniqueFd fdinfo(::open("/proc/self/fdinfo", O_PATH | O_DIRECTORY | O_CLOEXEC));
  const auto pid = processInFdinfo(readShortFile(fdinfo.get(), std::to_string(token.pidfd()).c_str()));
  if (!pid) return std::nullopt;
  const std::string folder = "/proc/" + std::to_string(*pid);
  const UniqueFd process(::open(folder.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  auto identifier = process ? identifierOf(process.get()) : std::nullopt;
  // Still alive now: then the identifier of the process was its own all the time.
  if (!token.isAlive()) return std::nullopt;
  return identifier;
}

std::optional<std::string> TaskIdentity::identifierOf(int process) const {
  if (auto flatpak = flatpakApplication(process)) return flatpak;
  if (auto snap = snapInSecurityLabel(readShortFile(process, "attr/current"))) return snap;
  struct stat program {};
  if (::fstatat(process, "exe", &program, 0) == 0) {
    if (auto application = applications_.identifierOfProgram(program.st_dev, program.st_ino))
      return application;
  }
  return executablePath(process);
}

}  // namespace brivo
