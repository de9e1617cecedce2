// SPDX-License-Identifier: MIT
// Readable names of PTP codes (ISO 15740) for logs and diagnostics. A code that no table (code_tables.h)
// names gets a text that says in which range it is, and the code in hexadecimal. Pure and *thread-safe*.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace brivo {

// Vendors have the codes 0x9xxx, 0xAxxx, 0xCxxx, 0xDxxx and 0xBxxx of these five, in this order.
std::string stringForOperationCode(std::uint32_t code);
std::string stringForResponseCode(std::uint32_t code);
std::string stringForEventCode(std::uint32_t code);
std::string stringForDevicePropCode(std::uint32_t code);
std::string stringForObjectFormatCode(std::uint32_t code);

/// "Undefined Canon Property" for a code without a name.
std::string stringForCanonProperty(std::uint32_t code);
/// None for a code in neither the reserved range nor the vendors'.
std::optional<std::string> stringForFunctionalMode(std::uint32_t code);
std::string stringForStorageType(std::uint32_t code);
std::string stringForFilesystemType(std::uint32_t code);
std::string stringForAccessCapability(std::uint32_t code);
std::string stringForProtectionStatus(std::uint32_t code);
std::string stringForAssociationType(std::uint32_t code);
std::string stringForInitFailReason(std::uint32_t code);

/// The data type code (ISO 15740, clause 5.3) of a Canon device property: 0x0002 for UINT8, 0x0004 for
/// UINT16, 0x0006 for UINT32, 0xFFFF for a string; 0 when it is not known.
std::uint16_t ptpDataTypeForProperty(std::uint32_t property);

}  // namespace brivo
