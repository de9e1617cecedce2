// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <string>

#include "support/temporary_folder.h"

namespace brivo::bench {

/// A camera card in a temporary folder: "DCIM/100ABCDE/IMG_0001.JPG" and so on, 999 files in a folder, each
/// an inode of its own.
class Card {
 public:
  /// A card with `files` files that hold `content`.
  explicit Card(std::size_t files, const std::string& content = "JPEG");

  /// The folder above the card, for BRIVOD_VOLUME_FOLDERS.
  const std::string& volumes() const { return volumes_.path(); }
  const std::string& path() const { return path_; }
  std::size_t files() const { return files_; }
  /// Files and folders.
  std::size_t objects() const;

 private:
  const test::TemporaryFolder volumes_;
  const std::string path_;
  const std::size_t files_;
};

}  // namespace brivo::bench
