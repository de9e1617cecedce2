// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_catalogue.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
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
constexpr off_t kLargestFile = 262'144;
/// What changed less than this before it was read may change again without its time telling.
constexpr std::int64_t kTimeGranularity = 2'000'000'000;

std::int64_t now() {
  const auto time = std::chrono::system_clock::now().time_since_epoch();
  return std::chrono::duration_cast<std::chrono::nanoseconds>(time).count();
}

/// Whether the last of its changes lies so far back that a further one would have given it another stamp.
bool isOld(const FileStamp& stamp, std::int64_t time) {
  return time - std::max(stamp.modified, stamp.changed) > kTimeGranularity;
}

bool isExecutable(const std::string& path, const FileStamp& stamp) {
  return stamp.isFile() && ::access(path.c_str(), X_OK) == 0;
}

bool mayBeExecutable(const std::string& path) {
  const FileStamp stamp = FileStamp::of(path);
  return stamp.isUnknown() || isExecutable(path, stamp);
}

bool mayBeFolder(const std::string& path) {
  const FileStamp stamp = FileStamp::of(path);
  return stamp.isUnknown() || stamp.isFolder();
}

/// The file that a shell would run for the name of a program.
FileStamp programInPath(const std::string& name) {
  const char* variable = std::getenv("PATH");
  std::string_view rest = variable ? variable : "/usr/local/bin:/usr/bin:/bin";
  while (!rest.empty()) {
    const auto colon = rest.find(':');
    const std::string path = appendingPathComponent(rest.substr(0, colon), name);
    const FileStamp stamp = path.starts_with('/') ? FileStamp::of(path) : FileStamp();
    if (isExecutable(path, stamp)) return stamp;
    rest = colon == std::string_view::npos ? std::string_view() : rest.substr(colon + 1);
  }
  return {};
}

FileStamp programCalled(const std::string& program) {
  if (program.starts_with('/')) return FileStamp::of(program);
  return program.empty() || program.find('/') != std::string::npos ? FileStamp() : programInPath(program);
}

/// Adds the names in a folder to `names`. 0, or the error that ended it.
int listNames(const std::string& folder, std::vector<std::string>& names) {
  const Directory directory = listDirectory(folder);
  if (!directory) return errno;
  for (;;) {
    errno = 0;
    const dirent* entry = ::readdir(directory.get());
    if (!entry) return errno;
    names.emplace_back(entry->d_name);
  }
}

std::optional<std::string> readText(const std::string& path) {
  const UniqueFd fd(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  return readSmallFile(fd.get(), std::size_t{kLargestFile});
}

}  // namespace

DesktopCatalogue::DesktopCatalogue(std::string userDataDir, std::vector<std::string> dataDirs,
                                   std::string vendorPrefix)
    : userDataDir_(std::move(userDataDir)),
      dataDirs_(std::move(dataDirs)),
      vendorPrefix_(std::move(vendorPrefix)) {}

bool DesktopCatalogue::isInstalled(const std::string& identifier) const {
  if (identifier.starts_with('/')) return mayBeExecutable(identifier);
  if (identifier.empty() || identifier.find('/') != std::string::npos) return false;
  if (mayBeFolder("/snap/" + identifier) || mayBeFolder("/var/lib/snapd/snap/" + identifier)) return true;
  const MutexLock lock(mutex_);
  refresh();
  const auto& applications = reading_.applications;
  return std::ranges::find(applications, identifier, &Application::identifier) != applications.end() ||
         !reading_.hasAllFolders;
}

std::optional<std::string> DesktopCatalogue::identifierOfProgram(dev_t device, ino_t inode) const {
  const MutexLock lock(mutex_);
  refresh();
  for (const Application& application : reading_.applications) {
    const FileStamp program = programCalled(application.program);
    if (program.mode != 0 && program.device == device && program.inode == inode)
      return application.identifier;
  }
  return std::nullopt;
}

void DesktopCatalogue::refresh() const {
  const auto isUnchanged = [](const auto& entry) { return FileStamp::of(entry.first) == entry.second; };
  if (settled_ && std::ranges::all_of(reading_.stamps, isUnchanged)) return;
  Reading reading;
  readFolder(reading, appendingPathComponent(userDataDir_, "applications"), "", true);
  readFolder(reading, appendingPathComponent(userDataDir_, "flatpak/exports/share/applications"), "", true);
  for (const std::string& folder : dataDirs_)
    readFolder(reading, appendingPathComponent(folder, "applications"), "", false);
  for (const char* folder :
       {"/var/lib/flatpak/exports/share/applications", "/var/lib/snapd/desktop/applications"}) {
    readFolder(reading, folder, "", false);
  }
  reading_ = std::move(reading);
  const auto isSettled = [time = now()](const auto& entry) { return isOld(entry.second, time); };
  settled_ =
      reading_.hasAllFolders && reading_.hasAllFiles && std::ranges::all_of(reading_.stamps, isSettled);
}

/// A file in a sub-folder has the folder's name and a dash before its own in its id.
void DesktopCatalogue::readFolder(Reading& reading, const std::string& folder, const std::string& prefix,
                                  bool ofUser) const {
  if (reading.stamps.contains(folder) || std::ranges::count(prefix, '-') >= kDeepestFolder) return;
  reading.stamps[folder] = FileStamp::of(folder);
  std::vector<std::string> names;
  if (const int error = listNames(folder, names)) {
    if (!meansNothingThere(error)) keepFolder(reading, folder);
    return;
  }
  std::ranges::sort(names);
  for (const std::string& name : names) {
    const std::string path = appendingPathComponent(folder, name);
    if (pathExtension(name) == "desktop") {
      readFile(reading, path, prefix + std::string(deletingPathExtension(name)), ofUser);
    } else if (!name.starts_with('.') && mayBeFolder(path)) {
      readFolder(reading, path, prefix + name + "-", ofUser);
    }
  }
}

void DesktopCatalogue::readFile(Reading& reading, const std::string& path, const std::string& identifier,
                                bool ofUser) const {
  if (ofUser && identifier.starts_with(vendorPrefix_)) return;
  const FileStamp stamp = reading.stamps[path] = FileStamp::of(path);
  if (!stamp.isUnknown() && (!stamp.isFile() || stamp.size > kLargestFile)) return;
  const auto text = readText(path);
  if (!text) return keepFile(reading, path, identifier);
  if (const auto entry = parseDesktopEntry(*text))
    reading.applications.push_back({path, identifier, entry->program});
}

void DesktopCatalogue::keepFolder(Reading& reading, const std::string& folder) const {
  reading.hasAllFolders = false;
  for (const Application& application : reading_.applications)
    if (isAtOrBelow(application.file, folder)) reading.applications.push_back(application);
}

/// A file that is there and was never read is that of an application about which no more is known.
void DesktopCatalogue::keepFile(Reading& reading, const std::string& path,
                                const std::string& identifier) const {
  reading.hasAllFiles = false;
  const auto before = std::ranges::find(reading_.applications, path, &Application::file);
  reading.applications.push_back(before != reading_.applications.end() ? *before
                                                                       : Application{path, identifier, ""});
}

}  // namespace brivo
