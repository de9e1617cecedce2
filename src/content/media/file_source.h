// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "platform/files/file_system.h"
#include "platform/images/byte_source.h"

namespace brivo {

/// A file on a volume as a source of an image's bytes: opened when the first byte is wanted, closed when it
/// goes. A file that cannot be opened has no bytes. *Thread-bound.*
class FileSource final : public images::ByteSource {
 public:
  /// `size` is the file's size in bytes, as the walk found it; `files` must outlive this.
  FileSource(FileSystem& files, std::string path, std::uint64_t size)
      : files_(files), path_(std::move(path)), size_(size) {}

  std::uint64_t size() const override { return size_; }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override;

 private:
  FileSystem& files_;
  const std::string path_;
  const std::uint64_t size_;
  mutable std::optional<UniqueFd> descriptor_;  // holds none when it could not be opened
};

}  // namespace brivo
