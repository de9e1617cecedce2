// SPDX-License-Identifier: MIT
#include "service_process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <stdexcept>

#include "command.h"
#include "platform/base/unique_fd.h"
#include "support/wait.h"

namespace brivo::bench {

namespace fs = std::filesystem;

namespace {

fs::path ownProgram() { return fs::read_symlink("/proc/self/exe"); }
/// The folder of the build that this program belongs to.
fs::path buildFolder() { return ownProgram().parent_path().parent_path(); }

}  // namespace

std::string builtProgram(const std::string& name) { return buildFolder() / "bin" / name; }

ServiceProcess::ServiceProcess(const std::string& volumes) : volumes_(volumes) {
  test::makeFolder(home_ / "data");
  for (const std::string& program : {ownProgram().string(), builtProgram("brivoctl")}) {
    if (brivoctl({"access", "grant", program}) != 0) {
      throw std::runtime_error("brivoctl access grant failed: " + log());
    }
  }
  pid_ = start("brivod", {});
  if (!test::waitUntil([this] { return fs::exists(managerSocket()); })) {
    throw std::runtime_error("brivod did not start: " + log());
  }
}

ServiceProcess::~ServiceProcess() {
  if (pid_ < 0) return;
  ::kill(pid_, SIGTERM);
  ::waitpid(pid_, nullptr, 0);
}

pid_t ServiceProcess::start(const std::string& program, const std::vector<std::string>& arguments) const {
  std::vector<std::string> words{builtProgram(program)};
  words.insert(words.end(), arguments.begin(), arguments.end());
  const UniqueFd file(::open((home_ / "log").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600));
  return bench::start({std::move(words),
                       {"HOME=" + home_.path(), "BRIVOD_RUNTIME_DIR=" + (home_ / "run"),
                        "BRIVOD_VOLUME_ROOTS=" + (home_ / "mounts"), "BRIVOD_VOLUME_FOLDERS=" + volumes_,
                        "XDG_DATA_HOME=" + (home_ / "data"), "XDG_CONFIG_HOME=" + (home_ / "config"),
                        "XDG_DATA_DIRS=" + (buildFolder() / "share").string()},
                       file.get(),
                       file.get()});
}

int ServiceProcess::brivoctl(const std::vector<std::string>& arguments) const {
  return exitCodeOf(start("brivoctl", arguments));
}

std::string ServiceProcess::log() const { return test::readFile(home_ / "log"); }

}  // namespace brivo::bench
