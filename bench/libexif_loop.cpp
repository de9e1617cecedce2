// SPDX-License-Identifier: MIT
#include "libexif_loop.h"

#include <libexif/exif-data.h>

#include <filesystem>
#include <memory>
#include <stdexcept>

namespace brivo::bench {

namespace {

bool hasFacts(const std::string& path) {
  const std::unique_ptr<ExifData, void (*)(ExifData*)> data(::exif_data_new_from_file(path.c_str()),
                                                            &::exif_data_unref);
  if (!data || data->size == 0) return false;
  const auto number = [&](ExifIfd directory, ExifTag tag) -> unsigned {
    const ExifEntry* entry = ::exif_content_get_entry(data->ifd[directory], tag);
    if (!entry) return 0;
    const ExifByteOrder order = ::exif_data_get_byte_order(data.get());
    return entry->format == EXIF_FORMAT_SHORT ? ::exif_get_short(entry->data, order)
                                              : ::exif_get_long(entry->data, order);
  };
  return number(EXIF_IFD_EXIF, EXIF_TAG_PIXEL_X_DIMENSION) != 0 &&
         number(EXIF_IFD_EXIF, EXIF_TAG_PIXEL_Y_DIMENSION) != 0 &&
         number(EXIF_IFD_0, EXIF_TAG_ORIENTATION) != 0;
}

}  // namespace

void readWithLibexif(const std::string& card) {
  for (const auto& entry : std::filesystem::recursive_directory_iterator(card + "/DCIM")) {
    if (entry.is_regular_file() && !hasFacts(entry.path()))
      throw std::runtime_error("libexif does not find everything in " + entry.path().string());
  }
}

}  // namespace brivo::bench
