// SPDX-License-Identifier: MIT
#include "platform/images/maker_previews.h"

#include <algorithm>
#include <array>
#include <optional>
#include <span>

#include "platform/base/byte_cursor.h"
#include "platform/images/jpeg.h"
#include "platform/images/tiff_block.h"

namespace brivo::images {

namespace {

using namespace std::string_view_literals;

/// How a directory names a preview: an element of one entry is its offset, an element of another its length.
/// An entry that is its own offset holds the preview as its value.
struct Place {
  std::uint16_t directory = 0;  ///< tag of the directory that it stands in; 0: the note's own
  std::uint16_t offset = 0;
  std::uint16_t length = 0;
  std::uint8_t offsetIndex = 0;
  std::uint8_t lengthIndex = 0;
};

constexpr std::array kNikon{Place{0x0011, 0x0201, 0x0202}};
constexpr std::array kOlympus{Place{0, 0x0100, 0x0100}, Place{0, 0x0081, 0x0081}, Place{0, 0x0280, 0x0280},
                              Place{0, 0x0088, 0x0089}, Place{0x2020, 0x0101, 0x0102}};
constexpr std::array kPentax{Place{0, 0x0004, 0x0003}};
constexpr std::array kCanon{Place{0, 0x00B6, 0x00B6, 5, 2}};
constexpr std::array kMinolta{Place{0, 0x0081, 0x0081}, Place{0, 0x0088, 0x0089}};
constexpr std::array kCasio{Place{0, 0x0004, 0x0003}, Place{0, 0x2000, 0x2000}};
constexpr std::array kSamsung{Place{0x0035, 0x0201, 0x0202}};

/// What the offsets in a note count from.
enum class Base {
  exif,    ///< the same as those of the EXIF block
  note,    ///< the start of the note
  both,    ///< the start of the note, but those of previews the same as those of the EXIF block
  header,  ///< a TIFF header in the note
};

struct Kind {
  std::string_view signature;  ///< that the note begins with
  std::string_view make;       ///< that the make begins with
  Base base;
  std::size_t directory;  ///< place of the directory, or of the TIFF header, in the note
  std::span<const Place> places;
};

constexpr std::array kKinds{
    Kind{"Nikon\0\2"sv, "", Base::header, 10, kNikon},
    Kind{"", "NIKON", Base::exif, 0, kNikon},
    Kind{"OLYMPUS\0"sv, "", Base::note, 12, kOlympus},
    Kind{"OM SYSTEM\0"sv, "", Base::note, 16, kOlympus},
    Kind{"OLYMP\0"sv, "", Base::exif, 8, kOlympus},
    Kind{"AOC\0"sv, "", Base::exif, 6, kPentax},
    Kind{"PENTAX \0"sv, "", Base::both, 10, kPentax},
    Kind{"QVC\0"sv, "", Base::exif, 6, kCasio},
    Kind{"DCI\0"sv, "", Base::exif, 6, kCasio},
    Kind{"", "CASIO", Base::exif, 0, kCasio},
    Kind{"", "Canon", Base::exif, 0, kCanon},
    Kind{"", "Minolta", Base::exif, 0, kMinolta},
    Kind{"", "KONICA MINOLTA", Base::exif, 0, kMinolta},
    Kind{"", "SAMSUNG", Base::note, 0, kSamsung},
};

const Kind* kindOf(const MakerNote& note, std::span<const std::byte> head) {
  const std::string_view text(reinterpret_cast<const char*>(head.data()), head.size());
  const auto kind = std::ranges::find_if(kKinds, [&](const Kind& candidate) {
    return text.starts_with(candidate.signature) && note.make.starts_with(candidate.make);
  });
  return kind == kKinds.end() ? nullptr : &*kind;
}

/// The order in which the directory at `place` has the fewer entries, for cameras and programs mark it
/// wrongly; none when they do not fit in the note either way.
std::optional<std::endian> orderOf(Parse& parse, const MakerNote& note, std::size_t place) {
  constexpr std::uint64_t kEntryBytes = 12;
  const auto count = parse.ranges.bytes(note.start + place, 2);
  const std::uint16_t little = ByteCursor(count, std::endian::little).u16();
  const std::uint16_t big = ByteCursor(count, std::endian::big).u16();
  if (std::min(little, big) > note.length / kEntryBytes) return std::nullopt;
  return little < big ? std::endian::little : std::endian::big;
}

/// The note's directories, which may name what lies behind the note.
struct Directories {
  TiffBlock block;
  std::uint64_t first;     ///< offset of the first one in the block
  std::uint64_t previews;  ///< what the offsets of previews count from, in the file
};

std::optional<Directories> directoriesOf(Parse& parse, const MakerNote& note, const Kind& kind) {
  const std::uint64_t all = parse.ranges.size();
  if (kind.base == Base::header) {
    auto block = TiffBlock::at(parse, note.start + kind.directory, all);
    if (!block) return std::nullopt;
    const std::uint64_t first = block->firstDirectory();
    return Directories{std::move(*block), first, note.start + kind.directory};
  }
  const auto order = orderOf(parse, note, kind.directory);
  if (!order) return std::nullopt;
  const std::uint64_t base = kind.base == Base::exif ? note.exifStart : note.start;
  return Directories{TiffBlock(parse, base, all, *order), note.start - base + kind.directory,
                     kind.base == Base::note ? note.start : note.exifStart};
}

/// A directory is named by its offset, or is the value of an entry without a type.
TiffDirectory directoryIn(TiffBlock& block, const TiffDirectory& parent, std::uint16_t tag) {
  const TiffEntry* entry = parent.find(tag);
  if (!entry) return {};
  if (entry->type == TiffType::undefined) return block.directory(entry->position);
  const std::uint64_t offset = block.number(*entry).value_or(0);
  return offset != 0 ? block.directory(offset) : TiffDirectory();
}

void addPreview(const Directories& directories, const TiffDirectory& directory, const Place& place) {
  const TiffBlock& block = directories.block;
  const TiffEntry* offset = directory.find(place.offset);
  const TiffEntry* length = directory.find(place.length);
  if (!offset || !length) return;
  if (place.offset == place.length && place.offsetIndex == place.lengthIndex) {
    addEmbeddedJpeg(block.parse(), block.start() + offset->position, offset->length);
    return;
  }
  const auto start = block.number(*offset, place.offsetIndex);
  const auto count = block.number(*length, place.lengthIndex);
  if (start && count && *start <= block.parse().ranges.size())
    addEmbeddedJpeg(block.parse(), directories.previews + *start, *count);
}

}  // namespace

void readMakerPreviews(Parse& parse, const MakerNote& note) {
  addEmbeddedJpeg(parse, note.start, note.length);  // some notes are nothing but a preview
  constexpr std::uint64_t kLongestSignature = 16;
  const auto head =
      parse.ranges.upTo(note.start, static_cast<std::size_t>(std::min(note.length, kLongestSignature)));
  const Kind* kind = kindOf(note, head);
  auto directories = kind ? directoriesOf(parse, note, *kind) : std::nullopt;
  if (!directories) return;
  const TiffDirectory own = directories->block.directory(directories->first);
  for (const Place& place : kind->places) {
    TiffDirectory inner;
    if (place.directory != 0) inner = directoryIn(directories->block, own, place.directory);
    addPreview(*directories, place.directory == 0 ? own : inner, place);
  }
}

void readMovedMakerPreviews(Parse& parse, std::uint64_t start, std::uint64_t length, std::string_view make) {
  constexpr std::uint32_t kMakerNote = 0x4D616B4E;  // "MakN"
  constexpr std::size_t kHeaderBytes = 20;
  ByteCursor cursor(parse.ranges.bytes(start, kHeaderBytes), std::endian::big);
  const auto signature = cursor.take(6);
  const std::string_view text(reinterpret_cast<const char*>(signature.data()), signature.size());
  if (length < kHeaderBytes || text != "Adobe\0"sv || cursor.u32() != kMakerNote) return;
  const std::uint32_t count = cursor.u32();
  cursor.skip(2);  // byte order
  const std::uint32_t once = cursor.u32();
  const std::uint64_t noteStart = start + kHeaderBytes;
  if (count < 6) return;
  readMakerPreviews(
      parse, {noteStart, std::min<std::uint64_t>(count - 6, length - kHeaderBytes), noteStart - once, make});
}

}  // namespace brivo::images
