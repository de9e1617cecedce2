// SPDX-License-Identifier: MIT
// Where things are: the XDG base directories and the service's own variables.
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace brivo {

/// What the environment says, with the defaults filled in (XDG Base Directory Specification 0.8;
/// relative paths in the variables are ignored, as it demands). *Immutable.*
struct Settings {
  /// $XDG_DATA_HOME, else ~/.local/share.
  std::string dataHome;
  /// $XDG_CONFIG_HOME, else ~/.config.
  std::string configHome;
  /// $XDG_DATA_DIRS, else /usr/local/share and /usr/share; most important first.
  std::vector<std::string> dataDirs;
  /// The data directory that this build installs to.
  std::string installedDataDir;
  /// $BRIVOD_RUNTIME_DIR, else $XDG_RUNTIME_DIR/brivod, else /run/brivod for root; else empty.
  std::string runtimeDir;
  /// $BRIVOD_VOLUME_ROOTS, else /media, /run/media and /mnt: mounts at or below them are volumes.
  std::vector<std::string> volumeRoots;
  /// $BRIVOD_VOLUME_FOLDERS, else none: every sub-folder of one is a volume.
  std::vector<std::string> volumeFolders;
  /// $BRIVOD_IDLE_SECONDS, none when unset or no number.
  std::optional<std::chrono::seconds> idleTime;

  /// True when a message bus started the process for somebody who calls it ($DBUS_STARTER_ADDRESS).
  bool startedByBus = false;

  static Settings fromEnvironment();

  /// The first existing `relativePath` below the data directories or the installed one; empty when
  /// none.
  std::string findDataFile(const std::string& relativePath) const;
};

}  // namespace brivo
