// SPDX-License-Identifier: MIT
#include "platform/settings/settings.h"

#include <pwd.h>
#include <unistd.h>

#include <charconv>
#include <cstdlib>
#include <string_view>

#include "platform/base/paths.h"

namespace brivo {

namespace {

std::string_view variable(const char* name) {
  const char* value = std::getenv(name);
  return value ? std::string_view(value) : std::string_view();
}

/// The absolute paths of a colon list, without repeats of empty fields and without trailing
/// slashes.
std::vector<std::string> pathList(std::string_view list) {
  std::vector<std::string> paths;
  while (!list.empty()) {
    const auto colon = list.find(':');
    std::string_view path = list.substr(0, colon);
    list = colon == std::string_view::npos ? std::string_view() : list.substr(colon + 1);
    while (path.size() > 1 && path.ends_with('/')) path.remove_suffix(1);
    if (path.starts_with('/')) paths.emplace_back(path);
  }
  return paths;
}

std::string homeFolder() {
  const std::string_view home = variable("HOME");
  if (home.starts_with('/')) return std::string(home);
  const passwd* entry = ::getpwuid(::getuid());
  return entry && entry->pw_dir ? entry->pw_dir : "/";
}

std::string folderOr(const char* name, const std::string& fallback) {
  const std::string_view value = variable(name);
  return value.starts_with('/') ? std::string(value) : fallback;
}

std::string runtimeFolder() {
  if (const auto own = variable("BRIVOD_RUNTIME_DIR"); own.starts_with('/')) return std::string(own);
  const auto xdg = variable("XDG_RUNTIME_DIR");
  if (xdg.starts_with('/')) return appendingPathComponent(xdg, "brivod");
  return ::getuid() == 0 ? "/run/brivod" : "";
}

std::optional<std::chrono::seconds> seconds(std::string_view text) {
  unsigned count = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return std::chrono::seconds(count);
}

}  // namespace

Settings Settings::fromEnvironment() {
  const std::string home = homeFolder();
  Settings settings;
  settings.dataHome = folderOr("XDG_DATA_HOME", appendingPathComponent(home, ".local/share"));
  settings.configHome = folderOr("XDG_CONFIG_HOME", appendingPathComponent(home, ".config"));
  settings.dataDirs = pathList(variable("XDG_DATA_DIRS"));
  if (settings.dataDirs.empty()) settings.dataDirs = {"/usr/local/share", "/usr/share"};
  settings.installedDataDir = BRIVOD_INSTALLED_DATA_DIR;
  settings.runtimeDir = runtimeFolder();
  const char* roots = std::getenv("BRIVOD_VOLUME_ROOTS");
  settings.volumeRoots = pathList(roots ? roots : "/media:/run/media:/mnt");
  settings.volumeFolders = pathList(variable("BRIVOD_VOLUME_FOLDERS"));
  settings.idleTime = seconds(variable("BRIVOD_IDLE_SECONDS"));
  settings.startedByBus = !variable("DBUS_STARTER_ADDRESS").empty();
  return settings;
}

std::string Settings::findDataFile(const std::string& relativePath) const {
  for (const std::string& folder : dataDirs) {
    std::string path = appendingPathComponent(folder, relativePath);
    if (::access(path.c_str(), F_OK) == 0) return path;
  }
  std::string installed = appendingPathComponent(installedDataDir, relativePath);
  return ::access(installed.c_str(), F_OK) == 0 ? installed : std::string();
}

}  // namespace brivo
