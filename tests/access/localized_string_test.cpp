// SPDX-License-Identifier: MIT
// With the catalogues of the build tree.
#include "access/localized_string.h"

#include <gtest/gtest.h>

#include <clocale>

#include "platform/text/message_catalogue.h"
#include "support/environment.h"

namespace brivo {
namespace {

/// The environment of a user, and the process's language in it.
class LocalizedStringTest : public testing::Test {
 protected:
  ~LocalizedStringTest() override { std::setlocale(LC_ALL, "C"); }

  static std::string allowIn(const char* locale, const char* language) {
    const test::ScopedVariable all("LC_ALL", std::nullopt);
    const test::ScopedVariable messages("LC_MESSAGES", std::nullopt);
    const test::ScopedVariable lang("LANG", locale);
    const test::ScopedVariable languages("LANGUAGE", language);
    speakLanguageOfUser();
    return OVLocalizedString("Allow");
  }
};

TEST_F(LocalizedStringTest, ATextIsInGermanForAGerman) { EXPECT_EQ(allowIn("C.UTF-8", "de"), "Erlauben"); }

TEST_F(LocalizedStringTest, ATextIsInJapaneseForAJapanese) {
  EXPECT_EQ(allowIn("C.UTF-8", "ja"), "\xE8\xA8\xB1\xE5\x8F\xAF");
}

TEST_F(LocalizedStringTest, ARegionsLanguageIsTheLanguage) {
  EXPECT_EQ(allowIn("C.UTF-8", "de_AT"), "Erlauben");
}

TEST_F(LocalizedStringTest, OfSeveralLanguagesTheFirstWithACatalogueCounts) {
  EXPECT_EQ(allowIn("C.UTF-8", "tlh:ja:de"), "\xE8\xA8\xB1\xE5\x8F\xAF");
}

TEST_F(LocalizedStringTest, TheLanguageCountsWithoutTheLocaleThatIsNamed) {
  EXPECT_EQ(allowIn("xx_XX.UTF-8", "de"), "Erlauben");
}

TEST_F(LocalizedStringTest, InTheLocaleCNothingIsTranslated) { EXPECT_EQ(allowIn("C", "de"), "Allow"); }

TEST_F(LocalizedStringTest, WithoutACatalogueItIsTheKey) { EXPECT_EQ(allowIn("C.UTF-8", "tlh"), "Allow"); }

TEST_F(LocalizedStringTest, WithoutATranslationItIsTheKey) {
  EXPECT_EQ(allowIn("C.UTF-8", "de"), "Erlauben");
  EXPECT_EQ(OVLocalizedString("A text that has no translation"), "A text that has no translation");
  EXPECT_EQ(OVLocalizedString(""), "");
}

}  // namespace
}  // namespace brivo
