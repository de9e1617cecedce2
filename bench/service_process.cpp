// SPDX-License-Identifier: MIT
#include "service_process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <thread>

#include "support/wait.h"

namespace brivo::bench {

namespace fs = std::filesystem;

namespace {

constexpr std::chrono::milliseconds kLookInterval{100};
constexpr int kMostLooks = 50;
constexpr double kUnchangedKilobytes = 64;

fs::path ownProgram() { return fs::read_symlink("/proc/self/exe"); }
/// The folder of the build that this program belongs to.
fs::path buildFolder() { return ownProgram().parent_path().parent_path(); }

std::vector<char*> pointersTo(std::vector<std::string>& words) {
  std::vector<char*> pointers;
  std::ranges::transform(words, std::back_inserter(pointers), [](std::string& word) { return word.data(); });
  pointers.push_back(nullptr);
  return pointers;
}

}  // namespace

ServiceProcess::ServiceProcess(const std::string& volumes) : volumes_(volumes) {
  test::makeFolder(home_ / "data");
  int status = 0;
  ::waitpid(run("brivoctl", {"access", "grant", ownProgram()}), &status, 0);
  if (status != 0) throw std::runtime_error("brivoctl access grant failed: " + test::readFile(home_ / "log"));
  pid_ = run("brivod", {});
  if (!test::waitUntil([this] { return fs::exists(managerSocket()); })) {
    throw std::runtime_error("brivod did not start: " + test::readFile(home_ / "log"));
  }
}

ServiceProcess::~ServiceProcess() {
  if (pid_ < 0) return;
  ::kill(pid_, SIGTERM);
  ::waitpid(pid_, nullptr, 0);
}

pid_t ServiceProcess::run(const std::string& program, const std::vector<std::string>& arguments) const {
  std::vector<std::string> words{buildFolder() / "bin" / program};
  words.insert(words.end(), arguments.begin(), arguments.end());
  std::vector<std::string> variables{"HOME=" + home_.path(),
                                     "BRIVOD_RUNTIME_DIR=" + (home_ / "run"),
                                     "BRIVOD_VOLUME_ROOTS=" + (home_ / "mounts"),
                                     "BRIVOD_VOLUME_FOLDERS=" + volumes_,
                                     "XDG_DATA_HOME=" + (home_ / "data"),
                                     "XDG_CONFIG_HOME=" + (home_ / "config"),
                                     "XDG_DATA_DIRS=" + (buildFolder() / "share").string()};
  const std::string log = home_ / "log";
  const std::vector<char*> argv = pointersTo(words);
  const std::vector<char*> environment = pointersTo(variables);
  const pid_t child = ::fork();
  if (child < 0) throw std::runtime_error("cannot fork");
  if (child > 0) return child;
  ::prctl(PR_SET_PDEATHSIG, SIGTERM);
  const int fd = ::open(log.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
  ::dup2(fd, STDERR_FILENO);
  ::dup2(fd, STDOUT_FILENO);
  ::execve(argv[0], argv.data(), environment.data());
  ::_exit(127);
}

std::size_t ServiceProcess::threadCount() const {
  const fs::directory_iterator tasks("/proc/" + std::to_string(pid_) + "/task");
  return static_cast<std::size_t>(std::distance(fs::begin(tasks), fs::end(tasks)));
}

double ServiceProcess::residentKilobytes() const {
  std::ifstream status("/proc/" + std::to_string(pid_) + "/status");
  for (std::string word; status >> word;) {
    double kilobytes = 0;
    if (word == "VmRSS:" && status >> kilobytes) return kilobytes;
  }
  throw std::runtime_error("brivod has ended: " + test::readFile(home_ / "log"));
}

double ServiceProcess::settledKilobytes() const {
  double last = residentKilobytes();
  for (int i = 0; i < kMostLooks; ++i) {
    std::this_thread::sleep_for(kLookInterval);
    const double now = residentKilobytes();
    if (std::abs(now - last) < kUnchangedKilobytes) return now;
    last = now;
  }
  return last;
}

}  // namespace brivo::bench
