// SPDX-License-Identifier: MIT
#include "platform/alerts/desktop_notifications.h"

#include "platform/alerts/alert_board.h"

namespace brivo {

namespace {

/// The alert as those see it who asked for it.
class Notification final : public UserAlert {
 public:
  Notification(RunLoop& loop, const std::shared_ptr<AlertBoard>& board, AlertText text)
      : loop_(loop), board_(board), alert_(std::make_shared<AlertBoard::Alert>(std::move(text))) {
    post(&AlertBoard::show);
  }
  ~Notification() override { post(&AlertBoard::withdraw); }
  Notification(const Notification&) = delete;
  Notification& operator=(const Notification&) = delete;

  bool waitUntilShown(std::chrono::milliseconds limit) const { return alert_->answer.waitUntilShown(limit); }
  Response waitForResponse() override { return alert_->answer.waitForAnswer(); }

 private:
  using Step = void (AlertBoard::*)(const std::shared_ptr<AlertBoard::Alert>&);

  void post(Step step) {
    loop_.post([weak = board_, alert = alert_, step] {
      if (const auto board = weak.lock()) (board.get()->*step)(alert);
    });
  }

  RunLoop& loop_;
  const std::weak_ptr<AlertBoard> board_;
  const std::shared_ptr<AlertBoard::Alert> alert_;
};

}  // namespace

DesktopNotifications::DesktopNotifications(RunLoop& loop, std::chrono::milliseconds patience)
    : loop_(loop), patience_(patience), board_(AlertBoard::create(loop)) {}

DesktopNotifications::~DesktopNotifications() { board_->end(); }

std::unique_ptr<UserAlert> DesktopNotifications::show(const Dictionary& alert) {
  auto notification = std::make_unique<Notification>(loop_, board_, AlertText::from(alert));
  if (!notification->waitUntilShown(patience_)) return nullptr;
  return notification;
}

void DesktopNotifications::dismissAll() { board_->dismissAll(); }

}  // namespace brivo
