// SPDX-License-Identifier: MIT
// What a file says of its picture, and what the dataset and the metadata dictionary make of it.
#include <algorithm>
#include <limits>

#include "content/media/brivo_file.h"
#include "content/media/file_source.h"
#include "platform/base/paths.h"
#include "platform/images/image_reader.h"
#include "platform/text/unicode.h"
#include "util/clocks.h"
#include "util/dates.h"
#include "util/log.h"

namespace brivo {

namespace {

constexpr std::uint32_t kFirstOrientationOnItsSide = 5;

std::uint32_t pixels(std::optional<std::uint64_t> number) {
  constexpr std::uint64_t most = std::numeric_limits<std::uint32_t>::max();
  return static_cast<std::uint32_t>(std::min(number.value_or(0), most));
}

/// One side of an image: what the file has already, what EXIF says, or what the image's own header says.
std::optional<std::uint32_t> side(std::uint32_t known, const images::ExifEntries& entries, const char* name,
                                  std::uint32_t ofHeader) {
  if (known != 0) return known;
  if (const auto stated = entries.find(images::ExifGroup::exif, name)) return pixels(stated->asUnsigned());
  return ofHeader != 0 ? std::optional(ofHeader) : std::nullopt;
}

std::optional<std::int64_t> dateOf(const std::optional<std::string>& text) {
  return text ? OVStandardDateFromString(*text) : std::nullopt;
}

}  // namespace

ImageDimensions OVGetDimensionsFromImageProperties(const Dictionary& properties) {
  const auto first = [&](std::initializer_list<const char*> keys) -> std::optional<std::uint64_t> {
    for (const char* key : keys) {
      if (const auto number = properties.unsignedInteger(key)) return number;
    }
    return std::nullopt;
  };
  return {properties.signedInteger("Orientation").value_or(1),
          first({"RawPixelWidth", "PixelWidth", "PixelXDimension"}),
          first({"RawPixelHeight", "PixelHeight", "PixelYDimension"})};
}

void BrivoFile::updateBasicMetadata() {
  if (updatedBasicMetadata_) return;
  const std::string extension = asciiLowerCased(pathExtension(name()));
  if (type() == kTypeMovie) {
    readMovieProperties();
  } else if (type() == kTypeImage && !rawImageSupported()) {
    if (extension == "jpg" || extension == "heic") {
      readCheapProperties(extension);
    } else {
      metadataDict();
      setHasThumbnail(true);
    }
  } else if (type() == kTypeImage) {
    setHasThumbnail(true);
  }
  updatedBasicMetadata_ = true;
}

void BrivoFile::readCheapProperties(std::string_view extension) {
  OVLog(name(), "------> Load {:>4} ------>", extension);
  startBenchmark();
  const auto properties = images::copySequentialProperties(FileSource(device().files(), path(), size()));
  if (properties) {
    // All of the flat result counts as EXIF.
    if (!processMetadata(properties, true)) updatedExpensiveMetadata_ = false;
    setHasThumbnail(thumbSize() != 0);
  }
  OVLog(name(), "{}", benchmarkLine("CopyMetadataFromSequentialDataProviderCallbacks", stopBenchmark()));
}

void BrivoFile::metadataWithOptions(const Dictionary&, const ResultHandler& reply) {
  updateBasicMetadata();
  reply(metadataDict().value_or(Dictionary()));
}

std::optional<Dictionary> BrivoFile::metadata() const {
  if (const auto picture = imageMetadata()) return picture->dictionary();
  if (const auto* other = std::get_if<Dictionary>(&metadata_)) return *other;
  return std::nullopt;
}

std::optional<ImageMetadata> BrivoFile::imageMetadata() const {
  const auto* archived = std::get_if<ArchivedMetadata>(&metadata_);
  return archived ? std::optional(archived->restored()) : std::nullopt;
}

std::optional<Dictionary> BrivoFile::metadataDict() {
  const bool isThere = !std::holds_alternative<std::monostate>(metadata_);
  if (isThere || !hasMetadata_ || updatedExpensiveMetadata_) return metadata();
  if (type() == kTypeImage) buildImageMetadata();
  if (type() == kTypeMovie) buildMovieMetadata();
  if (std::holds_alternative<std::monostate>(metadata_)) metadata_ = Dictionary();
  if (__OVLogTypeEnabled(kLogTypeDetail))
    OVLog(name(), "metadata for {}: {}\n", name(), describe(*metadata()));
  return metadata();
}

void BrivoFile::buildImageMetadata() {
  const auto properties = images::copyImageProperties(FileSource(device().files(), path(), size()));
  const bool hasExif = properties && properties->entries.has(images::ExifGroup::exif);
  if (!processMetadata(properties, hasExif)) hasMetadata_ = false;
}

bool BrivoFile::processMetadata(const std::optional<images::ImageProperties>& properties, bool hasExif) {
  if (updatedExpensiveMetadata_) return true;
  const bool found = properties && hasExif && keepMetadata(*properties);
  if (!found) hasMetadata_ = false;
  updatedExpensiveMetadata_ = true;  // also after a failure: it is not tried again
  return found;
}

/// What the image itself says comes before the TIFF directory, which before what the file has already.
std::optional<std::uint32_t> BrivoFile::orientationFrom(const images::ImageProperties& properties) {
  if (properties.orientation != 0) return properties.orientation;
  if (const auto ofTiff = properties.entries.find(images::ExifGroup::tiff, "Orientation")) {
    setImageOrientation(pixels(ofTiff->asUnsigned()));
    return imageOrientation();
  }
  return imageOrientation() != 0 ? std::optional(imageOrientation()) : std::nullopt;
}

bool BrivoFile::keepMetadata(const images::ImageProperties& properties) {
  const auto height = side(imageHeight(), properties.entries, "PixelYDimension", properties.size.height);
  const auto width = side(imageWidth(), properties.entries, "PixelXDimension", properties.size.width);
  if (!height || !width) {
    OVLogVerboseOrDebug(kLogTypeContent, name(), "{} Missing Metadata", name());
    return false;
  }
  const auto orientation = orientationFrom(properties);
  setEmbeddedThumbnail(properties.thumbnail);
  Dictionary shown{{"PixelHeight", *height}, {"PixelWidth", *width}};
  if (orientation) shown.set("Orientation", *orientation);
  setSizeAndOrientationFromImageProperties(shown);
  metadata_ = device().metadataArchive().archive({properties, imageWidth(), imageHeight(), orientation});
  return true;
}

/// Widths and heights that are not known leave the thumbnail out of the sub-images.
void BrivoFile::setEmbeddedThumbnail(const images::EmbeddedImage& thumbnail) {
  constexpr std::uint64_t most = std::numeric_limits<std::uint32_t>::max();
  if (!thumbnail || thumbnail.offset > most || thumbnail.length > most) return;
  const SubImage description{static_cast<std::uint32_t>(thumbnail.offset),
                             static_cast<std::uint32_t>(thumbnail.length), thumbnail.size.width,
                             thumbnail.size.height};
  setThumbOffset(description.JPEGOffset);
  setThumbSize(description.JPEGLength);
  setThumbWidth(description.ImageWidth);
  setThumbHeight(description.ImageHeight);
  if (const auto validated = rawImageValidateSubImage(&description)) addSubImageDict(*validated);
}

void BrivoFile::setSizeAndOrientationFromImageProperties(Dictionary& properties) {
  const ImageDimensions dimensions = OVGetDimensionsFromImageProperties(properties);
  const std::uint32_t width = pixels(dimensions.width);
  const std::uint32_t height = pixels(dimensions.height);
  setImageOrientation(static_cast<std::uint32_t>(dimensions.orientation));
  const bool onItsSide = imageOrientation() >= kFirstOrientationOnItsSide;
  setImageWidth(onItsSide ? height : width);
  setImageHeight(onItsSide ? width : height);
  if (!onItsSide) return;
  for (const char* key : {"PixelHeight", "PixelYDimension"}) properties.set(key, width);
  for (const char* key : {"PixelWidth", "PixelXDimension"}) properties.set(key, height);
}

std::optional<std::string> BrivoFile::exifCreationDateTime() const {
  const auto picture = imageMetadata();
  return picture ? picture->creationDateTime() : std::nullopt;
}

std::optional<std::string> BrivoFile::exifModificationDateTime() const {
  const auto picture = imageMetadata();
  return picture ? picture->modificationDateTime() : std::nullopt;
}

std::optional<std::int64_t> BrivoFile::exifCreationDate() const { return dateOf(exifCreationDateTime()); }

std::optional<std::int64_t> BrivoFile::exifModificationDate() const {
  return dateOf(exifModificationDateTime());
}

}  // namespace brivo
