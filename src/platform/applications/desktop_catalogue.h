// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <vector>

#include "platform/applications/installed_applications.h"
#include "platform/base/mutex.h"

namespace brivo {

/// The desktop files of this machine, read again when one of them or of their folders has changed.
class DesktopCatalogue final : public InstalledApplications {
 public:
  /// `userDataDir` is the user's own data folder, `dataDirs` the system's. An id that begins with
  /// `vendorPrefix` counts only from the latter, because everybody can write the former.
  DesktopCatalogue(std::string userDataDir, std::vector<std::string> dataDirs, std::string vendorPrefix);

  bool isInstalled(const std::string& identifier) const override BRIVO_EXCLUDES(mutex_);
  std::optional<std::string> identifierOfProgram(dev_t device, ino_t inode) const override
      BRIVO_EXCLUDES(mutex_);

 private:
  struct Application {
    std::string identifier;
    std::string program;  ///< absolute path, empty when it was not found
  };
  /// When a file or folder was last changed, in nanoseconds since 1970; -1 when it is not there.
  using ChangeTimes = std::map<std::string, std::int64_t>;

  void refresh() const BRIVO_REQUIRES(mutex_);
  void readFolder(const std::string& folder, const std::string& prefix, bool ofUser) const
      BRIVO_REQUIRES(mutex_);
  void readFile(const std::string& path, const std::string& identifier, bool ofUser) const
      BRIVO_REQUIRES(mutex_);

  const std::string userDataDir_;
  const std::vector<std::string> dataDirs_;
  const std::string vendorPrefix_;

  mutable Mutex mutex_;
  mutable std::vector<Application> applications_ BRIVO_GUARDED_BY(mutex_);  // by precedence
  mutable ChangeTimes times_ BRIVO_GUARDED_BY(mutex_);
  mutable bool settled_ BRIVO_GUARDED_BY(mutex_) = false;  // nothing had changed just before it was read
};

}  // namespace brivo
