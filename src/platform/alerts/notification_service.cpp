// SPDX-License-Identifier: MIT
#include "platform/alerts/notification_service.h"

#include <systemd/sd-bus.h>

#include <cerrno>
#include <memory>
#include <string_view>
#include <utility>

#include "platform/bus/bus_message.h"

namespace brivo {

namespace {

constexpr const char* kName = "org.freedesktop.Notifications";
constexpr const char* kPath = "/org/freedesktop/Notifications";
constexpr const char* kDriver = "org.freedesktop.DBus";
constexpr const char* kIcon = "camera-photo";  // Icon Naming Specification
constexpr std::uint8_t kCritical = 2;          // what servers do not take away by themselves
constexpr std::int32_t kNever = 0;
constexpr std::uint64_t kNoLimit = UINT64_MAX;

std::string senderOf(sd_bus_message* message) {
  const char* sender = sd_bus_message_get_sender(message);
  return sender ? sender : "";
}

/// Without a message where there is no bus.
BusMessage newCall(sd_bus* bus, const char* destination, const char* member) {
  BusMessage call;
  if (bus) sd_bus_message_new_method_call(bus, call.out(), destination, kPath, kName, member);
  return call;
}

int appendActions(sd_bus_message* message, const NotificationService::Notice& notice) {
  int result = sd_bus_message_open_container(message, 'a', "s");
  for (const auto& [key, label] : notice.actions) {
    if (result >= 0) result = sd_bus_message_append(message, "ss", key.c_str(), label.c_str());
  }
  return result < 0 ? result : sd_bus_message_close_container(message);
}

int appendNotice(sd_bus_message* message, const NotificationService::Notice& notice) {
  constexpr std::uint32_t replacesNone = 0;
  int result = sd_bus_message_append(message, "susss", "brivod", replacesNone, kIcon, notice.title.c_str(),
                                     notice.body.c_str());
  if (result >= 0) result = appendActions(message, notice);
  if (result < 0) return result;
  return sd_bus_message_append(message, "a{sv}i", 1, "urgency", "y", kCritical, kNever);
}

using Failure = NotificationService::Failure;

/// The bus answers for a server that is not there.
Failure failureIn(sd_bus_message* answer) {
  return answer && senderOf(answer).starts_with(':') ? Failure::refused : Failure::noServer;
}

bool isAnswer(sd_bus_message* answer) { return answer && !sd_bus_message_is_method_error(answer, nullptr); }

Result<std::vector<std::string>, Failure> stringsIn(sd_bus_message* answer) {
  if (!isAnswer(answer) || sd_bus_message_enter_container(answer, 'a', "s") < 0) return failureIn(answer);
  std::vector<std::string> strings;
  const char* text = nullptr;
  while (sd_bus_message_read(answer, "s", &text) > 0) strings.emplace_back(text);
  return strings;
}

Result<NotificationService::Place, Failure> placeIn(sd_bus_message* answer) {
  std::uint32_t id = 0;
  if (!isAnswer(answer) || sd_bus_message_read(answer, "u", &id) <= 0 || id == 0) return failureIn(answer);
  return NotificationService::Place{senderOf(answer), id};
}

}  // namespace

/// From the call to its answer, or to the end of the connection.
struct NotificationService::Question {
  Question(NotificationService& owner, Answer handler) : service(owner), onAnswer(std::move(handler)) {
    ++service.questions_;
  }
  ~Question() { --service.questions_; }
  Question(const Question&) = delete;
  Question& operator=(const Question&) = delete;

  NotificationService& service;
  const Answer onAnswer;
};

/// What libsystemd calls. A message that is not as it should be is no message.
struct NotificationService::Handlers {
  static int onAction(sd_bus_message* signal, void* userdata, sd_bus_error*) {
    Place place{senderOf(signal)};
    const char* key = nullptr;
    if (sd_bus_message_read(signal, "us", &place.id, &key) > 0) of(userdata).onAction(place, key);
    return 0;
  }

  static int onClosed(sd_bus_message* signal, void* userdata, sd_bus_error*) {
    Place place{senderOf(signal)};
    std::uint32_t reason = 0;
    if (sd_bus_message_read(signal, "uu", &place.id, &reason) > 0) of(userdata).onClosed(place);
    return 0;
  }

  /// Anybody can send this signal to us alone, but only the bus itself under its own name.
  static int onOwner(sd_bus_message* signal, void* userdata, sd_bus_error*) {
    const char* name = nullptr;
    const char* before = nullptr;
    const char* now = nullptr;
    if (senderOf(signal) != kDriver || sd_bus_message_read(signal, "sss", &name, &before, &now) <= 0)
      return 0;
    if (std::string_view(name) == kName) of(userdata).onServer(now);
    return 0;
  }

  static int onBusGone(sd_bus_message*, void* userdata, sd_bus_error*) {
    of(userdata).onBusGone();
    return 0;
  }

  static int onAnswer(sd_bus_message* answer, void* userdata, sd_bus_error*) {
    static_cast<Question*>(userdata)->onAnswer(answer);
    return 0;
  }

  static const Events& of(void* userdata) { return static_cast<NotificationService*>(userdata)->events_; }
};

bool NotificationService::connect() {
  if (bus_) return true;
  if (open() >= 0 && listen() >= 0) return true;
  disconnect();
  return false;
}

void NotificationService::disconnect() {
  if (!bus_) return;
  sd_bus_detach_event(bus_);
  bus_ = sd_bus_close_unref(bus_);
}

void NotificationService::awaitAnswers(std::chrono::milliseconds limit) {
  using Clock = std::chrono::steady_clock;
  const auto end = Clock::now() + limit;
  while (bus_ && questions_ > 0) {
    const int processed = sd_bus_process(bus_, nullptr);
    if (processed < 0) return;
    if (processed > 0) continue;
    const auto left = std::chrono::duration_cast<std::chrono::microseconds>(end - Clock::now()).count();
    if (left <= 0) return;
    const int waited = sd_bus_wait(bus_, static_cast<std::uint64_t>(left));
    if (waited < 0 && waited != -EINTR) return;
  }
}

int NotificationService::open() {
  const int result = sd_bus_open_user_with_description(&bus_, "alerts");
  if (result < 0) return result;
  sd_bus_set_close_on_exit(bus_, 0);  // what is on the screen is taken away after the loop has ended
  return sd_bus_attach_event(bus_, loop_.event(), 0);
}

// The bus takes these before anything that is sent after them, so no answer to a notification is missed. A
// bus that refuses one ends the connection.
int NotificationService::listen() {
  const auto match = [&](const char* sender, const char* path, const char* interface, const char* member,
                         sd_bus_message_handler_t handler) {
    return sd_bus_match_signal_async(bus_, nullptr, sender, path, interface, member, handler, nullptr, this);
  };
  int result = match(kName, kPath, kName, "ActionInvoked", Handlers::onAction);
  if (result >= 0) result = match(kName, kPath, kName, "NotificationClosed", Handlers::onClosed);
  if (result >= 0) {
    const std::string rule = std::string("type='signal',sender='") + kDriver + "',interface='" + kDriver +
                             "',member='NameOwnerChanged',arg0='" + kName + "'";
    result = sd_bus_add_match_async(bus_, nullptr, rule.c_str(), Handlers::onOwner, nullptr, this);
  }
  if (result < 0) return result;
  return match(nullptr, "/org/freedesktop/DBus/Local", "org.freedesktop.DBus.Local", "Disconnected",
               Handlers::onBusGone);
}

void NotificationService::call(sd_bus_message* message, Answer onAnswer) {
  auto question = std::make_unique<Question>(*this, std::move(onAnswer));
  sd_bus_slot* slot = nullptr;
  if (sd_bus_call_async(bus_, &slot, message, Handlers::onAnswer, question.get(), kNoLimit) < 0) {
    return question->onAnswer(nullptr);
  }
  sd_bus_slot_set_destroy_callback(slot, [](void* userdata) { delete static_cast<Question*>(userdata); });
  (void)question.release();
  sd_bus_slot_set_floating(slot, 1);
  sd_bus_slot_unref(slot);
}

void NotificationService::askCapabilities(const Handler<std::vector<std::string>>& onAnswer) {
  const BusMessage message = newCall(bus_, kName, "GetCapabilities");
  if (!message.get()) return onAnswer(Failure::noServer);
  call(message.get(), [onAnswer](sd_bus_message* answer) { onAnswer(stringsIn(answer)); });
}

void NotificationService::post(const Notice& notice, const Handler<Place>& onAnswer) {
  const BusMessage message = newCall(bus_, kName, "Notify");
  if (!message.get() || appendNotice(message.get(), notice) < 0) return onAnswer(Failure::noServer);
  call(message.get(), [onAnswer](sd_bus_message* answer) { onAnswer(placeIn(answer)); });
}

void NotificationService::close(const Place& place) {
  const BusMessage message = newCall(bus_, place.server.c_str(), "CloseNotification");
  if (!message.get() || sd_bus_message_append(message.get(), "u", place.id) < 0) return;
  sd_bus_message_set_expect_reply(message.get(), 0);
  sd_bus_message_set_auto_start(message.get(), 0);
  sd_bus_send(bus_, message.get(), nullptr);
}

}  // namespace brivo
