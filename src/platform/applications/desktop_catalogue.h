// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <vector>

#include "platform/applications/file_stamp.h"
#include "platform/applications/installed_applications.h"
#include "platform/base/mutex.h"

namespace brivo {

/// The desktop files of this machine, read again when one of them or of their folders has changed, and until
/// nothing of them failed to be read. What could not be read is as it was when it last could.
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
    std::string file;
    std::string identifier;
    std::string program;  ///< a path or a name to be looked up; empty when its file was never read
  };
  struct Reading {
    std::vector<Application> applications;    // by precedence
    std::map<std::string, FileStamp> stamps;  // of all files and folders, from before they were read
    bool hasAllFolders = true;
    bool hasAllFiles = true;
  };

  void refresh() const BRIVO_REQUIRES(mutex_);
  void readFolder(Reading& reading, const std::string& folder, const std::string& prefix, bool ofUser) const
      BRIVO_REQUIRES(mutex_);
  void readFile(Reading& reading, const std::string& path, const std::string& identifier, bool ofUser) const
      BRIVO_REQUIRES(mutex_);
  void keepFolder(Reading& reading, const std::string& folder) const BRIVO_REQUIRES(mutex_);
  void keepFile(Reading& reading, const std::string& path, const std::string& identifier) const
      BRIVO_REQUIRES(mutex_);

  const std::string userDataDir_;
  const std::vector<std::string> dataDirs_;
  const std::string vendorPrefix_;

  mutable Mutex mutex_;
  mutable Reading reading_ BRIVO_GUARDED_BY(mutex_);
  mutable bool settled_ BRIVO_GUARDED_BY(mutex_) = false;  // all was read, and not just after it had changed
};

}  // namespace brivo
