// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>

#include "support/temporary_folder.h"

namespace brivo::bench {

/// Makes the file at a path, whose folder is there.
using FileMaker = std::function<void(const std::string& path)>;
/// A file of `size` bytes that are on the disk and in the page cache.
FileMaker ofBytes(std::uint64_t size);
/// A file of `size` bytes without a block on the disk: it reads as zeros.
FileMaker ofNothing(std::uint64_t size);
/// One more name of the file at `path`, which is on the file system of the cards.
FileMaker asLinkTo(const std::string& path);

/// A camera card in a temporary folder: "DCIM/100ABCDE/IMG_0001.JPG", or with another extension, and so on,
/// 999 files in a folder.
class Card {
 public:
  /// A card with `files` files that hold `content`.
  explicit Card(std::size_t files, const std::string& content = "JPEG", const std::string& extension = "JPG");
  /// A card with `files` files made by `make`.
  Card(std::size_t files, const FileMaker& make, const std::string& extension = "JPG");

  /// The folder above the card, for BRIVOD_VOLUME_FOLDERS.
  const std::string& volumes() const { return volumes_.path(); }
  const std::string& path() const { return path_; }
  /// The path of the first file, and what it is on the card.
  std::string firstFile() const { return filePath(0); }
  static std::string firstFolder();
  std::string firstName() const { return fileName(0); }
  /// The same of the file with this index in the first folder.
  std::string filePath(std::size_t index) const { return path_ + firstFolder() + "/" + fileName(index); }
  std::string fileName(std::size_t index) const;
  std::size_t files() const { return files_; }
  /// Files and folders.
  std::size_t objects() const;

 private:
  const test::TemporaryFolder volumes_;
  const std::string path_;
  const std::size_t files_;
  const std::string extension_;
};

}  // namespace brivo::bench
