// SPDX-License-Identifier: MIT
#include "platform/images/heif_items.h"

#include <algorithm>
#include <limits>

namespace brivo::images {

namespace {

/// Identifiers and counts became wider in later versions of most tables.
std::uint32_t shortOrLong(ByteCursor& cursor, bool isLong) { return isLong ? cursor.u32() : cursor.u16(); }

/// An infe box. Versions 0 and 1 have no item type.
std::optional<HeifItem> itemOf(Parse& parse, const Box& entry) {
  ByteCursor cursor = contentOf(parse, entry, 16);
  const std::uint8_t version = fullBoxHeader(cursor).version;
  if (version != 2 && version != 3) return std::nullopt;
  const std::uint32_t id = shortOrLong(cursor, version == 3);
  cursor.skip(2);  // protection
  const HeifItem item{id, cursor.u32()};
  return cursor.ok() ? std::optional(item) : std::nullopt;
}

/// The indices into the property list that an ipma box has for `item`, from 1 on.
std::vector<std::uint16_t> associationsOf(ByteCursor cursor, std::uint32_t item) {
  const auto [version, flags] = fullBoxHeader(cursor);
  const bool isWide = (flags & 1) != 0;
  const std::uint32_t count = cursor.u32();
  std::vector<std::uint16_t> indices;
  for (std::uint32_t i = 0; i < count && cursor.ok(); ++i) {
    const bool isWanted = shortOrLong(cursor, version != 0) == item;
    const std::uint8_t associations = cursor.u8();
    if (!isWanted) {
      cursor.skip(isWide ? associations * std::size_t{2} : associations);
      continue;
    }
    // The highest bit says that a reader must know the property.
    for (std::uint8_t k = 0; k < associations; ++k)
      indices.push_back(isWide ? cursor.u16() & 0x7FFF : cursor.u8() & 0x7F);
  }
  return indices;
}

/// Where an item's extents count from.
enum class Base : std::uint8_t { file = 0, itemData = 1 };

struct Extent {
  std::uint64_t offset;
  std::uint64_t length;  ///< 0: all that there is
};

/// The extents of an item, as an iloc box states them.
struct Location {
  std::uint16_t base = 0;
  bool isInThisFile = true;
  std::vector<Extent> extents;
};

/// Walks an iloc box, whose integers have widths of its own.
class LocationTable {
 public:
  LocationTable(Parse& parse, ByteCursor cursor) : parse_(parse), cursor_(cursor) {
    version_ = fullBoxHeader(cursor_).version;
    const std::uint16_t widths = cursor_.u16();
    offsetBytes_ = widths >> 12;
    lengthBytes_ = widths >> 8 & 15;
    baseBytes_ = widths >> 4 & 15;
    indexBytes_ = version_ == 0 ? 0 : widths & 15;
  }

  Location find(std::uint32_t item) {
    const std::uint32_t count = shortOrLong(cursor_, version_ >= 2);
    for (std::uint32_t i = 0; i < count && cursor_.ok(); ++i) {
      const bool isWanted = shortOrLong(cursor_, version_ >= 2) == item;
      Location location = next(isWanted);
      if (isWanted) return location;
    }
    return {};
  }

 private:
  std::uint64_t number(std::size_t width) {
    return width == 8 ? cursor_.u64() : width == 4 ? cursor_.u32() : (cursor_.skip(width), 0);
  }

  Location next(bool withExtents) {
    Location location;
    if (version_ != 0) location.base = cursor_.u16() & 15;
    location.isInThisFile = cursor_.u16() == 0;
    const std::uint64_t base = number(baseBytes_);
    const std::size_t extents = cursor_.u16();
    if (!withExtents) {
      cursor_.skip(extents * (indexBytes_ + offsetBytes_ + lengthBytes_));
      return location;
    }
    const std::size_t most = parse_.spendEntries(extents);
    for (std::size_t i = 0; i < most; ++i) {
      number(indexBytes_);
      const std::uint64_t offset = number(offsetBytes_);
      // What would wrap around lies outside any file.
      const bool fits = offset <= std::numeric_limits<std::uint64_t>::max() - base;
      location.extents.push_back(
          {fits ? base + offset : std::numeric_limits<std::uint64_t>::max(), number(lengthBytes_)});
    }
    if (!cursor_.ok()) location.extents.clear();
    return location;
  }

  Parse& parse_;
  ByteCursor cursor_;
  std::uint8_t version_ = 0;
  std::size_t offsetBytes_ = 0;
  std::size_t lengthBytes_ = 0;
  std::size_t baseBytes_ = 0;
  std::size_t indexBytes_ = 0;
};

/// An extent as bytes of the file, no further than `holder` goes.
HeifPlace placeIn(const Box& holder, const Extent& extent) {
  if (extent.offset > holder.length) return {};
  const std::uint64_t room = holder.length - extent.offset;
  if (extent.length > room) return {};
  return {holder.start + extent.offset, extent.length != 0 ? extent.length : room, true};
}

}  // namespace

HeifItems::HeifItems(Parse& parse, const Box& meta) : parse_(parse), meta_(meta) {
  // One range for all tables, as they are read in no order.
  parse.ranges.upTo(meta.start,
                    static_cast<std::size_t>(std::min<std::uint64_t>(meta.length, kLongestTable)));
}

std::optional<std::uint32_t> HeifItems::primary() const {
  ByteCursor cursor = contentOf(parse_, table(fourCharacters("pitm")));
  const bool isLong = fullBoxHeader(cursor).version != 0;
  const std::uint32_t id = shortOrLong(cursor, isLong);
  return cursor.ok() ? std::optional(id) : std::nullopt;
}

std::vector<HeifItem> HeifItems::itemsOf(FourCharacters type, FourCharacters other) const {
  constexpr std::size_t kMostItems = 32;
  const Box list = table(fourCharacters("iinf"));
  ByteCursor cursor = contentOf(parse_, list, kFullBoxBytes);
  const std::uint64_t countBytes = fullBoxHeader(cursor).version == 0 ? 2 : 4;
  Boxes boxes(parse_, list, kFullBoxBytes + countBytes);
  std::vector<HeifItem> items;
  while (items.size() < kMostItems) {
    const auto box = boxes.next();
    if (!box) break;
    const auto item = itemOf(parse_, *box);
    if (item && (item->type == type || item->type == other)) items.push_back(*item);
  }
  return items;
}

std::vector<std::uint32_t> HeifItems::referencesOf(FourCharacters kind, std::uint32_t from) const {
  const Box list = table(fourCharacters("iref"));
  ByteCursor header = contentOf(parse_, list, kFullBoxBytes);
  const bool isLong = fullBoxHeader(header).version != 0;
  std::vector<std::uint32_t> references;
  Boxes boxes(parse_, list, kFullBoxBytes);
  while (const auto box = boxes.next()) {
    if (box->type != kind) continue;
    ByteCursor cursor = contentOf(parse_, *box);
    if (shortOrLong(cursor, isLong) != from) continue;
    const std::size_t count = parse_.spendEntries(cursor.u16());
    for (std::size_t i = 0; i < count && cursor.remaining() >= 2; ++i)
      references.push_back(shortOrLong(cursor, isLong));
  }
  return references;
}

std::vector<Box> HeifItems::propertiesOf(std::uint32_t item) const {
  constexpr std::size_t kMostProperties = 64;
  std::vector<Box> list, properties;
  Boxes boxes(parse_, table(fourCharacters("iprp")));
  while (const auto box = boxes.next()) {
    if (box->type == fourCharacters("ipco")) {
      Boxes children(parse_, *box);
      while (const auto child = children.next()) list.push_back(*child);
    } else if (box->type == fourCharacters("ipma")) {
      for (const std::uint16_t index : associationsOf(contentOf(parse_, *box), item)) {
        if (index != 0 && index <= list.size() && properties.size() < kMostProperties)
          properties.push_back(list[index - 1U]);
      }
    }
  }
  return properties;
}

HeifPlace HeifItems::placeOf(std::uint32_t item) const {
  const Location location =
      LocationTable(parse_, contentOf(parse_, table(fourCharacters("iloc")))).find(item);
  if (!location.isInThisFile || location.base > static_cast<std::uint16_t>(Base::itemData)) return {};
  const Box holder = Base{static_cast<std::uint8_t>(location.base)} == Base::file
                         ? Box{.length = parse_.ranges.size()}
                         : table(fourCharacters("idat"));
  HeifPlace whole;
  for (const Extent& extent : location.extents) {
    const HeifPlace place = placeIn(holder, extent);
    const bool follows = whole.length == 0 || place.offset == whole.offset + whole.length;
    if (place.length == 0 || !follows) {
      whole.isWhole = false;
      break;
    }
    whole = {whole.length == 0 ? place.offset : whole.offset, whole.length + place.length, true};
  }
  return whole;
}

}  // namespace brivo::images
