// SPDX-License-Identifier: MIT
#include "imaging/probes.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <functional>
#include <map>
#include <thread>

#include "platform/base/unique_fd.h"

namespace brivo::test {

namespace {

/// Each gives something negative, and errno, when it fails.
using Attempt = std::function<long(int file)>;

long opened(int fd) {
  const UniqueFd owner(fd);
  return fd;
}

long createFile(int) {
  const std::string path = "/tmp/brivod-probe-" + std::to_string(::getpid());
  const long result = opened(::open(path.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
  if (result >= 0) ::unlink(path.c_str());
  return result;
}

long reopen(int file) {
  return opened(::open(("/proc/self/fd/" + std::to_string(file)).c_str(), O_RDONLY | O_CLOEXEC));
}

long openWithOpenat2(int) {
  struct {
    std::uint64_t flags, mode, resolve;
  } how{O_RDONLY | O_CLOEXEC, 0, 0};
  return opened(static_cast<int>(::syscall(SYS_openat2, AT_FDCWD, "/etc/passwd", &how, sizeof how)));
}

long forkChild(int) {
  const pid_t child = ::fork();
  if (child == 0) ::_exit(0);
  if (child > 0) ::waitpid(child, nullptr, 0);
  return child;
}

long startThread(int) {
  try {
    std::thread([] {}).join();
    return 0;
  } catch (const std::system_error& error) {
    errno = error.code().value();
    return -1;
  }
}

/// In a process of its own where there can be one, for where it succeeds nothing comes after it.
long execute(int) {
  char name[] = "true";
  char* const arguments[] = {name, nullptr};
  const pid_t child = ::fork();
  if (child > 0) {
    int status = 0;
    ::waitpid(child, &status, 0);
    return status == 0 ? 0 : -1;
  }
  const int result = ::execv("/bin/true", arguments);
  if (child == 0) ::_exit(1);
  return result;
}

long mapCode(int) {
  void* const code = ::mmap(nullptr, 4096, PROT_READ | PROT_EXEC, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  return code == MAP_FAILED ? -1 : ::munmap(code, 4096);
}

long makeCode(int) {
  void* const page = ::mmap(nullptr, 4096, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (page == MAP_FAILED) return 0;
  const int result = ::mprotect(page, 4096, PROT_READ | PROT_EXEC);
  const int error = errno;
  ::munmap(page, 4096);
  errno = error;
  return result;
}

long setOwnLimit(int) {
  rlimit limit{};
  if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) return -1;
  return ::setrlimit(RLIMIT_NOFILE, &limit);
}

const std::map<std::string_view, Attempt>& attempts() {
  static const std::map<std::string_view, Attempt> table{
      {"open", [](int) { return opened(::open("/etc/passwd", O_RDONLY | O_CLOEXEC)); }},
      {"openat", [](int) { return opened(::openat(AT_FDCWD, "/etc/passwd", O_RDONLY | O_CLOEXEC)); }},
      {"openat2", openWithOpenat2},
      {"bare open",
       [](int) {
         return opened(static_cast<int>(::syscall(SYS_open, "/etc/passwd", O_RDONLY | O_CLOEXEC)));
       }},
      {"stat", [](int) -> long { return ::access("/etc/passwd", R_OK); }},
      {"create", createFile},
      {"reopen", reopen},
      {"unix socket", [](int) { return opened(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)); }},
      {"tcp socket", [](int) { return opened(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)); }},
      {"udp socket", [](int) { return opened(::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0)); }},
      {"fork", forkChild},
      {"thread", startThread},
      {"execve", execute},
      {"executable mapping", mapCode},
      {"memory made executable", makeCode},
      {"limit", setOwnLimit},
  };
  return table;
}

}  // namespace

std::vector<std::string_view> probeNames() {
  std::vector<std::string_view> names;
  for (const auto& [name, attempt] : attempts()) names.push_back(name);
  return names;
}

std::string probe(std::string_view name, int file) {
  errno = 0;
  return attempts().at(name)(file) >= 0 ? "done" : ::strerrorname_np(errno);
}

}  // namespace brivo::test
