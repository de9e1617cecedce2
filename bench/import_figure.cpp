// SPDX-License-Identifier: MIT
#include "import_figure.h"

#include <algorithm>
#include <filesystem>
#include <stdexcept>
#include <vector>

#include "command.h"
#include "figures.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

namespace fs = std::filesystem;

constexpr double kMostOverCopying = 1.3;
constexpr std::uint64_t kFileSize = 6'000'000;
constexpr int kUsage = 2;

/// Files below `folder` that are as large as those of the card.
std::size_t wholeFilesBelow(const std::string& folder) {
  const fs::recursive_directory_iterator entries(folder);
  return static_cast<std::size_t>(std::count_if(fs::begin(entries), fs::end(entries), [](const auto& entry) {
    return entry.is_regular_file() && entry.file_size() == kFileSize;
  }));
}

/// Milliseconds until `fill` has put the card's files into a new folder. Nothing waits to be written when it
/// begins, and nothing of it is left behind.
template <class Fill>
double timeToFill(const Card& card, Fill fill) {
  const test::TemporaryFolder target;
  runOrThrow({"sync"});
  const double milliseconds = millisecondsOf([&] { fill(target.path()); });
  if (wholeFilesBelow(target.path()) != card.files()) throw std::runtime_error("not all files are there");
  return milliseconds;
}

double timeOfCopying(const Card& card) {
  return timeToFill(card, [&](const std::string& target) {
    runOrThrow({"sh", "-c", R"(cp -r "$1" "$2" && sync)", "sh", card.path() + "/DCIM", target});
  });
}

void import(const WireSession& session, const std::vector<std::string>& arguments) {
  const int code = session.service().brivoctl(arguments);
  if (code == 0) return;
  throw std::runtime_error("brivoctl import ended with " + std::to_string(code) +
                           (code == kUsage ? ", as if it had no such command: " : ": ") +
                           session.service().log());
}

/// With a service that was just started, so that it knows of no import before.
double timeOfImport(const Card& card, const std::vector<std::string>& options) {
  const WireSession session(card);
  return timeToFill(card, [&](const std::string& target) {
    std::vector<std::string> arguments{"import", card.path(), "-d", target};
    arguments.insert(arguments.end(), options.begin(), options.end());
    import(session, arguments);
  });
}

}  // namespace

void printImportFigure(const Options& options) {
  const Card card(options.pick<std::size_t>(1'000, 20), ofBytes(kFileSize));
  timeOfCopying(card);
  std::vector<double> copied, imported, verified;
  for (int i = 0; i < options.pick(5, 3); ++i) {
    copied.push_back(timeOfCopying(card));
    imported.push_back(timeOfImport(card, {"--no-verify"}));
    verified.push_back(timeOfImport(card, {}));
  }
  const std::string files = grouped(card.files()) + " files of 6 MB";
  const double ratio = medianRatio(imported, copied);
  printFigure("bare: cp -r and sync, " + files, inMilliseconds(median(copied)), 1);
  printFigure("import without verification, " + files, inMilliseconds(median(imported)), ratio,
              atMost(kMostOverCopying, ratio));
  printFigure("import with verification, " + files, inMilliseconds(median(verified)),
              medianRatio(verified, copied));
}

}  // namespace brivo::bench
