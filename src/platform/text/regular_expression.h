// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string_view>

namespace brivo {

/// A compiled expression over Unicode text: \w, \d and \b follow Unicode properties, and ^ and $
/// match at every line boundary (any Unicode newline). *Immutable* and thread-safe once made.
class RegularExpression {
 public:
  /// `pattern` is a constant of the program; one that does not compile is a bug and ends the
  /// process.
  explicit RegularExpression(std::string_view pattern);
  ~RegularExpression();

  /// True when the expression matches somewhere in `text`, which must be valid UTF-8. Text on which
  /// matching runs into the engine's limits counts as no match.
  bool matches(std::string_view text) const;

 private:
  struct Code;
  std::unique_ptr<const Code> code_;
};

}  // namespace brivo
