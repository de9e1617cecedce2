// SPDX-License-Identifier: MIT
#include "access/access_database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <ctime>
#include <thread>

#include "support/processes.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using Table = AccessDatabase::Table;

class AccessDatabaseTest : public testing::Test {
 protected:
  std::string folder() const { return home / "org.orvid.imagecapture"; }
  std::string file() const { return folder() + "/externalMediaAccess.db"; }
  std::unique_ptr<AccessDatabase> open() { return std::make_unique<AccessDatabase>(pool, folder()); }
  std::unique_ptr<Database> plain() {
    test::makeFolder(folder());
    return std::move(Database::open(file())).value();
  }

  test::TemporaryFolder home;
  Pool pool;
};

TEST_F(AccessDatabaseTest, AFreshFolderGetsTheFileWithBothTables) {
  open();
  const auto database = plain();
  for (const char* table : {"orvid_apps", "camera_control"}) {
    for (const char* column : {"ID", "bundle_id", "date_added", "whitelisted"}) {
      EXPECT_TRUE(database->hasColumn(table, column)) << table << "." << column;
    }
  }
  struct stat status {};
  ASSERT_EQ(::stat(folder().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);
}

TEST_F(AccessDatabaseTest, AnOldFileWithoutTheColumnGainsIt) {
  ASSERT_FALSE(plain()->execute(
      "CREATE TABLE camera_control (ID INTEGER PRIMARY KEY, bundle_id TEXT, date_added INTEGER)"));
  const test::StandardErrorCapture log;
  open();
  EXPECT_THAT(log.text(), HasSubstr("'whitelisted' does not appear in camera_control, updating database"));
  EXPECT_TRUE(plain()->hasColumn("camera_control", "whitelisted"));
}

TEST_F(AccessDatabaseTest, AddingTwiceLeavesTwoRowsAndOneRevokeRemovesBoth) {
  const auto database = open();
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  database->addApplicationWithBundleIdentifier("org.example.App", false);
  database->addApplicationWithBundleIdentifier("org.example.Other", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(),
              ElementsAre("org.example.App", "org.example.App", "org.example.Other"));
  database->revokeApplicationWithBundleIdentifier("org.example.App");
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.Other"));
}

TEST_F(AccessDatabaseTest, AListOfAnEmptyTableIsEmpty) {
  const auto database = open();
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCamerasWithStatus(), IsEmpty());
  EXPECT_THAT(database->bundleIdentifiersControllingExternalCameras(), IsEmpty());
}

TEST_F(AccessDatabaseTest, ANullFlagYieldsAStatusWithoutTheKey) {
  const auto database = open();
  ASSERT_FALSE(plain()->execute("INSERT INTO orvid_apps(bundle_id) VALUES ('org.example.App')"));
  const auto rows = database->bundleIdentifiersAccessingExternalCamerasWithStatus();
  ASSERT_THAT(rows, SizeIs(1));
  EXPECT_EQ(*rows[0].string("bundle_id"), "org.example.App");
  EXPECT_FALSE(rows[0].contains("whitelisted"));
}

TEST_F(AccessDatabaseTest, ARowHasItsDateInSecondsAndItsFlag) {
  const auto database = open();
  const auto before = std::time(nullptr);
  database->addControlApplicationWithBundleIdentifier("org.example.App", true);
  const auto rows = database->rowsOf("org.example.App", Table::control);
  ASSERT_THAT(rows, SizeIs(1));
  EXPECT_GE(rows[0].signedInteger("date_added"), before);
  EXPECT_LE(rows[0].signedInteger("date_added"), std::time(nullptr));
  EXPECT_EQ(rows[0].signedInteger("whitelisted"), 1);
  EXPECT_THAT(database->rowsOf("org.example.App", Table::access), IsEmpty());
  EXPECT_THAT(database->bundleIdentifiersControllingExternalCameras(), ElementsAre("org.example.App"));
  database->revokeControlApplicationWithBundleIdentifier("org.example.App");
  EXPECT_THAT(database->bundleIdentifiersControllingExternalCameras(), IsEmpty());
}

TEST_F(AccessDatabaseTest, TheStatusOfAGrantCanBeChanged) {
  const auto database = open();
  database->addApplicationWithBundleIdentifier("org.example.App", false);
  database->updateApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_EQ(database->bundleIdentifiersAccessingExternalCamerasWithStatus()[0].boolean("whitelisted"), true);
}

TEST_F(AccessDatabaseTest, AnIdentifierWithQuotesIsDataAndNoStatement) {
  const auto database = open();
  const std::string hostile = "x'; DROP TABLE orvid_apps; --";
  database->addApplicationWithBundleIdentifier(hostile, true);
  database->addApplicationWithBundleIdentifier("' OR '1'='1", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre(hostile, "' OR '1'='1"));
  database->revokeApplicationWithBundleIdentifier("' OR '1'='1");
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre(hostile));
}

TEST_F(AccessDatabaseTest, GrantsOutliveTheService) {
  open()->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(open()->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
}

TEST_F(AccessDatabaseTest, TwoOpenDatabasesSeeEachOthersGrants) {
  const auto service = open();
  const auto commandLine = open();
  commandLine->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(service->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
}

TEST_F(AccessDatabaseTest, AFolderThatCannotBeMadeIsLoggedAndNothingIsGranted) {
  test::writeFile(folder(), "in the way");
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(), HasSubstr("ovaccess ! Failed to open/create database"));
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_EQ(test::readFile(folder()), "in the way");
}

TEST_F(AccessDatabaseTest, ACorruptFileIsLoggedAndNotDestroyed) {
  const std::string garbage(10'000, 'x');
  test::writeFile(file(), garbage);
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(), HasSubstr("Failed to create table: orvid_apps - "));
  EXPECT_THAT(log.text(), HasSubstr("Failed to create table: camera_control - "));
  database->addApplicationWithBundleIdentifier("org.example.App", true);
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_EQ(test::readFile(file()), garbage);
}

TEST_F(AccessDatabaseTest, AReadOnlyFileStillGivesItsGrants) {
  open()->addApplicationWithBundleIdentifier("org.example.App", true);
  ASSERT_EQ(::chmod(file().c_str(), 0444), 0);
  ASSERT_EQ(::chmod(folder().c_str(), 0555), 0);
  const test::StandardErrorCapture log;
  {
    const auto database = open();
    EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
    if (::getuid() != 0) {  // root may write it all the same
      database->addApplicationWithBundleIdentifier("org.example.Other", true);
      EXPECT_THAT(log.text(), HasSubstr("readonly"));
    }
  }
  ::chmod(folder().c_str(), 0755);
}

TEST_F(AccessDatabaseTest, ALockedFileIsWaitedFor) {
  const auto database = open();
  const auto other = plain();
  ASSERT_FALSE(other->execute("BEGIN EXCLUSIVE"));
  std::atomic<pid_t> adding = 0;
  std::thread add([&] {
    adding = ::gettid();
    database->addApplicationWithBundleIdentifier("org.example.App", true);
  });
  EXPECT_TRUE(test::waitUntil([&] { return adding != 0 && test::isBlocked(adding); }));
  EXPECT_FALSE(other->execute("COMMIT"));
  add.join();
  EXPECT_THAT(database->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
}

}  // namespace
}  // namespace brivo
