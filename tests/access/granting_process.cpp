// SPDX-License-Identifier: MIT
// granting_process FOLDER PREFIX COUNT: adds that many grants to the access database in the folder, and
// writes the identifier of each to its standard output once it was added.
#include <unistd.h>

#include <cstdlib>
#include <string>

#include "access/access_database.h"

int main(int, char** arguments) {
  brivo::Pool pool;
  brivo::AccessDatabase database(pool, arguments[1]);
  const int count = std::atoi(arguments[3]);
  for (int i = 0; i < count; ++i) {
    const std::string identifier = std::string(arguments[2]) + "." + std::to_string(i);
    database.addApplicationWithBundleIdentifier(identifier, true);
    const std::string line = identifier + "\n";
    if (::write(STDOUT_FILENO, line.data(), line.size()) < 0) return 1;
  }
  return 0;
}
