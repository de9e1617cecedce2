// SPDX-License-Identifier: MIT
#include "ptp/object_info_dataset.h"

#include <algorithm>

#include "check.h"

// A complete dataset is read inside its bytes, and what is written of it is read back as the same.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto bytes = std::as_bytes(std::span(data, size));
  if (!brivo::MSObjectInfoDataset::isComplete(bytes)) return 0;
  const brivo::MSObjectInfoDataset first(brivo::Data::copyOf(bytes));
  const auto written = first.content();
  check(written.size() == first.contentLength().buffer);
  if (!brivo::MSObjectInfoDataset::isComplete(written.bytes())) return 0;  // a name longer than PTP can count
  const brivo::MSObjectInfoDataset second(written);
  check(std::ranges::equal(second.content().bytes(), written.bytes()));
  return 0;
}
