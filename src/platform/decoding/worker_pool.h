// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "platform/base/data.h"
#include "platform/base/mutex.h"
#include "platform/base/unique_fd.h"
#include "platform/decoding/child_keeper.h"
#include "platform/decoding/worker_process.h"
#include "platform/decoding/worker_protocol.h"

namespace brivo {

struct WorkerOptions {
  /// Path of the worker program; see installedWorkerProgram().
  std::string program;
  /// Processes at most.
  std::size_t workers = defaultWorkerCount();
  /// Wall time for one request, from when a worker takes it.
  std::chrono::milliseconds budget = std::chrono::seconds(30);
  /// After so many files a worker is replaced, so that what libraries leak stays small.
  std::size_t filesPerWorker = 500;
  /// Lines about the workers: which protections are in force, once, and why none can be had, at most once a
  /// minute. Called on any thread, possibly on several at once. May be empty.
  std::function<void(std::string_view)> log;

  /// One per core, at least two.
  static std::size_t defaultWorkerCount();
};

/// Processes that work for one request at a time each. The first is started in advance, the others when there
/// is no idle one, and all are kept. Who comes first is served first. One that fails a request, or has served
/// long enough, is replaced. *Thread-safe.*
class WorkerPool {
 public:
  /// How long a process has until it is ready.
  static constexpr std::chrono::seconds kStartTime{10};
  static constexpr std::chrono::minutes kComplaintInterval{1};

  struct Answer {
    WorkerReply reply;  ///< its status is WorkerStatus::done
    UniqueFd result;    ///< a memory file with at least the bytes of the reply, sealed for good
  };

  explicit WorkerPool(WorkerOptions options);
  /// Ends the workers, and with them requests of other threads, which get no answer.
  ~WorkerPool();
  WorkerPool(const WorkerPool&) = delete;
  WorkerPool& operator=(const WorkerPool&) = delete;

  /// Waits for a worker and for its reply. None when there is nothing, no worker can be had, or the worker
  /// failed; also when `file` is open for writing, which no worker may be handed. A request that a worker
  /// died without taking goes to one other worker.
  std::optional<Answer> ask(const WorkerRequest& request, const UniqueFd& file) BRIVO_EXCLUDES(mutex_);

 private:
  using Clock = WorkerProcess::Clock;
  class Turn;

  bool beginTurn() BRIVO_EXCLUDES(mutex_);
  void endTurn() BRIVO_EXCLUDES(mutex_);

  /// Of a turn; null, with a complaint, when none can be started. Goes to one of the three below.
  std::unique_ptr<WorkerProcess> takeIdleOrStart() BRIVO_EXCLUDES(mutex_);
  std::unique_ptr<WorkerProcess> start() BRIVO_EXCLUDES(mutex_);
  void putBack(std::unique_ptr<WorkerProcess> worker) BRIVO_EXCLUDES(mutex_);
  void replace(std::unique_ptr<WorkerProcess> worker) BRIVO_EXCLUDES(mutex_);
  void discard(std::unique_ptr<WorkerProcess> worker) BRIVO_EXCLUDES(mutex_);

  WorkerProcess::Exchange tryOn(std::unique_ptr<WorkerProcess> worker, Clock::time_point readyBy,
                                const WorkerRequest& request, const UniqueFd& file, Answer& answer);
  void warmUp();
  bool isReady(WorkerProcess& worker, Clock::time_point readyBy) BRIVO_EXCLUDES(mutex_);
  void introduce(const WorkerHello& hello) BRIVO_EXCLUDES(mutex_);
  void complain(const std::string& trouble) BRIVO_EXCLUDES(mutex_);

  const WorkerOptions options_;
  ChildKeeper keeper_;

  Mutex mutex_;
  std::condition_variable_any changed_;
  bool ending_ BRIVO_GUARDED_BY(mutex_) = false;
  // Turns are numbered as their takers come, and begin in that order.
  std::uint64_t turnsWanted_ BRIVO_GUARDED_BY(mutex_) = 0;
  std::uint64_t turnsBegun_ BRIVO_GUARDED_BY(mutex_) = 0;
  std::uint64_t turnsEnded_ BRIVO_GUARDED_BY(mutex_) = 0;
  std::vector<std::unique_ptr<WorkerProcess>> idle_ BRIVO_GUARDED_BY(mutex_);
  std::set<WorkerProcess*> busy_ BRIVO_GUARDED_BY(mutex_);  // each is owned by a turn
  bool introduced_ BRIVO_GUARDED_BY(mutex_) = false;
  std::optional<Clock::time_point> lastComplaint_ BRIVO_GUARDED_BY(mutex_);

  std::thread warmUp_;  // last: uses everything above
};

/// The bytes of an answer; none when there is none, or it is empty.
std::optional<Data> resultOf(std::optional<WorkerPool::Answer> answer);

}  // namespace brivo
