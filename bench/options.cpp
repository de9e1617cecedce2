// SPDX-License-Identifier: MIT
#include "options.h"

#include <cstdio>
#include <cstdlib>
#include <string_view>

namespace brivo::bench {

namespace {

constexpr const char* kDiskFolder = "/var/tmp";

[[noreturn]] void showUsage(const char* program) {
  std::fprintf(stderr, "usage: %s [--quick] [--folder FOLDER]\n", program);
  std::exit(2);
}

}  // namespace

Options Options::fromCommandLine(int count, char** words) {
  Options options;
  ::setenv("TMPDIR", kDiskFolder, 0);
  for (int i = 1; i < count; ++i) {
    const std::string_view word = words[i];
    if (word == "--quick") {
      options.quick = true;
    } else if (word == "--folder" && i + 1 < count) {
      ::setenv("TMPDIR", words[++i], 1);
    } else {
      showUsage(words[0]);
    }
  }
  return options;
}

}  // namespace brivo::bench
