// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <vector>

#include "platform/images/iso_boxes.h"

namespace brivo::images {

/// One of the items that a meta box lists: a picture, or a block of metadata.
struct HeifItem {
  std::uint32_t id = 0;
  FourCharacters type = 0;
};

/// Bytes of the file that an item consists of.
struct HeifPlace {
  std::uint64_t offset = 0;  ///< from the start of the file
  std::uint64_t length = 0;  ///< 0: the item is not in the file
  bool isWhole = false;      ///< false when more of the item lies elsewhere
};

/// The tables of a meta box (ISO/IEC 14496-12 section 8.11, ISO/IEC 23008-12 section 9). Entries that are bad
/// are not there. *Thread-bound.*
class HeifItems {
 public:
  HeifItems(Parse& parse, const Box& meta);

  /// The item that the file is there for.
  std::optional<std::uint32_t> primary() const;
  /// All items, in the order of the file, as far as the parse goes.
  std::vector<HeifItem> items() const;
  /// The items with one of two types, in the order of the file; the first few dozen if there are more.
  std::vector<HeifItem> itemsOf(FourCharacters type, FourCharacters other) const;
  /// The items that item `from` refers to in the way that `kind` names, in their order.
  std::vector<std::uint32_t> referencesOf(FourCharacters kind, std::uint32_t from) const;
  /// The items that refer to item `to` in the way that `kind` names, in the order of the file.
  std::vector<std::uint32_t> referringTo(FourCharacters kind, std::uint32_t to) const;
  /// The properties of an item, in the order in which they are applied to it.
  std::vector<Box> propertiesOf(std::uint32_t item) const;
  /// Where an item is: its extents as long as each begins where the one before ends.
  HeifPlace placeOf(std::uint32_t item) const;

 private:
  Box table(FourCharacters type) const { return childOf(parse_, meta_, type, kFullBoxBytes); }
  Boxes infos() const;

  struct Properties {
    std::vector<Box> listed;        ///< those that items can have
    std::vector<Box> associations;  ///< the tables that say which item has which
  };
  const Properties& properties() const;

  Parse& parse_;
  const Box meta_;
  /// Read when first asked for, and kept: a picture made of many asks for those of each.
  mutable std::optional<Properties> properties_;
};

}  // namespace brivo::images
