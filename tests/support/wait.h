// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <functional>

namespace brivo::test {

/// Looks until `condition` is true; false when it is not within `limit`.
bool waitUntil(const std::function<bool()>& condition,
               std::chrono::milliseconds limit = std::chrono::seconds(20));

}  // namespace brivo::test
