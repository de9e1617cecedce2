// SPDX-License-Identifier: MIT
// A value, or what went wrong instead.
#pragma once

#include <cstring>
#include <string>
#include <utility>
#include <variant>

namespace brivo {

/// A failed system service: what was tried, on what, and the system's error number (0: none given).
struct SystemError {
  std::string what;
  int code = 0;

  /// One line for people.
  std::string text() const { return code == 0 ? what : what + ": " + std::strerror(code); }
};

/// Holds either a T or an E. Asking for the one that is not there is a bug of the caller.
template <class T, class E = SystemError>
class [[nodiscard]] Result {
 public:
  Result(T value) : storage_(std::in_place_index<0>, std::move(value)) {}
  Result(E error) : storage_(std::in_place_index<1>, std::move(error)) {}

  bool ok() const { return storage_.index() == 0; }
  explicit operator bool() const { return ok(); }

  T& value() & { return std::get<0>(storage_); }
  const T& value() const& { return std::get<0>(storage_); }
  T value() && { return std::get<0>(std::move(storage_)); }
  T& operator*() & { return value(); }
  const T& operator*() const& { return value(); }
  T operator*() && { return std::move(*this).value(); }
  T* operator->() { return &value(); }
  const T* operator->() const { return &value(); }

  const E& error() const { return std::get<1>(storage_); }

 private:
  std::variant<T, E> storage_;
};

}  // namespace brivo
