// SPDX-License-Identifier: MIT
// Real mounts for tests that run as root.
#pragma once

#include <string>

#include "platform/base/unique_fd.h"
#include "support/temporary_folder.h"

namespace brivo::test {

/// Moves this process into a mount namespace of its own, so that nothing it mounts outlives it. False when
/// the process may not; then tests that mount skip themselves.
bool enterMountNamespace();

/// An ext4 file system in an image file, mounted through a loop device while this lives.
class LoopMount {
 public:
  /// Mounts at `point`, which is made when missing. The image has `megabytes`.
  explicit LoopMount(const std::string& point, int megabytes = 16);
  ~LoopMount();
  LoopMount(const LoopMount&) = delete;
  LoopMount& operator=(const LoopMount&) = delete;

  const std::string& point() const { return point_; }
  /// An ordinary unmount: false when the file system is busy.
  bool unmount();
  /// Takes the medium away from under the file system: what is not in memory cannot be read any more.
  void yank() const;

 private:
  TemporaryFolder image_;
  std::string point_;
  bool mounted_ = false;
};

/// A FUSE file system whose server never answers: whoever asks it something waits, until this goes.
class HungMount {
 public:
  explicit HungMount(const std::string& point);
  ~HungMount();
  HungMount(const HungMount&) = delete;
  HungMount& operator=(const HungMount&) = delete;

 private:
  std::string point_;
  UniqueFd server_;
};

/// Mounts `source` of `type` at `point`; the process's namespace cleans up.
void mountAt(const std::string& source, const std::string& point, const char* type);
void bindMount(const std::string& from, const std::string& point);
void unmountAt(const std::string& point);

}  // namespace brivo::test
