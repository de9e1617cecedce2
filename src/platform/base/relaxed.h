// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>

namespace brivo {

/// A number that one thread may set while others read it, and whose order with other numbers does not matter.
/// It copies as a plain number does. *Thread-safe.*
template <class Number>
class Relaxed {
 public:
  Relaxed(Number number = 0) : number_(number) {}
  Relaxed(const Relaxed& other) : number_(Number{other}) {}
  Relaxed& operator=(const Relaxed& other) { return *this = Number{other}; }
  Relaxed& operator=(Number number) {
    number_.store(number, std::memory_order_relaxed);
    return *this;
  }
  operator Number() const { return number_.load(std::memory_order_relaxed); }

 private:
  std::atomic<Number> number_;
};

}  // namespace brivo
