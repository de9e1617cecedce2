// SPDX-License-Identifier: MIT
// A database file that something is wrong with: it is told, nothing is granted that cannot be read, and the
// file stays as it is.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <thread>

#include "database_fixture.h"
#include "support/file_size_limit.h"
#include "support/mounts.h"
#include "support/standard_error.h"

namespace brivo {
namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using Table = AccessDatabase::Table;

/// Root may do what modes forbid; others may not. What the folder holds is theirs while this lives.
class AsOrdinaryUser {
 public:
  explicit AsOrdinaryUser(const std::string& folder) {
    if (!isRoot_) return;
    for (const std::string& path :
         {std::string(fs::path(folder).parent_path()), folder, folder + "/externalMediaAccess.db"}) {
      EXPECT_EQ(::chown(path.c_str(), kNobody, kNobody), 0) << path;
    }
    EXPECT_EQ(::seteuid(kNobody), 0);
  }
  ~AsOrdinaryUser() {
    if (!isRoot_) return;
    EXPECT_EQ(::seteuid(0), 0);
  }
  AsOrdinaryUser(const AsOrdinaryUser&) = delete;
  AsOrdinaryUser& operator=(const AsOrdinaryUser&) = delete;

 private:
  static constexpr uid_t kNobody = 65534;
  const bool isRoot_ = ::geteuid() == 0;
};

class DatabaseFaultsTest : public test::AccessDatabaseTest {
 protected:
  void grantOne() { open()->addApplicationWithBundleIdentifier("org.example.App", true); }
  /// What is logged when an ordinary user grants and revokes; the one grant is there and stays.
  std::string logOfChangesThatFail() {
    const AsOrdinaryUser user(folder());
    const test::StandardErrorCapture log;
    const auto database = open();
    database->addApplicationWithBundleIdentifier("org.example.Other", true);
    database->revokeApplicationWithBundleIdentifier("org.example.App");
    EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
    return log.text();
  }
  /// That nothing comes of any operation, and none changes the file.
  void expectUseless(AccessDatabase& database) {
    const std::string before = test::readFile(file());
    database.addApplicationWithBundleIdentifier("org.example.New", true);
    database.addControlApplicationWithBundleIdentifier("org.example.New", true);
    database.updateApplicationWithBundleIdentifier("org.example.App", true);
    database.revokeApplicationWithBundleIdentifier("org.example.App");
    database.revokeControlApplicationWithBundleIdentifier("org.example.App");
    EXPECT_THAT(database.bundleIdentifiersAccessingExternalCameras(), IsEmpty());
    EXPECT_THAT(database.bundleIdentifiersAccessingExternalCamerasWithStatus(), IsEmpty());
    EXPECT_THAT(database.bundleIdentifiersControllingExternalCameras(), IsEmpty());
    EXPECT_THAT(database.rowsOf("org.example.App", Table::access), IsEmpty());
    EXPECT_TRUE(test::readFile(file()) == before) << "the file was changed";
  }
};

TEST_F(DatabaseFaultsTest, AFolderThatCannotBeMadeIsLoggedAndNothingIsGranted) {
  test::writeFile(folder(), "in the way");
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! Failed to open/create database"));
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_EQ(test::readFile(folder()), "in the way");
}

TEST_F(DatabaseFaultsTest, AFolderThatCannotBeMadeIsTriedAgainAndToldOnce) {
  test::writeFile(folder(), "in the way");
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(database->whyUnreadable(Table::access), testing::Optional(HasSubstr("no database")));
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  const std::string told = log.text();
  const auto failed = told.find("Failed to open/create database");
  EXPECT_EQ(told.find("Failed to open/create database", failed + 1), std::string::npos) << told;
  fs::remove(folder());
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
  EXPECT_EQ(database->whyUnreadable(Table::control), std::nullopt);
}

TEST_F(DatabaseFaultsTest, AFileThatIsNoDatabaseIsToldAndNotDestroyed) {
  test::writeFile(file(), std::string(10'000, 'x'));
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(),
              AllOf(HasSubstr("ovaccess ! Failed to create table: orvid_apps - file is not a database"),
                    HasSubstr("ovaccess ! Failed to create table: camera_control - "),
                    Not(HasSubstr("updating database"))));
  expectUseless(*database);
}

TEST_F(DatabaseFaultsTest, ADamagedHeaderIsToldAndTheFileNotDestroyed) {
  test::writeFile(file(), std::string("SQLite format 3\0", 16) + std::string(8192, '\xFF'));
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(), HasSubstr("Failed to create table: orvid_apps - "));
  expectUseless(*database);
}

TEST_F(DatabaseFaultsTest, AFileThatWasCutOffIsToldAndNotDestroyed) {
  grantOne();
  fs::resize_file(file(), 5000);
  const test::StandardErrorCapture log;
  const auto database = open();
  expectUseless(*database);
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! database disk image is malformed"));
}

TEST_F(DatabaseFaultsTest, ATableWithADamagedPageIsToldAndTheFileNotDestroyed) {
  grantOne();
  const int page = std::stoi(ask("SELECT rootpage FROM sqlite_master WHERE name = 'orvid_apps'"));
  std::string bytes = test::readFile(file());
  std::fill_n(bytes.begin() + (page - 1) * 4096, 4096, '\xAA');
  test::writeFile(file(), bytes);
  const test::StandardErrorCapture log;
  const auto database = open();
  database->addApplicationWithBundleIdentifier("org.example.New", true);
  database->revokeApplicationWithBundleIdentifier("org.example.App");
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCamerasWithStatus(), IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! database disk image is malformed"));
  EXPECT_TRUE(test::readFile(file()) == bytes);
}

TEST_F(DatabaseFaultsTest, AnEmptyFileBecomesADatabase) {
  test::writeFile(file(), "");
  grantOne();
  EXPECT_THAT(open()->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
}

TEST_F(DatabaseFaultsTest, AFolderInItsPlaceIsToldAndStays) {
  test::writeFile(file() + "/kept", "x");
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! Failed to open/create database"));
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_EQ(test::readFile(file() + "/kept"), "x");
}

TEST_F(DatabaseFaultsTest, AFifoInItsPlaceIsToldAndHoldsNobodyUp) {
  test::makeFolder(folder());
  ASSERT_EQ(::mkfifo(file().c_str(), 0600), 0);
  const test::StandardErrorCapture log;
  const auto database = open();
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("ovaccess !"));
}

TEST_F(DatabaseFaultsTest, AForeignSchemaGrantsNothingAndIsNotChanged) {
  ASSERT_FALSE(plain()->execute("CREATE TABLE orvid_apps (name TEXT)"));
  ASSERT_FALSE(plain()->execute("INSERT INTO orvid_apps VALUES ('org.example.App')"));
  ASSERT_FALSE(plain()->execute("CREATE TABLE camera_control (name TEXT, whitelisted INTEGER)"));
  const test::StandardErrorCapture log;
  const auto database = open();
  expectUseless(*database);
  EXPECT_THAT(log.text(), AllOf(HasSubstr("ovaccess ! table orvid_apps has no column named bundle_id"),
                                HasSubstr("ovcontrol ! no such column: bundle_id")));
}

TEST_F(DatabaseFaultsTest, AViewThatClaimsEveryGrantGrantsNothing) {
  ASSERT_FALSE(
      plain()->execute("CREATE VIEW orvid_apps AS SELECT 1 AS ID, 'org.example.App' AS bundle_id, 1 AS "
                       "date_added, 1 AS whitelisted"));
  const auto database = open();
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCamerasWithStatus(), IsEmpty());
  EXPECT_THAT(database->rowsOf("org.example.App", Table::access), IsEmpty());
}

TEST_F(DatabaseFaultsTest, FlagsThatAreNoNumbersCountAsUnconfirmed) {
  const auto database = open();
  ASSERT_FALSE(
      plain()->execute("INSERT INTO orvid_apps(bundle_id,whitelisted) VALUES ('org.example.App','yes')"));
  ASSERT_FALSE(plain()->execute("INSERT INTO orvid_apps(bundle_id,whitelisted) VALUES (NULL,1)"));
  const auto rows = database->bundleIdentifiersAccessingExternalCamerasWithStatus();
  ASSERT_THAT(rows, SizeIs(2));
  EXPECT_EQ(rows[0].boolean("whitelisted"), false);
  EXPECT_EQ(rows[1].string("bundle_id"), nullptr);
}

TEST_F(DatabaseFaultsTest, AReadOnlyFileGivesItsGrantsAndKeepsThem) {
  grantOne();
  ASSERT_EQ(::chmod(file().c_str(), 0444), 0);
  EXPECT_THAT(logOfChangesThatFail(), HasSubstr("ovaccess ! attempt to write a readonly database"));
}

TEST_F(DatabaseFaultsTest, AReadOnlyFolderGivesItsGrantsAndKeepsThem) {
  grantOne();
  ASSERT_EQ(::chmod(folder().c_str(), 0555), 0);
  EXPECT_THAT(logOfChangesThatFail(), HasSubstr("ovaccess ! "));
  ::chmod(folder().c_str(), 0755);
}

TEST_F(DatabaseFaultsTest, AFileThatMayNotBeReadGrantsNothing) {
  grantOne();
  ASSERT_EQ(::chmod(file().c_str(), 0), 0);
  const AsOrdinaryUser user(folder());
  const test::StandardErrorCapture log;
  EXPECT_THAT(open()->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! Failed to open/create database"));
}

/// Before the threads of the pool are made, for they look where the thread looked that made them.
struct InOwnMounts {
  const bool mayMount = test::enterMountNamespace();
};

class DatabaseMountsTest : private InOwnMounts, public DatabaseFaultsTest {
 protected:
  void SetUp() override {
    if (!mayMount) GTEST_SKIP() << "only root may mount";
  }
};

TEST_F(DatabaseMountsTest, AReadOnlyFileSystemGivesItsGrants) {
  grantOne();
  test::bindMount(folder(), folder());
  ASSERT_EQ(::mount(nullptr, folder().c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr), 0);
  {
    const test::StandardErrorCapture log;
    const auto database = open();
    database->addApplicationWithBundleIdentifier("org.example.Other", true);
    EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
    EXPECT_THAT(log.text(), HasSubstr("ovaccess ! attempt to write a readonly database"));
  }
  test::unmountAt(folder());
}

/// Grants until one does not take; gives those that did.
std::vector<std::string> grantUntilFull(AccessDatabase& database) {
  std::vector<std::string> granted;
  for (int i = 0; i < 1000; ++i) {
    const std::string identifier = std::to_string(i) + std::string(1000, 'x');
    database.addApplicationWithBundleIdentifier(identifier, true);
    if (database.rowsOf(identifier, Table::access).empty()) return granted;
    granted.push_back(identifier);
  }
  return granted;
}

TEST_F(DatabaseMountsTest, AFullDiskTakesNoGrantMoreAndLosesNone) {
  test::makeFolder(folder());
  ASSERT_EQ(::mount("none", folder().c_str(), "tmpfs", 0, "size=256k"), 0);
  {
    test::writeFile(folder() + "/filler", std::string(100'000, 'x'));
    const test::StandardErrorCapture log;
    const auto database = open();
    const auto granted = grantUntilFull(*database);
    EXPECT_GT(granted.size(), 10u);
    EXPECT_LT(granted.size(), 200u);
    EXPECT_THAT(log.text(), HasSubstr("ovaccess ! database or disk is full"));
    EXPECT_EQ(database->bundleIdentifiersAccessingExternalCameras(), granted);
    EXPECT_EQ(open()->bundleIdentifiersAccessingExternalCameras(), granted);
    EXPECT_EQ(ask("PRAGMA integrity_check"), "ok");
    fs::remove(folder() + "/filler");
    database->addApplicationWithBundleIdentifier("org.example.App", true);
    EXPECT_EQ(database->bundleIdentifiersAccessingExternalCameras().size(), granted.size() + 1);
  }
  test::unmountAt(folder());
}

TEST_F(DatabaseMountsTest, ADiskThatIsFullFromTheStartGrantsNothingUntilItHasRoom) {
  test::makeFolder(folder());
  ASSERT_EQ(::mount("none", folder().c_str(), "tmpfs", 0, "size=64k"), 0);
  {
    EXPECT_THROW(test::writeFile(folder() + "/filler", std::string(100'000, 'x')), std::runtime_error);
    const test::StandardErrorCapture log;
    EXPECT_THAT(open()->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
    EXPECT_THAT(log.text(), HasSubstr("Failed to create table: orvid_apps - database or disk is full"));
    fs::remove(folder() + "/filler");
    grantOne();
    EXPECT_THAT(open()->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
  }
  test::unmountAt(folder());
}

TEST_F(DatabaseFaultsTest, AFileThatMayNotGrowTakesNoGrantMoreAndLosesNone) {
  const auto database = open();
  std::vector<std::string> granted;
  {
    const test::FileSizeLimit limit(50'000);
    granted = grantUntilFull(*database);
  }
  EXPECT_GT(granted.size(), 5u);
  EXPECT_LT(granted.size(), 50u);
  EXPECT_EQ(open()->bundleIdentifiersAccessingExternalCameras(), granted);
  EXPECT_EQ(ask("PRAGMA integrity_check"), "ok");
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_EQ(open()->bundleIdentifiersAccessingExternalCameras().size(), granted.size() + 1);
}

TEST_F(DatabaseFaultsTest, AFileThatStaysLockedGrantsNothingAndIsToldOf) {
  grantOne();
  const auto database = open();
  const auto other = plain();
  ASSERT_FALSE(other->execute("BEGIN EXCLUSIVE"));
  const test::StandardErrorCapture log;
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCamerasWithStatus(), IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! database is locked"));
  EXPECT_FALSE(other->execute("COMMIT"));
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
}

TEST_F(DatabaseFaultsTest, AFileThatVanishesTakesItsGrantsAlongAndIsMadeAnew) {
  const auto service = open();
  service->addApplicationWithBundleIdentifier("org.example.App", true);
  fs::remove_all(folder());
  const test::StandardErrorCapture log;
  EXPECT_THAT(service->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! The database is not where it was, opening it anew"));
  open()->addApplicationWithBundleIdentifier("org.example.Other", true);
  EXPECT_THAT(service->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.Other"));
}

TEST_F(DatabaseFaultsTest, AFileThatIsPutInThePlaceOfTheOldOneCounts) {
  grantOne();
  const auto service = open();
  fs::copy_file(file(), home / "saved.db");
  service->revokeApplicationWithBundleIdentifier("org.example.App");
  service->addApplicationWithBundleIdentifier("org.example.Other", true);
  fs::rename(home / "saved.db", file());
  EXPECT_THAT(service->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
}

}  // namespace
}  // namespace brivo
