// SPDX-License-Identifier: MIT
#include "device/catalogue_counters.h"

#include <cmath>
#include <limits>

namespace brivo {

std::uint32_t CatalogueCounters::contentCatalogPercentCompleted() const {
  if (catalogingDone_) return 100;
  const auto announced = static_cast<std::uint32_t>(msObjectCount_.load());
  if (announced == 0) return 0;
  const auto indexed = static_cast<std::int32_t>(enumeratedCount_.load());
  const double percent = std::floor(static_cast<double>(indexed) / static_cast<double>(announced) * 100.0);
  if (percent <= 0) return 0;
  constexpr double most = std::numeric_limits<std::uint32_t>::max();
  return static_cast<std::uint32_t>(percent < most ? percent : most);
}

}  // namespace brivo
