// SPDX-License-Identifier: MIT
#include "util/dates.h"

#include <gtest/gtest.h>

#include <ctime>

#include "support/environment.h"

namespace brivo {
namespace {

/// Local time is that of a place without surprises, four hours behind UTC.
class DatesTest : public testing::Test {
 protected:
  DatesTest() : zone_("TZ", "<-04>4") { ::tzset(); }
  ~DatesTest() override { ::tzset(); }

  const test::ScopedVariable zone_;
};

constexpr std::int64_t kTenOClock = 1'622'556'000;  // 2021-06-01 14:00:00 UTC

TEST_F(DatesTest, AnExifDateIsLocalTime) {
  EXPECT_EQ(OVStandardDateFromString("2021:06:01 10:00:00"), kTenOClock);
}

TEST_F(DatesTest, DaylightSavingTimeIsTakenAsNotInEffect) {
  const test::ScopedVariable zone("TZ", "EST5EDT,M3.2.0,M11.1.0");
  ::tzset();
  EXPECT_EQ(OVStandardDateFromString("2021:06:01 10:00:00"), kTenOClock + 3600);
}

TEST_F(DatesTest, ADateIsReadAsFarAsItGoes) {
  std::tm year{};
  year.tm_year = 121;
  const std::int64_t start = std::mktime(&year);
  EXPECT_EQ(OVStandardDateFromString("2021:13:45 99:99:99"), start) << "the year alone, with day 0";
}

TEST_F(DatesTest, AStringOfLettersIsTheDateOfTheZeroedRecord) {
  std::tm zeros{};
  const std::int64_t start = std::mktime(&zeros);
  EXPECT_EQ(OVStandardDateFromString("never"), start);
  EXPECT_EQ(OVStandardDateFromString(""), start);
}

TEST_F(DatesTest, StandardStringFromAnyDateIsThePattern) {
  for (const double date : {0.0, 1.622556e9, -1e9})
    EXPECT_EQ(OVStandardStringFromDate(date), "yyyy:MM:dd HH:mm:ss");
}

TEST_F(DatesTest, APtpDateIsLocalTime) {
  EXPECT_EQ(OVStandardDateFromPTPString("20210601T100000.0"), kTenOClock);
  EXPECT_EQ(OVStandardDateFromPTPString("20210601T100000.7"), kTenOClock) << "the fraction does not matter";
  EXPECT_EQ(OVStandardDateFromPTPString("20210601T100000"), kTenOClock);
  EXPECT_EQ(OVStandardDateFromPTPString(std::nullopt), std::nullopt);
}

TEST(PTPDateText, APtpDateInTheFormOfExif) {
  EXPECT_EQ(OVEXIFDateStringFromPTPDateString("20210601T103000"), "2021:06:01 10:30:00");
  EXPECT_EQ(OVEXIFDateStringFromPTPDateString("20210601T103000.0+0200"), "2021:06:01 10:30:00");
}

TEST(PTPDateText, ATooShortOrMissingDateIsZeros) {
  for (const auto& text : {std::optional<std::string>("2021"), std::optional<std::string>("20210601T10300"),
                           std::optional<std::string>()}) {
    EXPECT_EQ(OVEXIFDateStringFromPTPDateString(text), "0000:00:00 00:00:00");
  }
}

TEST(PTPDateText, FieldsThatCannotBeReadStayZero) {
  EXPECT_EQ(OVEXIFDateStringFromPTPDateString("20210601 103000"), "2021:06:01 00:00:00") << "no T";
  EXPECT_EQ(OVEXIFDateStringFromPTPDateString("2021 6x1T103000"), "2021:06:00 00:00:00");
  EXPECT_EQ(OVEXIFDateStringFromPTPDateString("letters and all"), "0000:00:00 00:00:00");
}

}  // namespace
}  // namespace brivo
