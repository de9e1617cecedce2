// SPDX-License-Identifier: MIT
#include "content/dcf_names.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

bool isFile(std::string_view name) { return _ValidDCFObjectName(name, DCFKind::file); }
bool isFolder(std::string_view name) { return _ValidDCFObjectName(name, DCFKind::folder); }

TEST(DCFNamesTest, FileNames) {
  for (const char* good :
       {"IMG_0001.JPG", "img_0001.jpg", "DSC_9999.NEF", "_MG_1234.CR2", "IMG_E0001.HEIC", "IMG_0001.HEIC",
        "img_e0001.heic", "ABCD0000.THM", "IMG_0001.___", "IMG_0001.123"}) {
    EXPECT_TRUE(isFile(good)) << good;
  }
  for (const char* bad : {"", "IMG_0001.JPEG", "IMG_0001", "IMG_001.JPG", "IMG_00001.JPG", "IM-_0001.JPG",
                          "IMG_0001.JP", "IMG_0001.J-G", "IMG_0001.HEIF", "IMG_E001.JPG", "IMGXX0001.JPG",
                          "README.TXT", " IMG_0001.JPG", "IMG_0001.JPG ", "IMG_0001JPG"}) {
    EXPECT_FALSE(isFile(bad)) << bad;
  }
}

TEST(DCFNamesTest, ImgE0001HeicIsAcceptedAndAFourCharacterExtensionOtherThanHeicIsNot) {
  EXPECT_TRUE(isFile("IMG_E0001.HEIC"));
  EXPECT_FALSE(isFile("IMG_0001.JPEG"));
}

TEST(DCFNamesTest, FolderNames) {
  for (const char* good : {"100ABCDE", "999_____", "101canon", "DCIM", "dcim", "Dcim"}) {
    EXPECT_TRUE(isFolder(good)) << good;
  }
  for (const char* bad : {"", "099ABCDE", "ABCDEFGH", "100ABCD", "100ABCDEF", "100AB DE", "MP_ROOT", "DCIM2",
                          "XDCIM", "README.TXT", "100ABC-E"}) {
    EXPECT_FALSE(isFolder(bad)) << bad;
  }
}

TEST(DCFNamesTest, LettersAreUnicodeLetters) {
  EXPECT_TRUE(
      isFile("\xC3\xA4"
             "BC_0001.JPG"));
  EXPECT_TRUE(
      isFolder("100\xC3\x84\xC3\x96\xC3\x9C"
               "AB"));
  EXPECT_FALSE(
      isFile("\xC3\x9F"
             "MG_0001.JPG"))
      << "the sharp s is two letters in upper case";
}

TEST(DCFNamesTest, DigitsAreUnicodeDigits) {
  EXPECT_TRUE(isFile("IMG_\xD9\xA0\xD9\xA1\xD9\xA2\xD9\xA3.JPG")) << "Arabic-Indic digits";
}

TEST(DCFNamesTest, OneLineOfANameIsEnough) {
  EXPECT_TRUE(isFile("x\nIMG_0001.JPG"));
  EXPECT_TRUE(isFolder("100ABCDE\nx"));
}

TEST(DCFNamesTest, ANameThatIsNotUtf8OrBeginsWithNulIsNone) {
  EXPECT_FALSE(
      isFile("IMG\xFF"
             "0001.JPG"));
  EXPECT_FALSE(isFile(std::string_view("\0IMG_0001.JPG", 13)));
  EXPECT_FALSE(isFile(std::string_view()));
}

TEST(DCFNamesTest, PrefixAndDigitsOfImg0001) {
  EXPECT_EQ(baseImageFilePrefix("IMG_0001.JPG"), 0x494D475F);
  EXPECT_EQ(baseImageFileDigits("IMG_0001.JPG"), 1);
}

TEST(DCFNamesTest, PrefixAndDigitsOfANameThatIsTooShortAre0) {
  EXPECT_EQ(baseImageFilePrefix("A.B"), 0);
  EXPECT_EQ(baseImageFileDigits("A.B"), 0);
  EXPECT_EQ(baseImageFileDigits("ABC.JPEG"), 0);
  EXPECT_EQ(baseImageFilePrefix(""), 0);
}

TEST(DCFNamesTest, DigitsAreReadLeniently) {
  EXPECT_EQ(baseImageFileDigits("IMG_E1234.HEIC"), 1234);
  EXPECT_EQ(baseImageFileDigits("X  12.JPG"), 12);
  EXPECT_EQ(baseImageFileDigits("IMG_-123.JPG"), -123);
  EXPECT_EQ(baseImageFileDigits("IMG_+12A.JPG"), 12);
  EXPECT_EQ(baseImageFileDigits("DCIM"), 0);
}

TEST(DCFNamesTest, ThePrefixWrapsAround) {
  // c0 * 2^24 of a unit above 255 keeps its low 8 bits.
  EXPECT_EQ(baseImageFilePrefix("\xC4\x80"
                                "AAA"),
            static_cast<std::int32_t>(0x00414141));
  EXPECT_LT(baseImageFilePrefix("\xC3\xBF"
                                "AAA"),
            0);
}

}  // namespace
}  // namespace brivo
