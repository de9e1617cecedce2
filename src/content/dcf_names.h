// SPDX-License-Identifier: MIT
// The naming rules of DCF (JEITA CP-3461) as this system applies them. Pure and *thread-safe*.
#pragma once

#include <cstdint>
#include <string_view>

namespace brivo {

enum class DCFKind { file, folder };

/// True when the upper-cased name is a DCF file name (four word characters, perhaps an "E", four digits, a
/// dot and an extension of three word characters or "HEIC") or folder name (a number from 100 to 999 and five
/// word characters, or "DCIM"). A name that is not UTF-8 is neither.
bool _ValidDCFObjectName(std::string_view name, DCFKind kind);

/// The first four UTF-16 units of the name as one number, first unit highest, with 32-bit wrap-around; 0 when
/// the name is shorter.
std::int32_t baseImageFilePrefix(std::string_view name);

/// The number in the last four characters of the name without its extension, read leniently (blanks, a sign,
/// digits up to the first other character); 0 when there are fewer than four or no digits.
std::int32_t baseImageFileDigits(std::string_view name);

}  // namespace brivo
