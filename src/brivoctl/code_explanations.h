// SPDX-License-Identifier: MIT
// What the numbers in errors and in PTP traffic mean.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace brivoctl {

/// One meaning of a code; what it does not have is empty.
struct Explanation {
  std::string kind;  ///< such as "error" or "operation"
  std::int64_t code;
  std::string name;
  std::string olderName;
  std::string text;
};

/// All meanings that tables know. An error may also be given as the unsigned 32-bit number that its code is
/// in memory.
std::vector<Explanation> explanationsOf(std::int64_t code);

/// The names and texts of an error code in one line, such as "OVReturnDownloadFailed: _device download
/// failed."; empty when there are none.
std::string describeError(std::int32_t code);

}  // namespace brivoctl
