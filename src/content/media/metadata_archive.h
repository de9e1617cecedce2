// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <unordered_map>
#include <vector>

#include "content/media/image_metadata.h"
#include "platform/base/mutex.h"

namespace brivo {

/// The metadata of one picture in little memory: what differs from that of a picture like it. Move-only.
/// *Immutable.*
class ArchivedMetadata {
 public:
  /// As it was archived.
  ImageMetadata restored() const;

 private:
  friend class MetadataArchive;
  using Bytes = std::shared_ptr<const std::vector<std::byte>>;
  struct Difference;
  struct Delete {
    void operator()(Difference* difference) const;
  };

  ArchivedMetadata(Bytes model, std::span<const std::byte> changes);

  std::unique_ptr<Difference, Delete> difference_;
};

/// Archives the metadata of a card's pictures. Most pictures of a card come from one camera, so their
/// metadata have the same entries in the same places and differ in a few bytes: an archived one holds those
/// alone and shares the rest with a model. *Thread-safe.*
class MetadataArchive {
 public:
  /// Of the maker note only entry "17" is kept, and no GPS entry; embedded images other than the thumbnail,
  /// and the crop size, are not kept.
  ArchivedMetadata archive(const ImageMetadata& metadata) BRIVO_EXCLUDES(lock_);

 private:
  using Bytes = ArchivedMetadata::Bytes;
  /// Models of this many bytes, the latest last.
  using Models = std::vector<Bytes>;

  Models& modelsOfLength(std::size_t length) BRIVO_REQUIRES(lock_);

  Mutex lock_;
  std::unordered_map<std::size_t, Models> models_ BRIVO_GUARDED_BY(lock_);
};

}  // namespace brivo
