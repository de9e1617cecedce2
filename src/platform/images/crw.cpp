// SPDX-License-Identifier: MIT
#include "platform/images/crw.h"

#include <algorithm>
#include <bit>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"
#include "platform/images/jpeg.h"
#include "platform/images/stated_facts.h"

namespace brivo::images {

namespace {

constexpr std::string_view kSignature = "HEAPCCDR";
constexpr std::uint64_t kFileHeader = 14;
constexpr std::uint64_t kTail = 16'384;
constexpr std::uint64_t kPointerBytes = 4;
constexpr std::uint64_t kRecordBytes = 10;
constexpr std::uint64_t kInlineBytes = 8;
constexpr std::uint64_t kLongestText = 64;

/// A type is made of where the value is, its kind, and a number.
constexpr std::uint16_t kPlaceMask = 0xC000;
constexpr std::uint16_t kInHeap = 0x0000;
constexpr std::uint16_t kInRecord = 0x4000;
constexpr std::uint16_t kKindMask = 0x3800;
constexpr std::uint16_t kHeapKind = 0x2800;
constexpr std::uint16_t kOtherHeapKind = 0x3000;

constexpr std::uint16_t kMakeAndModel = 0x080A;
constexpr std::uint16_t kCaptureTime = 0x180E;
constexpr std::uint16_t kImageInfo = 0x1810;
constexpr std::uint16_t kJpegImage = 0x2007;
constexpr std::uint16_t kThumbnail = 0x2008;

/// `length` bytes of the file from `start` on.
struct Extent {
  std::uint64_t start = 0;
  std::uint64_t length = 0;
};

struct Record {
  std::uint16_t type = 0;  ///< without the place
  Extent value;
};

std::optional<std::endian> byteOrderOf(std::span<const std::byte> header) {
  const std::string_view text = lettersOf(header);
  if (!text.ends_with(kSignature) || text.size() != kFileHeader) return std::nullopt;
  if (text.starts_with("II")) return std::endian::little;
  return text.starts_with("MM") ? std::optional(std::endian::big) : std::nullopt;
}

/// Visits all records of a file.
class Ciff {
 public:
  Ciff(Parse& parse, std::endian order, Extent heap) : parse_(parse), order_(order), heaps_{heap} {}

  /// The next heap's records; none when there are no heaps left.
  std::vector<Record> nextRecords() {
    std::vector<Record> records;
    while (records.empty() && next_ < heaps_.size() && parse_.spendDirectory())
      records = recordsOf(heaps_[next_++]);
    for (const Record& record : records) {
      if (isHeap(record)) heaps_.push_back(record.value);
    }
    return records;
  }

 private:
  static bool isHeap(const Record& record) {
    const unsigned kind = record.type & kKindMask;
    return kind == kHeapKind || kind == kOtherHeapKind;
  }

  /// The last four bytes of a heap say where in it its directory begins.
  std::vector<Record> recordsOf(Extent heap) {
    std::vector<Record> records;
    if (heap.length < kPointerBytes) return records;
    ByteCursor pointer(parse_.ranges.bytes(heap.start + heap.length - kPointerBytes, kPointerBytes), order_);
    const std::uint64_t directory = pointer.u32();
    if (!pointer.ok() || directory > heap.length) return records;
    const std::uint64_t first = heap.start + directory + 2;
    ByteCursor head(parse_.ranges.bytes(first - 2, 2), order_);
    const std::uint64_t room = (heap.length - directory) / kRecordBytes;
    const std::size_t count = parse_.spendEntries(std::min<std::uint64_t>(head.u16(), room));
    const auto raw = parse_.ranges.upTo(first, count * kRecordBytes);
    ByteCursor cursor(raw, order_);
    for (std::uint64_t at = first; cursor.remaining() >= kRecordBytes; at += kRecordBytes) {
      if (const auto record = recordAt(cursor, at, heap)) records.push_back(*record);
    }
    return records;
  }

  static std::optional<Record> recordAt(ByteCursor& cursor, std::uint64_t at, Extent heap) {
    const std::uint16_t type = cursor.u16();
    const std::uint64_t length = cursor.u32();
    const std::uint64_t offset = cursor.u32();
    const auto plain = static_cast<std::uint16_t>(type & ~kPlaceMask);
    const unsigned place = type & kPlaceMask;
    if (place == kInRecord) return Record{plain, {at + 2, kInlineBytes}};
    const bool isOutside = offset > heap.length || length > heap.length - offset;
    if (place != kInHeap || isOutside) return std::nullopt;
    return Record{plain, {heap.start + offset, length}};
  }

  Parse& parse_;
  const std::endian order_;
  std::vector<Extent> heaps_;
  std::size_t next_ = 0;
};

/// Width, height, shape of a pixel, degrees clockwise, bits of a component.
void readImageInfo(Parse& parse, ByteCursor cursor) {
  PixelSize size;
  size.width = cursor.u32();
  size.height = cursor.u32();
  cursor.skip(4);
  const auto degrees = std::bit_cast<std::int32_t>(cursor.u32());
  const std::uint32_t depth = cursor.u32();
  if (!cursor.ok()) return;
  setOnce(parse.found.size, size);
  setOnce(parse.found.crop, size);
  setOnce(parse.found.orientation, orientationOfDegrees(degrees));
  if (depth <= 32) setOnce(parse.found.depth, depth);
}

void readMakeAndModel(Parse& parse, std::span<const std::byte> bytes) {
  const std::string_view text = lettersOf(bytes);
  const std::size_t end = text.find('\0');
  if (end == std::string_view::npos) return;
  keepMake(parse, text.substr(0, end));
  keepModel(parse, text.substr(end + 1));
}

void readFact(Parse& parse, const Record& record, std::endian order) {
  const auto bytes = [&] {
    const std::uint64_t length = std::min(record.value.length, kLongestText);
    return parse.ranges.bytes(record.value.start, static_cast<std::size_t>(length));
  };
  if (record.type == kImageInfo) readImageInfo(parse, ByteCursor(bytes(), order));
  if (record.type == kCaptureTime) keepCaptureTime(parse, ByteCursor(bytes(), order).u32());
  if (record.type == kMakeAndModel) readMakeAndModel(parse, bytes());
}

void keepImages(Parse& parse, const std::vector<Record>& images) {
  for (const Record& record : images) {
    const auto [start, length] = record.value;
    if (parse.scope == Scope::previews) {
      addEmbeddedJpeg(parse, start, length);
    } else if (record.type == kThumbnail && !parse.found.thumbnail) {
      parse.found.thumbnail = jpegAt(parse, start, length);
    }
  }
}

}  // namespace

bool readCrw(Parse& parse) {
  const auto header = parse.ranges.upTo(0, kFileHeader);
  const auto order = byteOrderOf(header);
  if (!order) return false;
  parse.ranges.allow(kForDirectories);
  ByteCursor cursor(header.subspan(2), *order);
  const std::uint64_t start = cursor.u32();
  const std::uint64_t end = parse.ranges.size();
  if (start > end) return true;
  // One range for the heap of facts and both directories, which lie at the end of the file.
  (void)parse.ranges.upTo(end - std::min(end, kTail), kTail);
  Ciff ciff(parse, *order, {start, end - start});
  std::vector<Record> images;
  for (auto records = ciff.nextRecords(); !records.empty(); records = ciff.nextRecords()) {
    for (const Record& record : records) {
      readFact(parse, record, *order);
      if (record.type == kJpegImage || record.type == kThumbnail) images.push_back(record);
    }
  }
  keepImages(parse, images);
  return true;
}

}  // namespace brivo::images
