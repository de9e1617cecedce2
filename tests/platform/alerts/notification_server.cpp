// SPDX-License-Identifier: MIT
#include "alerts/notification_server.h"

#include <gtest/gtest.h>

#include <future>

#include "support/wait.h"

namespace brivo::test {

namespace {

constexpr const char* kName = "org.freedesktop.Notifications";
constexpr const char* kPath = "/org/freedesktop/Notifications";

Shown read(sd_bus_message* call) {
  Shown shown;
  shown.client = sd_bus_message_get_sender(call);
  const char* application = "";
  const char* icon = "";
  const char* title = "";
  const char* body = "";
  EXPECT_GT(sd_bus_message_read(call, "susss", &application, &shown.replaces, &icon, &title, &body), 0);
  shown.application = application;
  shown.icon = icon;
  shown.title = title;
  shown.body = body;
  EXPECT_GT(sd_bus_message_enter_container(call, 'a', "s"), 0);
  const char* key = nullptr;
  const char* label = nullptr;
  while (sd_bus_message_read(call, "ss", &key, &label) > 0) shown.actions.emplace_back(key, label);
  sd_bus_message_exit_container(call);
  EXPECT_GT(sd_bus_message_enter_container(call, 'a', "{sv}"), 0);
  const char* hint = nullptr;
  std::uint8_t urgency = 0;
  while (sd_bus_message_enter_container(call, 'e', "sv") > 0) {
    EXPECT_GT(sd_bus_message_read(call, "s", &hint), 0);
    EXPECT_STREQ(hint, "urgency");
    EXPECT_GT(sd_bus_message_read(call, "v", "y", &urgency), 0);
    shown.urgency = urgency;
    sd_bus_message_exit_container(call);
  }
  sd_bus_message_exit_container(call);
  EXPECT_GT(sd_bus_message_read(call, "i", &shown.timeout), 0);
  return shown;
}

}  // namespace

BusPeer::BusPeer() {
  EXPECT_GE(sd_bus_open_user(&bus_), 0);
  EXPECT_GE(sd_bus_attach_event(bus_, loop_.event(), 0), 0);
  thread_ = std::thread([this] { loop_.run(); });
}

BusPeer::~BusPeer() {
  loop_.quit();
  thread_.join();
  sd_bus_detach_event(bus_);
  sd_bus_close_unref(bus_);
}

void BusPeer::run(const std::function<void(sd_bus*)>& task) {
  std::promise<void> done;
  loop_.post([&] {
    task(bus_);
    done.set_value();
  });
  done.get_future().wait();
}

void BusPeer::signal(const std::string& destination, const char* member,
                     const std::function<void(sd_bus_message*)>& append) {
  run([&](sd_bus* bus) {
    sd_bus_message* message = nullptr;
    ASSERT_GE(sd_bus_message_new_signal(bus, &message, kPath, kName, member), 0);
    if (!destination.empty()) sd_bus_message_set_destination(message, destination.c_str());
    append(message);
    EXPECT_GE(sd_bus_send(bus, message, nullptr), 0);
    sd_bus_message_unref(message);
  });
}

std::string BusPeer::name() {
  const char* name = nullptr;
  run([&](sd_bus* bus) { EXPECT_GE(sd_bus_get_unique_name(bus, &name), 0); });
  return name;
}

std::string Shown::keyOf(const std::string& label) const {
  for (const auto& [key, text] : actions) {
    if (text == label) return key;
  }
  ADD_FAILURE() << "no button is labelled " << label;
  return {};
}

NotificationServer::NotificationServer(std::vector<std::string> capabilities, Habit habit)
    : capabilities_(std::move(capabilities)), habit_(habit) {
  static const sd_bus_vtable table[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("GetCapabilities", "", "as", onCapabilities, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("Notify", "susssasa{sv}i", "u", onNotify, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("CloseNotification", "u", "", onClose, SD_BUS_VTABLE_UNPRIVILEGED), SD_BUS_VTABLE_END};
  peer_.run([this](sd_bus* bus) {
    EXPECT_GE(sd_bus_add_object_vtable(bus, nullptr, kPath, kName, table, this), 0);
    const auto flags = SD_BUS_NAME_ALLOW_REPLACEMENT | SD_BUS_NAME_REPLACE_EXISTING;
    EXPECT_GE(sd_bus_request_name(bus, kName, flags), 0);
  });
}

NotificationServer::~NotificationServer() {
  peer_.run([this](sd_bus*) {
    for (sd_bus_message* call : unanswered_) sd_bus_message_unref(call);
  });
}

int NotificationServer::onCapabilities(sd_bus_message* call, void* userdata, sd_bus_error*) {
  const auto* self = static_cast<NotificationServer*>(userdata);
  std::vector<char*> texts;
  for (const auto& text : self->capabilities_) texts.push_back(const_cast<char*>(text.c_str()));
  texts.push_back(nullptr);
  sd_bus_message* answer = nullptr;
  sd_bus_message_new_method_return(call, &answer);
  sd_bus_message_append_strv(answer, texts.data());
  const int result = sd_bus_send(nullptr, answer, nullptr);
  sd_bus_message_unref(answer);
  return result;
}

int NotificationServer::onNotify(sd_bus_message* call, void* userdata, sd_bus_error* error) {
  auto* self = static_cast<NotificationServer*>(userdata);
  Shown shown = read(call);
  shown.id = ++self->lastId_;
  {
    const std::lock_guard lock(self->mutex_);
    self->shown_.push_back(shown);
  }
  switch (self->habit_) {
    case Habit::refuses:
      return sd_bus_error_set(error, "org.freedesktop.Notifications.Error.ExcessNotificationGeneration",
                              "enough");
    case Habit::saysNumberZero:
      return self->answer(call, 0);
    case Habit::isSilent:
      self->unanswered_.push_back(sd_bus_message_ref(call));
      return 1;
    case Habit::closesFirst:
      sd_bus_emit_signal(sd_bus_message_get_bus(call), kPath, kName, "NotificationClosed", "uu", shown.id,
                         1u);
      return self->answer(call, shown.id);
    case Habit::losesItsName:
      self->answer(call, shown.id);
      sd_bus_release_name_async(sd_bus_message_get_bus(call), nullptr, kName, nullptr, nullptr);
      return sd_bus_request_name_async(sd_bus_message_get_bus(call), nullptr, kName, 0, nullptr, nullptr);
    case Habit::normal:
      break;
  }
  return self->answer(call, shown.id);
}

int NotificationServer::onClose(sd_bus_message* call, void* userdata, sd_bus_error*) {
  auto* self = static_cast<NotificationServer*>(userdata);
  std::uint32_t id = 0;
  sd_bus_message_read(call, "u", &id);
  {
    const std::lock_guard lock(self->mutex_);
    self->withdrawn_.push_back(id);
  }
  constexpr std::uint32_t closedByCall = 3;
  sd_bus_emit_signal(sd_bus_message_get_bus(call), kPath, kName, "NotificationClosed", "uu", id,
                     closedByCall);
  return sd_bus_reply_method_return(call, nullptr);
}

int NotificationServer::answer(sd_bus_message* call, std::uint32_t id) {
  return sd_bus_reply_method_return(call, "u", id);
}

std::vector<Shown> NotificationServer::shown() {
  const std::lock_guard lock(mutex_);
  return shown_;
}

Shown NotificationServer::waitForShown(std::size_t count) {
  EXPECT_TRUE(waitUntil([&] { return shown().size() >= count; }));
  return shown().empty() ? Shown() : shown().back();
}

std::vector<std::uint32_t> NotificationServer::withdrawn() {
  const std::lock_guard lock(mutex_);
  return withdrawn_;
}

void NotificationServer::press(const Shown& notification, const std::string& key) {
  peer_.signal("", "ActionInvoked", [&](sd_bus_message* signal) {
    sd_bus_message_append(signal, "us", notification.id, key.c_str());
  });
}

void NotificationServer::close(const Shown& notification, std::uint32_t reason) {
  peer_.signal("", "NotificationClosed",
               [&](sd_bus_message* signal) { sd_bus_message_append(signal, "uu", notification.id, reason); });
}

void NotificationServer::answerAll() {
  peer_.run([this](sd_bus*) {
    for (sd_bus_message* call : std::exchange(unanswered_, {})) {
      answer(call, lastId_);
      sd_bus_message_unref(call);
    }
  });
}

}  // namespace brivo::test
