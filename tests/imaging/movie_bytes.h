// SPDX-License-Identifier: MIT
// Movies as ISO base media and QuickTime files, box by box, for what no muxer writes.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace brivo::test {

/// The matrix of a track header: a, b, u, c, d, v, x, y, w.
using TrackMatrix = std::array<std::int32_t, 9>;
constexpr std::int32_t kOne16 = 1 << 16;
constexpr std::int32_t kOne30 = 1 << 30;
/// With a, b, c and d of a transform; x and y in pixels.
TrackMatrix matrixOf(int a, int b, int c, int d, int x = 0, int y = 0);

/// A track; times are in tenths of a second, and each sample takes one.
struct TrackBytes {
  std::string_view handler = "vide";
  std::string_view format = "jpeg";  ///< of the sample entry
  unsigned width = 64;
  unsigned height = 48;
  TrackMatrix matrix = matrixOf(1, 0, 0, 1);
  std::string entryBoxes = {};                                ///< such as clap and pasp
  std::vector<std::string> samples = {std::string(16, 's')};  ///< each one the whole picture
  std::size_t listings = 1;                                   ///< how often the table has each sample
  bool isFirstAloneWhole = false;                             ///< the others build on the first one
  std::string editBox = {};                                   ///< edts
};

struct MovieBytes {
  std::string_view brand = "qt  ";
  unsigned duration = 20;
  std::vector<TrackBytes> tracks;
  std::string userData = {};  ///< content of the udta box
  std::string metaBox = {};   ///< of the movie box
  bool isIndexLast = true;    ///< the movie box stands behind the samples

  std::string build() const;
  /// What stands before a movie box that is last, where the samples are followed by `padding` more bytes.
  std::string beginning(std::uint64_t padding = 0) const;
  /// A movie box that is last.
  std::string ending() const { return index(beginning().size() - samples().size()); }

 private:
  std::string samples() const;
  /// The movie box in a file whose samples begin at `start`.
  std::string index(std::uint64_t start) const;
};

/// clap (ISO/IEC 14496-12 section 12.1.4) in whole pixels, and pasp.
std::string cleanApertureBox(int width, int height, int x, int y);
std::string pixelShapeBox(unsigned horizontal, unsigned vertical);
/// An edit that begins at `start` of the track, in tenths of a second.
std::string editBox(unsigned duration, unsigned start);
/// A metadata box of QuickTime keys and their texts.
std::string keysBox(const std::vector<std::pair<std::string, std::string>>& items);
/// User data with a JPEG that stands for the movie.
std::string coverBox(const std::string& jpeg);
/// A text of user data, as QuickTime has them: the type begins with the byte 0xA9.
std::string userText(std::string_view type, std::string_view text);

}  // namespace brivo::test
