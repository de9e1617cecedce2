// SPDX-License-Identifier: MIT
#pragma once

#include <bit>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "platform/base/value.h"

namespace brivo::images {

/// The directories whose entries are kept.
enum class ExifGroup : std::uint8_t { exif, tiff, gps, makerNote };

/// Entries of EXIF directories in one run of bytes: small enough to be kept for each picture of a card, and
/// made into values only when somebody asks. Entries of one layout take the same bytes in the same places.
/// Copies are of their own. *Thread-bound.*
class ExifEntries {
 public:
  /// Longest value that is kept, in bytes.
  static constexpr std::size_t kLongestValue = 4096;
  /// Most bytes that all entries together take.
  static constexpr std::size_t kMostBytes = 16'384;

  ExifEntries() = default;
  /// From what packed() gave; what is not in that form is left out.
  explicit ExifEntries(std::vector<std::byte> packed) : packed_(std::move(packed)) {}

  /// Keeps an entry unless the tag has no standard name in its group (maker notes aside), is there already,
  /// or is too long. `type` is that of TIFF; `value` holds whole elements in byte order `order`.
  void add(ExifGroup group, std::uint16_t tag, std::uint16_t type, std::span<const std::byte> value,
           std::endian order);

  bool empty() const { return packed_.empty(); }
  bool has(ExifGroup group) const;

  /// The value under a name (EXIF 2.32; decimal tag number in maker notes): text without trailing NULs, a
  /// number (rationals as their quotient), an array of numbers where there are several, or undefined bytes as
  /// data. None when there is no such entry.
  std::optional<Value> find(ExifGroup group, std::string_view name) const;
  /// All of a group by name.
  Dictionary dictionary(ExifGroup group) const;

  /// Only the entries that `keep` gives true for, of which it is told group and tag.
  ExifEntries selected(bool (*keep)(ExifGroup group, std::uint16_t tag)) const;

  /// The entries as bytes, for packed storage.
  std::span<const std::byte> packed() const { return packed_; }

 private:
  struct Entry;
  void append(const Entry& entry);
  /// Calls `visit` with each entry until it gives true.
  template <class Visit>
  void visitEntries(Visit visit) const;

  std::vector<std::byte> packed_;
};

}  // namespace brivo::images
