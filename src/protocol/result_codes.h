// SPDX-License-Identifier: MIT
// The values of "errCode" in the results of object requests.
#pragma once

#include <cstdint>

namespace brivo {

inline constexpr std::int32_t kResultSuccess = 0;
inline constexpr std::int32_t kResultNoSuchObject = -21450;
inline constexpr std::int32_t kResultBadRange = -21449;
inline constexpr std::int32_t kResultReadTooLong = -21446;
inline constexpr std::int32_t kResultDownloadNotOffered = -9934;
inline constexpr std::int32_t kResultDeleteFailed = -9941;

/// The most bytes that one read may ask for.
inline constexpr std::uint64_t kLongestRead = 4'194'304;

/// The parent of a top-level folder.
inline constexpr std::uint32_t kTopLevelParent = 0xFFFFFFFE;

}  // namespace brivo
