// SPDX-License-Identifier: MIT
#include "camera_picture.h"

#include "support/image_bytes.h"

namespace brivo::bench {

namespace {

constexpr std::size_t kMainDirectory = 0, kExifDirectory = 1, kThumbnailDirectory = 2;

void addResolution(test::TiffBytes& tiff) {
  tiff.rationals(0x011A, {{72, 1}});
  tiff.rationals(0x011B, {{72, 1}});
  tiff.shorts(0x0128, {2});
}

void addMain(test::TiffBytes& tiff) {
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  tiff.ascii(0x0110, "Maker Model 1");
  tiff.shorts(0x0112, {6});
  addResolution(tiff);
  tiff.ascii(0x0131, "Firmware 1.0");
  tiff.ascii(0x0132, "2021:06:01 10:00:00");
  tiff.shorts(0x0213, {2});
  tiff.directory(0x8769, kExifDirectory);
}

void addExif(test::TiffBytes& tiff) {
  constexpr std::size_t kMakerNote = 8192;
  tiff.beginDirectory();
  tiff.rationals(0x829A, {{1, 250}});
  tiff.rationals(0x829D, {{56, 10}});
  tiff.shorts(0x8822, {2});
  tiff.shorts(0x8827, {400});
  tiff.undefined(0x9000, "0230");
  tiff.ascii(0x9003, "2021:06:01 10:00:00");
  tiff.ascii(0x9004, "2021:06:01 10:00:00");
  tiff.undefined(0x9101, std::string("\1\2\3\0", 4));
  tiff.shorts(0x9207, {5});
  tiff.shorts(0x9209, {16});
  tiff.rationals(0x920A, {{35, 1}});
  tiff.undefined(0x927C, std::string(kMakerNote, '.'));
  tiff.undefined(0x9286, "ASCII" + std::string(3, '\0') + std::string(256, ' '));
  tiff.undefined(0xA000, "0100");
  tiff.shorts(0xA001, {1});
  tiff.longs(0xA002, {6000});
  tiff.longs(0xA003, {4000});
  tiff.shorts(0xA402, {0});
  tiff.shorts(0xA403, {0});
}

void addThumbnail(test::TiffBytes& tiff, std::string thumbnail) {
  tiff.beginDirectory();
  tiff.shorts(0x0103, {6});
  addResolution(tiff);
  tiff.placed(0x0201, 0x0202, std::move(thumbnail));
}

}  // namespace

std::string withCameraExif(const std::string& jpeg, std::string thumbnail) {
  constexpr std::size_t kStartOfImage = 2;
  test::TiffBytes tiff;
  addMain(tiff);
  addExif(tiff);
  addThumbnail(tiff, std::move(thumbnail));
  tiff.link(kMainDirectory, kThumbnailDirectory);
  return jpeg.substr(0, kStartOfImage) + test::exifSegment(tiff.build()) + jpeg.substr(kStartOfImage);
}

}  // namespace brivo::bench
