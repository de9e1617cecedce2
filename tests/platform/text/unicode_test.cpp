// SPDX-License-Identifier: MIT
#include "platform/text/unicode.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(UnicodeTest, TellsUtf8FromOtherBytes) {
  EXPECT_TRUE(isUtf8("IMG_0001.JPG"));
  EXPECT_TRUE(isUtf8("\xF0\x9F\x93\xB7"));
  EXPECT_FALSE(isUtf8("\xFF"));
  EXPECT_FALSE(isUtf8("\xC0\xAF")) << "overlong";
  EXPECT_FALSE(isUtf8("\xED\xA0\x80")) << "surrogate";
  EXPECT_FALSE(isUtf8("\xE2\x82")) << "cut off";
}

TEST(UnicodeTest, NoncharactersBecomeReplacementCharacters) {
  EXPECT_EQ(replacingNoncharacters("a\uFDD0\uFDEF\uFFFE\uFFFF\U0001FFFE\U0010FFFF"),
            "a\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD");
  EXPECT_EQ(replacingNoncharacters("\uFDCF\uFDF0\uFFFD\U00010000"), "\uFDCF\uFDF0\uFFFD\U00010000");
  EXPECT_EQ(replacingNoncharacters("a\xFF"), "a\uFFFD");
}

TEST(UnicodeTest, InvalidBytesBecomeReplacementCharacters) {
  EXPECT_EQ(replacingInvalidUtf8("a\xFF\xC3\xA4"), "a\xEF\xBF\xBD\xC3\xA4");
  EXPECT_TRUE(isUtf8(replacingInvalidUtf8("\xE2\x82\xF0\x9F")));
}

TEST(UnicodeTest, ConvertsToUtf16AndBack) {
  const std::string text = "A\xC3\xA4\xF0\x9F\x93\xB7";
  const std::u16string units = toUtf16(text);
  EXPECT_EQ(units, u"A\u00E4\xD83D\xDCF7");
  EXPECT_EQ(toUtf8(units), text);
}

TEST(UnicodeTest, ALoneSurrogateBecomesAReplacementCharacter) {
  EXPECT_EQ(toUtf8(std::u16string(1, char16_t{0xD800})), "\xEF\xBF\xBD");
}

TEST(UnicodeTest, UpperCaseIsTheFullMapping) {
  EXPECT_EQ(upperCased("img_0001.jpg"), "IMG_0001.JPG");
  EXPECT_EQ(upperCased("\xC3\xA4"), "\xC3\x84");
  EXPECT_EQ(upperCased("stra\xC3\x9F\x65"), "STRASSE");
  EXPECT_EQ(upperCased("\xFF"), std::nullopt);
}

TEST(UnicodeTest, ControlCharactersAreShownEscaped) {
  EXPECT_EQ(escapingControls("plain text"), "plain text");
  EXPECT_EQ(escapingControls("a\nb\x1B[31m\x7F"), "a\\x0ab\\x1b[31m\\x7f");
  EXPECT_EQ(escapingControls("\xC2\x85"), "\\x85");
  EXPECT_EQ(escapingControls("\xE2\x80\xA8"), "\\u{2028}");
  EXPECT_EQ(escapingControls("\xFF\xC3\xA4"), "\xEF\xBF\xBD\xC3\xA4");
}

TEST(UnicodeTest, CountsAndCutsByCodePoints) {
  EXPECT_EQ(codePointCount("a\xC3\xA4\xF0\x9F\x93\xB7"), 3u);
  EXPECT_EQ(codePointPrefix("a\xC3\xA4z", 2), "a\xC3\xA4");
  EXPECT_EQ(codePointPrefix("ab", 5), "ab");
}

}  // namespace
}  // namespace brivo
