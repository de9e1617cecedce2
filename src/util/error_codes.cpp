// SPDX-License-Identifier: MIT
#include "util/error_codes.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "util/error_table.h"

namespace brivo {

namespace {

struct NumberName {
  int number;
  const char* name;
};

constexpr NumberName kSystemErrors[] = {
    {EINTR, "EINTR"},           {EIO, "EIO"},
    {ENXIO, "ENXIO"},           {EBADF, "EBADF"},
    {ENOMEM, "ENOMEM"},         {EFAULT, "EFAULT"},
    {EISDIR, "EISDIR"},         {EINVAL, "EINVAL"},
    {ESPIPE, "ESPIPE"},         {EAGAIN, "EAGAIN"},
    {ECONNRESET, "ECONNRESET"}, {ENOBUFS, "ENOBUFS"},
    {ENOTCONN, "ENOTCONN"},     {ETIMEDOUT, "ETIMEDOUT"},
};

std::string lineFor(int number, std::string_view place) {
  const auto* const row = std::ranges::find(kSystemErrors, number, &NumberName::number);
  if (row == std::end(kSystemErrors)) return fmt::format("Error {} occurred in '{}'.\n", number, place);
  return fmt::format("Error '{}' ({}) occurred in '{}'.\n", row->name, number, place);
}

Dictionary entryOf(const ErrorDescription& row) {
  // The one entry that keeps its text under a key of its own.
  const char* const textKey = row.code == 0 ? "success" : "text";
  return {{"legacy", row.legacy}, {"modern", row.modern}, {textKey, row.text}};
}

}  // namespace

std::optional<Dictionary> __OVErrorValueDict(std::int64_t code) {
  const auto errors = errorTable();
  const auto row = std::ranges::find(errors, code, &ErrorDescription::code);
  if (row == errors.end()) return std::nullopt;
  return entryOf(*row);
}

std::optional<std::string> __OVValueToErrorString(std::int64_t code) {
  const auto entry = __OVErrorValueDict(static_cast<std::uint32_t>(code));
  const std::string* const text = entry ? entry->string("text") : nullptr;
  return text ? std::optional(*text) : std::nullopt;
}

std::optional<std::string> __OVLongValueToErrorString(std::int32_t code) {
  return __OVValueToErrorString(code);
}

bool __OVAddDecodedErrorToDict(Dictionary& dictionary, std::int64_t code) {
  const std::int64_t own = dictionary.signedInteger("OVAErrorKey").value_or(0);
  const auto text = __OVValueToErrorString(own != 0 ? own : code);
  if (text) dictionary.set("errorDecoded", *text);
  return text.has_value();
}

bool __OVAddDecodedErrorToDict(const Dictionary&, std::int64_t) { return false; }

int printerrno(std::string_view place) {
  const std::string line = lineFor(errno, place);
  return std::fputs(line.c_str(), stderr) < 0 ? -1 : static_cast<int>(line.size());
}

}  // namespace brivo
