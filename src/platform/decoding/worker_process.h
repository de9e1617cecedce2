// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"
#include "platform/decoding/child_keeper.h"
#include "platform/decoding/worker_protocol.h"

namespace brivo {

/// One process of the worker program. It is ready when it has said hello; then it takes one request after the
/// other, until the first that ends in a fault. *Thread-bound* but for kill().
class WorkerProcess {
 public:
  using Clock = std::chrono::steady_clock;

  enum class Exchange {
    done,      ///< it replied, by the rules
    notTaken,  ///< it was dead, or out of step, before it took the request
    fault,     ///< it died, took too long or broke the rules; not to be used again
  };

  /// Starts one, without waiting until it is ready.
  static Result<std::unique_ptr<WorkerProcess>> start(ChildKeeper& keeper, const std::string& program);
  /// Kills the process.
  ~WorkerProcess();
  WorkerProcess(const WorkerProcess&) = delete;
  WorkerProcess& operator=(const WorkerProcess&) = delete;

  /// Waits for its hello; at once when that was heard before. None when it did not say it, and never will.
  const std::optional<WorkerHello>& awaitHello(Clock::time_point deadline);
  /// Hands over a request with `file`, open for reading alone, and `result`, an empty memory file. After
  /// done, `reply` is set, and the bytes it speaks of are in `result`, sealed for good.
  Exchange exchange(const WorkerRequest& request, int file, int result, Clock::time_point deadline,
                    WorkerReply& reply);
  /// Requests that were handed over.
  std::size_t requestCount() const { return requestCount_; }

  /// Ends the process, and with it whatever waits for it here. Any thread.
  void kill() const;

 private:
  WorkerProcess(UniqueFd child, UniqueFd socket) : child_(std::move(child)), socket_(std::move(socket)) {}

  bool isSilent() const;
  bool send(const WorkerRequest& request, int file, int result) const;

  const UniqueFd child_;
  const UniqueFd socket_;
  std::optional<WorkerHello> hello_;
  std::size_t requestCount_ = 0;
};

}  // namespace brivo
