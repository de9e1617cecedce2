// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_catalogue.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>

#include "platform/applications/desktop_entry.h"
#include "platform/base/directory.h"
#include "platform/base/paths.h"
#include "platform/base/small_file.h"
#include "platform/base/unique_fd.h"

namespace brivo {

namespace {

constexpr int kDeepestFolder = 4;
constexpr std::size_t kLargestFile = 262'144;
/// What changed less than this before it was read may change again without its time telling.
constexpr std::int64_t kTimeGranularity = 2'000'000'000;

std::int64_t changeTime(const std::string& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return -1;
  return std::int64_t{status.st_mtim.tv_sec} * 1'000'000'000 + status.st_mtim.tv_nsec;
}

std::int64_t now() {
  const auto time = std::chrono::system_clock::now().time_since_epoch();
  return std::chrono::duration_cast<std::chrono::nanoseconds>(time).count();
}

bool isExecutableFile(const std::string& path) {
  struct stat status {};
  return ::stat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) && ::access(path.c_str(), X_OK) == 0;
}

bool isFolder(const std::string& path) {
  struct stat status {};
  return ::stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode);
}

/// The file that a shell would run for `program`.
std::string resolved(const std::string& program) {
  if (program.starts_with('/')) return program;
  if (program.find('/') != std::string::npos) return {};
  const char* variable = std::getenv("PATH");
  std::string_view rest = variable ? variable : "/usr/local/bin:/usr/bin:/bin";
  while (!rest.empty()) {
    const auto colon = rest.find(':');
    std::string path = appendingPathComponent(rest.substr(0, colon), program);
    if (path.starts_with('/') && isExecutableFile(path)) return path;
    rest = colon == std::string_view::npos ? std::string_view() : rest.substr(colon + 1);
  }
  return {};
}

std::optional<std::string> readText(const std::string& path) {
  const UniqueFd fd(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  return readSmallFile(fd.get(), kLargestFile);
}

}  // namespace

DesktopCatalogue::DesktopCatalogue(std::string userDataDir, std::vector<std::string> dataDirs,
                                   std::string vendorPrefix)
    : userDataDir_(std::move(userDataDir)),
      dataDirs_(std::move(dataDirs)),
      vendorPrefix_(std::move(vendorPrefix)) {}

bool DesktopCatalogue::isInstalled(const std::string& identifier) const {
  if (identifier.starts_with('/')) return isExecutableFile(identifier);
  if (identifier.empty() || identifier.find('/') != std::string::npos) return false;
  if (isFolder("/snap/" + identifier) || isFolder("/var/lib/snapd/snap/" + identifier)) return true;
  const MutexLock lock(mutex_);
  refresh();
  return std::ranges::find(applications_, identifier, &Application::identifier) != applications_.end();
}

std::optional<std::string> DesktopCatalogue::identifierOfProgram(dev_t device, ino_t inode) const {
  const MutexLock lock(mutex_);
  refresh();
  for (const Application& application : applications_) {
    struct stat status {};
    if (!application.program.empty() && ::stat(application.program.c_str(), &status) == 0 &&
        status.st_dev == device && status.st_ino == inode) {
      return application.identifier;
    }
  }
  return std::nullopt;
}

void DesktopCatalogue::refresh() const {
  const auto unchanged = [](const auto& entry) { return changeTime(entry.first) == entry.second; };
  if (settled_ && std::ranges::all_of(times_, unchanged)) return;
  applications_.clear();
  times_.clear();
  readFolder(appendingPathComponent(userDataDir_, "applications"), "", true);
  readFolder(appendingPathComponent(userDataDir_, "flatpak/exports/share/applications"), "", true);
  for (const std::string& folder : dataDirs_)
    readFolder(appendingPathComponent(folder, "applications"), "", false);
  for (const char* folder :
       {"/var/lib/flatpak/exports/share/applications", "/var/lib/snapd/desktop/applications"}) {
    readFolder(folder, "", false);
  }
  const std::int64_t time = now();
  settled_ =
      std::ranges::all_of(times_, [&](const auto& entry) { return time - entry.second > kTimeGranularity; });
}

/// A file in a sub-folder has the folder's name and a dash before its own in its id.
void DesktopCatalogue::readFolder(const std::string& folder, const std::string& prefix, bool ofUser) const {
  if (times_.contains(folder) || std::ranges::count(prefix, '-') >= kDeepestFolder) return;
  times_[folder] = changeTime(folder);
  const Directory directory = listDirectory(folder);
  if (!directory) return;
  std::vector<std::string> names;
  while (const dirent* entry = ::readdir(directory.get())) names.emplace_back(entry->d_name);
  std::ranges::sort(names);
  for (const std::string& name : names) {
    const std::string path = appendingPathComponent(folder, name);
    if (pathExtension(name) == "desktop") {
      readFile(path, prefix + std::string(deletingPathExtension(name)), ofUser);
    } else if (!name.starts_with('.') && isFolder(path)) {
      readFolder(path, prefix + name + "-", ofUser);
    }
  }
}

void DesktopCatalogue::readFile(const std::string& path, const std::string& identifier, bool ofUser) const {
  if (ofUser && identifier.starts_with(vendorPrefix_)) return;
  times_[path] = changeTime(path);
  const auto text = readText(path);
  const auto entry = text ? parseDesktopEntry(*text) : std::nullopt;
  if (entry) applications_.push_back({identifier, resolved(entry->program)});
}

}  // namespace brivo
