// SPDX-License-Identifier: MIT
#include "platform/decoding/child_keeper.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

#include "platform/decoding/process_reference.h"
#include "platform/decoding/spawn.h"
#include "platform/work/thread_name.h"

namespace brivo {

namespace {

void wakeUp(const UniqueFd& eventFd) {
  constexpr std::uint64_t one = 1;
  (void)!::write(eventFd.get(), &one, sizeof one);
}

/// True when the child had ended, and is no more.
bool reapIfEnded(const UniqueFd& child) {
  siginfo_t ended{};
  const int result = ::waitid(P_PIDFD, static_cast<id_t>(child.get()), &ended, WEXITED | WNOHANG);
  return result != 0 || ended.si_pid != 0;
}

}  // namespace

ChildKeeper::ChildKeeper()
    : wake_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      thread_(wake_ ? std::thread([this] { run(); }) : std::thread()) {}

ChildKeeper::~ChildKeeper() {
  {
    const MutexLock lock(mutex_);
    ending_ = true;
  }
  wakeUp(wake_);
  if (thread_.joinable()) thread_.join();
}

Result<UniqueFd> ChildKeeper::start(const std::string& program, UniqueFd socket) {
  if (!thread_.joinable()) return SystemError{"start " + program + " without descriptors", EMFILE};
  std::future<Result<UniqueFd>> child;
  {
    const MutexLock lock(mutex_);
    child = orders_.emplace_back(Order{program, std::move(socket), {}}).child.get_future();
  }
  wakeUp(wake_);
  return child.get();
}

void ChildKeeper::run() {
  setThreadName("imaging");
  while (!isEnding()) {
    wait(-1);
    takeOrders();
    reap();
  }
  awaitDeaths();
}

bool ChildKeeper::isEnding() const {
  const MutexLock lock(mutex_);
  return ending_;
}

void ChildKeeper::wait(int timeout) {
  std::vector<pollfd> sources{{wake_.get(), POLLIN, 0}};
  for (const UniqueFd& child : children_) sources.push_back({child.get(), POLLIN, 0});
  ::poll(sources.data(), sources.size(), timeout);
  std::uint64_t count = 0;
  if (sources.front().revents != 0) (void)!::read(wake_.get(), &count, sizeof count);
}

void ChildKeeper::takeOrders() {
  std::vector<Order> orders;
  {
    const MutexLock lock(mutex_);
    orders.swap(orders_);
  }
  for (Order& order : orders) order.child.set_value(startNow(order.program, order.socket));
}

Result<UniqueFd> ChildKeeper::startNow(const std::string& program, const UniqueFd& socket) {
  auto child = spawnWithSocket(program, socket);
  if (!child) return child;
  UniqueFd second = child->duplicate();
  const int error = errno;
  children_.push_back(std::move(*child));
  if (second) return second;
  killReferenced(children_.back());
  return SystemError{"watch " + program, error};
}

void ChildKeeper::reap() { std::erase_if(children_, reapIfEnded); }

/// One that waits for a medium that does not answer cannot die before that does.
void ChildKeeper::awaitDeaths() {
  using Clock = std::chrono::steady_clock;
  const auto deadline = Clock::now() + kDyingTime;
  for (reap(); !children_.empty() && Clock::now() < deadline; reap()) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
    wait(static_cast<int>(std::max<std::int64_t>(0, left.count())));
  }
}

}  // namespace brivo
