// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace brivo {

/// Which applications there are on this machine. *Thread-safe.*
class InstalledApplications {
 public:
  virtual ~InstalledApplications() = default;

  /// True for the id of a desktop file, for the name of a snap, and for the absolute path of an executable
  /// file; also when it cannot be told, because what would say so cannot be read.
  virtual bool isInstalled(const std::string& identifier) const = 0;
  /// The id of the desktop file whose program is the file with this device and inode number; of several the
  /// first by the precedence of their folders and then by name. None when there is none.
  virtual std::optional<std::string> identifierOfProgram(dev_t device, ino_t inode) const = 0;
};

}  // namespace brivo
