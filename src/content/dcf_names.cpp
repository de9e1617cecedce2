// SPDX-License-Identifier: MIT
#include "content/dcf_names.h"

#include <string>

#include "platform/base/paths.h"
#include "platform/text/regular_expression.h"
#include "platform/text/unicode.h"

namespace brivo {

namespace {

const RegularExpression& expressionFor(DCFKind kind) {
  static const RegularExpression file(R"(^[\w]{4}(E){0,1}(\d){4}\.(([\w]){3}|HEIC)$)");
  static const RegularExpression folder(R"(^([1-9]{1}[\d]{2}[\w]{5})$|^((?i)\bDCIM\b)$)");
  return kind == DCFKind::file ? file : folder;
}

std::int32_t lenientInteger(std::u16string_view text) {
  std::size_t i = 0;
  while (i < text.size() && (text[i] == u' ' || text[i] == u'\t')) ++i;
  const bool negative = i < text.size() && text[i] == u'-';
  if (i < text.size() && (text[i] == u'-' || text[i] == u'+')) ++i;
  std::int32_t number = 0;  // at most four digits
  for (; i < text.size() && text[i] >= u'0' && text[i] <= u'9'; ++i) number = number * 10 + (text[i] - u'0');
  return negative ? -number : number;
}

}  // namespace

bool _ValidDCFObjectName(std::string_view name, DCFKind kind) {
  if (name.empty() || name.front() == '\0') return false;
  const auto upper = upperCased(name);
  return upper && expressionFor(kind).matches(*upper);
}

std::int32_t baseImageFilePrefix(std::string_view name) {
  const std::u16string units = toUtf16(name.substr(0, 16));  // four units are at most sixteen bytes
  if (units.size() < 4) return 0;
  std::uint32_t prefix = 0;
  for (std::size_t i = 0; i < 4; ++i) prefix = prefix * 256 + units[i];
  return static_cast<std::int32_t>(prefix);
}

std::int32_t baseImageFileDigits(std::string_view name) {
  const std::u16string stem = toUtf16(deletingPathExtension(name));
  if (stem.size() < 4) return 0;
  return lenientInteger(std::u16string_view(stem).substr(stem.size() - 4));
}

}  // namespace brivo
