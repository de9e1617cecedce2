// SPDX-License-Identifier: MIT
// The listings of PTP codes with their names. *Immutable.*
#pragma once

#include <cstdint>
#include <span>

namespace brivo {

/// A code and its name; each code stands once in its table.
struct PTPCodeName {
  std::uint32_t code;
  const char* name;
};

// Codes of ISO 15740 and of vendors, in the order of the codes.
std::span<const PTPCodeName> operationCodes();
std::span<const PTPCodeName> responseCodes();
std::span<const PTPCodeName> eventCodes();
std::span<const PTPCodeName> devicePropCodes();
std::span<const PTPCodeName> objectFormatCodes();
/// Device properties of one vendor.
std::span<const PTPCodeName> canonProperties();
/// The one whose code is far from those.
std::span<const PTPCodeName> canonPropertiesElsewhere();
std::span<const PTPCodeName> functionalModes();
std::span<const PTPCodeName> storageTypes();
std::span<const PTPCodeName> filesystemTypes();
std::span<const PTPCodeName> accessCapabilities();
std::span<const PTPCodeName> protectionStatuses();
std::span<const PTPCodeName> associationTypes();
/// Why a connection was refused (CIPA DC-005, Init Fail packet).
std::span<const PTPCodeName> initFailReasons();

/// What the codes of a table are of, for people, and the table.
struct PTPCodeTable {
  const char* kind;
  std::span<const PTPCodeName> rows;
};

/// All of the above.
std::span<const PTPCodeTable> allPTPCodeTables();

/// The name of `code` in a table; null when it has none there.
const char* nameOfPTPCode(std::span<const PTPCodeName> table, std::uint32_t code);

}  // namespace brivo
