// SPDX-License-Identifier: MIT
#include "content/media/image_metadata.h"

namespace brivo {

using images::ExifGroup;

Dictionary ImageMetadata::dictionary() const {
  Dictionary metadata;
  if (auto identifier = properties.entries.find(ExifGroup::makerNote, "17"))
    metadata.set("{MakerNorel}", Dictionary{{"17", *std::move(identifier)}});
  metadata.set("{Exif}", exifDictionary(properties));
  metadata.set("PixelHeight", height);
  metadata.set("PixelYDimension", height);
  metadata.set("PixelWidth", width);
  metadata.set("PixelXDimension", width);
  if (orientation) metadata.set("Orientation", std::uint32_t{*orientation});
  if (properties.entries.has(ExifGroup::tiff))
    metadata.set("{TIFF}", properties.entries.dictionary(ExifGroup::tiff));
  if (properties.depth != 0) metadata.set("Depth", std::uint32_t{properties.depth});
  return metadata;
}

std::optional<std::string> ImageMetadata::creationDateTime() const {
  auto ofExif = text(ExifGroup::exif, "DateTime");
  if (ofExif && !modificationDateTime()) return ofExif;
  if (auto original = text(ExifGroup::exif, "DateTimeOriginal")) return original;
  if (auto ofTiff = text(ExifGroup::tiff, "DateTime")) return ofTiff;
  return ofExif;
}

std::optional<std::string> ImageMetadata::modificationDateTime() const {
  if (auto digitized = text(ExifGroup::exif, "DateTimeDigitized")) return digitized;
  return text(ExifGroup::tiff, "DateTime");
}

std::optional<std::string> ImageMetadata::text(ExifGroup group, const char* name) const {
  const auto value = properties.entries.find(group, name);
  const auto* found = value ? value->get<std::string>() : nullptr;
  return found ? std::optional(*found) : std::nullopt;
}

}  // namespace brivo
