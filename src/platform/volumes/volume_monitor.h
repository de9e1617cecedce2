// SPDX-License-Identifier: MIT
#pragma once

#include "platform/volumes/domain_monitor.h"
#include "platform/work/pool.h"

namespace brivo {

/// The DomainMonitor over the kernel's mount table and inotify. It sleeps until one of them has something to
/// tell.
class VolumeMonitor final : public DomainMonitor {
 public:
  /// Mounts at or below `roots` and sub-folders of `folders` are looked at. `pool` runs what may wait for a
  /// medium, and must outlive the monitor.
  VolumeMonitor(Pool& pool, std::vector<std::string> roots, std::vector<std::string> folders);

  Token beginMonitoring(DomainChangeHandler handler) override;
  void endMonitoring(const Token& token) override;

 private:
  Pool& pool_;
  const std::vector<std::string> roots_;
  const std::vector<std::string> folders_;
};

}  // namespace brivo
