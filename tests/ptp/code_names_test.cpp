// SPDX-License-Identifier: MIT
#include "ptp/code_names.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <set>
#include <string_view>

#include "ptp/code_tables.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using Table = std::span<const PTPCodeName>;

void expectTable(Table table, std::size_t rows, PTPCodeName first, PTPCodeName last) {
  SCOPED_TRACE(first.name);
  ASSERT_EQ(table.size(), rows);
  EXPECT_EQ(table.front().code, first.code);
  EXPECT_STREQ(table.front().name, first.name);
  EXPECT_EQ(table.back().code, last.code);
  EXPECT_STREQ(table.back().name, last.name);
  EXPECT_TRUE(std::ranges::is_sorted(table, std::ranges::less_equal(), &PTPCodeName::code))
      << "each code once";
}

/// The names that stand in more than one row.
std::set<std::string_view> repeatedNames(Table table) {
  std::set<std::string_view> seen;
  std::set<std::string_view> repeated;
  for (const auto& row : table) {
    if (!seen.insert(row.name).second) repeated.insert(row.name);
  }
  return repeated;
}

std::size_t rowsBetween(Table table, std::uint32_t first, std::uint32_t last) {
  return static_cast<std::size_t>(
      std::ranges::count_if(table, [&](const auto& row) { return row.code >= first && row.code <= last; }));
}

TEST(CodeTablesTest, RowsAndEndsOfEachTable) {
  expectTable(operationCodes(), 212 + 1 /* the undefined one */, {0x1000, "PTPOperationCodeUndefined"},
              {0x9805, "MTPGetObjectPropList"});
  expectTable(responseCodes(), 33, {0x2000, "PTPResponseCodeUndefined"},
              {0x2020, "PTPResponseCodeSpecificationOfDestinationUnsupported"});
  expectTable(eventCodes(), 18, {0x4000, "PTPEventCodeUndefined"},
              {0xC003, "PTPEventCodeNorelRestartSession"});
  expectTable(devicePropCodes(), 32, {0x5000, "PTPDevicePropCodeUndefined"},
              {0x501F, "PTPDevicePropCodeCopyrightInfo"});
  expectTable(objectFormatCodes(), 32, {0x3000, "PTPObjectFormatCodeUndefined"},
              {0x3810, "PTPObjectFormatCodeJPX"});
  expectTable(canonProperties(), 159, {0xD101, "CanonAperture"}, {0xD1DF, "CanonCADarkBright"});
  expectTable(functionalModes(), 2, {0, "PTPFunctionalModeStandard"}, {1, "PTPFunctionalModeSleepState"});
  expectTable(storageTypes(), 5, {0, "PTPStorageTypeUndefined"}, {4, "PTPStorageTypeRemovableRAM"});
  expectTable(filesystemTypes(), 4, {0, "PTPFilesystemTypeUndefined"}, {3, "PTPFilesystemTypeDCF"});
  expectTable(accessCapabilities(), 3, {0, "PTPAccessCapabilityReadWrite"},
              {2, "PTPAccessCapabilityReadOnlyWithObjectDeletion"});
  expectTable(protectionStatuses(), 2, {0, "PTPProtectionStatusNoProtection"},
              {1, "PTPProtectionStatusReadOnly"});
  expectTable(associationTypes(), 8, {0, "PTPAssociationTypeUndefined"},
              {7, "PTPAssociationTypeAncillaryData"});
  expectTable(initFailReasons(), 3, {1, "PTPInitFailReasonRejectedInitiator"},
              {3, "PTPInitFailReasonUnspecified"});
}

TEST(CodeTablesTest, AllTablesAreListedWithTheirKind) {
  std::size_t rows = 0;
  std::set<std::string_view> kinds;
  for (const auto& table : allPTPCodeTables()) {
    rows += table.rows.size();
    kinds.insert(table.kind);
  }
  EXPECT_EQ(kinds.size(), 13u);
  EXPECT_EQ(rows, 213u + 33 + 18 + 32 + 32 + 159 + 1 + 2 + 5 + 4 + 3 + 2 + 8 + 3);
}

TEST(CodeTablesTest, StandardRowsFillTheirRanges) {
  EXPECT_EQ(rowsBetween(operationCodes(), 0x1000, 0x101C), 0x1Du);
  EXPECT_EQ(rowsBetween(operationCodes(), 0x101D, 0x8FFF), 1u) << "0x1023";
  EXPECT_EQ(rowsBetween(responseCodes(), 0x2000, 0x2020), 33u);
  EXPECT_EQ(rowsBetween(eventCodes(), 0x4000, 0x400E), 15u);
  EXPECT_EQ(rowsBetween(eventCodes(), 0xC001, 0xC003), 3u);
  EXPECT_EQ(rowsBetween(devicePropCodes(), 0x5000, 0x501F), 32u);
  EXPECT_EQ(rowsBetween(objectFormatCodes(), 0x3000, 0x300E), 15u);
  EXPECT_EQ(rowsBetween(objectFormatCodes(), 0x3800, 0x3810), 17u);
}

TEST(CodeTablesTest, EveryStandardNameHasThePrefixOfItsTable) {
  const auto check = [](Table table, std::uint32_t last, std::string_view prefix) {
    for (const auto& row : table) {
      EXPECT_TRUE(row.code > last || std::string_view(row.name).starts_with(prefix)) << row.name;
    }
  };
  check(operationCodes(), 0x1FFF, "PTPOperationCode");
  check(responseCodes(), 0xFFFF, "PTPResponseCode");
  check(eventCodes(), 0xFFFF, "PTPEventCode");
  check(devicePropCodes(), 0xFFFF, "PTPDevicePropCode");
  check(objectFormatCodes(), 0xFFFF, "PTPObjectFormatCode");
}

TEST(CodeTablesTest, VendorsHaveTheirShareOfTheOperations) {
  std::map<std::string, int> counts;
  for (const auto& row : operationCodes()) {
    const std::string_view name = row.name;
    ++counts[name.starts_with("Canon_") ? "Canon" : name.starts_with("MTP") ? "MTP" : "PTP"];
  }
  EXPECT_EQ(counts["Canon"], 170);
  EXPECT_EQ(counts["MTP"], 4);
  EXPECT_EQ(rowsBetween(operationCodes(), 0x9001, 0x900B), 9u + 2u) << "with two of another vendor";
}

TEST(CodeTablesTest, FourOperationNamesStandInTwoRowsAndNoOtherNameDoes) {
  EXPECT_THAT(repeatedNames(operationCodes()),
              ElementsAre("Canon_GetObjectInfoEx", "Canon_GetPartialObjectEx", "Canon_SendPartialObject",
                          "Canon_SetObjectTime"));
  for (const auto& table : allPTPCodeTables().subspan(1)) {
    EXPECT_THAT(repeatedNames(table.rows), testing::IsEmpty()) << table.kind;
  }
}

TEST(CodeNamesTest, EveryRowIsNamedByItsFunction) {
  for (const auto& row : operationCodes()) EXPECT_EQ(stringForOperationCode(row.code), row.name);
  for (const auto& row : responseCodes()) EXPECT_EQ(stringForResponseCode(row.code), row.name);
  for (const auto& row : eventCodes()) EXPECT_EQ(stringForEventCode(row.code), row.name);
  for (const auto& row : devicePropCodes()) EXPECT_EQ(stringForDevicePropCode(row.code), row.name);
  for (const auto& row : objectFormatCodes()) EXPECT_EQ(stringForObjectFormatCode(row.code), row.name);
  for (const auto& row : canonProperties()) EXPECT_EQ(stringForCanonProperty(row.code), row.name);
  for (const auto& row : functionalModes()) EXPECT_EQ(stringForFunctionalMode(row.code), row.name);
  for (const auto& row : storageTypes()) EXPECT_EQ(stringForStorageType(row.code), row.name);
  for (const auto& row : filesystemTypes()) EXPECT_EQ(stringForFilesystemType(row.code), row.name);
  for (const auto& row : accessCapabilities()) EXPECT_EQ(stringForAccessCapability(row.code), row.name);
  for (const auto& row : protectionStatuses()) EXPECT_EQ(stringForProtectionStatus(row.code), row.name);
  for (const auto& row : associationTypes()) EXPECT_EQ(stringForAssociationType(row.code), row.name);
  for (const auto& row : initFailReasons()) EXPECT_EQ(stringForInitFailReason(row.code), row.name);
}

TEST(CodeNamesTest, Operation9FFFIsVendorDefined1030ReservedAnd5001Neither) {
  EXPECT_EQ(stringForOperationCode(0x9FFF), "PTPOperationCodeVendorDefined (0x9FFF)");
  EXPECT_EQ(stringForOperationCode(0x1030), "PTPOperationCodeReserved (0x1030)");
  EXPECT_EQ(stringForOperationCode(0x5001), "(0x5001)");
}

TEST(CodeNamesTest, AnUnnamedCodeInsideAVendorsRangeIsVendorDefined) {
  EXPECT_EQ(stringForOperationCode(0x9040), "PTPOperationCodeVendorDefined (0x9040)");
  EXPECT_EQ(stringForOperationCode(0x9804), "PTPOperationCodeVendorDefined (0x9804)");
  EXPECT_EQ(stringForOperationCode(0x9000), "PTPOperationCodeVendorDefined (0x9000)");
}

TEST(CodeNamesTest, OperationsAroundTheStandardOnes) {
  EXPECT_EQ(stringForOperationCode(0x1001), "PTPOperationCodeGetDeviceInfo");
  EXPECT_EQ(stringForOperationCode(0x101B), "PTPOperationCodeGetPartialObject");
  EXPECT_EQ(stringForOperationCode(0x101C), "PTPOperationCodeInitiateOpenCapture");
  EXPECT_EQ(stringForOperationCode(0x101D), "PTPOperationCodeReserved (0x101D)");
  EXPECT_EQ(stringForOperationCode(0x1023), "PTPOperationCodeGetFilesystemManifest");
  EXPECT_EQ(stringForOperationCode(0x1FFF), "PTPOperationCodeReserved (0x1FFF)");
  EXPECT_EQ(stringForOperationCode(0), "(0x0000)");
}

TEST(CodeNamesTest, TheTwoVendorsThatShareTheFirstVendorCodes) {
  EXPECT_EQ(stringForOperationCode(0x9001), "PTPOperationCodeGetNumDownloadableObjects_Norel");
  EXPECT_EQ(stringForOperationCode(0x9002), "PTPOperationCodeGetAllObjectInfo32_Norel");
  EXPECT_EQ(stringForOperationCode(0x9003), "PTPOperationCodeGetUserAssignedDeviceName_Norel");
  EXPECT_EQ(stringForOperationCode(0x9004), "PTPOperationCodeAllowKeepAwake_Norel");
  EXPECT_EQ(stringForOperationCode(0x9005), "PTPOperationCodeGetAllObjectInfo64_Norel");
  EXPECT_EQ(stringForOperationCode(0x9006), "Canon_GetObjectHandleByName");
  EXPECT_EQ(stringForOperationCode(0x9007), "PTPOperationCodeGetPartialObject64_Norel");
  EXPECT_EQ(stringForOperationCode(0x9008), "Canon_InitiateReleaseControl");
  EXPECT_EQ(stringForOperationCode(0x9009), "PTPOperationCodeGetObjectMetadata_Norel");
  EXPECT_EQ(stringForOperationCode(0x900A), "PTPOperationCodeGetMD5PartialObject64_Norel");
  EXPECT_EQ(stringForOperationCode(0x900B), "PTPOperationCodeSetMediaCapabilities") << "without a suffix";
  EXPECT_EQ(stringForOperationCode(0x900C), "Canon_ViewfinderOff");
}

TEST(CodeNamesTest, MisspeltAndBareNumberOperationNamesStay) {
  EXPECT_EQ(stringForOperationCode(0x9026), "Canon_InitiateDirectTansferEx");
  EXPECT_EQ(stringForOperationCode(0x902C), "Canon_902C");
  EXPECT_EQ(stringForOperationCode(0x902D), "Canon_GetDirectory");
  EXPECT_EQ(stringForOperationCode(0x902E), "Canon_902E");
  EXPECT_EQ(stringForOperationCode(0x902F), "Canon_902F");
  EXPECT_EQ(stringForOperationCode(0x91FF), "Canon_FAPIMessageRX");
}

TEST(CodeNamesTest, TheMtpOperationsLeaveOneOut) {
  EXPECT_EQ(stringForOperationCode(0x9801), "MTPGetObjectPropsSupported");
  EXPECT_EQ(stringForOperationCode(0x9802), "MTPGetObjectPropDesc");
  EXPECT_EQ(stringForOperationCode(0x9803), "MTPGetObjectPropValue");
  EXPECT_EQ(stringForOperationCode(0x9805), "MTPGetObjectPropList");
}

TEST(CodeNamesTest, VendorDefinedResponsesAreInTheBlockA) {
  EXPECT_EQ(stringForResponseCode(0xA001), "PTPResponseCodeVendorDefined (0xA001)");
  EXPECT_EQ(stringForResponseCode(0x9001), "(0x9001)");
  EXPECT_EQ(stringForResponseCode(0x2021), "PTPResponseCodeReserved (0x2021)");
  EXPECT_EQ(stringForResponseCode(0x2001), "PTPResponseCodeOK");
  EXPECT_EQ(stringForResponseCode(0x2019), "PTPResponseCodeDeviceBusy");
}

TEST(CodeNamesTest, VendorDefinedEventsAreInTheBlockC) {
  EXPECT_EQ(stringForEventCode(0xC000), "PTPEventCodeVendorDefined (0xC000)");
  EXPECT_EQ(stringForEventCode(0xC001), "PTPEventCodeNorelDeviceUnlocked");
  EXPECT_EQ(stringForEventCode(0xC002), "PTPEventCodeNorelUserAssignedNameChanged");
  EXPECT_EQ(stringForEventCode(0xC004), "PTPEventCodeVendorDefined (0xC004)");
  EXPECT_EQ(stringForEventCode(0x400F), "PTPEventCodeReserved (0x400F)");
  EXPECT_EQ(stringForEventCode(0x400E), "PTPEventCodeUnreportedStatus");
  EXPECT_EQ(stringForEventCode(0xA000), "(0xA000)");
}

TEST(CodeNamesTest, VendorDefinedDevicePropertiesAreInTheBlockD) {
  EXPECT_EQ(stringForDevicePropCode(0xD101), "PTPDevicePropCodeVendorDefined (0xD101)");
  EXPECT_EQ(stringForDevicePropCode(0x5020), "PTPDevicePropCodeReserved (0x5020)");
  EXPECT_EQ(stringForDevicePropCode(0x5001), "PTPDevicePropCodeBatteryLevel");
  EXPECT_EQ(stringForDevicePropCode(0x1001), "(0x1001)");
}

TEST(CodeNamesTest, VendorDefinedObjectFormatsAreInTheBlockB) {
  EXPECT_EQ(stringForObjectFormatCode(0xB101), "PTPObjectFormatCodeVendorDefined (0xB101)");
  EXPECT_EQ(stringForObjectFormatCode(0x300F), "PTPObjectFormatCodeReservedForFuture (0x300F)");
  EXPECT_EQ(stringForObjectFormatCode(0x3811), "PTPObjectFormatCodeReservedForFuture (0x3811)");
  EXPECT_EQ(stringForObjectFormatCode(0x2000), "(0x2000)");
}

TEST(CodeNamesTest, TwoObjectFormatsAreReservedByName) {
  EXPECT_EQ(stringForObjectFormatCode(0x3806), "PTPObjectFormatCodeReserved1");
  EXPECT_EQ(stringForObjectFormatCode(0x380C), "PTPObjectFormatCodeReserved2");
}

TEST(CodeNamesTest, OnePropertyIsNamedOutsideItsTableAndOneRowSaysThatItIsNone) {
  EXPECT_EQ(stringForCanonProperty(0xD02C), "CanonImageQualityEnumeration");
  EXPECT_EQ(stringForCanonProperty(0xD117), "Undefined Canon Property");
  EXPECT_EQ(stringForCanonProperty(0xD100), "Undefined Canon Property");
  EXPECT_EQ(stringForCanonProperty(0xD1E0), "Undefined Canon Property");
  EXPECT_EQ(stringForCanonProperty(0xFFFFFFFF), "Undefined Canon Property");
}

TEST(CodeNamesTest, TwoPropertyNamesEndInFourBlanks) {
  EXPECT_EQ(stringForCanonProperty(0xD115), "CanonOwner    ");
  EXPECT_EQ(stringForCanonProperty(0xD1D9), "CanonAEB    ");
  const auto ending = std::ranges::count_if(
      canonProperties(), [](const auto& row) { return std::string_view(row.name).ends_with(' '); });
  EXPECT_EQ(ending, 2);
}

TEST(CodeNamesTest, MisspeltPropertyNamesStay) {
  EXPECT_EQ(stringForCanonProperty(0xD1C9), "CanonContinousAFMode");
}

TEST(CodeNamesTest, AFunctionalModeOf1234HasNoStringAtAll) {
  EXPECT_EQ(stringForFunctionalMode(0x1234), std::nullopt);
  EXPECT_EQ(stringForFunctionalMode(0x8001), "PTPFunctionalModeVendorDefined (0x8001)");
  EXPECT_EQ(stringForFunctionalMode(2), "PTPFunctionalModeReserved (0x0002)");
  EXPECT_EQ(stringForFunctionalMode(0x0FFF), "PTPFunctionalModeReserved (0x0FFF)");
}

TEST(CodeNamesTest, StorageTypesCapabilitiesAndProtectionAreReservedWhereverTheyAreUnknown) {
  EXPECT_EQ(stringForStorageType(5), "PTPStorageTypeReserved (0x0005)");
  EXPECT_EQ(stringForStorageType(0x8000), "PTPStorageTypeReserved (0x8000)");
  EXPECT_EQ(stringForAccessCapability(3), "PTPAccessCapabilityReserved (0x0003)");
  EXPECT_EQ(stringForProtectionStatus(2), "PTPProtectionStatusReserved (0x0002)");
}

TEST(CodeNamesTest, FilesystemAndAssociationTypesHaveAVendorBlockAReservedOneAndNeither) {
  EXPECT_EQ(stringForFilesystemType(0x8003), "PTPFilesystemTypeVendorDefined (0x8003)");
  EXPECT_EQ(stringForFilesystemType(4), "PTPFilesystemTypeReserved (0x0004)");
  EXPECT_EQ(stringForFilesystemType(0x1000), "(0x1000)");
  EXPECT_EQ(stringForAssociationType(0x8003), "PTPAssociationTypeVendorDefined (0x8003)");
  EXPECT_EQ(stringForAssociationType(8), "PTPAssociationTypeReserved (0x0008)");
  EXPECT_EQ(stringForAssociationType(0x7000), "(0x7000)");
  EXPECT_EQ(stringForAssociationType(6), "PTPAssociationType2DPanoramic");
}

TEST(CodeNamesTest, AnUnknownFailureReasonIsItsCode) {
  EXPECT_EQ(stringForInitFailReason(0), "(0x0000)");
  EXPECT_EQ(stringForInitFailReason(4), "(0x0004)");
}

TEST(CodeNamesTest, CodesOfMoreThan16BitsAreInTheBlockOfTheirLowBitsAndShownWhole) {
  EXPECT_EQ(stringForOperationCode(0x00011001), "PTPOperationCodeReserved (0x11001)");
  EXPECT_EQ(stringForResponseCode(0xFFFFA001), "PTPResponseCodeVendorDefined (0xFFFFA001)");
}

TEST(PropertyTypesTest, EveryListedPropertyHasItsType) {
  const std::map<int, std::vector<std::uint32_t>> listed{
      {0x0002,
       {0xD104, 0xD107, 0xD109, 0xD110, 0xD180, 0xD181, 0xD182, 0xD183, 0xD184, 0xD185, 0xD186, 0xD187,
        0xD188, 0xD189, 0xD18A, 0xD18E, 0xD18F, 0xD190, 0xD191}},
      {0x0004,
       {0xD101, 0xD102, 0xD103, 0xD105, 0xD106, 0xD108, 0xD10B, 0xD10C, 0xD10F, 0xD111, 0xD112, 0xD114,
        0xD119, 0xD11A, 0xD11D, 0xD1A9, 0xD1B0, 0xD1B1, 0xD1D9}},
      {0x0006, {0xD10A, 0xD10D, 0xD10E, 0xD113, 0xD116, 0xD11B, 0xD11C, 0xD11E, 0xD11F, 0xD17C, 0xD17E,
                0xD194, 0xD1A3, 0xD1A8, 0xD1AA, 0xD1AB, 0xD1AC, 0xD1AE, 0xD1B2, 0xD1B3, 0xD1B4, 0xD1B5,
                0xD1B6, 0xD1B7, 0xD1B8, 0xD1BA, 0xD1BB, 0xD1C1, 0xD1D4, 0xD1D5, 0xD1DC, 0xD1DD}},
      {0xFFFF, {0xD115, 0xD1AF, 0xD1D0, 0xD1D1, 0xD1D8}}};
  std::map<std::uint32_t, int> expected;
  for (const auto& [type, properties] : listed) {
    for (const std::uint32_t property : properties) expected[property] = type;
  }
  for (std::uint32_t property = 0; property <= 0x1FFFF; ++property) {
    const auto row = expected.find(property);
    ASSERT_EQ(ptpDataTypeForProperty(property), row == expected.end() ? 0 : row->second) << property;
  }
}

}  // namespace
}  // namespace brivo
