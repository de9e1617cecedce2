// SPDX-License-Identifier: MIT
#pragma once

#include <filesystem>

#include "platform/base/unique_fd.h"
#include "platform/images/byte_source.h"

namespace brivo::images {

/// A file on disk that keeps account of what is asked of it.
class FileSource final : public ByteSource {
 public:
  /// Throws when the file cannot be opened.
  explicit FileSource(const std::filesystem::path& path);

  std::uint64_t size() const override { return size_; }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override;

  std::size_t ranges() const { return ranges_; }       ///< how often bytes were asked for
  std::uint64_t bytesAsked() const { return bytes_; }  ///< in all
  bool stayedInside() const { return stayedInside_; }  ///< no byte was asked for that the file has not

 private:
  const UniqueFd file_;
  const std::uint64_t size_;
  mutable std::size_t ranges_ = 0;
  mutable std::uint64_t bytes_ = 0;
  mutable bool stayedInside_ = true;
};

}  // namespace brivo::images
