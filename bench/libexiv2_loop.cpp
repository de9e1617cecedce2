// SPDX-License-Identifier: MIT
#include "libexiv2_loop.h"

#include <exiv2/exiv2.hpp>
#include <filesystem>
#include <stdexcept>

namespace brivo::bench {

namespace {

bool hasFacts(const std::string& path) {
  const auto image = Exiv2::ImageFactory::open(path);
  image->readMetadata();
  const Exiv2::ExifData& data = image->exifData();
  const auto thumbnail = data.findKey(Exiv2::ExifKey("Exif.Thumbnail.JPEGInterchangeFormatLength"));
  return image->pixelWidth() > 0 && image->pixelHeight() > 0 &&
         data.findKey(Exiv2::ExifKey("Exif.Image.Orientation")) != data.end() && thumbnail != data.end();
}

}  // namespace

void readWithLibexiv2(const std::string& card) {
  for (const auto& entry : std::filesystem::recursive_directory_iterator(card + "/DCIM")) {
    if (entry.is_regular_file() && !hasFacts(entry.path()))
      throw std::runtime_error("libexiv2 does not find everything in " + entry.path().string());
  }
}

}  // namespace brivo::bench
