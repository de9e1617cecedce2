// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <future>
#include <memory>
#include <mutex>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "orvidcore/orvidcore.h"
#include "orvidcore/running_service.h"
#include "support/wait.h"

namespace orvid {

/// How GoogleTest shows a kind.
inline void PrintTo(ErrorKind kind, std::ostream* out) {
  constexpr const char* kNames[] = {"noService", "refused",   "disconnected", "timedOut",
                                    "request",   "malformed", "file"};
  *out << kNames[static_cast<std::size_t>(kind)];
}

}  // namespace orvid

namespace orvid::test {

using brivo::test::waitUntil;

/// What happened, in order, as text. *Thread-safe.*
class Recorder {
 public:
  void add(std::string event) {
    const std::lock_guard lock(mutex_);
    events_.push_back(std::move(event));
  }
  std::vector<std::string> events() const {
    const std::lock_guard lock(mutex_);
    return events_;
  }
  std::size_t count(std::string_view event) const {
    const auto all = events();
    return static_cast<std::size_t>(std::ranges::count(all, event));
  }
  bool waitFor(std::string_view event) const {
    return waitUntil([&] { return count(event) > 0; });
  }

 private:
  mutable std::mutex mutex_;
  std::vector<std::string> events_;
};

/// The outcome of one asynchronous call. The callback must run once.
template <class T>
class Outcome {
 public:
  Callback<T> callback() {
    return [state = state_](Result<T> result) {
      const std::lock_guard lock(state->mutex);
      ++state->calls;
      state->result = std::move(result);
    };
  }
  std::size_t calls() const {
    const std::lock_guard lock(state_->mutex);
    return state_->calls;
  }
  bool arrives() const {
    return waitUntil([&] { return calls() > 0; });
  }
  /// Waits for the result; throws when none comes.
  Result<T> get() const {
    if (!arrives()) throw std::runtime_error("no outcome");
    const std::lock_guard lock(state_->mutex);
    return *state_->result;
  }

 private:
  struct State {
    std::mutex mutex;
    std::size_t calls = 0;
    std::optional<Result<T>> result;
  };
  std::shared_ptr<State> state_ = std::make_shared<State>();
};

/// The error's kind, none for a success.
template <class T>
std::optional<ErrorKind> kindOf(const Result<T>& result) {
  return result.ok() ? std::nullopt : std::optional(result.error().kind);
}

/// The kinds of many outcomes, once all have arrived.
template <class T>
std::vector<std::optional<ErrorKind>> kindsOf(const std::vector<Outcome<T>>& outcomes) {
  std::vector<std::optional<ErrorKind>> kinds;
  for (const auto& outcome : outcomes) kinds.push_back(kindOf(outcome.get()));
  return kinds;
}

/// The service's code in an ErrorKind::request, 0 for everything else.
template <class T>
std::int32_t codeOf(const Result<T>& result) {
  return kindOf(result) == ErrorKind::request ? result.error().code : 0;
}

/// `size` bytes of which no two neighbouring pieces are alike.
std::string pattern(std::size_t size);

/// A running service and a connection to it.
class ClientTest : public testing::Test {
 protected:
  ClientTest() { connect(); }

  void connect() {
    auto connected = DeviceBrowser::connect(service.address());
    if (!connected.ok()) throw std::runtime_error(connected.error().text);
    browser = *std::move(connected);
  }
  /// Waits until the card `name` is in the device list.
  DeviceInfo waitForDevice(const std::string& name) const;
  /// Opens the card `name`.
  std::shared_ptr<Device> open(const std::string& name) const;
  /// Opens the card "CARD" and gives its settled catalogue.
  std::vector<Object> catalogueOfCard();
  /// The object of a catalogue with this name; throws when there is none.
  static Object named(const std::vector<Object>& objects, const std::string& name);
  /// A card "CARD" with one file of this content, as an object.
  Object onlyFile(std::string_view content);

  RunningService service;
  Recorder told;  // outlives the browser, whose events may come to its end
  std::shared_ptr<DeviceBrowser> browser;
  std::shared_ptr<Device> device;
};

}  // namespace orvid::test
