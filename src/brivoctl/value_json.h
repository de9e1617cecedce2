// SPDX-License-Identifier: MIT
#pragma once

#include "brivoctl/output.h"

namespace brivoctl {

/// A value that the service sent. Bytes become text in base64 (RFC 4648); numbers that JSON has no form for
/// (not a number, infinite) become null.
Json jsonOf(const orvid::Value& value);
Json jsonOf(const orvid::Dictionary& dictionary);

/// The entries as lines for people, those of nested dictionaries indented below their key; bytes in
/// hexadecimal when they are few.
std::string linesOf(const orvid::Dictionary& dictionary);

}  // namespace brivoctl
