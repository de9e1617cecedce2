// SPDX-License-Identifier: MIT
#include "platform/power/logind_inhibitors.h"

#include <systemd/sd-bus.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <map>
#include <utility>

#include "platform/base/mutex.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// The locks by name. What holders do touches memory alone; the loop asks logind and keeps the time.
class LogindInhibitors::Locks : public std::enable_shared_from_this<Locks> {
 public:
  using Clock = std::chrono::steady_clock;

  Locks(RunLoop& loop, std::function<void(const std::string&)> onUnavailable,
        std::chrono::milliseconds linger)
      : loop_(loop), onUnavailable_(std::move(onUnavailable)), linger_(linger) {}
  ~Locks() { disconnect(); }
  Locks(const Locks&) = delete;
  Locks& operator=(const Locks&) = delete;

  // Any thread.
  void hold(const std::string& name, std::uint64_t holder, Clock::time_point deadline)
      BRIVO_EXCLUDES(mutex_) {
    const MutexLock guard(mutex_);
    Lock& lock = locks_[name];
    lock.holders.emplace(holder, deadline);
    if (!lock.fd && !unavailable_ && !std::exchange(lock.asked, true)) onLoop(name, &Locks::ask);
    if (!std::exchange(lock.expiryTimer, true)) startTimer(deadline, name, &Locks::expire);
  }

  void release(const std::string& name, std::uint64_t holder) BRIVO_EXCLUDES(mutex_) {
    const MutexLock guard(mutex_);
    const auto found = locks_.find(name);
    if (found != locks_.end() && found->second.holders.erase(holder) > 0) becameIdle(name, found->second);
  }

  // Loop thread.
  void disconnect() {
    if (!bus_) return;
    sd_bus_detach_event(bus_);
    bus_ = sd_bus_close_unref(bus_);
  }

 private:
  struct Lock {
    std::map<std::uint64_t, Clock::time_point> holders;  // and when each is given up
    Clock::time_point idleSince;
    bool expiryTimer = false;  // one timer of each kind runs at most, however many assertions come and go
    bool lingerTimer = false;
    bool asked = false;
    UniqueFd fd;
  };
  struct Request {
    std::weak_ptr<Locks> locks;
    std::string name;
  };
  using Step = void (Locks::*)(const std::string& name);

  Task stepFor(const std::string& name, Step step) {
    return [weak = weak_from_this(), name, step] {
      if (const auto self = weak.lock()) (self.get()->*step)(name);
    };
  }
  void onLoop(const std::string& name, Step step) { loop_.post(stepFor(name, step)); }
  void startTimer(Clock::time_point due, const std::string& name, Step step) {
    const auto delay = std::chrono::ceil<std::chrono::milliseconds>(due - Clock::now());
    loop_.postAfter(std::max(delay, std::chrono::milliseconds(0)), stepFor(name, step));
  }

  void becameIdle(const std::string& name, Lock& lock) BRIVO_REQUIRES(mutex_) {
    if (!lock.holders.empty()) return;
    lock.idleSince = Clock::now();
    if (!std::exchange(lock.lingerTimer, true))
      startTimer(lock.idleSince + linger_, name, &Locks::dropIfIdle);
  }

  // The rest on the loop's thread.
  void dropIfIdle(const std::string& name) BRIVO_EXCLUDES(mutex_) {
    const MutexLock guard(mutex_);
    Lock& lock = locks_[name];
    lock.lingerTimer = false;
    if (!lock.holders.empty()) return;
    if (Clock::now() < lock.idleSince + linger_) {
      lock.lingerTimer = true;
      startTimer(lock.idleSince + linger_, name, &Locks::dropIfIdle);
    } else {
      lock.fd.reset();
    }
  }

  void expire(const std::string& name) BRIVO_EXCLUDES(mutex_) {
    const MutexLock guard(mutex_);
    Lock& lock = locks_[name];
    lock.expiryTimer = false;
    std::erase_if(lock.holders, [now = Clock::now()](const auto& holder) { return holder.second <= now; });
    if (lock.holders.empty()) return becameIdle(name, lock);
    lock.expiryTimer = true;
    startTimer(lock.holders.begin()->second, name, &Locks::expire);
  }

  void ask(const std::string& name) BRIVO_EXCLUDES(mutex_) {
    const int result = bus_ ? 0 : connect();
    if (result >= 0) return send(name);
    fail(std::strerror(-result));
  }

  int connect() {
    const int result = sd_bus_open_system_with_description(&bus_, "power");
    return result < 0 ? result : sd_bus_attach_event(bus_, loop_.event(), 0);
  }

  void send(const std::string& name) {
    auto request = std::make_unique<Request>(Request{weak_from_this(), name});
    const auto onAnswer = [](sd_bus_message* answer, void* userdata, sd_bus_error*) {
      const auto* asked = static_cast<Request*>(userdata);
      if (const auto self = asked->locks.lock()) self->answered(asked->name, answer);
      return 0;
    };
    sd_bus_slot* slot = nullptr;
    const int result = sd_bus_call_method_async(
        bus_, &slot, "org.freedesktop.login1", "/org/freedesktop/login1", "org.freedesktop.login1.Manager",
        "Inhibit", onAnswer, request.get(), "ssss", "sleep:idle", "brivod", name.c_str(), "block");
    if (result < 0) return fail(std::strerror(-result));
    sd_bus_slot_set_destroy_callback(slot, [](void* userdata) { delete static_cast<Request*>(userdata); });
    (void)request.release();
    sd_bus_slot_set_floating(slot, 1);
    sd_bus_slot_unref(slot);
  }

  void answered(const std::string& name, sd_bus_message* answer) BRIVO_EXCLUDES(mutex_) {
    int fd = -1;
    UniqueFd own;
    if (sd_bus_message_is_method_error(answer, nullptr)) {
      const sd_bus_error* error = sd_bus_message_get_error(answer);
      fail(error->message ? error->message : error->name);
    } else if (sd_bus_message_read(answer, "h", &fd) >= 0) {
      UniqueFd borrowed(fd);
      own = borrowed.duplicate();
      (void)borrowed.release();
    }
    const MutexLock guard(mutex_);
    Lock& lock = locks_[name];
    lock.asked = false;
    lock.fd = std::move(own);
    becameIdle(name, lock);
  }

  void fail(const std::string& why) BRIVO_EXCLUDES(mutex_) {
    {
      const MutexLock guard(mutex_);
      if (std::exchange(unavailable_, true)) return;
    }
    onUnavailable_("the machine may sleep during transfers: " + why);
    // Not here: a handler of the connection may be running.
    loop_.post([weak = weak_from_this()] {
      if (const auto self = weak.lock()) self->disconnect();
    });
  }

  RunLoop& loop_;
  const std::function<void(const std::string&)> onUnavailable_;
  const std::chrono::milliseconds linger_;
  sd_bus* bus_ = nullptr;  // loop thread

  Mutex mutex_;
  bool unavailable_ BRIVO_GUARDED_BY(mutex_) = false;
  std::map<std::string, Lock> locks_ BRIVO_GUARDED_BY(mutex_);
};

LogindInhibitors::LogindInhibitors(RunLoop& loop, std::function<void(const std::string&)> onUnavailable,
                                   std::chrono::milliseconds linger)
    : locks_(std::make_shared<Locks>(loop, std::move(onUnavailable), linger)) {}

LogindInhibitors::~LogindInhibitors() { locks_->disconnect(); }

PowerAssertions::Handle LogindInhibitors::create(const std::string& name, std::chrono::seconds timeout) {
  static std::atomic<std::uint64_t> lastHolder = 0;
  const std::uint64_t holder = ++lastHolder;
  locks_->hold(name, holder, Locks::Clock::now() + timeout);
  return Handle(locks_.get(), [locks = locks_, name, holder](void*) { locks->release(name, holder); });
}

}  // namespace brivo
