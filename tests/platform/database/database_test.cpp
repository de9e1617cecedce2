// SPDX-License-Identifier: MIT
#include "platform/database/database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/temporary_folder.h"

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
  EXPECT_TRUE(database->hasColumn("t", "a"));
  EXPECT_FALSE(database->hasColumn("t", "b"));
  EXPECT_FALSE(database->hasColumn("u", "a"));
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
