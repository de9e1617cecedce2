// SPDX-License-Identifier: MIT
// Conversions between the text forms of the system. Pure and *thread-safe*.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace brivo {

/// True when `text` is well-formed UTF-8 (Unicode Standard, table 3-7).
bool isUtf8(std::string_view text);

/// `bytes` with every ill-formed sequence replaced by U+FFFD, and so always UTF-8.
std::string replacingInvalidUtf8(std::string_view bytes);

/// The same, with U+FFFD for each noncharacter too (Unicode Standard, section 23.7): sd-bus refuses messages
/// that hold one.
std::string replacingNoncharacters(std::string_view bytes);

/// UTF-8 to UTF-16 code units in native order; ill-formed sequences become U+FFFD.
std::u16string toUtf16(std::string_view utf8);

/// UTF-16 to UTF-8; lone surrogates become U+FFFD.
std::string toUtf8(std::u16string_view utf16);

/// Full upper-case mapping, independent of language (Unicode Standard, section 3.13). None when
/// `text` is not UTF-8.
std::optional<std::string> upperCased(std::string_view text);

/// `text` with A to Z turned into a to z; everything else stays. For file-name extensions.
std::string asciiLowerCased(std::string_view text);

/// `text` as one safe line: valid UTF-8, control characters (C0, DEL, C1, line and paragraph
/// separators) as \xNN or \u{NNNN}.
std::string escapingControls(std::string_view text);

/// The number of Unicode code points; each byte of an ill-formed sequence counts as one.
std::size_t codePointCount(std::string_view text);

/// The first `count` code points of `text`.
std::string_view codePointPrefix(std::string_view text, std::size_t count);

}  // namespace brivo
