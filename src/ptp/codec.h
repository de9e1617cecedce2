// SPDX-License-Identifier: MIT
// Readers and writers of the primitive data types of PTP datasets (ISO 15740, clause 5.3):
// little-endian integers, strings of UTF-16 code units, arrays.
//
// Every function works on a cursor into the caller's buffer and leaves it just past what it read or
// wrote. Only the MaxSize readers look at the end of the buffer, and only as far as each says; all
// others trust the caller to have a buffer that is large enough. Bytes from outside go through
// ByteCursor first. Pure and *thread-safe*.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace brivo {

/// Where to read next.
using PTPReadCursor = const std::uint8_t*;
/// Where to write next.
using PTPWriteCursor = std::uint8_t*;

// Integers without a check.
std::int32_t ReadSInt16(PTPReadCursor& cursor);
std::uint32_t ReadUInt16(PTPReadCursor& cursor);
std::int32_t ReadSInt32(PTPReadCursor& cursor);
std::uint32_t ReadUInt32(PTPReadCursor& cursor);
std::int64_t ReadSInt64(PTPReadCursor& cursor);
std::uint64_t ReadUInt64(PTPReadCursor& cursor);

// Integers that must end at or before `limit`, the address one past the last valid byte. A shortage
// gives 0 and leaves the cursor where it was; it cannot be told from a stored 0.
std::int32_t ReadSInt16MaxSize(PTPReadCursor& cursor, PTPReadCursor limit);
std::uint32_t ReadUInt16MaxSize(PTPReadCursor& cursor, PTPReadCursor limit);
std::int32_t ReadSInt32MaxSize(PTPReadCursor& cursor, PTPReadCursor limit);
std::uint32_t ReadUInt32MaxSize(PTPReadCursor& cursor, PTPReadCursor limit);
std::int64_t ReadSInt64MaxSize(PTPReadCursor& cursor, PTPReadCursor limit);
std::uint64_t ReadUInt64MaxSize(PTPReadCursor& cursor, PTPReadCursor limit);

// Integers to write; the low bits of the value that fit are stored.
void WriteSInt16(PTPWriteCursor& cursor, std::int32_t value);
void WriteUInt16(PTPWriteCursor& cursor, std::uint32_t value);
void WriteSInt32(PTPWriteCursor& cursor, std::int32_t value);
void WriteUInt32(PTPWriteCursor& cursor, std::uint32_t value);
void WriteSInt64(PTPWriteCursor& cursor, std::int64_t value);
void WriteUInt64(PTPWriteCursor& cursor, std::uint64_t value);

/// A PTP string: a count byte N, then N code units of which the last is a terminator and is dropped
/// unseen. The empty string is the byte 0 alone.
std::u16string CopyUnicodeStringWithLengthByteFromBuffer(PTPReadCursor& cursor);
/// The same, or none with the cursor unmoved when cursor + N is beyond `limit`. The check is that
/// loose: the count byte itself and up to N + 1 bytes beyond `limit` are read, so the buffer must
/// be larger than `limit` says.
std::optional<std::u16string> CopyUnicodeStringWithLengthByteFromBufferMaxSize(PTPReadCursor& cursor,
                                                                               PTPReadCursor limit);
/// Writes 1 byte for an empty string, else 1 + 2 * (length + 1). The count byte keeps the low 8
/// bits of length + 1, so that longer strings than 254 units get a count that does not fit them.
void WriteUnicodeStringWithLengthByteToBuffer(PTPWriteCursor& cursor, std::u16string_view string);

/// Code units up to a 0 unit, which is read too.
std::u16string CopyUnicodeStringFromBuffer(PTPReadCursor& cursor);
/// Writes 2 * (length + 1) bytes.
void WriteUnicodeStringToBuffer(PTPWriteCursor& cursor, std::u16string_view string);

/// An array of 16-bit values: a 32-bit count C and the elements.
std::vector<std::uint16_t> CopyArrayOfUnsignedShortsFromBuffer(PTPReadCursor& cursor);
/// The same, or none with the cursor unmoved when cursor + (C * 2 + 4), in 32-bit arithmetic, is
/// beyond `limit`. The count itself is read without a check.
std::optional<std::vector<std::uint16_t>> CopyArrayOfUnsignedShortsFromBufferMaxSize(PTPReadCursor& cursor,
                                                                                     PTPReadCursor limit);
void WriteArrayOfUnsignedShortsToBuffer(PTPWriteCursor& cursor, const std::vector<std::uint16_t>& array);

/// An array of 32-bit object handles: a 32-bit count C and the elements.
std::vector<std::uint32_t> CopyArrayOfHandlesFromBuffer(PTPReadCursor& cursor);
/// The same, or none with the cursor unmoved and a line in the log when cursor + (C * 4 + 4), in
/// 32-bit arithmetic, is beyond `limit`. The count itself is read without a check.
std::optional<std::vector<std::uint32_t>> CopyArrayOfHandlesFromBufferMaxSize(PTPReadCursor& cursor,
                                                                              PTPReadCursor limit);
void WriteArrayOfHandlesToBuffer(PTPWriteCursor& cursor, const std::vector<std::uint32_t>& array);

}  // namespace brivo
