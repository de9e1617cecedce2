// SPDX-License-Identifier: MIT
#include "command.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <stdexcept>

#include "figures.h"
#include "platform/base/unique_fd.h"
#include "support/temporary_folder.h"

namespace brivo::bench {

namespace {

constexpr int kNotFound = 127;

std::vector<char*> pointersTo(std::vector<std::string>& words) {
  std::vector<char*> pointers;
  std::ranges::transform(words, std::back_inserter(pointers), [](std::string& word) { return word.data(); });
  pointers.push_back(nullptr);
  return pointers;
}

std::vector<std::string> ownEnvironment() {
  std::vector<std::string> variables;
  for (char** variable = environ; *variable; ++variable) variables.emplace_back(*variable);
  return variables;
}

/// Gives the exit code as exitCodeOf() does.
int waitFor(pid_t process, rusage& usage) {
  int status = 0;
  if (::wait4(process, &status, 0, &usage) != process) {
    throw std::runtime_error("cannot wait for a process");
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

std::string contentOf(const UniqueFd& file) {
  return test::readFile("/proc/self/fd/" + std::to_string(file.get()));
}

}  // namespace

pid_t start(Command command) {
  const std::vector<char*> words = pointersTo(command.words);
  const std::vector<char*> environment = pointersTo(command.environment);
  const pid_t child = ::fork();
  if (child < 0) throw std::runtime_error("cannot fork");
  if (child > 0) return child;
  ::prctl(PR_SET_PDEATHSIG, SIGTERM);
  ::dup2(command.output, STDOUT_FILENO);
  ::dup2(command.error, STDERR_FILENO);
  ::execvpe(words[0], words.data(), environment.data());
  ::_exit(kNotFound);
}

int exitCodeOf(pid_t process) {
  rusage usage{};
  return waitFor(process, usage);
}

Outcome run(std::vector<std::string> words) {
  const UniqueFd nowhere(::open("/dev/null", O_WRONLY | O_CLOEXEC));
  const UniqueFd errors(::memfd_create("bench-errors", MFD_CLOEXEC));
  rusage usage{};
  const Stopwatch watch;
  const int exitCode =
      waitFor(start({std::move(words), ownEnvironment(), nowhere.get(), errors.get()}), usage);
  const double milliseconds = watch.milliseconds();
  return {exitCode, milliseconds, static_cast<double>(usage.ru_maxrss), contentOf(errors)};
}

Outcome runOrThrow(const std::vector<std::string>& words) {
  Outcome outcome = run(words);
  if (outcome.exitCode == 0) return outcome;
  throw std::runtime_error(words.front() + " ended with " + std::to_string(outcome.exitCode) + ": " +
                           outcome.errors);
}

bool isInstalled(const std::string& program) { return run({program, "--version"}).exitCode != kNotFound; }

}  // namespace brivo::bench
