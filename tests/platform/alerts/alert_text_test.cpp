// SPDX-License-Identifier: MIT
#include "platform/alerts/alert_text.h"

#include <gtest/gtest.h>

#include "platform/text/unicode.h"

namespace brivo {
namespace {

const std::string kEllipsis = "\xE2\x80\xA6";

AlertText textOf(const std::string& text) {
  return AlertText::from({{"title", text}, {"message", text}, {"defaultButton", text}});
}

TEST(AlertTextTest, TakesItsTextsFromTheirKeys) {
  const auto text = AlertText::from({{"title", "a"},
                                     {"message", "b"},
                                     {"otherButton", "o"},
                                     {"defaultButton", "d"},
                                     {"alternateButton", "l"},
                                     {"more", "m"}});
  EXPECT_EQ(text.title, "a");
  EXPECT_EQ(text.message, "b");
  ASSERT_EQ(text.buttons.size(), 3u);
  EXPECT_EQ(text.buttons[0].label, "d");
  EXPECT_EQ(text.buttons[0].response, UserAlert::defaultButton);
  EXPECT_EQ(text.buttons[1].label, "l");
  EXPECT_EQ(text.buttons[1].response, UserAlert::alternateButton);
  EXPECT_EQ(text.buttons[2].label, "o");
  EXPECT_EQ(text.buttons[2].response, UserAlert::otherButton);
}

TEST(AlertTextTest, WhatIsMissingOrNoTextIsEmpty) {
  const auto text = AlertText::from({{"title", 5}, {"defaultButton", true}});
  EXPECT_EQ(text.title, "");
  EXPECT_EQ(text.message, "");
  EXPECT_TRUE(text.buttons.empty());
}

TEST(AlertTextTest, OnlyTheMessageHasSeveralLines) {
  const auto text = textOf("a\nb");
  EXPECT_EQ(text.title, "a b");
  EXPECT_EQ(text.message, "a\nb");
  EXPECT_EQ(text.buttons[0].label, "a b");
}

TEST(AlertTextTest, ControlCharactersBecomeSpaces) {
  EXPECT_EQ(textOf(std::string("a\0\x1B\x7F\xC2\x85z", 7)).title, "a    z");
}

TEST(AlertTextTest, InvalidBytesBecomeReplacementCharacters) {
  EXPECT_EQ(textOf("a\xFFz").title, "a\xEF\xBF\xBDz");
}

TEST(AlertTextTest, NoncharactersBecomeReplacementCharacters) {
  for (const char* text : {"\xEF\xBF\xBE", "\xEF\xBF\xBF", "\xEF\xB7\x90", "\xEF\xB7\xAF", "\xF0\x9F\xBF\xBE",
                           "\xF0\x9F\xBF\xBF", "\xF4\x8F\xBF\xBF"}) {
    EXPECT_EQ(textOf(text).title, "\xEF\xBF\xBD");
  }
  EXPECT_EQ(textOf("\xF0\x9F\x93\xB7").title, "\xF0\x9F\x93\xB7") << "a camera";
  EXPECT_EQ(textOf("\xF0\x9F\xBE\xBE").title, "\xF0\x9F\xBE\xBE") << "U+1FFBE is just unassigned";
}

TEST(AlertTextTest, LongTextsAreCutBetweenCharacters) {
  std::string cameras;
  for (int i = 0; i < 3000; ++i) cameras += "\xF0\x9F\x93\xB7";
  const auto text = textOf(cameras);
  EXPECT_EQ(text.title, cameras.substr(0, 200 * 4) + kEllipsis);
  EXPECT_EQ(text.message, cameras.substr(0, 2000 * 4) + kEllipsis);
  EXPECT_EQ(text.buttons[0].label, cameras.substr(0, 80 * 4) + kEllipsis);
}

TEST(AlertTextTest, TextsOfTheGreatestLengthStayWhole) {
  EXPECT_EQ(textOf(std::string(200, 'x')).title, std::string(200, 'x'));
  EXPECT_EQ(textOf(std::string(201, 'x')).title, std::string(200, 'x') + kEllipsis);
}

TEST(AlertTextTest, OfAHugeTextOnlyTheStartIsLookedAt) {
  const std::string huge(std::size_t{64} << 20, '\xFF');
  const auto text = textOf(huge);
  EXPECT_TRUE(isUtf8(text.message));
  EXPECT_EQ(codePointCount(text.message), 2001u);
}

TEST(AlertTextTest, MarkupIsEscaped) {
  EXPECT_EQ(escapingMarkup("<a href=\"x\">&amp;</a>"), "&lt;a href=\"x\"&gt;&amp;amp;&lt;/a&gt;");
  EXPECT_EQ(escapingMarkup("plain"), "plain");
}

}  // namespace
}  // namespace brivo
