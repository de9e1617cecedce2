// SPDX-License-Identifier: MIT
extern "C" {
#include <libavutil/pixdesc.h>
}

#include <algorithm>
#include <span>

#include "imaging/codec.h"
#include "imaging/decode_request.h"
#include "imaging/heif_file.h"
#include "imaging/heif_grid.h"
#include "imaging/heif_library.h"

namespace brivo::imaging {

namespace {

using images::fourCharacters;

constexpr images::FourCharacters kGrid = fourCharacters("grid");

AVCodecID codecOf(images::FourCharacters type) {
  switch (type) {
    case fourCharacters("hvc1"):
    case fourCharacters("hev1"):
      return AV_CODEC_ID_HEVC;
    case fourCharacters("av01"):
      return AV_CODEC_ID_AV1;
    default:
      return AV_CODEC_ID_NONE;
  }
}

/// Parameter sets take a few hundred bytes.
constexpr std::size_t kMostConfigurationBytes = 65'536;

std::uint32_t longerSide(Extent size) { return std::max(size.width, size.height); }

/// An item may be coded larger than it is, as codecs want multiples of something.
void cropTo(AVFrame& frame, Extent size) {
  if (size.width == 0 || size.height == 0) return;
  frame.width = static_cast<int>(std::min(static_cast<std::uint32_t>(frame.width), size.width));
  frame.height = static_cast<int>(std::min(static_cast<std::uint32_t>(frame.height), size.height));
}

bool isRgb(const AVFrame& frame) {
  const auto* format = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame.format));
  return format && (format->flags & AV_PIX_FMT_FLAG_RGB) != 0;
}

/// 2 stands for what is not said in each of the lists of codes, and so does what is not in them.
template <class Code>
Code codeOf(std::uint16_t value, Code count) {
  return static_cast<Code>(value < count ? value : 2);
}

/// What the file says, then what the coded bytes say; a file that says nothing has the matrix of ITU-R
/// BT.601.
void setColours(AVFrame& frame, const std::optional<ColourCodes>& said) {
  if (said) {
    frame.color_range = said->isFullRange ? AVCOL_RANGE_JPEG : AVCOL_RANGE_MPEG;
    frame.color_primaries = codeOf(said->primaries, AVCOL_PRI_NB);
    frame.color_trc = codeOf(said->transfer, AVCOL_TRC_NB);
  }
  if (isRgb(frame)) return;  // whether there is a matrix at all is the pixel format's matter
  const AVColorSpace matrix = said ? codeOf(said->matrix, AVCOL_SPC_NB) : AVCOL_SPC_UNSPECIFIED;
  if (matrix != AVCOL_SPC_UNSPECIFIED && matrix != AVCOL_SPC_RGB) frame.colorspace = matrix;
  if (frame.colorspace == AVCOL_SPC_UNSPECIFIED) frame.colorspace = AVCOL_SPC_SMPTE170M;
}

void adoptColours(HeifPicture& whole, const HeifPicture& part) {
  if (!whole.colours) whole.colours = part.colours;
  if (whole.iccProfile.length == 0) whole.iccProfile = part.iccProfile;
}

std::span<const std::byte> bytesIn(const AVPacket& packet) {
  return std::as_bytes(std::span(packet.data, static_cast<std::size_t>(packet.size)));
}

/// Decodes one picture of a file.
class Decoding {
 public:
  Decoding(HeifFile& file, const ThumbnailRequest& request) : file_(file), request_(request) {}

  /// None when the picture is of a kind that is left to others, or broken.
  std::optional<Picture> decode(HeifPicture picture) {
    if (picture.type == fourCharacters("jpeg")) return decodeJpegItem(picture);
    const std::uint32_t wanted = request_.maximumPixelSize;
    if (wanted != 0 && longerSide(picture.size) / 3 >= wanted) care_ = Care::reduced;
    Frame frame = picture.type == kGrid ? decodeGrid(picture) : decodeCoded(picture);
    if (!frame) return std::nullopt;
    setColours(*frame, picture.colours);
    return Picture{std::move(frame), file_.contentOf(picture.iccProfile, kMostProfileBytes)};
  }

 private:
  std::optional<Picture> decodeJpegItem(const HeifPicture& picture) {
    const Packet packet = file_.bytesOf(picture.id);
    if (!packet) return std::nullopt;
    const images::MemorySource source(bytesIn(*packet));
    return decodeJpeg(source, {.maximumPixelSize = request_.maximumPixelSize, .imageTallerThan = {}});
  }

  Frame decodeGrid(HeifPicture& grid) {
    const Packet packet = file_.bytesOf(grid.id);
    const auto layout = packet ? gridLayout(ByteCursor(bytesIn(*packet))) : std::nullopt;
    const auto parts = file_.partsOf(grid.id);
    if (!layout || parts.size() < layout->tiles()) return nullptr;
    GridFrame whole(*layout);
    for (std::uint32_t i = 0; i < layout->tiles(); ++i) {
      const HeifPicture part = file_.picture(parts[i]);
      adoptColours(grid, part);
      const Frame tile = decodeCoded(part);
      if (!tile || !whole.place(*tile, i)) return nullptr;
    }
    return whole.take();
  }

  Frame decodeCoded(const HeifPicture& picture) {
    const Packet packet = useCodecOf(picture) ? file_.bytesOf(picture.id) : nullptr;
    Frame frame = packet ? codec_->decode(*packet) : nullptr;
    if (frame) cropTo(*frame, picture.size);
    return frame;
  }

  /// Tiles mostly share one property, and a codec is dear to open.
  bool useCodecOf(const HeifPicture& picture) {
    const images::Box& configuration = picture.configuration;
    if (codec_ && type_ == picture.type && configuration_ == configuration.start) return true;
    codec_ =
        Codec::open(codecOf(picture.type), file_.contentOf(configuration, kMostConfigurationBytes), care_);
    type_ = picture.type;
    configuration_ = configuration.start;
    return codec_.has_value();
  }

  HeifFile& file_;
  const ThumbnailRequest& request_;
  Care care_ = Care::exact;
  std::optional<Codec> codec_;
  images::FourCharacters type_ = 0;  ///< what the codec was opened for, as is the next
  std::uint64_t configuration_ = 0;  ///< where its property is in the file
};

/// The smallest that is large enough for `wanted` pixels (0: any), else the largest.
std::optional<HeifPicture> bestOf(const std::vector<HeifPicture>& thumbnails, std::uint32_t wanted) {
  std::optional<HeifPicture> best;
  for (const HeifPicture& other : thumbnails) {
    const std::uint32_t side = longerSide(other.size);
    const bool isBestEnough = best && wanted != 0 && longerSide(best->size) >= wanted;
    const bool isEnough = wanted != 0 && side >= wanted;
    const bool isBetter =
        !best || (isBestEnough ? isEnough && side < longerSide(best->size) : side > longerSide(best->size));
    if (isBetter) best = other;
  }
  return best;
}

/// True when `thumbnail` is what `request` wants instead of `primary`.
bool serves(const HeifPicture& thumbnail, const HeifPicture& primary, const ThumbnailRequest& request) {
  if (request.source != ThumbnailSource::full) return true;
  const std::uint32_t all = longerSide(primary.size);
  const std::uint32_t wanted = request.maximumPixelSize == 0 ? all : std::min(request.maximumPixelSize, all);
  return wanted != 0 && longerSide(thumbnail.size) >= wanted;
}

/// What is not decoded here is left to libheif, but for grids: it shows whatever was in memory where tiles
/// are missing.
std::optional<Picture> decodePicture(const images::ByteSource& source, HeifFile& file,
                                     const HeifPicture& picture, const ThumbnailRequest& request,
                                     std::optional<std::uint32_t> thumbnail) {
  auto decoded = Decoding(file, request).decode(picture);
  if (decoded || picture.type == kGrid) return decoded;
  return decodeWithLibheif(source, thumbnail);
}

}  // namespace

std::optional<Picture> decodeHeif(const images::ByteSource& source, const ThumbnailRequest& request) {
  HeifFile file(source);
  const auto primary = file.primary();
  if (!primary) return std::nullopt;
  const auto thumbnail = bestOf(file.thumbnailsOf(primary->id), request.maximumPixelSize);
  if (thumbnail && serves(*thumbnail, *primary, request)) {
    auto picture = decodePicture(source, file, *thumbnail, request, thumbnail->id);
    if (picture) return picture;
  }
  if (request.source == ThumbnailSource::embedded) return std::nullopt;
  return decodePicture(source, file, *primary, request, std::nullopt);
}

}  // namespace brivo::imaging
