// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <memory>
#include <string>

namespace brivo {

/// Keeps the machine awake while work is done. *Thread-safe.*
class PowerAssertions {
 public:
  /// Stands for one assertion; the assertion ends when the last copy goes.
  using Handle = std::shared_ptr<void>;

  virtual ~PowerAssertions() = default;

  /// An assertion that keeps the machine from sleeping until its handle goes, but at most for `timeout`.
  /// Never waits for the system's power service.
  virtual Handle create(const std::string& name, std::chrono::seconds timeout) = 0;
};

}  // namespace brivo
