// SPDX-License-Identifier: MIT
#include "imaging/sample_entry.h"

#include <bit>
#include <optional>

#include "platform/images/iso_boxes.h"

namespace brivo::imaging {

namespace {

using images::Box;
using images::Boxes;
using images::childOf;
using images::contentOf;
using images::fourCharacters;
using images::Parse;

/// Many short reads, for a movie box that may lie anywhere.
constexpr images::FetchLimits kForMovieBoxes{4096, 256, 1'048'576};

constexpr std::uint64_t kBeforeEntries = images::kFullBoxBytes + sizeof(std::uint32_t);
/// Of the fields of a visual sample entry.
constexpr std::uint64_t kBeforeSize = 24;
constexpr std::uint64_t kBeforeBoxesOfEntry = 78;

Box movieBox(Parse& parse) {
  Boxes boxes(parse);
  while (const auto box = boxes.next()) {
    if (box->type == fourCharacters("moov")) return *box;
  }
  return {};
}

/// ISO/IEC 14496-12 section 8.3.2; 0, which no track has, when there is no header.
std::uint32_t idOf(Parse& parse, const Box& track) {
  auto content = contentOf(parse, childOf(parse, track, fourCharacters("tkhd")));
  const bool wideTimes = images::fullBoxHeader(content).version == 1;
  content.skip(wideTimes ? 2 * sizeof(std::uint64_t) : 2 * sizeof(std::uint32_t));
  return content.u32();
}

Box firstEntry(Parse& parse, const Box& track) {
  Box box = track;
  for (const char* type : {"mdia", "minf", "stbl", "stsd"}) box = childOf(parse, box, fourCharacters(type));
  return Boxes(parse, box, kBeforeEntries).next().value_or(Box());
}

/// A fraction whose numerator may have a sign; 0 when it is none.
double fraction(ByteCursor& cursor) {
  const auto numerator = std::bit_cast<std::int32_t>(cursor.u32());
  const std::uint32_t denominator = cursor.u32();
  return denominator == 0 ? 0 : static_cast<double>(numerator) / denominator;
}

/// Section 12.1.4; none when it does not lie within the picture.
std::optional<CleanAperture> cleanAperture(Parse& parse, const Box& entry,
                                           const VideoFormatDescription& format) {
  const Box box = childOf(parse, entry, fourCharacters("clap"), kBeforeBoxesOfEntry);
  if (box.length == 0) return std::nullopt;
  auto content = contentOf(parse, box);
  const CleanAperture clean{fraction(content), fraction(content), fraction(content), fraction(content)};
  const auto isInside = [](double length, double offset, double whole) {
    const double start = (whole - length) / 2 + offset;
    return length >= 1 && start >= 0 && start + length <= whole;
  };
  const bool valid = content.ok() && isInside(clean.width, clean.horizontalOffset, format.width) &&
                     isInside(clean.height, clean.verticalOffset, format.height);
  return valid ? std::optional(clean) : std::nullopt;
}

void readPixelShape(Parse& parse, const Box& entry, VideoFormatDescription& format) {
  const Box box = childOf(parse, entry, fourCharacters("pasp"), kBeforeBoxesOfEntry);
  if (box.length == 0) return;
  auto content = contentOf(parse, box);
  const std::uint32_t horizontal = content.u32();
  const std::uint32_t vertical = content.u32();
  if (horizontal == 0 || vertical == 0) return;
  format.horizontalSpacing = horizontal;
  format.verticalSpacing = vertical;
}

std::optional<SampleEntry> readEntry(Parse& parse, const Box& box) {
  auto content = contentOf(parse, box, kBeforeBoxesOfEntry);
  content.skip(kBeforeSize);
  SampleEntry entry;
  entry.encrypted = box.type == fourCharacters("encv");
  entry.format.width = content.u16();
  entry.format.height = content.u16();
  if (!content.ok()) return std::nullopt;
  readPixelShape(parse, box, entry.format);
  entry.format.cleanAperture = cleanAperture(parse, box, entry.format);
  return entry;
}

}  // namespace

SampleEntries firstSampleEntries(const images::ByteSource& source) {
  Parse parse(source, images::Scope::basics);
  parse.ranges.allow(kForMovieBoxes);
  SampleEntries entries;
  Boxes boxes(parse, movieBox(parse));
  while (const auto track = boxes.next()) {
    if (track->type != fourCharacters("trak")) continue;
    if (const auto entry = readEntry(parse, firstEntry(parse, *track)))
      entries.try_emplace(idOf(parse, *track), *entry);
  }
  return entries;
}

}  // namespace brivo::imaging
