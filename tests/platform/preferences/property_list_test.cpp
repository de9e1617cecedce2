// SPDX-License-Identifier: MIT
#include "platform/preferences/property_list.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

std::string list(const std::string& inside) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\">" + inside + "</plist>";
}

TEST(PropertyListTest, ReadsEveryElement) {
  const auto dictionary =
      parsePropertyList(list("<dict><key>s</key><string>a &amp; b</string><key>i</key><integer>-7</integer>"
                             "<key>u</key><integer>18446744073709551615</integer><key>r</key><real>1.5</real>"
                             "<key>t</key><true/><key>f</key><false/><key>d</key><data>\n  AQID\n</data>"
                             "<key>when</key><date>2024-01-02T03:04:05Z</date>"
                             "<key>a</key><array><string>x</string><dict/></array></dict>"));
  ASSERT_TRUE(dictionary);
  EXPECT_EQ(*dictionary->string("s"), "a & b");
  EXPECT_EQ(dictionary->signedInteger("i"), -7);
  EXPECT_EQ(dictionary->unsignedInteger("u"), 18446744073709551615u);
  EXPECT_EQ(dictionary->real("r"), 1.5);
  EXPECT_EQ(dictionary->boolean("t"), true);
  EXPECT_EQ(dictionary->boolean("f"), false);
  EXPECT_EQ(dictionary->data("d")->text(), "\x01\x02\x03");
  EXPECT_EQ(*dictionary->string("when"), "2024-01-02T03:04:05Z");
  EXPECT_EQ(dictionary->array("a")->size(), 2u);
}

TEST(PropertyListTest, WhatIsWrittenReadsBack) {
  const Dictionary dictionary{{"name", "<\"&'>"},
                              {"number", std::int32_t{-3}},
                              {"big", std::uint64_t{1} << 63},
                              {"flag", true},
                              {"real", 0.1},
                              {"bytes", Data::copyOf("\x01\x02\x03\x04")},
                              {"list", Array{"a", Dictionary{{"k", false}}}}};
  const auto read = parsePropertyList(formatPropertyList(dictionary));
  ASSERT_TRUE(read);
  EXPECT_EQ(*read->string("name"), "<\"&'>");
  EXPECT_EQ(read->signedInteger("number"), -3);
  EXPECT_EQ(read->unsignedInteger("big"), std::uint64_t{1} << 63);
  EXPECT_EQ(read->boolean("flag"), true);
  EXPECT_EQ(read->real("real"), 0.1);
  EXPECT_EQ(*read->data("bytes"), Data::copyOf("\x01\x02\x03\x04"));
  EXPECT_EQ(*read->array("list"), (Array{"a", Dictionary{{"k", false}}}));
}

TEST(PropertyListTest, ValuesWithoutAnElementAreLeftOutWithTheirKeys) {
  const auto read =
      parsePropertyList(formatPropertyList({{"endpoint", Endpoint{"unix:path=/x"}}, {"kept", 1}}));
  ASSERT_TRUE(read);
  EXPECT_EQ(read->size(), 1u);
}

TEST(PropertyListTest, RefusesWhatIsNoPropertyList) {
  for (const std::string& bad :
       {std::string(""), std::string("bplist00"), std::string("<plist>"), list(""), list("<array/>"),
        list("<dict><key>k</key></dict>"), list("<dict><string>v</string></dict>"),
        list("<dict><key>k</key><wrong/></dict>"), list("<dict><key>k</key><integer>x</integer></dict>"),
        list("<dict><key>k</key><integer/></dict>"), list("<dict><key>k</key><data>!</data></dict>")}) {
    EXPECT_FALSE(parsePropertyList(bad)) << bad;
  }
}

TEST(PropertyListTest, RefusesBottomlessNesting) {
  std::string deep = "<dict>";
  for (int i = 0; i < 100000; ++i) deep += "<key>k</key><array>";
  EXPECT_FALSE(parsePropertyList(list(deep)));
  std::string closed = "<dict><key>k</key>";
  for (int i = 0; i < 100; ++i) closed += "<array>";
  for (int i = 0; i < 100; ++i) closed += "</array>";
  EXPECT_FALSE(parsePropertyList(list(closed + "</dict>")));
}

}  // namespace
}  // namespace brivo
