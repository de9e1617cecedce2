// SPDX-License-Identifier: MIT
#include "brivoctl/code_explanations.h"

#include <limits>

#include "protocol/result_codes.h"
#include "ptp/code_tables.h"
#include "util/error_table.h"

namespace brivoctl {

namespace {

/// What the service answers requests with.
struct ResultText {
  std::int32_t code;
  const char* text;
};

constexpr ResultText kResults[] = {
    {brivo::kResultNoSuchObject, "no such object"},
    {brivo::kResultBadRange, "bad range"},
    {brivo::kResultReadTooLong, "read longer than 4 MiB"},
    {brivo::kResultDownloadNotOffered, "download not offered"},
    {brivo::kResultDeleteFailed, "delete failed"},
};

constexpr bool isUnsigned32(std::int64_t code) {
  return code >= 0 && code <= std::numeric_limits<std::uint32_t>::max();
}

void addErrors(std::vector<Explanation>& found, std::int64_t code) {
  for (const auto& row : brivo::errorTable()) {
    if (row.code != code) continue;
    const bool hasModern = *row.modern != '\0';
    found.push_back(
        {"error", code, hasModern ? row.modern : row.legacy, hasModern ? row.legacy : "", row.text});
  }
  for (const auto& row : kResults) {
    if (row.code == code) found.push_back({"request result", code, "", "", row.text});
  }
}

void addPTPCodes(std::vector<Explanation>& found, std::uint32_t code) {
  for (const auto& table : brivo::allPTPCodeTables()) {
    if (const char* const name = brivo::nameOfPTPCode(table.rows, code)) {
      found.push_back({table.kind, code, name, "", ""});
    }
  }
}

}  // namespace

std::vector<Explanation> explanationsOf(std::int64_t code) {
  std::vector<Explanation> found;
  addErrors(found, isUnsigned32(code) ? static_cast<std::int32_t>(code) : code);
  if (isUnsigned32(code)) addPTPCodes(found, static_cast<std::uint32_t>(code));
  return found;
}

std::string describeError(std::int32_t code) {
  std::vector<Explanation> found;
  addErrors(found, code);
  if (found.empty()) return {};
  const Explanation& first = found.front();
  return first.name.empty() ? first.text : first.name + ": " + first.text;
}

}  // namespace brivoctl
