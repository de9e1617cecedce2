// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "access/access_database.h"
#include "support/temporary_folder.h"

namespace brivo::test {

/// A folder for one access database, and a look into it past our own code.
class AccessDatabaseTest : public testing::Test {
 protected:
  std::string folder() const { return home / "org.orvid.imagecapture"; }
  std::string file() const { return folder() + "/externalMediaAccess.db"; }
  std::unique_ptr<AccessDatabase> open() { return std::make_unique<AccessDatabase>(pool, folder()); }
  /// The file with no opinion on what is in it.
  std::unique_ptr<Database> plain() {
    makeFolder(folder());
    return std::move(Database::open(file())).value();
  }
  /// The first value of the first row, or the engine's message.
  std::string ask(const std::string& statement) {
    std::string answer;
    const auto failure =
        plain()->execute(statement, {}, [&](const auto& row) { answer = row[0].second.value_or("NULL"); });
    return failure.value_or(answer);
  }

  TemporaryFolder home;
  Pool pool;
};

}  // namespace brivo::test
