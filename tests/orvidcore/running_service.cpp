// SPDX-License-Identifier: MIT
#include "orvidcore/running_service.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <sstream>
#include <stdexcept>

#include "support/wait.h"

namespace orvid::test {

namespace fs = std::filesystem;

namespace {

/// For exec: pointers to `strings`, and a null.
std::vector<char*> pointersTo(std::vector<std::string>& strings) {
  std::vector<char*> pointers;
  for (std::string& string : strings) pointers.push_back(string.data());
  pointers.push_back(nullptr);
  return pointers;
}

}  // namespace

RunningService::RunningService(Grants grants) {
  for (const char* name : {"volumes", "data", "config"}) brivo::test::makeFolder(folder_ / name);
  if (grants == Grants::thisProgram) grantThisProgram();
  process_ = launch({BRIVOD_PROGRAM});
  const bool started =
      brivo::test::waitUntil([&] { return std::filesystem::exists(folder_ / "run/manager"); });
  if (!started) throw std::runtime_error("the service did not start:\n" + log());
}

RunningService::~RunningService() {
  if (process_ != 0) {
    ::kill(process_, SIGTERM);
    goOn();
    int status = 0;
    ::waitpid(process_, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "status " << status << "\n" << log();
  }
  for (const char* report : {"ERROR: ", "WARNING: ThreadSanitizer", "runtime error:"}) {
    EXPECT_EQ(log().find(report), std::string::npos) << log();
  }
}

std::vector<std::string> RunningService::environment() const {
  std::vector<std::string> variables{
      "BRIVOD_RUNTIME_DIR=" + folder_ / "run",        "BRIVOD_VOLUME_FOLDERS=" + folder_ / "volumes",
      "BRIVOD_VOLUME_ROOTS=" + folder_ / "no mounts", "HOME=" + folder_.path(),
      "XDG_CONFIG_HOME=" + folder_ / "config",        "XDG_DATA_HOME=" + folder_ / "data",
      std::string("XDG_DATA_DIRS=") + BRIVOD_SHARE};
  for (const char* name : {"PATH", "ASAN_OPTIONS", "LSAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS"}) {
    if (const char* value = std::getenv(name)) variables.push_back(std::string(name) + "=" + value);
  }
  return variables;
}

pid_t RunningService::launch(std::vector<std::string> command) const {
  std::vector<std::string> variables = environment();
  const std::vector<char*> arguments = pointersTo(command);
  const std::vector<char*> environment = pointersTo(variables);
  const int log = ::open((folder_ / "log").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
  const pid_t child = ::fork();
  if (child == 0) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);  // a test that is cut short leaves no service behind
    ::dup2(log, STDERR_FILENO);
    ::execve(arguments.front(), arguments.data(), environment.data());
    ::_exit(127);
  }
  ::close(log);
  if (child < 0) throw std::runtime_error("fork failed");
  return child;
}

void RunningService::grantThisProgram() const {
  const pid_t brivoctl = launch({BRIVOCTL_PROGRAM, "access", "grant", fs::read_symlink("/proc/self/exe")});
  int status = 0;
  ::waitpid(brivoctl, &status, 0);
  if (status != 0) throw std::runtime_error("brivoctl access grant failed:\n" + log());
}

std::string RunningService::addFile(std::string_view card, std::string_view name,
                                    std::string_view content) const {
  std::string path = this->card(card) + "/DCIM/" + std::string(name);
  brivo::test::writeFile(path, content);
  return path;
}

void RunningService::insertEmptyCard(std::string_view name) const {
  brivo::test::makeFolder(folder_ / "prepared/DCIM");
  fs::rename(folder_ / "prepared", card(name));
}

void RunningService::removeCard(std::string_view name) const {
  fs::rename(card(name), folder_ / ("removed " + std::string(name)));
}

void RunningService::kill() {
  ::kill(process_, SIGKILL);
  ::waitpid(process_, nullptr, 0);
  process_ = 0;
}

void RunningService::pause() {
  ::kill(process_, SIGSTOP);
  ::waitpid(process_, nullptr, WUNTRACED);
}

void RunningService::goOn() {
  if (process_ != 0) ::kill(process_, SIGCONT);
}

}  // namespace orvid::test
