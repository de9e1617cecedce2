// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_door.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

namespace brivo::zeph {

namespace {

constexpr const char* kLocal = "org.freedesktop.DBus.Local";
constexpr const char* kLocalPath = "/org/freedesktop/DBus/Local";

/// Answers of RequestName (D-Bus Specification, "Message Bus Messages").
enum NameAnswer : std::uint32_t { primaryOwner = 1, inQueue = 2, alreadyOwner = 4 };

}  // namespace

BusDoor::BusDoor(std::shared_ptr<RunLoop> loop, DoorPlan plan)
    : loop_(std::move(loop)), plan_(std::move(plan)) {}

BusDoor::~BusDoor() { leaveBus(); }

void BusDoor::open() {
  if (ended_ || bus_) return;
  givesNameUp_ = false;
  const int result = connect();
  if (result >= 0) return takeName();
  leaveBus();
  if (result == -ENOMEDIUM) return say("there is no session bus");  // and no address where one might appear
  say(fmt::format("no session bus: {}", std::strerror(-result)));
  retryLater();
}

int BusDoor::connect() {
  int result = sd_bus_open_user_with_description(&bus_, "door");
  if (result < 0) return result;
  sd_bus_set_exit_on_disconnect(bus_, 0);
  sd_bus_set_close_on_exit(bus_, 0);  // it would wait for a bus that does not read
  const auto onGone = [](sd_bus_message*, void* self, sd_bus_error*) {
    auto* door = static_cast<BusDoor*>(self);
    // Not here: a handler of the connection is running.
    door->loop_->post([weak = door->weak_from_this()] {
      if (const auto gone = weak.lock()) gone->lost();
    });
    return 0;
  };
  result = sd_bus_match_signal_async(bus_, nullptr, kLocal, kLocalPath, kLocal, "Disconnected", onGone,
                                     nullptr, this);
  visits_ = std::make_shared<BusVisits>(loop_, bus_, plan_);
  if (result >= 0) result = visits_->start();
  return result < 0 ? result : sd_bus_attach_event(bus_, loop_->event(), SD_EVENT_PRIORITY_NORMAL);
}

void BusDoor::takeName() {
  const auto onAnswer = [](sd_bus_message* answer, void* self, sd_bus_error*) {
    static_cast<BusDoor*>(self)->nameAnswered(answer);
    return 0;
  };
  nameCall_ = sd_bus_slot_unref(nameCall_);
  const int result =
      sd_bus_request_name_async(bus_, &nameCall_, plan_.name.c_str(), SD_BUS_NAME_QUEUE, onAnswer, this);
  if (result < 0) say(fmt::format("cannot ask for the name {}: {}", plan_.name, std::strerror(-result)));
}

void BusDoor::nameAnswered(sd_bus_message* answer) {
  if (sd_bus_is_open(bus_) <= 0) return;  // lost() follows
  std::uint32_t said = 0;
  if (const sd_bus_error* error = sd_bus_message_get_error(answer)) {
    return say(fmt::format("the session bus refuses the name {}: {}", plan_.name, error->message));
  }
  retry_ = kFirstRetry;
  if (sd_bus_message_read(answer, "u", &said) < 0) return;
  if (said == primaryOwner || said == alreadyOwner) say(fmt::format("{} on the session bus", plan_.name));
  if (said == inQueue) say(fmt::format("another process has the name {} on the session bus", plan_.name));
}

void BusDoor::giveNameUp(std::function<void(bool given)> then) {
  if (!bus_) return then(true);
  givesNameUp_ = true;
  afterGivingUp_ = std::move(then);
  const auto onAnswer = [](sd_bus_message* answer, void* self, sd_bus_error*) {
    static_cast<BusDoor*>(self)->nameGiven(answer);
    return 0;
  };
  nameCall_ = sd_bus_slot_unref(nameCall_);
  if (sd_bus_release_name_async(bus_, &nameCall_, plan_.name.c_str(), onAnswer, this) < 0)
    answerGiveUp(false);
}

void BusDoor::nameGiven(sd_bus_message* answer) {
  if (sd_bus_is_open(bus_) <= 0) return;  // lost() follows
  answerGiveUp(sd_bus_message_is_method_error(answer, nullptr) <= 0);
}

void BusDoor::takeNameAgain() {
  if (std::exchange(givesNameUp_, false) && bus_) takeName();
}

void BusDoor::answerGiveUp(bool given) {
  if (const auto then = std::exchange(afterGivingUp_, nullptr)) then(given);
}

void BusDoor::lost() {
  if (ended_ || !bus_) return;
  leaveBus();
  say("the session bus has gone");
  retryLater();
  answerGiveUp(true);  // nobody can call any more
}

void BusDoor::retryLater() {
  loop_->postAfter(retry_, [weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->open();
  });
  retry_ = std::min(retry_ * 2, kLastRetry);
}

void BusDoor::end() {
  ended_ = true;
  leaveBus();
}

void BusDoor::leaveBus() {
  nameCall_ = sd_bus_slot_unref(nameCall_);
  visits_.reset();
  if (!bus_) return;
  sd_bus_detach_event(bus_);
  bus_ = sd_bus_close_unref(bus_);
}

void BusDoor::say(const std::string& line) {
  if (said_ == line) return;
  said_ = line;
  if (plan_.onNotice) plan_.onNotice(line);
}

}  // namespace brivo::zeph
