// SPDX-License-Identifier: MIT
#include <array>
#include <string>
#include <string_view>

#include "imaging/codec.h"
#include "imaging/decode_request.h"
#include "imaging/whole_file.h"
#include "platform/base/byte_cursor.h"

namespace brivo::imaging {

namespace {

using namespace std::string_view_literals;

struct Kind {
  std::size_t offset;
  std::string_view bytes;
  AVCodecID codec;
};

/// What files begin with.
constexpr std::array kKinds{
    Kind{0, "\x89PNG\r\n\x1A\n"sv, AV_CODEC_ID_PNG},
    Kind{0, "II*\0"sv, AV_CODEC_ID_TIFF},
    Kind{0, "MM\0*"sv, AV_CODEC_ID_TIFF},
    Kind{8, "WEBP"sv, AV_CODEC_ID_WEBP},
    Kind{0, "GIF8"sv, AV_CODEC_ID_GIF},
    Kind{0, "BM"sv, AV_CODEC_ID_BMP},
    Kind{4, "jP  \r\n\x87\n"sv, AV_CODEC_ID_JPEG2000},
    Kind{0, "\xFF\x4F\xFF\x51"sv, AV_CODEC_ID_JPEG2000},
};

AVCodecID codecOf(const images::ByteSource& source) {
  std::array<char, 16> start{};
  const std::size_t count = source.read(std::as_writable_bytes(std::span(start)), 0);
  const std::string_view text(start.data(), count);
  for (const Kind& kind : kKinds) {
    if (text.size() > kind.offset && text.substr(kind.offset).starts_with(kind.bytes)) return kind.codec;
  }
  return AV_CODEC_ID_NONE;
}

Frame decodeFile(AVCodecID id, std::span<const std::byte> file) {
  const Packet packet = packetOf(file);
  auto codec = Codec::open(id);
  return packet && codec ? codec->decode(*packet) : nullptr;
}

/// Pages beyond these are not looked at.
constexpr std::size_t kMostPages = 16;
constexpr std::size_t kFirstDirectory = 4;  // where the header of TIFF 6.0 says it

/// Where the directories of the pages of a TIFF file begin.
std::vector<std::uint32_t> pagesOf(std::span<const std::byte> file) {
  ByteCursor cursor(file, file[0] == std::byte{'M'} ? std::endian::big : std::endian::little);
  constexpr std::size_t kEntryBytes = 12;
  std::vector<std::uint32_t> pages;
  cursor.seek(kFirstDirectory);
  for (std::uint32_t page = cursor.u32(); page != 0 && pages.size() < kMostPages; page = cursor.u32()) {
    cursor.seek(page);
    cursor.skip(cursor.u16() * kEntryBytes);
    if (!cursor.ok()) break;
    pages.push_back(page);
  }
  return pages;
}

/// The decoder takes the page that the header names as the first.
Frame decodePage(std::vector<std::byte>& file, std::uint32_t page) {
  const bool big = file[0] == std::byte{'M'};
  for (int i = 0; i < 4; ++i) {
    file[kFirstDirectory + static_cast<std::size_t>(i)] =
        static_cast<std::byte>(page >> 8 * (big ? 3 - i : i) & 0xFF);
  }
  return decodeFile(AV_CODEC_ID_TIFF, file);
}

bool isTaller(const AVFrame& frame, std::uint32_t pixels) {
  return static_cast<std::uint32_t>(frame.height) > pixels;
}

/// The first page of a TIFF file that is tall enough, or else the first.
Frame chosenPage(std::vector<std::byte>& file, const ThumbnailRequest& request) {
  Frame first = decodeFile(AV_CODEC_ID_TIFF, file);
  if (!request.imageTallerThan || (first && isTaller(*first, *request.imageTallerThan))) return first;
  const std::vector<std::uint32_t> pages = pagesOf(file);
  for (std::size_t i = 1; i < pages.size(); ++i) {
    Frame next = decodePage(file, pages[i]);
    if (next && isTaller(*next, *request.imageTallerThan)) return next;
  }
  return first;
}

}  // namespace

std::optional<Picture> decodeWithCodec(const images::ByteSource& source, const ThumbnailRequest& request) {
  if (request.source == ThumbnailSource::embedded) return std::nullopt;
  const AVCodecID id = codecOf(source);
  if (id == AV_CODEC_ID_NONE) return std::nullopt;
  std::vector<std::byte> file = wholeFile(source);
  if (file.empty()) return std::nullopt;
  Picture picture;
  picture.frame = id == AV_CODEC_ID_TIFF ? chosenPage(file, request) : decodeFile(id, file);
  if (!picture.frame) return std::nullopt;
  picture.iccProfile = iccProfileOf(*picture.frame);
  return picture;
}

}  // namespace brivo::imaging
