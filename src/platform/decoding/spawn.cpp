// SPDX-License-Identifier: MIT
#include "platform/decoding/spawn.h"

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <vector>

#include "platform/decoding/process_reference.h"
#include "platform/decoding/sanitized_build.h"
#include "platform/decoding/worker_protocol.h"

namespace brivo {

namespace {

/// What happens to the descriptors between the two programs.
class FileActions {
 public:
  explicit FileActions(int socket) {
    ::posix_spawn_file_actions_init(&actions_);
    // dup2 to itself would leave close-on-exec as it is, but posix_spawn(3) clears it.
    ::posix_spawn_file_actions_adddup2(&actions_, socket, kWorkerSocket);
    // What a library prints belongs into the log, and no file that comes later may get one of these numbers.
    ::posix_spawn_file_actions_adddup2(&actions_, STDERR_FILENO, STDIN_FILENO);
    ::posix_spawn_file_actions_adddup2(&actions_, STDERR_FILENO, STDOUT_FILENO);
    ::posix_spawn_file_actions_addclosefrom_np(&actions_, kWorkerSocket + 1);
  }
  ~FileActions() { ::posix_spawn_file_actions_destroy(&actions_); }
  FileActions(const FileActions&) = delete;
  FileActions& operator=(const FileActions&) = delete;

  const posix_spawn_file_actions_t* get() const { return &actions_; }

 private:
  posix_spawn_file_actions_t actions_{};
};

/// Default signals, none of them blocked; no terminal, so that its signals go to the service alone.
class Attributes {
 public:
  Attributes() {
    sigset_t none;
    sigset_t all;
    ::sigemptyset(&none);
    ::sigfillset(&all);
    ::posix_spawnattr_init(&attributes_);
    ::posix_spawnattr_setsigmask(&attributes_, &none);
    ::posix_spawnattr_setsigdefault(&attributes_, &all);
    ::posix_spawnattr_setflags(&attributes_,
                               POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSID);
  }
  ~Attributes() { ::posix_spawnattr_destroy(&attributes_); }
  Attributes(const Attributes&) = delete;
  Attributes& operator=(const Attributes&) = delete;

  const posix_spawnattr_t* get() const { return &attributes_; }

 private:
  posix_spawnattr_t attributes_{};
};

/// Nothing but the settings of sanitizers.
std::vector<std::string> environmentOfWorkers() {
  std::vector<std::string> variables;
  if (!kSanitizedBuild) return variables;
  for (const char* name : {"ASAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS"}) {
    if (const char* value = std::getenv(name)) variables.push_back(std::string(name) + "=" + value);
  }
  return variables;
}

std::vector<char*> pointersTo(std::vector<std::string>& strings) {
  std::vector<char*> pointers;
  pointers.reserve(strings.size() + 1);
  for (std::string& string : strings) pointers.push_back(string.data());
  pointers.push_back(nullptr);
  return pointers;
}

}  // namespace

Result<UniqueFd> spawnWithSocket(const std::string& program, const UniqueFd& socket) {
  std::vector<std::string> arguments{program};
  std::vector<std::string> environment = environmentOfWorkers();
  pid_t process = 0;
  const int error =
      ::posix_spawn(&process, program.c_str(), FileActions(socket.get()).get(), Attributes().get(),
                    pointersTo(arguments).data(), pointersTo(environment).data());
  if (error != 0) return SystemError{"start " + program, error};
  UniqueFd child = referenceToChild(process);
  if (child) return child;
  const int cause = errno;
  ::kill(process, SIGKILL);
  ::waitpid(process, nullptr, 0);
  return SystemError{"watch " + program, cause};
}

}  // namespace brivo
