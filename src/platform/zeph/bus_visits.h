// SPDX-License-Identifier: MIT
#pragma once

#include <systemd/sd-bus.h>

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/bus/bus_message.h"
#include "platform/work/run_loop.h"
#include "platform/zeph/door.h"

namespace brivo::zeph {

/// The calls that come over one connection to the session bus: asks the bus who calls, asks the doorkeeper
/// where that goes, and hands out the sockets. What one caller asks for and what one process holds is
/// limited, so that nobody keeps the others out. *Thread-bound* to the I/O thread.
class BusVisits : public std::enable_shared_from_this<BusVisits> {
 public:
  /// Calls in work, of one name on the bus and of all.
  static constexpr std::size_t kMostOfOneCaller = 32;
  static constexpr std::size_t kMostInWork = 256;
  /// Connections that one process has through the door at a time.
  static constexpr std::size_t kMostOfOneProcess = 64;

  /// `bus` and `plan` must outlive this.
  BusVisits(std::shared_ptr<RunLoop> loop, sd_bus* bus, const DoorPlan& plan);
  ~BusVisits();
  BusVisits(const BusVisits&) = delete;
  BusVisits& operator=(const BusVisits&) = delete;

  /// Serves the methods. Negative errno on failure.
  int start();
  std::size_t inWork() const { return visitors_.size(); }

 private:
  struct Visitor;
  using Step = void (BusVisits::*)(Visitor& visitor, sd_bus_message* answer);

  int onMethod(sd_bus_message* call, sd_bus_error* error);
  int onAny(sd_bus_message* message);
  bool hasTooMany(const char* caller) const;

  /// Asks the bus about the caller; `then` gets the answer.
  void ask(Visitor& visitor, const char* member, Step then);
  void credentialsTold(Visitor& visitor, sd_bus_message* answer);
  void ownerTold(Visitor& visitor, sd_bus_message* answer);
  void letIn(Visitor& visitor);

  void answered(std::uint64_t number, Result<Passage, CallError> result);
  Result<UniqueFd, CallError> admit(const Visitor& visitor, const Passage& passage);
  void hand(Visitor& visitor, const UniqueFd& socket, const Arguments& values);
  void refuse(std::uint64_t number, const CallError& error);

  const std::shared_ptr<RunLoop> loop_;
  sd_bus* const bus_;
  const DoorPlan& plan_;

  std::uint64_t lastNumber_ = 0;
  std::map<std::uint64_t, std::unique_ptr<Visitor>> visitors_;
  std::map<std::int32_t, std::vector<std::weak_ptr<Connection>>> connections_;  // by process
  // Receipts of the last calls that were answered with a descriptor, for the bus may send one back.
  std::deque<std::pair<std::uint64_t, BusMessage>> handed_;
};

}  // namespace brivo::zeph
