// SPDX-License-Identifier: MIT
#include "options.h"

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string_view>

#include "figures.h"

namespace brivo::bench {

namespace {

constexpr const char* kDiskFolder = "/var/tmp";

[[noreturn]] void showUsage(const char* program) {
  std::fprintf(stderr, "usage: %s [--quick] [--folder FOLDER] [--card FOLDER]\n", program);
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
    } else if (word == "--card" && i + 1 < count) {
      options.card = words[++i];
    } else {
      showUsage(words[0]);
    }
  }
  return options;
}

int runBenchmark(int count, char** words, void (*measure)(const Options&)) {
  const Options options = Options::fromCommandLine(count, words);
  try {
    printHeadings();
    measure(options);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "%s: %s\n", words[0], error.what());
    return 1;
  }
  return 0;
}

}  // namespace brivo::bench
