// SPDX-License-Identifier: MIT
// The owner of one file descriptor.
#pragma once

#include <utility>

namespace brivo {

/// Closes its descriptor when it goes. *Thread-bound.*
class UniqueFd {
 public:
  UniqueFd() = default;
  /// Takes ownership of `fd`; a negative value means none.
  explicit UniqueFd(int fd) : fd_(fd) {}
  UniqueFd(UniqueFd&& other) noexcept : fd_(other.release()) {}
  UniqueFd& operator=(UniqueFd&& other) noexcept {
    if (this != &other) reset(other.release());
    return *this;
  }
  ~UniqueFd() { reset(); }

  int get() const { return fd_; }
  explicit operator bool() const { return fd_ >= 0; }

  /// Gives the descriptor to the caller, who must close it.
  [[nodiscard]] int release() { return std::exchange(fd_, -1); }
  /// Closes what is owned and owns `fd` instead. errno is left as it was.
  void reset(int fd = -1);
  /// A second descriptor of the same open file, close-on-exec; none when the process has no more.
  UniqueFd duplicate() const;

 private:
  int fd_ = -1;
};

}  // namespace brivo
