// SPDX-License-Identifier: MIT
#include "platform/decoding/worker_pool.h"

#include <fcntl.h>

#include <algorithm>
#include <utility>

#include "platform/base/memfd.h"
#include "platform/base/memory_file.h"

namespace brivo {

namespace {

bool isForReadingAlone(const UniqueFd& file) {
  const int flags = ::fcntl(file.get(), F_GETFL);
  return flags >= 0 && (flags & O_ACCMODE) == O_RDONLY;
}

std::string protections(const WorkerHello& hello) {
  std::string text = "imaging worker: no new privileges, seccomp, ";
  text += hello.landlockAbi == 0 ? "no Landlock" : "Landlock ABI " + std::to_string(hello.landlockAbi);
  return text + (hello.memoryLimited != 0 ? ", limits on memory, descriptors and file size"
                                          : ", limits on descriptors and file size, no limit on memory");
}

}  // namespace

std::size_t WorkerOptions::defaultWorkerCount() { return std::max(2U, std::thread::hardware_concurrency()); }

/// The right to use one worker.
class WorkerPool::Turn {
 public:
  explicit Turn(WorkerPool& pool) : pool_(pool), granted_(pool.beginTurn()) {}
  ~Turn() { pool_.endTurn(); }
  Turn(const Turn&) = delete;
  Turn& operator=(const Turn&) = delete;

  explicit operator bool() const { return granted_; }

 private:
  WorkerPool& pool_;
  const bool granted_;
};

WorkerPool::WorkerPool(WorkerOptions options) : options_(std::move(options)), warmUp_([this] { warmUp(); }) {}

WorkerPool::~WorkerPool() {
  {
    const MutexLock lock(mutex_);
    ending_ = true;
    for (const WorkerProcess* worker : busy_) worker->kill();
    changed_.notify_all();
    while (turnsEnded_ != turnsWanted_) changed_.wait(mutex_);
  }
  warmUp_.join();
}

bool WorkerPool::beginTurn() {
  const MutexLock lock(mutex_);
  const std::uint64_t number = turnsWanted_++;
  const std::size_t most = std::max<std::size_t>(1, options_.workers);
  while (!ending_ && (number != turnsBegun_ || turnsBegun_ - turnsEnded_ >= most)) changed_.wait(mutex_);
  ++turnsBegun_;
  changed_.notify_all();
  return !ending_;
}

void WorkerPool::endTurn() {
  const MutexLock lock(mutex_);
  ++turnsEnded_;
  changed_.notify_all();
}

std::unique_ptr<WorkerProcess> WorkerPool::takeIdleOrStart() {
  {
    const MutexLock lock(mutex_);
    if (!idle_.empty()) {
      auto worker = std::move(idle_.back());
      idle_.pop_back();
      busy_.insert(worker.get());
      return worker;
    }
  }
  return start();
}

std::unique_ptr<WorkerProcess> WorkerPool::start() {
  {
    const MutexLock lock(mutex_);
    if (ending_) return nullptr;
  }
  auto started = WorkerProcess::start(keeper_, options_.program);
  if (!started) {
    complain("cannot " + started.error().text());
    return nullptr;
  }
  auto worker = *std::move(started);
  const MutexLock lock(mutex_);
  busy_.insert(worker.get());
  if (ending_) worker->kill();
  return worker;
}

void WorkerPool::putBack(std::unique_ptr<WorkerProcess> worker) {
  if (worker->requestCount() >= options_.filesPerWorker) return replace(std::move(worker));
  const MutexLock lock(mutex_);
  busy_.erase(worker.get());
  idle_.push_back(std::move(worker));
}

void WorkerPool::replace(std::unique_ptr<WorkerProcess> worker) {
  discard(std::move(worker));
  if (auto fresh = start()) putBack(std::move(fresh));
}

void WorkerPool::discard(std::unique_ptr<WorkerProcess> worker) {
  const MutexLock lock(mutex_);
  busy_.erase(worker.get());
}

bool WorkerPool::isReady(WorkerProcess& worker, Clock::time_point readyBy) {
  const auto& hello = worker.awaitHello(readyBy);
  if (hello) introduce(*hello);
  return hello.has_value();
}

/// What a request does, without the request.
void WorkerPool::warmUp() {
  const Turn turn(*this);
  auto worker = turn ? takeIdleOrStart() : nullptr;
  if (!worker) return;
  if (isReady(*worker, Clock::now() + kStartTime)) return putBack(std::move(worker));
  discard(std::move(worker));
  complain(options_.program + " does not get ready");
}

std::optional<WorkerPool::Answer> WorkerPool::ask(const WorkerRequest& request, const UniqueFd& file) {
  using Exchange = WorkerProcess::Exchange;
  if (!isForReadingAlone(file)) return std::nullopt;
  const Turn turn(*this);
  if (!turn) return std::nullopt;
  const auto readyBy = Clock::now() + kStartTime;
  Answer answer;
  Exchange outcome = tryOn(takeIdleOrStart(), readyBy, request, file, answer);
  if (outcome == Exchange::notTaken) outcome = tryOn(start(), readyBy, request, file, answer);
  if (outcome == Exchange::notTaken) complain(options_.program + " does not get ready");
  if (outcome != Exchange::done || answer.reply.status != WorkerStatus::done) return std::nullopt;
  return answer;
}

WorkerProcess::Exchange WorkerPool::tryOn(std::unique_ptr<WorkerProcess> worker, Clock::time_point readyBy,
                                          const WorkerRequest& request, const UniqueFd& file,
                                          Answer& answer) {
  using Exchange = WorkerProcess::Exchange;
  answer.result = makeMemfd("picture", 0);
  if (!worker || !answer.result) {
    if (worker) putBack(std::move(worker));
    return Exchange::fault;
  }
  Exchange outcome = Exchange::notTaken;
  if (isReady(*worker, readyBy)) {
    outcome = worker->exchange(request, file.get(), answer.result.get(), Clock::now() + options_.budget,
                               answer.reply);
  }
  if (outcome == Exchange::done) putBack(std::move(worker));
  if (outcome == Exchange::notTaken) discard(std::move(worker));
  if (outcome == Exchange::fault) replace(std::move(worker));
  return outcome;
}

void WorkerPool::introduce(const WorkerHello& hello) {
  {
    const MutexLock lock(mutex_);
    if (std::exchange(introduced_, true)) return;
  }
  if (options_.log) options_.log(protections(hello));
}

void WorkerPool::complain(const std::string& trouble) {
  {
    const MutexLock lock(mutex_);
    const auto now = Clock::now();
    if (ending_ || (lastComplaint_ && now - *lastComplaint_ < kComplaintInterval)) return;
    lastComplaint_ = now;
  }
  if (options_.log) options_.log("imaging worker: " + trouble);
}

std::optional<Data> resultOf(std::optional<WorkerPool::Answer> answer) {
  if (!answer || answer->reply.byteCount == 0) return std::nullopt;
  return dataFromSealedMemfd(std::move(answer->result), answer->reply.byteCount);
}

}  // namespace brivo
