// SPDX-License-Identifier: MIT
#include "pictures.h"

#include <algorithm>
#include <filesystem>
#include <stdexcept>

#include "command.h"
#include "figures.h"

namespace brivo::bench {

namespace fs = std::filesystem;

namespace {

/// Debian's own, which has the packages.
constexpr const char* kPython = "/usr/bin/python3";

fs::path script() { return fs::path(BRIVOD_SOURCE_DIR).parent_path() / "shared/bench/make_card.py"; }

bool canMakeCards() {
  return fs::exists(script()) && run({kPython, "-c", "import PIL, numpy"}).exitCode == 0;
}

void makeCard(const std::string& path, std::size_t count, std::size_t distinct) {
  runOrThrow({kPython, script(), path, "--jpegs", std::to_string(count), "--distinct",
              std::to_string(distinct), "--plain", "--store", "stub"});
}

}  // namespace

std::optional<Pictures> Pictures::find(const Options& options, std::size_t count) {
  if (options.card.empty() && !canMakeCards()) {
    printNote("no pictures: no --card, or no make_card.py with python3-pil and python3-numpy");
    return std::nullopt;
  }
  std::unique_ptr<test::TemporaryFolder> folder;
  std::string card = options.card;
  if (card.empty()) {
    folder = std::make_unique<test::TemporaryFolder>();
    card = *folder / "card";
    makeCard(card, count, options.pick<std::size_t>(50, 4));
  }
  Pictures pictures(std::move(folder), card);
  if (pictures.paths_.size() < count) throw std::runtime_error(card + " has too few pictures");
  return pictures;
}

Pictures::Pictures(std::unique_ptr<test::TemporaryFolder> folder, const std::string& card)
    : folder_(std::move(folder)) {
  for (const auto& entry : fs::recursive_directory_iterator(card + "/DCIM")) {
    if (entry.path().extension() == ".JPG") paths_.push_back(entry.path());
  }
  std::ranges::sort(paths_);
}

FileMaker Pictures::inOrder() const {
  return [this, next = paths_.begin()](const std::string& path) mutable { asLinkTo (*next++)(path); };
}

}  // namespace brivo::bench
