// SPDX-License-Identifier: MIT
// Finished JPEGs inside a file: how they are found in raw files, noted and chosen.
#include "content/media/brivo_file.h"
#include "content/media/file_source.h"
#include "platform/images/image_reader.h"
#include "util/clocks.h"
#include "util/log.h"

namespace brivo {

void BrivoFile::rawImageMinimumProperties() {
  OVLog(name(), "------> rawImageMinimumProperties ------>");
  startBenchmark();
  Dictionary properties;
  if (const auto found = images::copyContainerProperties(FileSource(device().files(), path(), size()))) {
    const Dictionary container = images::containerDictionary(*found);
    readRawProperties(*container.dictionary("{raw}"), properties);
  }
  setSizeAndOrientationFromImageProperties(properties);
  OVLog(name(), "{}", benchmarkLine("<------ rawImageMinimumProperties <------", stopBenchmark()));
}

void BrivoFile::readRawProperties(const Dictionary& raw, Dictionary& properties) {
  const auto takeOrientation = [&](std::optional<std::uint64_t> orientation) {
    if (imageOrientation() != 0 || !orientation) return;
    setImageOrientation(static_cast<std::uint32_t>(*orientation));
    properties.set("Orientation", imageOrientation());
  };
  const Dictionary* crop = raw.dictionary("CropSize");
  if (crop && imageWidth() == 0 && imageHeight() == 0) {
    setImageWidth(static_cast<std::uint32_t>(crop->unsignedInteger("Width").value_or(0)));
    setImageHeight(static_cast<std::uint32_t>(crop->unsignedInteger("Height").value_or(0)));
    properties.set("PixelWidth", imageWidth());
    properties.set("PixelHeight", imageHeight());
  }
  takeOrientation(raw.unsignedInteger("Orientation"));
  const Array* thumbnails = raw.array("Thumbnails");
  for (std::size_t i = 0; thumbnails && i < thumbnails->size(); ++i) {
    const auto* entry = (*thumbnails)[i].get<Dictionary>();
    const SubImage description = entry ? SubImage::fromDictionary(*entry) : SubImage();
    const auto validated = rawImageValidateSubImage(&description);
    if (!validated || validated->JPEGOffset == 0) continue;
    if (entry->contains("Orientation")) takeOrientation(validated->Orientation);
    addSubImageDict(*validated);
  }
}

std::optional<SubImage> BrivoFile::rawImageValidateSubImage(const SubImage* description, Error* error) {
  const auto validated = validatedSubImage(description, error);
  switch (validated ? validated->imageType : SubImageType::none) {
    case SubImageType::smallThumbnail:
      smallThumbnail_ = true;
      setThumbOffset(validated->JPEGOffset);
      setThumbSize(validated->JPEGLength);
      setThumbWidth(validated->ImageWidth);
      setThumbHeight(validated->ImageHeight);
      break;
    case SubImageType::ptpSubThumbnailImage:
      smallThumbnail_ = true;
      break;
    case SubImageType::previewImage:
      previewThumbnail_ = true;
      break;
    case SubImageType::none:
      break;
  }
  return validated;
}

void BrivoFile::addSubImageDict(const SubImage& image) {
  if (!subImages_.add(image)) return;
  OVLog(name(), "[subImage] {:>10}: [{:>10}(w)x {:>10}(h)]", "adding", image.ImageWidth, image.ImageHeight);
}

std::optional<SubImage> BrivoFile::subImageDictForPixelWidth(std::uint32_t width) const {
  const auto wanted = static_cast<std::int32_t>(width);
  OVLog(name(), "[subImage] {:>10}: [{:>10}(w)]", "searching", wanted);
  const SubImage* found = subImages_.forPixelWidth(width);
  if (!found) {
    OVLog(name(), "[subImage] {:>10}: [{:>10}]", "none", wanted);
    return std::nullopt;
  }
  OVLog(name(), "[subImage] {:>10}: [{:>10}(w)x {:>10}(h)]", "found", found->ImageWidth, found->ImageHeight);
  return *found;
}

int BrivoFile::compare(const BrivoItem& item, const BrivoItem& against, const void* /*context*/) {
  return item.compareObjectHandle(against);
}

}  // namespace brivo
