// SPDX-License-Identifier: MIT
#include "util/preferences.h"

#include <gtest/gtest.h>

#include "platform/preferences/preferences_store.h"
#include "support/environment.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "util/log.h"

namespace brivo {
namespace {

class PreferencesTest : public testing::Test {
 protected:
  PreferencesTest() { OVLoggingLevel = 0; }
  ~PreferencesTest() override { OVLoggingLevel = 0; }

  void store(const Dictionary& preferences) { ASSERT_FALSE(store_.write(OVPreferencesDomain, preferences)); }
  Dictionary stored() const { return store_.read(OVPreferencesDomain); }

  test::TemporaryFolder folder_;
  test::ScopedVariable config_{"XDG_CONFIG_HOME", folder_.path()};
  PreferencesStore store_{folder_.path()};
};

TEST_F(PreferencesTest, AStoredLevelIsTaken) {
  store({{"loggingLevel", 6}});
  __OVReadPrefs();
  EXPECT_EQ(OVLoggingLevel, 6u);
}

TEST_F(PreferencesTest, ALevelStoredAs0CountsAsAbsentAndTheDefaultIsWrittenBack) {
  store({{"loggingLevel", 0}, {"other", "kept"}});
  __OVReadPrefs();
  EXPECT_EQ(OVLoggingLevel, 3075u);
  EXPECT_EQ(stored().unsignedInteger("loggingLevel"), 3075u);
  EXPECT_EQ(*stored().string("other"), "kept");
}

TEST_F(PreferencesTest, ALevelStoredAsAStringCountsAsAbsent) {
  store({{"loggingLevel", "6"}});
  __OVReadPrefs();
  EXPECT_EQ(OVLoggingLevel, 3075u);
  EXPECT_EQ(stored().unsignedInteger("loggingLevel"), 3075u);
}

TEST_F(PreferencesTest, ALevelThatIsAlreadySetIsLeftAlone) {
  OVLoggingLevel = 4;
  __OVReadPrefs();
  EXPECT_EQ(OVLoggingLevel, 4u);
  EXPECT_FALSE(stored().contains("loggingLevel"));
}

TEST_F(PreferencesTest, ACorruptFileCountsAsEmpty) {
  test::writeFile(folder_ / "org.orvid.OrvidCore.plist", "<plist><dict><key>");
  __OVReadPrefs();
  EXPECT_EQ(OVLoggingLevel, 3075u);
}

TEST_F(PreferencesTest, AStoreThatCannotBeWrittenIsLogged) {
  const test::ScopedVariable nowhere("XDG_CONFIG_HOME", folder_ / "a/b");
  const test::StandardErrorCapture capture;
  __OVReadPrefs();
  EXPECT_EQ(OVLoggingLevel, 3075u);
  EXPECT_NE(capture.text().find("preferences ! "), std::string::npos);
}

TEST_F(PreferencesTest, TheThrottleSwitchIs0Or1) {
  EXPECT_EQ(OVQueryOrvidDefault("throttleSwitch"), 0u);
  store({{"throttleSwitch", 17}});
  EXPECT_EQ(OVQueryOrvidDefault("throttleSwitch"), 1u);
}

TEST_F(PreferencesTest, TheSliderIsAskedForUnderItsMisspelledKeyOnly) {
  store({{"throttleSlider", 512.9}});
  EXPECT_EQ(OVQueryOrvidDefault("throttleSilder"), 512u);
  EXPECT_EQ(OVQueryOrvidDefault("throttleSlider"), 0u);
}

TEST_F(PreferencesTest, WithNoSliderInTheStoreItYields1024) {
  EXPECT_EQ(OVQueryOrvidDefault("throttleSilder"), 1024u);
}

TEST_F(PreferencesTest, ASliderOutOfRangeBecomesTheNearestNumber) {
  store({{"throttleSlider", -5.0}});
  EXPECT_EQ(OVQueryOrvidDefault("throttleSilder"), 0u);
  store({{"throttleSlider", 1e20}});
  EXPECT_EQ(OVQueryOrvidDefault("throttleSilder"), 4294967295u);
}

TEST_F(PreferencesTest, AnyOtherKeyYields0) { EXPECT_EQ(OVQueryOrvidDefault("loggingLevel"), 0u); }

}  // namespace
}  // namespace brivo
