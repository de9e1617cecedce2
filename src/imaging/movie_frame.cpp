// SPDX-License-Identifier: MIT
// The first picture of a movie.
#include <algorithm>
#include <cmath>
#include <span>
#include <vector>

#include "imaging/codec.h"
#include "imaging/movie_request.h"
#include "imaging/scaling.h"

namespace brivo::imaging {

namespace {

const AVStream* firstVideo(const AVFormatContext& container) {
  for (const AVStream* stream : std::span(container.streams, container.nb_streams)) {
    if (isVideo(*stream)) return stream;
  }
  return nullptr;
}

/// Of `shown`, made small enough for `maximum`.
Extent within(MaximumSize maximum, VideoDimensions shown) {
  double scale = 1;
  if (maximum.width != 0) scale = std::min(scale, maximum.width / shown.width);
  if (maximum.height != 0) scale = std::min(scale, maximum.height / shown.height);
  const auto side = [&](double length) {
    return static_cast<std::uint32_t>(std::clamp(std::round(length * scale), 1.0, kLongestSide + 1.0));
  };
  return {side(shown.width), side(shown.height)};
}

/// How often a picture can be halved on its way out of the codec and still be twice as large as wanted.
int halvings(const VideoFormatDescription& format, Extent wanted) {
  int count = 0;
  while (format.width >> (count + 2) >= wanted.width && format.height >> (count + 2) >= wanted.height &&
         count < 3)
    ++count;
  return format.cleanAperture ? 0 : count;
}

Care careFor(const VideoFormatDescription& format, Extent wanted) {
  constexpr std::uint32_t kUnseen = 3;
  return format.width / kUnseen >= wanted.width ? Care::reduced : Care::exact;
}

/// A field of a picture, or what lies before the first edit, may come before the rest of it.
constexpr std::size_t kMostShownPackets = 4;
/// More than a minute of pictures that build on each other.
constexpr std::size_t kMostPackets = 4096;

/// Packets from one that needs no other up to the first, or the next few, that are shown.
class Beginning {
 public:
  /// False for one that is not shown, or is before the first that needs no other.
  bool take(Packet packet) {
    if (packets_.empty() && (packet->flags & AV_PKT_FLAG_KEY) == 0) return false;
    const bool isShown = (packet->flags & AV_PKT_FLAG_DISCARD) == 0;
    if (isShown) ++shown_;
    packets_.push_back(std::move(packet));
    return isShown;
  }
  std::span<const Packet> packets() const { return packets_; }
  bool isLongEnough() const { return shown_ == kMostShownPackets || packets_.size() == kMostPackets; }

 private:
  std::vector<Packet> packets_;
  std::size_t shown_ = 0;
};

Frame firstPicture(MovieInput& input, Codec& codec) {
  Beginning beginning;
  while (Packet packet = input.next()) {
    if (beginning.take(std::move(packet))) {
      if (Frame frame = codec.decodeFirst(beginning.packets())) return frame;
    }
    if (beginning.isLongEnough()) beginning = Beginning();
  }
  return codec.decodeFirst(beginning.packets());
}

bool cropToCleanAperture(AVFrame& frame, const VideoFormatDescription& format) {
  const bool isStoredSize = static_cast<std::uint32_t>(frame.width) == format.width &&
                            static_cast<std::uint32_t>(frame.height) == format.height;
  if (!format.cleanAperture || !isStoredSize) return true;
  const CleanAperture& clean = *format.cleanAperture;
  const auto before = [](double whole, double length, double offset) {
    return static_cast<std::size_t>(std::lround(std::max(0.0, (whole - length) / 2 + offset)));
  };
  const auto after = [](std::uint32_t whole, std::size_t start, double length) {
    return whole - std::min<std::size_t>(whole, start + static_cast<std::size_t>(std::lround(length)));
  };
  frame.crop_left = before(format.width, clean.width, clean.horizontalOffset);
  frame.crop_top = before(format.height, clean.height, clean.verticalOffset);
  frame.crop_right = after(format.width, frame.crop_left, clean.width);
  frame.crop_bottom = after(format.height, frame.crop_top, clean.height);
  return av_frame_apply_cropping(&frame, AV_FRAME_CROP_UNALIGNED) == 0;
}

/// ITU-R BT.709 is what video of high definition is in unless it says otherwise.
void assumeColours(AVFrame& frame, const VideoFormatDescription& format) {
  constexpr std::uint32_t kHighDefinition = 720;
  if (frame.colorspace == AVCOL_SPC_UNSPECIFIED && std::min(format.width, format.height) >= kHighDefinition)
    frame.colorspace = AVCOL_SPC_BT709;
}

/// Of the first video track, with the size of its pictures if that can be found out.
VideoStorage completeStorage(MovieInput& input, const AVStream& stream) {
  const SampleEntries entries = sampleEntriesOf(input);
  const VideoStorage storage = storageOf(stream, entries);
  if (storage.format.width != 0 && storage.format.height != 0) return storage;
  input.completeStreams();
  return storageOf(stream, entries);
}

Frame decodeFirst(MovieInput& input, const AVStream& stream, const VideoFormatDescription& format,
                  Extent wanted) {
  auto codec = Codec::open(*stream.codecpar, careFor(format, wanted), halvings(format, wanted));
  if (!codec) return nullptr;
  input.readOnly(stream);
  Frame frame = firstPicture(input, *codec);
  return frame && cropToCleanAperture(*frame, format) ? std::move(frame) : nullptr;
}

}  // namespace

std::optional<Picture> firstFrameOf(const images::ByteSource& source, MaximumSize maximum) {
  const auto input = MovieInput::open(source);
  if (!input) return std::nullopt;
  if ((input->container().ctx_flags & AVFMTCTX_NOHEADER) != 0) input->completeStreams();
  const AVStream* stream = firstVideo(input->container());
  if (!stream) return std::nullopt;
  const auto [decodable, format] = completeStorage(*input, *stream);
  if (!decodable || format.width == 0 || format.height == 0) return std::nullopt;
  const Extent wanted = within(maximum, presentationDimensions(format));
  Frame frame = decodeFirst(*input, *stream, format, wanted);
  if (!frame) return std::nullopt;
  assumeColours(*frame, format);
  frame = scaledForJpeg(std::move(frame), wanted);
  return frame ? std::optional(Picture{std::move(frame), {}}) : std::nullopt;
}

}  // namespace brivo::imaging
