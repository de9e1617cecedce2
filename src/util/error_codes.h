// SPDX-License-Identifier: MIT
// Names and texts of result codes (error_table.h), and of the system's error number.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/base/value.h"

namespace brivo {

/// The entry of `code`: "legacy" and "modern", its names, and "text". The entry of 0 has its text under
/// "success" instead. None for a code that is not in the table. *Thread-safe*, as are all of these.
std::optional<Dictionary> __OVErrorValueDict(std::int64_t code);

/// The "text" of the entry whose code is the low 32 bits of `code` as an unsigned number. A negative code is
/// no such number and 0 has no "text", so both give none: only the codes above 0 have a text here.
std::optional<std::string> __OVValueToErrorString(std::int64_t code);
std::optional<std::string> __OVLongValueToErrorString(std::int32_t code);

/// Sets "errorDecoded" to the text of `code`, or of the number under "OVAErrorKey" when there is one other
/// than 0, as __OVValueToErrorString() gives it. False, and nothing changed, when there is no text.
bool __OVAddDecodedErrorToDict(Dictionary& dictionary, std::int64_t code);
/// A dictionary that must not change stays as it is: false.
bool __OVAddDecodedErrorToDict(const Dictionary& dictionary, std::int64_t code);

/// Prints the calling thread's error number (errno(3)), with its name if it is one that reading from a device
/// or a socket gives, and `place` as one line on standard error. The number of characters printed.
int printerrno(std::string_view place);

}  // namespace brivo
