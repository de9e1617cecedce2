// SPDX-License-Identifier: MIT
#include "iso_bytes.h"

#include "support/image_bytes.h"

namespace brivo::test {

namespace {

/// What lies between the two extents of an item that is apart.
constexpr std::string_view kGap = "gap!";

}  // namespace

std::string big(std::uint64_t value, std::size_t width) { return integer(value, width, std::endian::big); }

std::string box(std::string_view type, std::string_view content) {
  return big(content.size() + 8, 4) + std::string(type) + std::string(content);
}

std::string fullBox(std::string_view type, unsigned version, unsigned flags, std::string_view content) {
  return box(type, big(version, 1) + big(flags, 3) + std::string(content));
}

std::string uuidBox(std::uint64_t high, std::uint64_t low, std::string_view content) {
  return box("uuid", big(high, 8) + big(low, 8) + std::string(content));
}

std::string fileType(std::string_view brand, std::string_view others) {
  return box("ftyp", std::string(brand) + big(0, 4) + std::string(others));
}

std::string pictureTrack(unsigned width, unsigned height, std::uint64_t sampleOffset,
                         std::uint64_t sampleLength, bool wide) {
  const std::string entry =
      box("hvc1", std::string(24, '\0') + big(width, 2) + big(height, 2) + std::string(50, '\0'));
  const std::string chunks = wide ? fullBox("co64", 0, 0, big(1, 4) + big(sampleOffset, 8))
                                  : fullBox("stco", 0, 0, big(1, 4) + big(sampleOffset, 4));
  // Both ways of stating lengths: one for all samples, or one for each.
  const std::string lengths = wide ? fullBox("stsz", 0, 0, big(sampleLength, 4) + big(1, 4))
                                   : fullBox("stsz", 0, 0, big(0, 4) + big(1, 4) + big(sampleLength, 4));
  const std::string samples = box("stbl", fullBox("stsd", 0, 0, big(1, 4) + entry) + lengths + chunks);
  return box("trak", fullBox("tkhd", 0, 7, std::string(80, '\0')) + box("mdia", box("minf", samples)));
}

std::string extents(unsigned width, unsigned height) {
  return fullBox("ispe", 0, 0, big(width, 4) + big(height, 4));
}
std::string turn(unsigned quarters) { return box("irot", big(quarters, 1)); }
std::string mirror(unsigned axis) { return box("imir", big(axis, 1)); }
std::string channels(unsigned depth) {
  return fullBox("pixi", 0, 0, big(3, 1) + big(depth, 1) + big(depth, 1) + big(depth, 1));
}

std::string exifItem(std::string_view tiff, std::string_view before) {
  return big(before.size(), 4) + std::string(before) + std::string(tiff);
}

void HeifBytes::item(std::uint32_t id, std::string_view type, std::string content, Where where) {
  items_.push_back({id, std::string(type), std::move(content), where});
}

void HeifBytes::properties(std::uint32_t item, std::initializer_list<std::string> boxes) {
  Association association{item, {}};
  for (const std::string& property : boxes) {
    list_ += property;
    association.indices.push_back(++listed_);
  }
  associations_.push_back(std::move(association));
}

void HeifBytes::reference(std::string_view kind, std::uint32_t from,
                          std::initializer_list<std::uint32_t> to) {
  std::string content = identifier(from) + big(to.size(), 2);
  for (const std::uint32_t id : to) content += identifier(id);
  references_ += box(kind, content);
}

std::string HeifBytes::infos() const {
  std::string entries;
  for (const Item& item : items_)
    entries += fullBox("infe", 2 + longVersion(), 0, identifier(item.id) + big(0, 2) + item.type + '\0');
  return fullBox("iinf", longVersion(), 0, big(items_.size(), form_.areIdentifiersLong ? 4 : 2) + entries);
}

std::string HeifBytes::locations(std::uint64_t start) const {
  const bool areIdentifiersLong = form_.locations == 2;
  std::string entries;
  std::uint64_t inItemData = 0;
  for (const Item& item : items_) {
    const bool isInFile = item.where != Where::itemData;
    std::uint64_t& place = isInFile ? start : inItemData;
    const std::uint64_t base = isInFile ? form_.base : 0;
    entries += big(item.id, areIdentifiersLong ? 4 : 2);
    if (form_.locations != 0) entries += big(isInFile ? 0 : 1, 2);
    entries += big(0, 2) + big(base, 8);
    const bool isSplit = item.where == Where::twoExtents || item.where == Where::apart;
    const std::size_t first = isSplit ? item.content.size() / 2 : item.content.size();
    entries += big(isSplit ? 2 : 1, 2) + big(place - base, 4) + big(first, 4);
    place += first;
    if (!isSplit) continue;
    if (item.where == Where::apart) place += kGap.size();
    entries += big(place - base, 4) + big(item.content.size() - first, 4);
    place += item.content.size() - first;
  }
  return fullBox("iloc", form_.locations, 0,
                 big(0x4480, 2) + big(items_.size(), areIdentifiersLong ? 4 : 2) + entries);
}

std::string HeifBytes::associations() const {
  std::string entries;
  for (const Association& association : associations_) {
    entries += identifier(association.item) + big(association.indices.size(), 1);
    for (const std::size_t index : association.indices)
      entries += form_.areAssociationsLong ? big(index | 0x8000, 2) : big(index | 0x80, 1);
  }
  return fullBox("ipma", longVersion(), form_.areAssociationsLong ? 1 : 0,
                 big(associations_.size(), 4) + entries);
}

std::string HeifBytes::meta(std::uint64_t start) const {
  std::string data;
  for (const Item& item : items_) {
    if (item.where == Where::itemData) data += item.content;
  }
  return fullBox("meta", 0, 0,
                 fullBox("hdlr", 0, 0, big(0, 4) + "pict" + std::string(13, '\0')) +
                     fullBox("pitm", longVersion(), 0, identifier(1)) + locations(start) + infos() +
                     box("iprp", box("ipco", list_) + associations()) + box("idat", data) +
                     fullBox("iref", longVersion(), 0, references_));
}

std::string HeifBytes::build(std::string_view brand) const {
  const std::string type = fileType(brand, "mif1");
  std::string data;
  for (const Item& item : items_) {
    if (item.where == Where::itemData) continue;
    std::string content = item.content;
    if (item.where == Where::apart) content.insert(content.size() / 2, kGap);
    data += content;
  }
  // Where the bytes lie does not change how long the tables are.
  const std::size_t before = type.size() + 8 + (form_.isMetaLast ? 0 : meta(0).size());
  const std::string tables = meta(before);
  return form_.isMetaLast ? type + box("mdat", data) + tables : type + tables + box("mdat", data);
}

}  // namespace brivo::test
