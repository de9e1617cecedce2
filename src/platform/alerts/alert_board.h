// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/alerts/alert_answer.h"
#include "platform/alerts/alert_text.h"
#include "platform/alerts/notification_service.h"

namespace brivo {

/// The alerts that are on the screen or on their way there. An alert goes to the server that there is, is
/// shown again when that server goes and as soon as there is another, and ends when it is answered, when
/// nobody can answer it any more, or when it is withdrawn. *Thread-bound* to the loop.
class AlertBoard : public std::enable_shared_from_this<AlertBoard> {
 public:
  /// One alert. What is not constant belongs to the board, but for the answer, which is thread-safe.
  struct Alert {
    explicit Alert(AlertText what);

    const AlertText text;
    /// Begins the keys of the buttons and is known to the server alone: who replaces the notification by one
    /// of their own cannot give it buttons that mean ours.
    const std::string secret;
    AlertAnswer answer;

    bool asking = false;                              // a server
    int asked = 0;                                    // how often one was
    std::optional<std::string> askedWhile;            // the board's server then
    std::optional<NotificationService::Place> place;  // while it is on the screen
  };

  /// An empty board that has not connected yet. Any thread. `loop` must outlive it.
  static std::shared_ptr<AlertBoard> create(RunLoop& loop);
  ~AlertBoard() = default;
  AlertBoard(const AlertBoard&) = delete;
  AlertBoard& operator=(const AlertBoard&) = delete;

  /// Brings an alert that was not shown before to the screen and keeps it until withdraw(). Waits for
  /// nothing: what becomes of it is in Alert::answer, refused when nobody can be asked.
  void show(const std::shared_ptr<Alert>& alert);
  /// Takes it from the screen and forgets it.
  void withdraw(const std::shared_ptr<Alert>& alert);
  /// Withdraws every alert as dismissed.
  void dismissAll();
  /// The same, and leaves the bus; waits ten seconds at most for a server that is just being asked. Also when
  /// the loop does not run any more.
  void end();

 private:
  using Place = NotificationService::Place;
  using Failure = NotificationService::Failure;
  /// Something that happened on a screen; `key` is of the button that was pressed, none when it was closed.
  struct Happening {
    Place place;
    std::optional<std::string> key;
  };

  explicit AlertBoard(RunLoop& loop);

  void ask(const std::shared_ptr<Alert>& alert);
  void knowCapabilities(const std::shared_ptr<Alert>& alert, const std::vector<std::string>& capabilities);
  void knowPlace(const std::shared_ptr<Alert>& alert, const Place& place);
  void failed(const std::shared_ptr<Alert>& alert, Failure failure);
  void changeServer(const std::string& server);
  void loseBus();
  void hear(const Happening& happening);
  bool isKept(const std::shared_ptr<Alert>& alert) const;
  bool anyAsking() const;

  RunLoop& loop_;
  NotificationService service_;
  std::vector<std::shared_ptr<Alert>> alerts_;
  std::optional<std::string> server_;  // none while the bus has not told of a change
  std::vector<Happening> early_;       // perhaps about a notification whose number has not come yet
};

}  // namespace brivo
