// SPDX-License-Identifier: MIT
#include "content/media/metadata_archive.h"

#include <algorithm>
#include <new>

#include "platform/base/byte_cursor.h"

namespace brivo {

using images::ExifEntries;
using images::ExifGroup;

namespace {

constexpr std::size_t kMostModelsOfOneLength = 4;
constexpr std::size_t kMostLengths = 64;
/// Equal bytes that are worth ending a change for.
constexpr std::size_t kWorthSkipping = 4;

using Record = std::vector<std::byte>;

void append(Record& record, std::uint64_t number, std::size_t width) {
  for (std::size_t i = 0; i < width; ++i) record.push_back(static_cast<std::byte>(number >> 8 * i & 0xFF));
}

bool isKept(ExifGroup group, std::uint16_t tag) {
  constexpr std::uint16_t kContentIdentifier = 17;
  return group == ExifGroup::exif || group == ExifGroup::tiff ||
         (group == ExifGroup::makerNote && tag == kContentIdentifier);
}

/// Numbers of fixed width, little-endian, and behind them the entries. Orientation "none" is 0.
Record recordOf(const ImageMetadata& metadata) {
  const images::ImageProperties& properties = metadata.properties;
  const ExifEntries entries = properties.entries.selected(isKept);
  Record record;
  record.reserve(64 + entries.packed().size());
  append(record, metadata.width, 4);
  append(record, metadata.height, 4);
  append(record, metadata.orientation.has_value() ? 1 : 0, 1);
  append(record, metadata.orientation.value_or(0), 2);
  append(record, properties.size.width, 4);
  append(record, properties.size.height, 4);
  append(record, properties.depth, 2);
  append(record, properties.orientation, 2);
  append(record, properties.thumbnail.offset, 8);
  append(record, properties.thumbnail.length, 8);
  append(record, properties.thumbnail.size.width, 4);
  append(record, properties.thumbnail.size.height, 4);
  record.insert(record.end(), entries.packed().begin(), entries.packed().end());
  return record;
}

ImageMetadata metadataOf(std::span<const std::byte> record) {
  ByteCursor cursor(record);
  ImageMetadata metadata;
  images::ImageProperties& properties = metadata.properties;
  metadata.width = cursor.u32();
  metadata.height = cursor.u32();
  const bool hasOrientation = cursor.u8() != 0;
  const std::uint16_t orientation = cursor.u16();
  if (hasOrientation) metadata.orientation = orientation;
  properties.size.width = cursor.u32();
  properties.size.height = cursor.u32();
  properties.depth = cursor.u16();
  properties.orientation = cursor.u16();
  properties.thumbnail.offset = cursor.u64();
  properties.thumbnail.length = cursor.u64();
  properties.thumbnail.size.width = cursor.u32();
  properties.thumbnail.size.height = cursor.u32();
  const auto entries = cursor.take(cursor.remaining());
  properties.entries = ExifEntries({entries.begin(), entries.end()});
  return metadata;
}

/// What makes `model` the `record`, both of the same length: how many bytes stay, how many change, and these;
/// and so on.
Record changesOf(std::span<const std::byte> model, std::span<const std::byte> record) {
  Record changes;
  std::size_t done = 0;
  while (true) {
    const auto differs = std::ranges::mismatch(model.subspan(done), record.subspan(done)).in2;
    const auto start = static_cast<std::size_t>(differs - record.begin());
    if (start == record.size()) return changes;
    std::size_t end = start + 1;
    for (std::size_t at = end; at < record.size() && at < end + kWorthSkipping; ++at) {
      if (model[at] != record[at]) end = at + 1;
    }
    append(changes, start - done, 2);
    append(changes, end - start, 2);
    changes.insert(changes.end(), record.begin() + static_cast<std::ptrdiff_t>(start),
                   record.begin() + static_cast<std::ptrdiff_t>(end));
    done = end;
  }
}

Record changed(Record model, std::span<const std::byte> changes) {
  ByteCursor cursor(changes);
  std::size_t at = 0;
  while (cursor.remaining() > 0) {
    at += cursor.u16();
    const auto bytes = cursor.take(cursor.u16());
    std::ranges::copy(bytes, model.begin() + static_cast<std::ptrdiff_t>(at));
    at += bytes.size();
  }
  return model;
}

}  // namespace

/// One piece of memory: this, and the bytes of the changes behind it.
struct ArchivedMetadata::Difference {
  Bytes model;
  std::uint32_t length;

  std::byte* changes() { return reinterpret_cast<std::byte*>(this + 1); }
};

ArchivedMetadata::ArchivedMetadata(Bytes model, std::span<const std::byte> changes) {
  void* memory = ::operator new(sizeof(Difference) + changes.size());
  difference_.reset(new (memory) Difference{std::move(model), static_cast<std::uint32_t>(changes.size())});
  std::ranges::copy(changes, difference_->changes());
}

void ArchivedMetadata::Delete::operator()(Difference* difference) const {
  difference->~Difference();
  ::operator delete(difference);
}

ImageMetadata ArchivedMetadata::restored() const {
  return metadataOf(changed(*difference_->model, {difference_->changes(), difference_->length}));
}

ArchivedMetadata MetadataArchive::archive(const ImageMetadata& metadata) {
  Record record = recordOf(metadata);
  const MutexLock lock(lock_);
  Models& models = modelsOfLength(record.size());
  for (const Bytes& model : models) {
    const Record changes = changesOf(*model, record);
    if (changes.size() <= record.size() / 2) return {model, changes};
  }
  if (models.size() == kMostModelsOfOneLength) models.erase(models.begin());
  models.push_back(std::make_shared<const Record>(std::move(record)));
  return {models.back(), {}};
}

MetadataArchive::Models& MetadataArchive::modelsOfLength(std::size_t length) {
  if (models_.size() == kMostLengths && !models_.contains(length)) models_.clear();
  return models_[length];
}

}  // namespace brivo
