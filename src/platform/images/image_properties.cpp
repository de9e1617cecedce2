// SPDX-License-Identifier: MIT
#include "platform/images/image_properties.h"

#include <string_view>

namespace brivo::images {

namespace {

void setKnown(Dictionary& dictionary, std::string_view key, std::uint64_t number) {
  if (number != 0) dictionary.set(key, number);
}

void setKnown(Dictionary& dictionary, std::string_view key, Dictionary entries) {
  if (!entries.empty()) dictionary.set(key, std::move(entries));
}

void setImageKeys(Dictionary& dictionary, const ImageProperties& properties) {
  setKnown(dictionary, "PixelWidth", properties.size.width);
  setKnown(dictionary, "PixelHeight", properties.size.height);
  setKnown(dictionary, "Depth", properties.depth);
  setKnown(dictionary, "Orientation", properties.orientation);
}

Dictionary descriptionOf(const EmbeddedImage& image) {
  Dictionary description{{"JPEGOffset", image.offset},
                         {"JPEGLength", image.length},
                         {"Width", image.size.width},
                         {"Height", image.size.height}};
  setKnown(description, "Orientation", image.orientation);
  return description;
}

}  // namespace

Dictionary exifDictionary(const ImageProperties& properties) {
  Dictionary exif = properties.entries.dictionary(ExifGroup::exif);
  setImageKeys(exif, properties);
  if (properties.thumbnail) {
    exif.set("ThumbnailOffset", properties.thumbnail.offset);
    exif.set("ThumbnailSize", properties.thumbnail.length);
    setKnown(exif, "ThumbnailWidth", properties.thumbnail.size.width);
    setKnown(exif, "ThumbnailHeight", properties.thumbnail.size.height);
  }
  return exif;
}

Dictionary flatDictionary(const ImageProperties& properties) {
  Dictionary flat = exifDictionary(properties);
  setKnown(flat, "{TIFF}", properties.entries.dictionary(ExifGroup::tiff));
  setKnown(flat, "{MakerNorel}", properties.entries.dictionary(ExifGroup::makerNote));
  return flat;
}

Dictionary nestedDictionary(const ImageProperties& properties) {
  Dictionary nested;
  setImageKeys(nested, properties);
  if (properties.entries.has(ExifGroup::exif)) nested.set("{Exif}", exifDictionary(properties));
  setKnown(nested, "{TIFF}", properties.entries.dictionary(ExifGroup::tiff));
  setKnown(nested, "{GPS}", properties.entries.dictionary(ExifGroup::gps));
  setKnown(nested, "{MakerNorel}", properties.entries.dictionary(ExifGroup::makerNote));
  return nested;
}

Dictionary containerDictionary(const ImageProperties& properties) {
  Dictionary raw;
  Array thumbnails;
  for (const EmbeddedImage& image : properties.embedded) thumbnails.append(descriptionOf(image));
  if (!thumbnails.empty()) raw.set("Thumbnails", std::move(thumbnails));
  // A file under a raw name may hold any picture; that is shown as large as it is.
  if (const PixelSize shown = properties.crop ? properties.crop : properties.size)
    raw.set("CropSize", Dictionary{{"Width", shown.width}, {"Height", shown.height}});
  setKnown(raw, "Orientation", properties.orientation);
  return Dictionary{{"{raw}", std::move(raw)}};
}

}  // namespace brivo::images
