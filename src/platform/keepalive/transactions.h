// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <string>

namespace brivo {

/// Counts the reasons for which the process must stay. *Thread-safe.*
class Transactions {
 public:
  /// One reason, until the last copy goes.
  using Transaction = std::shared_ptr<const std::string>;

  /// Hears whenever the last transaction has ended, on the thread that ended it. Set before the first
  /// begin().
  void onNone(std::function<void()> handler) { *onNone_ = std::move(handler); }

  Transaction begin(const std::string& name);
  /// Transactions that are under way.
  std::size_t count() const { return *count_; }

 private:
  // Shared with the transactions, which may end after this has gone.
  std::shared_ptr<std::atomic<std::size_t>> count_ = std::make_shared<std::atomic<std::size_t>>(0);
  std::shared_ptr<std::function<void()>> onNone_ = std::make_shared<std::function<void()>>();
};

}  // namespace brivo
