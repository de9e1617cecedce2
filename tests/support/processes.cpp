// SPDX-License-Identifier: MIT
#include "support/processes.h"

#include <filesystem>
#include <fstream>
#include <optional>
#include <sstream>
#include <string>

namespace brivo::test {

namespace {

struct Status {
  char state = 0;
  pid_t parent = 0;
};

/// Of proc(5)'s "stat", where the name in parentheses may hold anything.
std::optional<Status> statusOf(const std::string& folder) {
  std::ifstream file(folder + "/stat");
  std::stringstream text;
  text << file.rdbuf();
  const std::string line = text.str();
  const auto name = line.rfind(')');
  if (name == std::string::npos) return std::nullopt;
  std::istringstream rest(line.substr(name + 1));
  Status status;
  rest >> status.state >> status.parent;
  return status;
}

}  // namespace

std::vector<pid_t> childrenOf(pid_t process) {
  std::vector<pid_t> children;
  for (const auto& entry : std::filesystem::directory_iterator("/proc")) {
    const std::string name = entry.path().filename();
    if (name.find_first_not_of("0123456789") != std::string::npos) continue;
    const auto status = statusOf(entry.path());
    if (status && status->parent == process) children.push_back(std::stoi(name));
  }
  return children;
}

bool isRunning(pid_t process) {
  const auto status = statusOf("/proc/" + std::to_string(process));
  return status && status->state != 'Z' && status->state != 'X';
}

bool isBlocked(pid_t thread) {
  const auto status = statusOf("/proc/" + std::to_string(thread));
  return status && status->state == 'S';
}

}  // namespace brivo::test
