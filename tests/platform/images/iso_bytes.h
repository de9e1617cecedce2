// SPDX-License-Identifier: MIT
// Made-up files of ISO base media boxes for tests, byte by byte.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

namespace brivo::test {

/// `value` in `width` bytes, big-endian.
std::string big(std::uint64_t value, std::size_t width);

std::string box(std::string_view type, std::string_view content);
std::string fullBox(std::string_view type, unsigned version, unsigned flags, std::string_view content);
std::string uuidBox(std::uint64_t high, std::uint64_t low, std::string_view content);
/// A brand, and others that the file is compatible with.
std::string fileType(std::string_view brand, std::string_view others = {});

/// A movie track whose pictures have a size, with one sample.
std::string pictureTrack(unsigned width, unsigned height, std::uint64_t sampleOffset = 0,
                         std::uint64_t sampleLength = 0, bool wide = true);

// Properties of items.
std::string extents(unsigned width, unsigned height);  ///< ispe
std::string turn(unsigned quarters);                   ///< irot
std::string mirror(unsigned axis);                     ///< imir
std::string channels(unsigned depth);                  ///< pixi

/// Writes a HEIF: a meta box with items, and their bytes behind it.
class HeifBytes {
 public:
  /// How the tables are written.
  struct Form {
    unsigned locations = 1;  ///< version of iloc; 0, 1, or 2
    bool areIdentifiersLong = false;
    bool areAssociationsLong = false;
    bool isMetaLast = false;  ///< the meta box stands behind the bytes
    std::uint64_t base = 0;   ///< base offset of every item
  };
  /// Where the bytes of an item lie.
  enum class Where { file, itemData, twoExtents, apart };

  HeifBytes() = default;
  explicit HeifBytes(Form form) : form_(form) {}

  void item(std::uint32_t id, std::string_view type, std::string content = {}, Where where = Where::file);
  void properties(std::uint32_t item, std::initializer_list<std::string> boxes);
  void reference(std::string_view kind, std::uint32_t from, std::initializer_list<std::uint32_t> to);

  /// All of it; item 1 is the primary one.
  std::string build(std::string_view brand = "heic") const;

 private:
  struct Item {
    std::uint32_t id;
    std::string type;
    std::string content;
    Where where;
  };
  struct Association {
    std::uint32_t item;
    std::vector<std::size_t> indices;
  };

  std::string identifier(std::uint32_t id) const { return big(id, form_.areIdentifiersLong ? 4 : 2); }
  unsigned longVersion() const { return form_.areIdentifiersLong ? 1 : 0; }
  std::string infos() const;
  std::string locations(std::uint64_t start) const;
  std::string associations() const;
  std::string meta(std::uint64_t start) const;

  Form form_;
  std::vector<Item> items_;
  std::vector<Association> associations_;
  std::string list_;
  std::size_t listed_ = 0;
  std::string references_;
};

/// EXIF as an item holds it.
std::string exifItem(std::string_view tiff, std::string_view before = {});

}  // namespace brivo::test
