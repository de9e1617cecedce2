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

/// What an iref box holds of one kind of reference: who refers, and to whom.
struct Reference {
  std::uint32_t from;
  ByteCursor to;
};

/// Walks the references of one kind.
class ReferenceTable {
 public:
  ReferenceTable(Parse& parse, const Box& list, FourCharacters kind)
      : parse_(parse), boxes_(parse, list, kFullBoxBytes), kind_(kind) {
    ByteCursor header = contentOf(parse, list, kFullBoxBytes);
    isLong_ = fullBoxHeader(header).version != 0;
  }

  std::optional<Reference> next() {
    while (const auto box = boxes_.next()) {
      if (box->type != kind_) continue;
      ByteCursor cursor = contentOf(parse_, *box);
      const std::uint32_t from = shortOrLong(cursor, isLong_);
      return Reference{from, cursor};
    }
    return std::nullopt;
  }

  std::vector<std::uint32_t> targets(Reference reference) {
    const std::size_t count = parse_.spendEntries(reference.to.u16());
    std::vector<std::uint32_t> items;
    for (std::size_t i = 0; i < count && reference.to.remaining() >= 2; ++i)
      items.push_back(shortOrLong(reference.to, isLong_));
    return items;
  }

 private:
  Parse& parse_;
  Boxes boxes_;
  const FourCharacters kind_;
  bool isLong_ = false;
};

std::vector<Box> remaining(Boxes boxes) {
  std::vector<Box> list;
  while (const auto box = boxes.next()) list.push_back(*box);
  return list;
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

Boxes HeifItems::infos() const {
  const Box list = table(fourCharacters("iinf"));
  ByteCursor cursor = contentOf(parse_, list, kFullBoxBytes);
  const std::uint64_t countBytes = fullBoxHeader(cursor).version == 0 ? 2 : 4;
  return Boxes(parse_, list, kFullBoxBytes + countBytes);
}

std::vector<HeifItem> HeifItems::items() const {
  std::vector<HeifItem> items;
  Boxes boxes = infos();
  while (const auto box = boxes.next()) {
    if (const auto item = itemOf(parse_, *box)) items.push_back(*item);
  }
  return items;
}

std::vector<HeifItem> HeifItems::itemsOf(FourCharacters type, FourCharacters other) const {
  constexpr std::size_t kMostItems = 32;
  Boxes boxes = infos();
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
  std::vector<std::uint32_t> items;
  ReferenceTable references(parse_, table(fourCharacters("iref")), kind);
  while (const auto reference = references.next()) {
    if (reference->from != from) continue;
    const auto more = references.targets(*reference);
    items.insert(items.end(), more.begin(), more.end());
  }
  return items;
}

std::vector<std::uint32_t> HeifItems::referringTo(FourCharacters kind, std::uint32_t to) const {
  std::vector<std::uint32_t> items;
  ReferenceTable references(parse_, table(fourCharacters("iref")), kind);
  while (const auto reference = references.next()) {
    const auto targets = references.targets(*reference);
    if (std::ranges::find(targets, to) != targets.end()) items.push_back(reference->from);
  }
  return items;
}

std::vector<Box> HeifItems::propertiesOf(std::uint32_t item) const {
  constexpr std::size_t kMostProperties = 64;
  std::vector<Box> properties;
  const auto& [listed, associations] = this->properties();
  for (const Box& table : associations) {
    for (const std::uint16_t index : associationsOf(contentOf(parse_, table), item)) {
      if (index != 0 && index <= listed.size() && properties.size() < kMostProperties)
        properties.push_back(listed[index - 1U]);
    }
  }
  return properties;
}

const HeifItems::Properties& HeifItems::properties() const {
  if (properties_) return *properties_;
  properties_.emplace();
  for (const Box& box : remaining(Boxes(parse_, table(fourCharacters("iprp"))))) {
    if (box.type == fourCharacters("ipma")) properties_->associations.push_back(box);
    if (box.type != fourCharacters("ipco")) continue;
    const auto children = remaining(Boxes(parse_, box));
    properties_->listed.insert(properties_->listed.end(), children.begin(), children.end());
  }
  return *properties_;
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
