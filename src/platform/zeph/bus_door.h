// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>

#include "platform/work/run_loop.h"
#include "platform/zeph/bus_visits.h"
#include "platform/zeph/door.h"

namespace brivo::zeph {

/// Keeps the door on the session bus: connects, takes the name, and comes back when the bus does. Another
/// owner of the name is waited for, and so is a bus that has an address and is not there. *Thread-bound* to
/// the I/O thread.
class BusDoor : public std::enable_shared_from_this<BusDoor> {
 public:
  static constexpr std::chrono::milliseconds kFirstRetry{500};
  static constexpr std::chrono::milliseconds kLastRetry{60'000};

  BusDoor(std::shared_ptr<RunLoop> loop, DoorPlan plan);
  ~BusDoor();
  BusDoor(const BusDoor&) = delete;
  BusDoor& operator=(const BusDoor&) = delete;

  /// Connects and takes the name, now or as soon as it can be had.
  void open();
  /// Gives the name up. `then` hears when no call to it can arrive any more; those that came before have been
  /// read. It hears false when the bus did not say so.
  void giveNameUp(std::function<void(bool given)> then);
  /// After giveNameUp(), however it ended: takes the name again.
  void takeNameAgain();
  /// Calls that have been read and not been answered.
  std::size_t visitsInWork() const { return visits_ ? visits_->inWork() : 0; }
  /// Leaves the bus for good.
  void end();

 private:
  int connect();
  void takeName();
  void nameAnswered(sd_bus_message* answer);
  void nameGiven(sd_bus_message* answer);
  void lost();
  void leaveBus();
  void retryLater();
  void say(const std::string& line);
  void answerGiveUp(bool given);

  const std::shared_ptr<RunLoop> loop_;
  const DoorPlan plan_;
  bool ended_ = false;
  std::chrono::milliseconds retry_ = kFirstRetry;
  std::string said_;  // the last line: what goes on is said once
  sd_bus* bus_ = nullptr;
  std::shared_ptr<BusVisits> visits_;
  sd_bus_slot* nameCall_ = nullptr;
  bool givesNameUp_ = false;
  std::function<void(bool given)> afterGivingUp_;
};

}  // namespace brivo::zeph
