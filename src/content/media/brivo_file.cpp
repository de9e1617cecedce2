// SPDX-License-Identifier: MIT
#include "content/media/brivo_file.h"

#include <algorithm>
#include <array>

#include "platform/base/paths.h"
#include "platform/text/unicode.h"
#include "platform/types/file_types.h"

namespace brivo {

namespace {

std::string lowerCasedExtension(std::string_view name) { return asciiLowerCased(pathExtension(name)); }

}  // namespace

std::shared_ptr<BrivoFile> BrivoFile::initWithFSURL(std::string path, std::string name,
                                                    const BrivoItem* parent, CameraDevice& device,
                                                    const ResourceValues* prefetched) {
  const auto values = valuesOf(path, device, prefetched);
  if (!values) return nullptr;
  auto file =
      std::make_shared<BrivoFile>(MakingKey(), std::move(path), std::move(name), parent, device, *values);
  file->decideKind();
  if (file->hasMetadata()) readFirstMetadata(file);
  return file;
}

std::shared_ptr<BrivoFile> BrivoFile::initForReadingOnlyWithName(std::string name, const BrivoItem& parent,
                                                                 CameraDevice& device) {
  std::string path = parent.path() + name;
  const auto values = device.files().resourceValues(path);
  if (!values.ok()) return nullptr;
  return std::make_shared<BrivoFile>(MakingKey(), std::move(path), std::move(name), &parent, device,
                                     values->size);
}

void BrivoFile::decideKind() {
  const std::string extension = lowerCasedExtension(name());
  if (rawImageSupported() || pixelorSupported()) {
    setType(kTypeImage);
  } else if (isMovieExtension(extension)) {
    setType(kTypeMovie);
  } else if (isAudioExtension(extension)) {
    setType(kTypeAudio);
  } else {
    setType(kTypeOther);
  }
  hasMetadata_ = type() == kTypeImage || type() == kTypeMovie;
  setHasThumbnail(hasMetadata_);
}

std::string_view BrivoFile::Tevo() const {
  switch (type()) {
    case kTypeImage:
      return kGenericImageType;
    case kTypeMovie:
      return kGenericMovieType;
    case kTypeAudio:
      return kGenericAudioType;
    case kTypeOther:
      return kGenericDataType;
    default:
      return {};  // only made to be read
  }
}

/// Raw files take longer than others; where speed is wanted they must not hold up the walk.
void BrivoFile::readFirstMetadata(const std::shared_ptr<BrivoFile>& file) {
  if (!file->rawImageSupported()) return file->updateBasicMetadata();
  if (!file->device().prioritizeSpeed()) return file->rawImageMinimumProperties();
  file->device().addInitiatedOperation([file] { file->rawImageMinimumProperties(); });
}

void BrivoFile::setHasThumbnail(bool value) {
  hasThumbnail_ = value;
  if (!value) {
    setThumbSize(0);
  } else if (thumbSize() == 0) {
    setThumbSize(1);
  }
}

bool BrivoFile::pixelorSupported() const { return isDecodableImageExtension(lowerCasedExtension(name())); }

bool BrivoFile::rawImageSupported() const {
  const std::string extension = lowerCasedExtension(name());
  return hasValidInformation(extension) && extension != "tif" && isCameraRawExtension(extension);
}

bool BrivoFile::hasValidInformation(std::string_view extension) {
  constexpr std::array<std::string_view, 9> excluded{"wav", "aif", "3fr", "erf", "iiq",
                                                     "raw", "tif", "fff", "dng"};
  return std::ranges::find(excluded, asciiLowerCased(extension)) == excluded.end();
}

bool BrivoFile::validateReturnDataSize(std::int64_t returned, std::int64_t requested) {
  return returned != 0 && returned != std::numeric_limits<std::int64_t>::max() && returned == requested;
}

bool BrivoFile::openStream() { return !device().beingEjected() && stream_.open(device().files(), path()); }

bool BrivoFile::closeStream() { return !device().beingEjected() && stream_.close(); }

std::int64_t BrivoFile::readStream(std::span<std::byte> buffer, std::uint64_t offset) const {
  if (device().beingEjected()) return 0;
  return stream_.read(device().files(), buffer, offset, size());
}

std::unique_ptr<ProtectedMapping> BrivoFile::readMap(std::size_t length, std::uint64_t offset) const {
  return stream_.map(length, offset);
}

bool BrivoFile::closeMap(std::unique_ptr<ProtectedMapping>& map) const {
  if (!map || device().beingEjected()) return false;
  map.reset();
  return true;
}

void BrivoFile::createBufferCache() {
  destroyBufferCache();
  bufferCache_ = OVBufferCache::initWithFile(*this, device().makeSerialQueue());
  if (bufferCache_) bufferCache_->startReading();
}

}  // namespace brivo
