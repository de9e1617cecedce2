// SPDX-License-Identifier: MIT
#include "platform/images/jpeg.h"

#include <algorithm>
#include <string_view>

#include "platform/base/byte_cursor.h"
#include "platform/images/exif.h"

namespace brivo::images {

namespace {

constexpr std::uint16_t kStartOfImage = 0xFFD8;
constexpr std::uint8_t kApp0 = 0xE0;
constexpr std::uint8_t kApp1 = 0xE1;
constexpr std::uint8_t kApp2 = 0xE2;
constexpr std::size_t kFillBytes = 16;

using namespace std::string_view_literals;
constexpr std::string_view kExifSignature = "Exif\0"sv;  // a NUL or 0xFF follows
constexpr std::string_view kMultiPictureSignature = "MPF\0"sv;
constexpr std::string_view kFlashPixSignature = "FPXR\0"sv;
constexpr std::string_view kJfifExtensionSignature = "JFXX\0\x10"sv;

constexpr std::uint16_t kMultiPictureEntries = 0xB002;
constexpr std::size_t kMultiPictureEntryBytes = 16;

/// A marker segment: its parameters lie in `length` bytes from `start` on.
struct Segment {
  std::uint8_t marker = 0;
  std::uint64_t start = 0;
  std::uint64_t length = 0;
};

/// T.81 B.1.1.3: markers that stand alone, and the zero that makes an 0xFF plain data.
bool isWithoutParameters(std::uint8_t marker) { return marker <= 0x01 || (marker >= 0xD0 && marker <= 0xD8); }
/// The end of the image, or the start of a scan, behind which there are only entropy-coded data.
bool endsHeaders(std::uint8_t marker) { return marker == 0xD9 || marker == 0xDA; }
/// SOF0 to SOF15 without DHT, JPG and DAC.
bool isFrameHeader(std::uint8_t marker) {
  return marker >= 0xC0 && marker <= 0xCF && marker != 0xC4 && marker != 0xC8 && marker != 0xCC;
}

/// The marker segments of the JPEG in a range of the file, up to its first scan.
class Segments {
 public:
  Segments(Parse& parse, std::uint64_t start, std::uint64_t length)
      : parse_(parse), next_(start + 2), end_(start + std::min(length, parse.ranges.size() - start)) {}

  /// The next segment; none at the end of the headers, or where they are broken.
  std::optional<Segment> next() {
    while (parse_.spendDirectory() && next_ < end_) {
      const auto head = parse_.ranges.upTo(next_, kFillBytes);
      ByteCursor cursor(head, std::endian::big);
      if (cursor.u8() != 0xFF) {  // decoders skip what is no marker, and so do we
        next_ += static_cast<std::size_t>(std::ranges::find(head, std::byte{0xFF}) - head.begin());
        if (head.empty()) return std::nullopt;
        continue;
      }
      std::uint8_t marker = cursor.u8();
      while (marker == 0xFF && cursor.remaining() > 2) marker = cursor.u8();  // fill bytes
      next_ += cursor.position();
      if (marker == 0xFF) continue;
      if (isWithoutParameters(marker)) continue;
      if (endsHeaders(marker)) return std::nullopt;
      const std::uint16_t length = cursor.u16();
      if (!cursor.ok() || length < 2) return std::nullopt;
      const Segment segment{marker, next_ + 2, length - 2U};
      next_ += length;
      return segment;
    }
    return std::nullopt;
  }

 private:
  Parse& parse_;
  std::uint64_t next_;
  const std::uint64_t end_;
};

bool startsWith(Parse& parse, const Segment& segment, std::string_view signature) {
  if (segment.length < signature.size()) return false;
  const auto bytes = parse.ranges.bytes(segment.start, signature.size());
  return std::string_view(reinterpret_cast<const char*>(bytes.data()), bytes.size()) == signature;
}

struct Frame {
  PixelSize size;
  std::uint16_t depth = 0;
  std::uint8_t components = 0;
};

/// T.81 B.2.2: sample precision, lines, samples per line, components.
Frame frameOf(Parse& parse, const Segment& segment) {
  ByteCursor cursor(parse.ranges.bytes(segment.start, 6), std::endian::big);
  Frame frame;
  frame.depth = cursor.u8();
  frame.size.height = cursor.u16();
  frame.size.width = cursor.u16();
  frame.components = cursor.u8();
  return cursor.ok() ? frame : Frame();
}

/// SOF0 to SOF2 with the components of grey or of Y′CbCr; not a frame that could not be read.
bool isForViewers(const Segment& segment, const Frame& frame) {
  return segment.marker <= 0xC2 && frame.depth == 8 && (frame.components == 1 || frame.components == 3);
}

bool isJpeg(Parse& parse, std::uint64_t offset, std::uint64_t length) {
  const std::uint64_t size = parse.ranges.size();
  if (offset > size || length > size - offset) return false;
  ByteCursor cursor(parse.ranges.bytes(offset, 2), std::endian::big);
  return cursor.u16() == kStartOfImage;
}

void readExifSegment(Parse& parse, const Segment& segment) {
  constexpr std::size_t kSignatureBytes = 6;
  if (segment.length <= kSignatureBytes) return;
  auto block = TiffBlock::at(parse, segment.start + kSignatureBytes, segment.length - kSignatureBytes);
  if (block) readExif(*block);
}

/// CIPA DC-007 5.2.3: offsets count from the block's start, and the file's own image has the offset 0.
void readMultiPictureSegment(Parse& parse, const Segment& segment) {
  const std::uint64_t start = segment.start + kMultiPictureSignature.size();
  auto block = TiffBlock::at(parse, start, segment.length - kMultiPictureSignature.size());
  if (!block) return;
  const TiffDirectory directory = block->directory(block->firstDirectory());
  const TiffEntry* entry = directory.find(kMultiPictureEntries);
  if (!entry) return;
  ByteCursor cursor(block->bytes(*entry), block->order());
  while (cursor.remaining() >= kMultiPictureEntryBytes) {
    cursor.skip(4);  // attributes
    const std::uint64_t length = cursor.u32();
    const std::uint64_t offset = cursor.u32();
    cursor.skip(4);  // dependent images
    if (offset != 0) addEmbeddedJpeg(parse, start + offset, length);
  }
}

/// EXIF 2.32 annex B: a FlashPix stream may end with a JPEG. One that goes on in another segment is not in
/// one run, and of no use.
void readFlashPixSegment(Parse& parse, const Segment& segment) {
  const auto bytes = parse.ranges.bytes(segment.start, static_cast<std::size_t>(segment.length));
  const std::string_view text(reinterpret_cast<const char*>(bytes.data()), bytes.size());
  const std::size_t image = text.find("\xFF\xD8\xFF");
  if (image != text.npos && text.ends_with("\xFF\xD9"))
    addEmbeddedJpeg(parse, segment.start + image, segment.length - image);
}

void readPreviewSegment(Parse& parse, const Segment& segment) {
  if (segment.marker == kApp2 && startsWith(parse, segment, kMultiPictureSignature)) {
    readMultiPictureSegment(parse, segment);
  } else if (segment.marker == kApp2 && startsWith(parse, segment, kFlashPixSignature)) {
    readFlashPixSegment(parse, segment);
  } else if (segment.marker == kApp0 && startsWith(parse, segment, kJfifExtensionSignature)) {
    const std::size_t before = kJfifExtensionSignature.size();
    addEmbeddedJpeg(parse, segment.start + before, segment.length - before);
  }
}

}  // namespace

bool readJpegFile(Parse& parse) {
  if (!isJpeg(parse, 0, parse.ranges.size())) return false;
  parse.ranges.allow(kForHeadersInARow);
  readJpeg(parse, 0, parse.ranges.size());
  return true;
}

void readJpeg(Parse& parse, std::uint64_t start, std::uint64_t length) {
  Segments segments(parse, start, length);
  bool hasExif = false;
  Frame frame;
  // Nothing else is read once both are known, unless previews are wanted: what is not read costs nothing.
  while (parse.scope == Scope::previews || !hasExif || !frame.size) {
    const auto segment = segments.next();
    if (!segment) break;
    if (isFrameHeader(segment->marker) && !frame.size) frame = frameOf(parse, *segment);
    if (segment->marker == kApp1 && !hasExif && startsWith(parse, *segment, kExifSignature)) {
      readExifSegment(parse, *segment);
      hasExif = !parse.found.entries.empty();
    }
    if (parse.scope == Scope::previews) readPreviewSegment(parse, *segment);
  }
  setOnce(parse.found.size, frame.size);
  setOnce(parse.found.depth, frame.depth);
}

EmbeddedImage jpegAt(Parse& parse, std::uint64_t offset, std::uint64_t length) {
  if (length == 0 || !isJpeg(parse, offset, length)) return {};
  EmbeddedImage image{offset, length, {}, 0};
  Segments segments(parse, offset, length);
  while (const auto segment = segments.next()) {
    if (!isFrameHeader(segment->marker)) continue;
    const Frame frame = frameOf(parse, *segment);
    if (frame.size && !isForViewers(*segment, frame)) return {};
    image.size = frame.size;
    break;
  }
  return image;
}

void addEmbeddedJpeg(Parse& parse, std::uint64_t offset, std::uint64_t length, PixelSize stated,
                     std::uint16_t orientation) {
  auto& embedded = parse.found.embedded;
  constexpr std::size_t kMostImages = 64;
  if (embedded.size() == kMostImages ||
      std::ranges::find(embedded, offset, &EmbeddedImage::offset) != embedded.end())
    return;
  EmbeddedImage image = jpegAt(parse, offset, length);
  if (!image) return;
  setOnce(image.size, stated);
  image.orientation = orientation;
  embedded.push_back(image);
}

}  // namespace brivo::images
