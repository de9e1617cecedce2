// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <condition_variable>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "platform/base/mutex.h"
#include "platform/base/unique_fd.h"
#include "platform/volumes/domain_monitor.h"
#include "platform/volumes/volume_scan.h"
#include "platform/work/pool.h"

namespace brivo {

/// One monitoring: a thread that waits for the mount table and for inotify, compares what could be a volume
/// with what it knew, and has the pool look into what is new. A volume that does not answer the look is not
/// reported and holds up no other. *Thread-bound* to its own thread where not said otherwise.
class MonitorThread {
 public:
  /// Events come in bursts; a folder is looked at when it has settled for this long.
  static constexpr std::chrono::milliseconds kSettleTime{200};
  /// How long start() waits for volumes to answer.
  static constexpr std::chrono::milliseconds kPromptTime{1000};

  MonitorThread(Pool& pool, std::vector<std::string> roots, std::vector<std::string> folders,
                DomainChangeHandler handler);
  /// Waits for the thread. Looks that are still waiting for a medium go on without it.
  ~MonitorThread();

  /// Any thread. An error when the kernel's services cannot be had.
  std::optional<SystemError> start();

 private:
  using Clock = std::chrono::steady_clock;

  /// What the pool found in a candidate.
  struct Finding {
    std::string path;
    std::string identity;
    bool containsPhotos;
    int watch;
  };
  /// How the pool hands its findings over; outlives the thread when a look does.
  struct Inbox {
    UniqueFd wake;
    UniqueFd inotify;
    Mutex mutex;
    std::vector<Finding> findings BRIVO_GUARDED_BY(mutex);
    bool ending BRIVO_GUARDED_BY(mutex) = false;
  };
  /// A candidate and what is known of it.
  struct Volume {
    VolumeCandidate candidate;
    std::optional<bool> containsPhotos;  // none until the first finding
    int watch = -1;
    bool looking = false;
    bool lookAgain = false;
  };

  void run();
  void wait();
  void readInotify();
  void takeFindings();
  void rescan();
  std::vector<VolumeCandidate> candidates() const;
  void watchFolders();
  void forget(const std::string& path);
  void look(Volume& volume);
  void report();
  void announceWhenAllAnswered();

  Pool& pool_;
  const std::vector<std::string> roots_;
  const std::vector<std::string> folders_;
  const DomainChangeHandler handler_;
  const std::shared_ptr<Inbox> inbox_;

  UniqueFd mountinfo_;
  std::map<std::string, Volume> volumes_;
  std::set<int> folderWatches_;
  bool rescanNow_ = true;
  std::optional<Clock::time_point> settled_;  // when to look at what inotify told
  std::set<int> touched_;                     // watches of volumes that changed

  Mutex mutex_;
  std::condition_variable_any answered_;
  bool allAnswered_ BRIVO_GUARDED_BY(mutex_) = false;

  std::thread thread_;  // last: uses everything above
};

}  // namespace brivo
