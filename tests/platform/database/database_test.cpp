// SPDX-License-Identifier: MIT
#include "platform/database/database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <future>

#include "support/processes.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using testing::HasSubstr;

class DatabaseTest : public testing::Test {
 protected:
  std::unique_ptr<Database> open() { return std::move(Database::open(folder / "test.db")).value(); }

  test::TemporaryFolder folder;
};

TEST_F(DatabaseTest, RowsComeAsTextWithTheirColumns) {
  const auto database = open();
  ASSERT_FALSE(database->execute("CREATE TABLE t (name TEXT, number INTEGER)"));
  ASSERT_FALSE(database->execute("INSERT INTO t VALUES (?, ?)", {"a", 7}));
  ASSERT_FALSE(database->execute("INSERT INTO t VALUES (?, NULL)", {"b"}));
  std::vector<Database::Row> rows;
  ASSERT_FALSE(
      database->execute("SELECT name, number FROM t", {}, [&](const auto& row) { rows.push_back(row); }));
  ASSERT_EQ(rows.size(), 2u);
  EXPECT_EQ(rows[0], (Database::Row{{"name", "a"}, {"number", "7"}}));
  EXPECT_EQ(rows[1], (Database::Row{{"name", "b"}, {"number", std::nullopt}}));
}

TEST_F(DatabaseTest, ABoundTextIsDataAndNeverAStatement) {
  const auto database = open();
  ASSERT_FALSE(database->execute("CREATE TABLE t (name TEXT)"));
  const std::string hostile = "x'); DROP TABLE t; --";
  ASSERT_FALSE(database->execute("INSERT INTO t VALUES (?)", {hostile}));
  std::string found;
  ASSERT_FALSE(database->execute("SELECT name FROM t WHERE name = ?", {hostile},
                                 [&](const auto& row) { found = *row[0].second; }));
  EXPECT_EQ(found, hostile);
}

TEST_F(DatabaseTest, AFailedStatementGivesTheEnginesMessage) {
  const auto database = open();
  EXPECT_THAT(database->execute("SELECT * FROM absent").value_or(""), HasSubstr("no such table"));
}

TEST_F(DatabaseTest, AFileThatIsNoDatabaseFailsAtItsFirstStatementAndStaysAsItIs) {
  const std::string garbage(5000, 'x');
  test::writeFile(folder / "test.db", garbage);
  const auto database = open();
  EXPECT_THAT(database->execute("CREATE TABLE t (a)").value_or(""), HasSubstr("not a database"));
  EXPECT_EQ(test::readFile(folder / "test.db"), garbage);
}

TEST_F(DatabaseTest, APathThatCannotBeOpenedIsAnError) {
  EXPECT_FALSE(Database::open(folder / "no/folder/test.db").ok());
  test::makeFolder(folder / "d");
  EXPECT_FALSE(Database::open(folder / "d").ok());
}

TEST_F(DatabaseTest, TellsWhetherAColumnIsThere) {
  const auto database = open();
  ASSERT_FALSE(database->execute("CREATE TABLE t (a)"));
  EXPECT_EQ(database->hasColumn("t", "a"), true);
  EXPECT_EQ(database->hasColumn("t", "b"), false);
  EXPECT_EQ(database->hasColumn("u", "a"), false);
}

TEST_F(DatabaseTest, AFileThatIsNoDatabaseDoesNotTellWhetherAColumnIsThere) {
  test::writeFile(folder / "test.db", std::string(5000, 'x'));
  EXPECT_EQ(open()->hasColumn("t", "a"), std::nullopt);
}

TEST_F(DatabaseTest, ATextMayHaveZerosInIt) {
  const auto database = open();
  const std::string text("a\0b", 3);
  ASSERT_FALSE(database->execute("CREATE TABLE t (name TEXT)"));
  ASSERT_FALSE(database->execute("INSERT INTO t VALUES (?)", {text}));
  std::vector<std::string> found;
  ASSERT_FALSE(database->execute("SELECT name FROM t WHERE name IS ?", {text},
                                 [&](const auto& row) { found.push_back(*row[0].second); }));
  EXPECT_THAT(found, testing::ElementsAre(text));
}

TEST_F(DatabaseTest, AChangeIsOnTheMediumBeforeItIsReported) {
  const auto database = open();
  std::string level;
  ASSERT_FALSE(database->execute("PRAGMA synchronous", {}, [&](const auto& row) { level = *row[0].second; }));
  EXPECT_EQ(level, "3") << "EXTRA: the folder is waited for as well";
}

TEST_F(DatabaseTest, AChangeIsOnTheMediumAlsoWhenTheFileWasLockedAtFirst) {
  const auto other = open();
  ASSERT_FALSE(other->execute("CREATE TABLE t (a)"));
  ASSERT_FALSE(other->execute("BEGIN EXCLUSIVE"));
  const auto database = open();
  EXPECT_TRUE(database->execute("SELECT a FROM t"));
  ASSERT_FALSE(other->execute("COMMIT"));
  std::string level;
  ASSERT_FALSE(database->execute("PRAGMA synchronous", {}, [&](const auto& row) { level = *row[0].second; }));
  EXPECT_EQ(level, "3");
}

TEST_F(DatabaseTest, TellsThatItsFileWasRemovedOrReplaced) {
  const std::string file = folder / "test.db";
  const auto database = open();
  ASSERT_FALSE(database->execute("CREATE TABLE t (a)"));
  EXPECT_FALSE(database->hasLostItsFile());
  std::filesystem::rename(file, folder / "old.db");
  EXPECT_TRUE(database->hasLostItsFile());
  test::writeFile(file, "");
  EXPECT_TRUE(database->hasLostItsFile());
}

TEST_F(DatabaseTest, TriggersAndViewsInTheFileAreNotRun) {
  {
    sqlite3* foreign = nullptr;
    ASSERT_EQ(sqlite3_open((folder / "test.db").c_str(), &foreign), SQLITE_OK);
    EXPECT_EQ(sqlite3_exec(foreign,
                           "CREATE TABLE t (a); CREATE TABLE trace (a);"
                           "CREATE TRIGGER copy AFTER INSERT ON t BEGIN INSERT INTO trace VALUES (1); END;"
                           "CREATE VIEW everything AS SELECT a FROM t;",
                           nullptr, nullptr, nullptr),
              SQLITE_OK);
    sqlite3_close(foreign);
  }
  const auto database = open();
  ASSERT_FALSE(database->execute("INSERT INTO t VALUES (1)"));
  int traces = 0;
  ASSERT_FALSE(database->execute("SELECT a FROM trace", {}, [&](const auto&) { ++traces; }));
  EXPECT_EQ(traces, 0);
  EXPECT_THAT(database->execute("SELECT a FROM everything").value_or(""), HasSubstr("prohibited"));
}

TEST_F(DatabaseTest, AFileThatIsLockedIsWaitedFor) {
  const auto database = open();
  ASSERT_FALSE(database->execute("CREATE TABLE t (number INTEGER)"));
  const auto other = open();
  ASSERT_FALSE(other->execute("BEGIN EXCLUSIVE"));
  std::atomic<pid_t> thread = 0;
  auto adding = std::async(std::launch::async, [&] {
    thread = ::gettid();
    return database->execute("INSERT INTO t VALUES (1)");
  });
  EXPECT_TRUE(test::waitUntil([&] { return thread != 0 && test::isBlocked(thread); }));
  EXPECT_FALSE(other->execute("COMMIT"));
  EXPECT_EQ(adding.get(), std::nullopt);
}

TEST_F(DatabaseTest, TwoConnectionsSeeEachOthersWrites) {
  const auto first = open();
  const auto second = open();
  ASSERT_FALSE(first->execute("CREATE TABLE t (a)"));
  ASSERT_FALSE(second->execute("INSERT INTO t VALUES (1)"));
  int rows = 0;
  ASSERT_FALSE(first->execute("SELECT a FROM t", {}, [&](const auto&) { ++rows; }));
  EXPECT_EQ(rows, 1);
  EXPECT_FALSE(first->close());
}

}  // namespace
}  // namespace brivo
