// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "platform/images/byte_source.h"

namespace brivo::images {

/// How much of a file one parse may fetch beyond its first range.
struct FetchLimits {
  std::size_t usual;       ///< bytes of a range, unless more are asked for at once
  std::size_t ranges;      ///< ranges in all
  std::size_t bytes;       ///< bytes in all
  std::size_t before = 0;  ///< bytes of a range before those that are asked for
};

/// Bytes of the first range: enough for the headers of most pictures.
inline constexpr std::size_t kFirstRange = 16'384;
/// For formats whose headers lie in a row (JPEG, PNG): many short ranges.
inline constexpr FetchLimits kForHeadersInARow{4096, 64, 524'288};
/// For formats whose directories point all over the file (TIFF, ISO base media): few long ones. What a
/// directory needs often lies right before it.
inline constexpr FetchLimits kForDirectories{32'768, 4, 245'760, 4096};

/// The bytes of an image, fetched in ranges as they are asked for and kept until the parse ends. What lies
/// outside the file, and what the limits do not allow any more, is not there. *Thread-bound.*
class Ranges {
 public:
  /// `source` must outlive this. Nothing is fetched yet, and nothing but the first range can be until
  /// allow().
  explicit Ranges(const ByteSource& source) : source_(source) {}

  /// Allows what `limits` say from here on.
  void allow(FetchLimits limits) { limits_ = limits; }

  /// Bytes that the image has.
  std::uint64_t size() const { return source_.size(); }
  /// The `length` bytes from `offset` on, borrowed as long as this lives; empty unless all of them are there.
  std::span<const std::byte> bytes(std::uint64_t offset, std::size_t length);
  /// The same, but fewer when the file ends earlier.
  std::span<const std::byte> upTo(std::uint64_t offset, std::size_t length);

 private:
  struct Range {
    std::uint64_t offset;
    std::unique_ptr<std::byte[]> memory;
    std::span<const std::byte> bytes;
  };

  std::span<const std::byte> fetch(std::uint64_t offset, std::size_t length);

  const ByteSource& source_;
  FetchLimits limits_{kFirstRange, 1, kFirstRange};  ///< what is left
  std::vector<Range> fetched_;
};

}  // namespace brivo::images
