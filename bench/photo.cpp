// SPDX-License-Identifier: MIT
#include "photo.h"

#include <random>
#include <vector>

#include "jpeg_writer.h"

namespace brivo::bench {

namespace {

constexpr int kQuality = 92;
constexpr int kMostNoise = 20;

/// Goes from one value to the other.
JSAMPLE between(int from, int to, unsigned part, unsigned whole) {
  const auto share = static_cast<int>(part * 256 / whole);
  return static_cast<JSAMPLE>(from + (to - from) * share / 256);
}

/// From -kMostNoise to kMostNoise, near 0 most often.
int noise(std::minstd_rand& random) {
  const auto bits = random();
  const int sum = static_cast<int>(bits >> 8 & 0xFF) + static_cast<int>(bits >> 16 & 0xFF);
  return (sum - 255) * kMostNoise / 255;
}

}  // namespace

std::string makePhoto(unsigned width, unsigned height) {
  JpegWriter writer(width, height, kQuality);
  std::minstd_rand random;
  std::vector<JSAMPLE> row(JpegWriter::kSamplesPerPixel * width);
  for (unsigned y = 0; y < height; ++y) {
    for (unsigned x = 0; x < width; ++x) {
      JSAMPLE* pixel = &row[JpegWriter::kSamplesPerPixel * x];
      pixel[0] = static_cast<JSAMPLE>(between(40, 210, x, width) + noise(random));
      pixel[1] = between(60, 196, y, height);
      pixel[2] = between(200, 64, x, width);
    }
    writer.write(row);
  }
  return writer.finish();
}

}  // namespace brivo::bench
