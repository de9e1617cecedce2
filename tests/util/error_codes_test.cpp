// SPDX-License-Identifier: MIT
#include "util/error_codes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <set>

#include "support/standard_error.h"
#include "util/error_table.h"

namespace brivo {
namespace {

using testing::ElementsAre;

constexpr std::size_t kRows = 72;

const ErrorDescription& row(std::size_t index) { return errorTable()[index]; }

void expectRow(std::size_t index, std::int32_t code, std::string_view legacy, std::string_view modern,
               std::string_view text) {
  SCOPED_TRACE(index);
  EXPECT_EQ(row(index).code, code);
  EXPECT_EQ(row(index).legacy, legacy);
  EXPECT_EQ(row(index).modern, modern);
  EXPECT_EQ(row(index).text, text);
}

TEST(ErrorTableTest, ItHas72RowsAndEachCodeOnce) {
  ASSERT_EQ(errorTable().size(), kRows);
  std::set<std::int32_t> codes;
  for (const auto& error : errorTable()) codes.insert(error.code);
  EXPECT_EQ(codes.size(), kRows);
}

TEST(ErrorTableTest, TheFirstAndTheLastRow) {
  expectRow(0, 0, "success", "", "_operation success.");
  expectRow(71, 8, "KERN_NO_ACCESS", "", "[kern_return.h] _kernel reurned no access.");
}

TEST(ErrorTableTest, Rows1To59GoDownFromMinus9900) {
  for (int index = 1; index <= 59; ++index) {
    EXPECT_EQ(row(static_cast<std::size_t>(index)).code, -9899 - index);
  }
  expectRow(1, -9900, "OVLegacyReturnCodeCommunicationErr", "", "_device communication error.");
  expectRow(59, -9958, "", "OVReturnSessionNotOpened", "_device session not open.");
}

TEST(ErrorTableTest, Rows60To71AreTheConnectionFailureAndBorrowedCodes) {
  expectRow(60, -21345, "", "OVReturnConnectionFailedToOpen", "_device module ZEPH communication failed.");
  std::vector<std::int32_t> borrowed;
  for (const auto& error : errorTable().subspan(61)) borrowed.push_back(error.code);
  EXPECT_THAT(borrowed, ElementsAre(-128, -50, -47, -43, -4, 1, 17, 28, 725, 726, 8));
}

TEST(ErrorTableTest, EveryBorrowedTextBeginsWithTheHeaderItIsFrom) {
  for (const auto& error : errorTable().subspan(61)) {
    EXPECT_THAT(error.text, testing::MatchesRegex("\\[[A-Za-z_]+\\.h\\] _[a-z]+ .*\\.")) << error.code;
    EXPECT_STRNE(error.legacy, "");
    EXPECT_STREQ(error.modern, "");
  }
}

TEST(ErrorTableTest, ThreePairsOfRowsShareAName) {
  EXPECT_STREQ(row(16).legacy, row(17).legacy);
  EXPECT_STREQ(row(33).modern, row(34).modern);
  EXPECT_STREQ(row(52).modern, row(53).modern);
  expectRow(17, -9916, "OVLegacyReturnCodeDeviceLocationIDNotFoundErr", "", "_device fw GUID invalid.");
  expectRow(34, -9933, "", "OVReturnReceivedUnsolicitedScannerStatusInfo",
            "_scanner reported unsolicited error.");
  expectRow(53, -9952, "", "OVReturnDeviceCouldNotPair", "_noreldevice unpairing failed.");
}

TEST(ErrorTableTest, Row16EndsInABlank) {
  expectRow(16, -9915, "OVLegacyReturnCodeDeviceLocationIDNotFoundErr", "",
            "_device usb location ID invalid. ");
}

TEST(ErrorTableTest, MisspeltNamesAndTextsStay) {
  expectRow(25, -9924, "", "OVReturnScanOperationCanceled", "_scaner action canceled.");
  expectRow(39, -9938, "OVReturnFailedToEnabeTethering", "OVReturnFailedToEnableTethering",
            "_camera enable tethering failed.");
  expectRow(40, -9939, "OVReturnFailedToDisabeTethering", "OVReturnFailedToDisableTethering",
            "_camera disable tethering failed.");
  EXPECT_STREQ(row(21).text, "_obsoleted");
  EXPECT_STREQ(row(23).text, "_module parameter invalid") << "no full stop";
  EXPECT_STREQ(row(49).text, "_obsolete | _device software install failed.");
  EXPECT_STREQ(row(50).text, "_obsolete | _device software install canceled.");
}

TEST(ErrorTableTest, EveryOwnCodeHasExactlyOneNameBut4ThatHaveTwo) {
  std::vector<std::int32_t> two;
  for (const auto& error : errorTable().subspan(1)) {
    const bool legacy = *error.legacy != '\0';
    const bool modern = *error.modern != '\0';
    EXPECT_TRUE(legacy || modern) << error.code;
    if (legacy && modern) two.push_back(error.code);
  }
  EXPECT_THAT(two, ElementsAre(-9922, -9923, -9938, -9939));
}

TEST(ErrorCodesTest, EveryRowIsFoundByItsCode) {
  for (const auto& error : errorTable()) {
    const auto entry = __OVErrorValueDict(error.code);
    ASSERT_TRUE(entry) << error.code;
    EXPECT_EQ(entry->size(), 3u);
    EXPECT_EQ(*entry->string("legacy"), error.legacy);
    EXPECT_EQ(*entry->string("modern"), error.modern);
    EXPECT_EQ(*entry->string(error.code == 0 ? "success" : "text"), error.text);
  }
}

TEST(ErrorCodesTest, TheEntryOfMinus9900HasItsNameButItsTextIsNotFoundByNumber) {
  EXPECT_EQ(*__OVErrorValueDict(-9900)->string("legacy"), "OVLegacyReturnCodeCommunicationErr");
  EXPECT_EQ(__OVValueToErrorString(-9900), std::nullopt);
  EXPECT_EQ(__OVLongValueToErrorString(-9900), std::nullopt);
}

TEST(ErrorCodesTest, TheEntryOf0KeepsItsTextUnderSuccess) {
  const auto entry = __OVErrorValueDict(0);
  EXPECT_EQ(*entry->string("success"), "_operation success.");
  EXPECT_EQ(*entry->string("legacy"), "success");
  EXPECT_EQ(*entry->string("modern"), "");
  EXPECT_FALSE(entry->contains("text"));
}

TEST(ErrorCodesTest, TheTextOf0IsNone) {
  EXPECT_EQ(__OVValueToErrorString(0), std::nullopt);
  EXPECT_EQ(__OVLongValueToErrorString(0), std::nullopt);
}

TEST(ErrorCodesTest, TheTextOf17IsThatTheFileExists) {
  EXPECT_EQ(__OVValueToErrorString(17), "[errno.h] _file already exists.");
  EXPECT_EQ(__OVLongValueToErrorString(17), "[errno.h] _file already exists.");
}

TEST(ErrorCodesTest, OnlyTheCodesAbove0HaveATextByNumber) {
  std::set<std::int32_t> found;
  for (const auto& error : errorTable()) {
    if (__OVValueToErrorString(error.code)) found.insert(error.code);
    EXPECT_EQ(__OVLongValueToErrorString(error.code), __OVValueToErrorString(error.code));
  }
  EXPECT_THAT(found, ElementsAre(1, 8, 17, 28, 725, 726));
}

TEST(ErrorCodesTest, TextsAreLookedUpByTheLow32Bits) {
  EXPECT_EQ(__OVValueToErrorString((std::int64_t{1} << 32) + 17), "[errno.h] _file already exists.");
  EXPECT_EQ(__OVValueToErrorString(std::int64_t{4'294'957'396}), std::nullopt) << "-9900 as unsigned";
  EXPECT_EQ(__OVErrorValueDict((std::int64_t{1} << 32) + 17), std::nullopt);
}

TEST(ErrorCodesTest, ACodeThatIsInNoRowHasNoEntry) {
  for (const std::int64_t code : {-9899, -9959, -1, 2, 727, -21449}) {
    EXPECT_EQ(__OVErrorValueDict(code), std::nullopt) << code;
  }
}

TEST(ErrorCodesTest, TheDecodedErrorIsAdded) {
  Dictionary dictionary{{"kept", 1}};
  EXPECT_TRUE(__OVAddDecodedErrorToDict(dictionary, 28));
  EXPECT_EQ(*dictionary.string("errorDecoded"), "[errno.h] _device out of space.");
  EXPECT_EQ(dictionary.size(), 2u);
}

TEST(ErrorCodesTest, AnErrorInTheDictionaryIsUsedInsteadOfTheGivenCode) {
  Dictionary dictionary{{"OVAErrorKey", 17}};
  EXPECT_TRUE(__OVAddDecodedErrorToDict(dictionary, 28));
  EXPECT_EQ(*dictionary.string("errorDecoded"), "[errno.h] _file already exists.");
  dictionary.set("OVAErrorKey", -9900);
  EXPECT_FALSE(__OVAddDecodedErrorToDict(dictionary, 28));
}

TEST(ErrorCodesTest, AnErrorOf0InTheDictionaryOrOneThatIsNoNumberIsNotUsed) {
  for (const Value& other : {Value(0), Value("17")}) {
    Dictionary dictionary{{"OVAErrorKey", other}};
    EXPECT_TRUE(__OVAddDecodedErrorToDict(dictionary, 1));
    EXPECT_EQ(*dictionary.string("errorDecoded"), "[errno.h] _file operation not permitted.");
  }
}

TEST(ErrorCodesTest, WithoutATextNothingIsAdded) {
  for (const std::int64_t code : {0, -9900, 2}) {
    Dictionary dictionary;
    EXPECT_FALSE(__OVAddDecodedErrorToDict(dictionary, code)) << code;
    EXPECT_TRUE(dictionary.empty());
  }
}

TEST(ErrorCodesTest, AnImmutableDictionaryIsRefusedAndStaysAsItIs) {
  const Dictionary dictionary{{"OVAErrorKey", 17}};
  EXPECT_FALSE(__OVAddDecodedErrorToDict(dictionary, 17));
  EXPECT_EQ(dictionary, (Dictionary{{"OVAErrorKey", 17}}));
}

/// What printerrno("here") prints for an error number, and that it counts right.
std::string printed(int number) {
  const test::StandardErrorCapture capture;
  errno = number;
  const int count = printerrno("here");
  const std::string text = capture.text();
  EXPECT_EQ(static_cast<std::size_t>(count), text.size());
  return text;
}

TEST(ErrorCodesTest, Error2PrintsTheGenericLine) { EXPECT_EQ(printed(2), "Error 2 occurred in 'here'.\n"); }

TEST(ErrorCodesTest, NamedErrorNumbersPrintTheirName) {
  EXPECT_EQ(printed(4), "Error 'EINTR' (4) occurred in 'here'.\n");
  EXPECT_EQ(printed(5), "Error 'EIO' (5) occurred in 'here'.\n");
  EXPECT_EQ(printed(6), "Error 'ENXIO' (6) occurred in 'here'.\n");
  EXPECT_EQ(printed(9), "Error 'EBADF' (9) occurred in 'here'.\n");
  EXPECT_EQ(printed(12), "Error 'ENOMEM' (12) occurred in 'here'.\n");
  EXPECT_EQ(printed(14), "Error 'EFAULT' (14) occurred in 'here'.\n");
  EXPECT_EQ(printed(21), "Error 'EISDIR' (21) occurred in 'here'.\n");
  EXPECT_EQ(printed(22), "Error 'EINVAL' (22) occurred in 'here'.\n");
  EXPECT_EQ(printed(29), "Error 'ESPIPE' (29) occurred in 'here'.\n");
}

TEST(ErrorCodesTest, ErrorsWhoseNumbersDifferAmongSystemsPrintTheNameTheyHaveHere) {
  EXPECT_EQ(printed(EAGAIN), "Error 'EAGAIN' (11) occurred in 'here'.\n");
  EXPECT_THAT(printed(ECONNRESET), testing::StartsWith("Error 'ECONNRESET' ("));
  EXPECT_THAT(printed(ENOBUFS), testing::StartsWith("Error 'ENOBUFS' ("));
  EXPECT_THAT(printed(ENOTCONN), testing::StartsWith("Error 'ENOTCONN' ("));
  EXPECT_THAT(printed(ETIMEDOUT), testing::StartsWith("Error 'ETIMEDOUT' ("));
}

TEST(ErrorCodesTest, AnyOtherErrorNumberPrintsTheGenericLine) {
  EXPECT_EQ(printed(0), "Error 0 occurred in 'here'.\n");
  EXPECT_EQ(printed(-3), "Error -3 occurred in 'here'.\n");
  EXPECT_EQ(printed(EDEADLK), "Error 35 occurred in 'here'.\n");
}

}  // namespace
}  // namespace brivo
