// SPDX-License-Identifier: MIT
#include "ptp/records.h"

#include "check.h"

namespace {

bool isInside(std::span<const std::byte> part, std::span<const std::byte> whole) {
  return part.empty() ||
         (part.data() >= whole.data() && part.data() + part.size() <= whole.data() + whole.size());
}

void checkContainer(const brivo::PTPContainer& container, std::span<const std::byte> bytes) {
  check(container.length == bytes.size());
  check(*brivo::nameOfPTPContainerType(container) != '\0');
  check(container.parameters.size() <= 5);
  check(!container.payload || isInside(*container.payload, bytes));
}

}  // namespace

// Records are taken off the front until one is none of them; each takes bytes, and what it borrows is in
// them.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  auto rest = std::as_bytes(std::span(data, size));
  while (true) {
    const auto before = rest;
    const auto record = brivo::takePTPRecord(rest);
    if (!record) {
      check(rest.size() == before.size());
      return 0;
    }
    check(rest.size() < before.size());
    const auto taken = before.first(before.size() - rest.size());
    if (const auto* const container = std::get_if<brivo::PTPContainer>(&*record)) {
      checkContainer(*container, taken);
    } else {
      check(std::get<brivo::MSObjectInfoDataset>(*record).contentLength().content <= taken.size());
    }
  }
}
