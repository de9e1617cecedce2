// SPDX-License-Identifier: MIT
#include "check.h"
#include "content/dcf_names.h"
#include "platform/text/unicode.h"

// Any bytes can be a file's name; what is shown of them is valid text on one line.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto name = textOf(data, size);
  const bool isDcf = brivo::_ValidDCFObjectName(name, brivo::DCFKind::file) ||
                     brivo::_ValidDCFObjectName(name, brivo::DCFKind::folder);
  if (isDcf) check(brivo::isUtf8(name));
  (void)brivo::baseImageFilePrefix(name);
  (void)brivo::baseImageFileDigits(name);

  const auto shown = brivo::replacingInvalidUtf8(name);
  check(brivo::isUtf8(shown));
  check(brivo::toUtf8(brivo::toUtf16(shown)) == shown);
  const auto line = brivo::escapingControls(name);
  check(brivo::isUtf8(line) && line.find('\n') == std::string::npos);
  check(brivo::codePointPrefix(name, brivo::codePointCount(name)) == name);
  return 0;
}
