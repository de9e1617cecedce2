// SPDX-License-Identifier: MIT
#include "platform/volumes/volume_monitor.h"

#include "platform/volumes/monitor_thread.h"

namespace brivo {

namespace {

/// What a token points to.
struct Monitoring {
  std::unique_ptr<MonitorThread> thread;
};

}  // namespace

VolumeMonitor::VolumeMonitor(Pool& pool, std::vector<std::string> roots, std::vector<std::string> folders)
    : pool_(pool), roots_(std::move(roots)), folders_(std::move(folders)) {}

DomainMonitor::Token VolumeMonitor::beginMonitoring(DomainChangeHandler handler) {
  auto monitoring = std::make_shared<Monitoring>();
  monitoring->thread = std::make_unique<MonitorThread>(pool_, roots_, folders_, handler);
  if (const auto error = monitoring->thread->start()) {
    handler(*error);
    return nullptr;
  }
  return monitoring;
}

void VolumeMonitor::endMonitoring(const Token& token) {
  if (token) static_cast<Monitoring*>(token.get())->thread.reset();
}

}  // namespace brivo
