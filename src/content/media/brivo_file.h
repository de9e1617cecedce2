// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <limits>
#include <memory>
#include <span>
#include <string>
#include <string_view>

#include "content/brivo_item.h"
#include "io/buffer_cache.h"
#include "io/file_stream.h"

namespace brivo {

/// A four-character code as a number, first character highest.
constexpr std::uint32_t fourCharacterCode(const char (&code)[5]) {
  std::uint32_t value = 0;
  for (int i = 0; i < 4; ++i) value = value << 8 | static_cast<std::uint8_t>(code[i]);
  return value;
}

inline constexpr std::uint32_t kTypeImage = fourCharacterCode("imag");
inline constexpr std::uint32_t kTypeMovie = fourCharacterCode("moov");
inline constexpr std::uint32_t kTypeAudio = fourCharacterCode("audo");
inline constexpr std::uint32_t kTypeOther = fourCharacterCode("othe");

/// A regular file on a volume. Its kind is decided once, from the extension of its name. The stream
/// operations are *thread-safe*, those of the buffer cache belong to one thread at a time; the rest as in
/// BrivoItem.
class BrivoFile final : public BrivoItem, public ReadAheadSource {
 public:
  /// Makes the item of the file at `path`; null, with no handle taken, when the file system cannot tell its
  /// values. `prefetched` spares asking it.
  static std::shared_ptr<BrivoFile> initWithFSURL(std::string path, std::string name, const BrivoItem* parent,
                                                  CameraDevice& device,
                                                  const ResourceValues* prefetched = nullptr);
  /// A file that is only to be read: no handle, no kind. Its path is the parent's path directly followed by
  /// `name`, so the parent's must end with a separator. Null when there is no such file.
  static std::shared_ptr<BrivoFile> initForReadingOnlyWithName(std::string name, const BrivoItem& parent,
                                                               CameraDevice& device);

  const std::string& name() const override { return BrivoItem::name(); }
  std::uint64_t size() const override { return BrivoItem::size(); }

  bool hasThumbnail() const { return hasThumbnail_; }
  /// Keeps the dataset honest: "yes" turns a thumbnail size of 0 into 1, which marks a thumbnail whose size
  /// is not known yet; "no" sets the size to 0.
  void setHasThumbnail(bool value);
  bool hasMetadata() const { return hasMetadata_; }
  void setHasMetadata(bool value) { hasMetadata_ = value; }
  /// Identifier of the generic type class: image, movie, audio or data.
  std::string_view Tevo() const { return Tevo_; }

  // What lives in the dataset. Sizes and positions in bytes, widths and heights in pixels.
  std::uint32_t thumbSize() const { return info().thumbCompressedSize(); }
  void setThumbSize(std::uint32_t bytes) { mutableInfo().setThumbCompressedSize(bytes); }
  std::uint32_t thumbOffset() const { return info().thumbOffset(); }
  void setThumbOffset(std::uint32_t bytes) { mutableInfo().setThumbOffset(bytes); }
  std::uint32_t thumbWidth() const { return info().thumbPixWidth(); }
  void setThumbWidth(std::uint32_t pixels) { mutableInfo().setThumbPixWidth(pixels); }
  std::uint32_t thumbHeight() const { return info().thumbPixHeight(); }
  void setThumbHeight(std::uint32_t pixels) { mutableInfo().setThumbPixHeight(pixels); }
  std::uint32_t imageWidth() const { return info().imagePixWidth(); }
  void setImageWidth(std::uint32_t pixels) { mutableInfo().setImagePixWidth(pixels); }
  std::uint32_t imageHeight() const { return info().imagePixHeight(); }
  void setImageHeight(std::uint32_t pixels) { mutableInfo().setImagePixHeight(pixels); }
  /// EXIF orientation, 1 to 8; 0 when it is not known. The setter keeps the low 16 bits.
  std::uint32_t imageOrientation() const { return info().imageOrietation(); }
  void setImageOrientation(std::uint32_t value) {
    mutableInfo().setImageOrietation(static_cast<std::uint16_t>(value));
  }

  /// The image decoders read files with this extension (in any letter case).
  bool pixelorSupported() const;
  /// The file counts as a camera raw file: registered as one, not "tif", and not excluded by
  /// hasValidInformation().
  bool rawImageSupported() const;
  /// False for the extensions, in any letter case, whose raw files are not taken as such.
  static bool hasValidInformation(std::string_view extension);

  /// True for a read that gave as many bytes as were asked for, neither 0 nor the failure marker.
  static bool validateReturnDataSize(std::int64_t returned, std::int64_t requested);

  /// Opens the file for one more reader; false when the device is being ejected. A file that cannot be opened
  /// counts as open, and its reads fail.
  bool openStream();
  /// Ends one reader; true when this closed the descriptor.
  bool closeStream();
  /// Bytes read into `buffer` from `offset` on, not beyond the file's size; 0 when no stream is open, -1 when
  /// the medium failed.
  std::int64_t readStream(std::span<std::byte> buffer, std::uint64_t offset) const override;
  /// Maps `length` bytes from `offset` on for reading, zeros where the medium fails; null when no stream is
  /// open or the file cannot be mapped.
  std::unique_ptr<ProtectedMapping> readMap(std::size_t length, std::uint64_t offset) const;
  /// Unmaps; false, with the mapping left alone, when there is none or the device is being ejected.
  bool closeMap(std::unique_ptr<ProtectedMapping>& map) const;
  std::uint32_t fileOpenCount() const { return stream_.streamCount(); }

  /// Begins to read ahead from the start of the file, in a new cache in place of one that is there; without
  /// memory for it there is none.
  void createBufferCache();
  void destroyBufferCache() { bufferCache_.reset(); }
  /// Null when there is none.
  OVBufferCache* bufferCache() const { return bufferCache_.get(); }

 private:
  using BrivoItem::BrivoItem;
  void decideKind();

  FileStream stream_;
  std::string_view Tevo_;
  bool hasThumbnail_ = false;
  bool hasMetadata_ = false;
  std::unique_ptr<OVBufferCache> bufferCache_;  // last: it reads from the stream
};

}  // namespace brivo
