// SPDX-License-Identifier: MIT
#include "platform/base/url.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(UrlTest, AFileUrlEncodesWhatAUrlMayNotHold) {
  EXPECT_EQ(Url::file("/media/EOS DIGITAL").text(), "file:///media/EOS%20DIGITAL");
  EXPECT_EQ(Url::file("/a\xFF#?").text(), "file:///a%FF%23%3F");
}

TEST(UrlTest, ThePathComesBackByteForByte) {
  const std::string path = "/media/\xC3\xA4 \n%41\xFF";
  EXPECT_EQ(Url::file(path).path(), path);
}

TEST(UrlTest, DifferentFormsOfOnePlaceHaveOnePath) {
  EXPECT_EQ(Url("file:///media/CARD/").path(), "/media/CARD");
  EXPECT_EQ(Url("file://localhost/media/CARD").path(), "/media/CARD");
  EXPECT_EQ(Url("file:/media/C%41RD").path(), "/media/CARD");
}

TEST(UrlTest, OtherSchemesHaveNoPath) {
  const Url url("https://example.org/media");
  EXPECT_FALSE(url.isFile());
  EXPECT_EQ(url.path(), "");
}

TEST(UrlTest, ABrokenEscapeIsLiteral) { EXPECT_EQ(Url("file:///a%4").path(), "/a%4"); }

}  // namespace
}  // namespace brivo
