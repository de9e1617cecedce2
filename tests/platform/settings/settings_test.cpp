// SPDX-License-Identifier: MIT
#include "platform/settings/settings.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "support/environment.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

using test::ScopedVariable;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(SettingsTest, DefaultsComeFromTheBaseDirectorySpecification) {
  const ScopedVariable home("HOME", "/home/someone");
  const ScopedVariable data("XDG_DATA_HOME", std::nullopt);
  const ScopedVariable config("XDG_CONFIG_HOME", std::nullopt);
  const ScopedVariable dirs("XDG_DATA_DIRS", std::nullopt);
  const ScopedVariable roots("BRIVOD_VOLUME_ROOTS", std::nullopt);
  const ScopedVariable folders("BRIVOD_VOLUME_FOLDERS", std::nullopt);
  const Settings settings = Settings::fromEnvironment();
  EXPECT_EQ(settings.dataHome, "/home/someone/.local/share");
  EXPECT_EQ(settings.configHome, "/home/someone/.config");
  EXPECT_THAT(settings.dataDirs, ElementsAre("/usr/local/share", "/usr/share"));
  EXPECT_THAT(settings.volumeRoots, ElementsAre("/media", "/run/media", "/mnt"));
  EXPECT_THAT(settings.volumeFolders, IsEmpty());
}

TEST(SettingsTest, ColonListsSkipWhatIsNoAbsolutePath) {
  const ScopedVariable folders("BRIVOD_VOLUME_FOLDERS", "/a/:relative::/b");
  EXPECT_THAT(Settings::fromEnvironment().volumeFolders, ElementsAre("/a", "/b"));
}

TEST(SettingsTest, AnEmptyListOfRootsMeansNone) {
  const ScopedVariable roots("BRIVOD_VOLUME_ROOTS", "");
  EXPECT_THAT(Settings::fromEnvironment().volumeRoots, IsEmpty());
}

TEST(SettingsTest, TheRuntimeFolderHasThreeSources) {
  const ScopedVariable own("BRIVOD_RUNTIME_DIR", std::nullopt);
  {
    const ScopedVariable xdg("XDG_RUNTIME_DIR", "/run/user/7");
    EXPECT_EQ(Settings::fromEnvironment().runtimeDir, "/run/user/7/brivod");
    const ScopedVariable override("BRIVOD_RUNTIME_DIR", "/somewhere");
    EXPECT_EQ(Settings::fromEnvironment().runtimeDir, "/somewhere");
  }
  const ScopedVariable xdg("XDG_RUNTIME_DIR", std::nullopt);
  EXPECT_EQ(Settings::fromEnvironment().runtimeDir, ::getuid() == 0 ? "/run/brivod" : "");
}

TEST(SettingsTest, TheIdleTimeIsANumberOfSecondsOrNothing) {
  {
    const ScopedVariable idle("BRIVOD_IDLE_SECONDS", "90");
    EXPECT_EQ(Settings::fromEnvironment().idleTime, std::chrono::seconds(90));
  }
  for (const char* nonsense : {"", "soon", "1s", "-1"}) {
    const ScopedVariable idle("BRIVOD_IDLE_SECONDS", nonsense);
    EXPECT_EQ(Settings::fromEnvironment().idleTime, std::nullopt) << nonsense;
  }
}

TEST(SettingsTest, ADataFileIsTakenFromTheFirstFolderThatHasIt) {
  const test::TemporaryFolder folder;
  test::writeFile(folder / "second/OrvidCore/list", "x");
  test::writeFile(folder / "third/OrvidCore/list", "y");
  Settings settings;
  settings.dataDirs = {folder / "first", folder / "second", folder / "third"};
  settings.installedDataDir = folder / "installed";
  EXPECT_EQ(settings.findDataFile("OrvidCore/list"), folder / "second/OrvidCore/list");
  EXPECT_EQ(settings.findDataFile("OrvidCore/other"), "");
  test::writeFile(folder / "installed/OrvidCore/other", "z");
  EXPECT_EQ(settings.findDataFile("OrvidCore/other"), folder / "installed/OrvidCore/other");
}

}  // namespace
}  // namespace brivo
