// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::test {

/// Collects what is written to descriptor 2 while it lives.
class StandardErrorCapture {
 public:
  StandardErrorCapture();
  /// Puts standard error back.
  ~StandardErrorCapture();
  StandardErrorCapture(const StandardErrorCapture&) = delete;
  StandardErrorCapture& operator=(const StandardErrorCapture&) = delete;

  /// Everything written so far.
  std::string text() const;

 private:
  int saved_;
  int file_;
};

}  // namespace brivo::test
