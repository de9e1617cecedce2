// SPDX-License-Identifier: MIT
#include "access/access_database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <ctime>

#include "database_fixture.h"
#include "support/standard_error.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using Table = AccessDatabase::Table;

using test::AccessDatabaseTest;

TEST_F(AccessDatabaseTest, AFreshFolderGetsTheFileWithBothTables) {
  open();
  const auto database = plain();
  for (const char* table : {"orvid_apps", "camera_control"}) {
    for (const char* column : {"ID", "bundle_id", "date_added", "whitelisted"}) {
      EXPECT_EQ(database->hasColumn(table, column), true) << table << "." << column;
    }
  }
  struct stat status {};
  ASSERT_EQ(::stat(folder().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);
}

TEST_F(AccessDatabaseTest, AnOldFileWithoutTheColumnGainsItAndKeepsItsGrants) {
  ASSERT_FALSE(plain()->execute(
      "CREATE TABLE camera_control (ID INTEGER PRIMARY KEY, bundle_id TEXT, date_added INTEGER)"));
  ASSERT_FALSE(
      plain()->execute("INSERT INTO camera_control(bundle_id,date_added) VALUES ('org.example.App',7)"));
  const test::StandardErrorCapture log;
  const auto database = open();
  EXPECT_THAT(log.text(), HasSubstr("'whitelisted' does not appear in camera_control, updating database"));
  EXPECT_EQ(plain()->hasColumn("camera_control", "whitelisted"), true);
  EXPECT_THAT(database->bundleIdentifiersControllingExternalCameras(), ElementsAre("org.example.App"));
  EXPECT_FALSE(database->rowsOf("org.example.App", Table::control)[0].contains("whitelisted"));
  database->addControlApplicationWithBundleIdentifier("org.example.Other", true);
  EXPECT_EQ(database->rowsOf("org.example.Other", Table::control)[0].boolean("whitelisted"), true);
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

TEST_F(AccessDatabaseTest, AnIdentifierIsDataAndNeverAStatement) {
  const auto database = open();
  const std::vector<std::string> hostile{"x'; DROP TABLE orvid_apps; --",
                                         "' OR '1'='1",
                                         "\"; DELETE FROM orvid_apps; --",
                                         "?1 :a @b $c %s %d {} {0}",
                                         "two\nlines\r\n\x1B[2J",
                                         std::string("org.orvid.Photos\0.evil", 22),
                                         std::string("\0", 1),
                                         "\xFF\xFE no UTF-8 \xC0\x80",
                                         "",
                                         std::string(1 << 20, 'x')};
  for (const std::string& identifier : hostile) {
    database->addApplicationWithBundleIdentifier(identifier, false);
    database->addControlApplicationWithBundleIdentifier(identifier, true);
  }
  EXPECT_EQ(database->bundleIdentifiersAccessingExternalCameras(), hostile);
  EXPECT_EQ(database->bundleIdentifiersControllingExternalCameras(), hostile);
  std::vector<std::string> left = hostile;
  for (const std::string& identifier : hostile) {
    database->updateApplicationWithBundleIdentifier(identifier, true);
    const auto rows = database->rowsOf(identifier, Table::access);
    ASSERT_THAT(rows, SizeIs(1));
    EXPECT_EQ(*rows[0].string("bundle_id"), identifier);
    EXPECT_EQ(rows[0].boolean("whitelisted"), true);
    database->revokeApplicationWithBundleIdentifier(identifier);
    left.erase(left.begin());
    EXPECT_EQ(database->bundleIdentifiersAccessingExternalCameras(), left);
  }
  EXPECT_EQ(database->bundleIdentifiersControllingExternalCameras(), hostile)
      << "the other table is untouched";
}

TEST_F(AccessDatabaseTest, ALineOfTheLogIsOneLineWhateverTheIdentifier) {
  const auto database = open();
  const test::StandardErrorCapture log;
  database->revokeApplicationWithBundleIdentifier("org.example\n<3>everything is fine\x1B[2J");
  const std::string text = log.text();
  EXPECT_EQ(std::ranges::count(text, '\n'), 1) << text;
  EXPECT_EQ(text.find('\x1B'), std::string::npos);
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

}  // namespace
}  // namespace brivo
