// SPDX-License-Identifier: MIT
#include "ptp/code_names.h"

#include <fmt/format.h>

#include <string_view>

#include "ptp/code_tables.h"

namespace brivo {

namespace {

using Table = std::span<const PTPCodeName>;

/// The sixteenth of the code space that a code is in.
constexpr std::uint32_t blockOf(std::uint32_t code) { return code & 0xF000; }

std::string bare(std::uint32_t code) { return fmt::format("(0x{:04X})", code); }

/// What a code is called that has no name: by the block that vendors have and the one that is reserved.
struct Ranges {
  std::string_view vendorName;
  std::uint32_t vendorBlock;
  std::string_view reservedName;
  std::uint32_t reservedBlock;
};

std::optional<std::string> nameInRange(std::uint32_t code, const Ranges& ranges) {
  if (blockOf(code) == ranges.vendorBlock) return fmt::format("{} {}", ranges.vendorName, bare(code));
  if (blockOf(code) == ranges.reservedBlock) return fmt::format("{} {}", ranges.reservedName, bare(code));
  return std::nullopt;
}

std::optional<std::string> nameOrRange(Table table, std::uint32_t code, const Ranges& ranges) {
  if (const char* const name = nameOfPTPCode(table, code)) return name;
  return nameInRange(code, ranges);
}

std::string nameOr(Table table, std::uint32_t code, const std::string& otherwise) {
  const char* const name = nameOfPTPCode(table, code);
  return name ? name : otherwise;
}

}  // namespace

std::string stringForOperationCode(std::uint32_t code) {
  return nameOrRange(operationCodes(), code,
                     {"PTPOperationCodeVendorDefined", 0x9000, "PTPOperationCodeReserved", 0x1000})
      .value_or(bare(code));
}

std::string stringForResponseCode(std::uint32_t code) {
  return nameOrRange(responseCodes(), code,
                     {"PTPResponseCodeVendorDefined", 0xA000, "PTPResponseCodeReserved", 0x2000})
      .value_or(bare(code));
}

std::string stringForEventCode(std::uint32_t code) {
  return nameOrRange(eventCodes(), code,
                     {"PTPEventCodeVendorDefined", 0xC000, "PTPEventCodeReserved", 0x4000})
      .value_or(bare(code));
}

std::string stringForDevicePropCode(std::uint32_t code) {
  return nameOrRange(devicePropCodes(), code,
                     {"PTPDevicePropCodeVendorDefined", 0xD000, "PTPDevicePropCodeReserved", 0x5000})
      .value_or(bare(code));
}

std::string stringForObjectFormatCode(std::uint32_t code) {
  return nameOrRange(
             objectFormatCodes(), code,
             {"PTPObjectFormatCodeVendorDefined", 0xB000, "PTPObjectFormatCodeReservedForFuture", 0x3000})
      .value_or(bare(code));
}

std::string stringForCanonProperty(std::uint32_t code) {
  return nameOr(canonProperties(), code,
                nameOr(canonPropertiesElsewhere(), code, "Undefined Canon Property"));
}

std::optional<std::string> stringForFunctionalMode(std::uint32_t code) {
  return nameOrRange(functionalModes(), code,
                     {"PTPFunctionalModeVendorDefined", 0x8000, "PTPFunctionalModeReserved", 0});
}

std::string stringForStorageType(std::uint32_t code) {
  return nameOr(storageTypes(), code, "PTPStorageTypeReserved " + bare(code));
}

std::string stringForFilesystemType(std::uint32_t code) {
  return nameOrRange(filesystemTypes(), code,
                     {"PTPFilesystemTypeVendorDefined", 0x8000, "PTPFilesystemTypeReserved", 0})
      .value_or(bare(code));
}

std::string stringForAccessCapability(std::uint32_t code) {
  return nameOr(accessCapabilities(), code, "PTPAccessCapabilityReserved " + bare(code));
}

std::string stringForProtectionStatus(std::uint32_t code) {
  return nameOr(protectionStatuses(), code, "PTPProtectionStatusReserved " + bare(code));
}

std::string stringForAssociationType(std::uint32_t code) {
  return nameOrRange(associationTypes(), code,
                     {"PTPAssociationTypeVendorDefined", 0x8000, "PTPAssociationTypeReserved", 0})
      .value_or(bare(code));
}

std::string stringForInitFailReason(std::uint32_t code) {
  return nameOr(initFailReasons(), code, bare(code));
}

}  // namespace brivo
