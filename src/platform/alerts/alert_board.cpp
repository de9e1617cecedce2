// SPDX-License-Identifier: MIT
#include "platform/alerts/alert_board.h"

#include <algorithm>
#include <chrono>
#include <utility>

#include "platform/base/uuid.h"

namespace brivo {

namespace {

/// Servers that end whenever they are shown an alert must not be started for ever.
constexpr int kMostAsked = 10;
/// More than this does not happen between a question and its answer.
constexpr std::size_t kMostEarly = 64;

/// Servers answer in milliseconds, where the machine has time for them: what is taken from the screen too
/// early is on it for ever.
constexpr std::chrono::seconds kPatienceAtEnd{10};

bool has(const std::vector<std::string>& capabilities, const char* capability) {
  return std::ranges::find(capabilities, capability) != capabilities.end();
}

std::string keyOf(const AlertBoard::Alert& alert, UserAlert::Response response) {
  return alert.secret + "-" + std::to_string(static_cast<int>(response));
}

NotificationService::Notice noticeOf(const AlertBoard::Alert& alert, bool markup) {
  const AlertText& text = alert.text;
  NotificationService::Notice notice{text.title, markup ? escapingMarkup(text.message) : text.message, {}};
  for (const auto& button : text.buttons) {
    notice.actions.emplace_back(keyOf(alert, button.response), button.label);
  }
  return notice;
}

/// A key that is none of the buttons' is no answer.
void press(AlertBoard::Alert& alert, const std::string& key) {
  for (const auto& button : alert.text.buttons) {
    if (key == keyOf(alert, button.response)) alert.answer.answer(button.response);
  }
}

}  // namespace

AlertBoard::Alert::Alert(AlertText what) : text(std::move(what)), secret(randomUuidString()) {}

AlertBoard::AlertBoard(RunLoop& loop)
    : loop_(loop),
      service_(loop, {[this](const Place& place, const std::string& key) {
                        hear({place, key});
                      },
                      [this](const Place& place) {
                        hear({place, std::nullopt});
                      },
                      [this](const std::string& server) { changeServer(server); }, [this] { loseBus(); }}) {}

std::shared_ptr<AlertBoard> AlertBoard::create(RunLoop& loop) {
  return std::shared_ptr<AlertBoard>(new AlertBoard(loop));
}

void AlertBoard::show(const std::shared_ptr<Alert>& alert) {
  alerts_.push_back(alert);
  ask(alert);
}

void AlertBoard::ask(const std::shared_ptr<Alert>& alert) {
  alert->place.reset();
  if (++alert->asked > kMostAsked) return alert->answer.giveUp();
  if (!service_.connect()) return alert->answer.giveUp();
  if (!anyAsking()) early_.clear();
  alert->asking = true;
  alert->askedWhile = server_;
  service_.askCapabilities([weak = weak_from_this(), alert](const auto& capabilities) {
    const auto self = weak.lock();
    if (!self) return;
    if (!capabilities.ok()) return self->failed(alert, capabilities.error());
    self->knowCapabilities(alert, *capabilities);
  });
}

void AlertBoard::knowCapabilities(const std::shared_ptr<Alert>& alert,
                                  const std::vector<std::string>& capabilities) {
  if (!isKept(alert)) return;
  if (!has(capabilities, "actions")) return failed(alert, Failure::refused);
  service_.post(noticeOf(*alert, has(capabilities, "body-markup")),
                [weak = weak_from_this(), alert](const auto& place) {
                  const auto self = weak.lock();
                  if (!self) return;
                  if (!place.ok()) return self->failed(alert, place.error());
                  self->knowPlace(alert, *place);
                });
}

void AlertBoard::knowPlace(const std::shared_ptr<Alert>& alert, const Place& place) {
  alert->asking = false;
  if (!isKept(alert)) return service_.close(place);
  if (server_ && *server_ != place.server) {  // it took the alert and is not the server any more
    service_.close(place);
    return ask(alert);
  }
  alert->place = place;
  alert->answer.setShown();
  for (const Happening& happening : std::exchange(early_, {})) hear(happening);
}

/// An alert that was on a screen once waits for the next server; one that never was is refused.
void AlertBoard::failed(const std::shared_ptr<Alert>& alert, Failure failure) {
  alert->asking = false;
  if (!isKept(alert)) return;
  if (failure == Failure::refused) return alert->answer.giveUp();
  const bool another = server_ && !server_->empty() && server_ != alert->askedWhile;
  if (another) return ask(alert);
  if (!alert->answer.wasShown()) alert->answer.giveUp();
}

void AlertBoard::changeServer(const std::string& server) {
  server_ = server;
  for (const auto& alert : std::vector(alerts_)) {
    if (alert->asking || !alert->answer.wasShown() || alert->answer.isOver()) continue;
    if (!alert->place && server.empty()) continue;  // was tried when the one before went
    if (alert->place) service_.close(*alert->place);
    ask(alert);  // even without a server: the bus may start one
  }
}

void AlertBoard::loseBus() {
  server_.reset();
  early_.clear();
  for (const auto& alert : alerts_) {
    alert->place.reset();
    alert->answer.giveUp();
  }
  // Not here: the connection is calling.
  loop_.post([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->service_.disconnect();
  });
}

void AlertBoard::hear(const Happening& happening) {
  const auto found = std::ranges::find_if(
      alerts_, [&](const auto& alert) { return alert->place && *alert->place == happening.place; });
  if (found == alerts_.end()) {
    if (anyAsking() && early_.size() < kMostEarly) early_.push_back(happening);
    return;
  }
  Alert& alert = **found;
  if (happening.key) return press(alert, *happening.key);
  alert.place.reset();
  alert.answer.answer(UserAlert::dismissed);
}

void AlertBoard::withdraw(const std::shared_ptr<Alert>& alert) {
  if (alert->place) service_.close(*alert->place);
  alert->place.reset();
  std::erase(alerts_, alert);
}

void AlertBoard::dismissAll() {
  for (const auto& alert : std::vector(alerts_)) {
    alert->answer.giveUp();
    withdraw(alert);
  }
}

/// What a server is just being asked to show has no number yet by which it could be taken away.
void AlertBoard::end() {
  dismissAll();
  service_.awaitAnswers(kPatienceAtEnd);
  service_.disconnect();
}

bool AlertBoard::isKept(const std::shared_ptr<Alert>& alert) const {
  return std::ranges::find(alerts_, alert) != alerts_.end();
}

bool AlertBoard::anyAsking() const {
  return std::ranges::any_of(alerts_, [](const auto& alert) { return alert->asking; });
}

}  // namespace brivo
