// SPDX-License-Identifier: MIT
// A folder of real camera files with expected.json, in which another program says what is in each of them.
#pragma once

#include <filesystem>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

namespace brivo::images {

/// What the other program says of one file.
struct CorpusFile {
  std::string name;  ///< path below the corpus
  nlohmann::json facts;
};

class Corpus {
 public:
  /// The corpus in $BRIVOD_CORPUS, or else in its usual place beside the source; none when it is not there.
  static const Corpus* find();

  const std::vector<CorpusFile>& files() const { return files_; }
  std::filesystem::path pathOf(const CorpusFile& file) const { return folder_ / file.name; }

 private:
  explicit Corpus(std::filesystem::path folder);

  const std::filesystem::path folder_;
  std::vector<CorpusFile> files_;
};

/// A JSON file. Throws when it cannot be read.
nlohmann::json readJson(const std::filesystem::path& path);

}  // namespace brivo::images
