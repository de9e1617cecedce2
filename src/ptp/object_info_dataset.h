// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "platform/base/data.h"
#include "platform/base/relaxed.h"

namespace brivo {

/// The record that describes one object of a card to clients: this system's variant of the
/// ObjectInfo dataset of ISO 15740 (clause 5.5.2). Numbers are 0 and the name is empty until set.
/// *Thread-bound*, but that one thread may set what is said of the image and its thumbnail while others read.
///
/// Serialised form, little-endian, in this order: objectHandle 4, content length 4, objectFormat 2,
/// protectionStatus 2, objectCompressedSize 8, thumbFormat 2, thumbCompressedSize 4, thumbOffset 4,
/// thumbPixWidth 4, thumbPixHeight 4, imagePixWidth 4, imagePixHeight 4, imageBitDepth 4,
/// parentObject 4, associationType 2, imageOrietation 2, captureDate_tvsec 8,
/// modificationDate_tvsec 8, and at offset 74 the name as a PTP string; zero bytes fill it up to
/// content length + 8.
class MSObjectInfoDataset {
 public:
  /// The lengths of the serialised form. The content length goes into it; the buffer length is its
  /// size.
  struct Lengths {
    std::uint32_t content;
    std::uint32_t buffer;
  };

  /// Bytes before the name.
  static constexpr std::size_t kFixedSize = 74;

  MSObjectInfoDataset() = default;
  /// Parses the serialised form. Neither the fixed part nor the end of the name is checked against
  /// the length: at least kFixedSize + 1 bytes must be readable and, from offset 74 on, 1 + 2 *
  /// (the byte there). When the loose check of the PTP string reader refuses the name it stays
  /// empty.
  explicit MSObjectInfoDataset(const Data& data);

  /// True when parsing `bytes` reads nothing outside them.
  static bool isComplete(std::span<const std::byte> bytes);

  Lengths contentLength() const;
  /// The serialised form.
  Data content() const;

  std::uint32_t objectHandle() const { return objectHandle_; }
  void setObjectHandle(std::uint32_t value) { objectHandle_ = value; }
  /// PTP object format code.
  std::uint16_t objectFormat() const { return objectFormat_; }
  void setObjectFormat(std::uint16_t value) { objectFormat_ = value; }
  /// 1 when the file cannot be written, else 0.
  std::uint16_t protectionStatus() const { return protectionStatus_; }
  void setProtectionStatus(std::uint16_t value) { protectionStatus_ = value; }
  /// Bytes.
  std::uint64_t objectCompressedSize() const { return objectCompressedSize_; }
  void setObjectCompressedSize(std::uint64_t value) { objectCompressedSize_ = value; }
  /// PTP object format code of the thumbnail.
  std::uint16_t thumbFormat() const { return thumbFormat_; }
  void setThumbFormat(std::uint16_t value) { thumbFormat_ = value; }
  /// Bytes; 1 marks a thumbnail whose size is not known yet.
  std::uint32_t thumbCompressedSize() const { return thumbCompressedSize_; }
  void setThumbCompressedSize(std::uint32_t value) { thumbCompressedSize_ = value; }
  /// Where the embedded thumbnail starts in the file, in bytes.
  std::uint32_t thumbOffset() const { return thumbOffset_; }
  void setThumbOffset(std::uint32_t value) { thumbOffset_ = value; }
  /// Pixels, as are the next three.
  std::uint32_t thumbPixWidth() const { return thumbPixWidth_; }
  void setThumbPixWidth(std::uint32_t value) { thumbPixWidth_ = value; }
  std::uint32_t thumbPixHeight() const { return thumbPixHeight_; }
  void setThumbPixHeight(std::uint32_t value) { thumbPixHeight_ = value; }
  std::uint32_t imagePixWidth() const { return imagePixWidth_; }
  void setImagePixWidth(std::uint32_t value) { imagePixWidth_ = value; }
  std::uint32_t imagePixHeight() const { return imagePixHeight_; }
  void setImagePixHeight(std::uint32_t value) { imagePixHeight_ = value; }
  /// Bits per pixel.
  std::uint32_t imageBitDepth() const { return imageBitDepth_; }
  void setImageBitDepth(std::uint32_t value) { imageBitDepth_ = value; }
  /// Handle of the containing folder; 0xFFFFFFFE for a top-level folder.
  std::uint32_t parentObject() const { return parentObject_; }
  void setParentObject(std::uint32_t value) { parentObject_ = value; }
  /// 1 for folders, 0 for files.
  std::uint16_t associationType() const { return associationType_; }
  void setAssociationType(std::uint16_t value) { associationType_ = value; }
  /// EXIF orientation, 1 to 8.
  std::uint16_t imageOrietation() const { return imageOrietation_; }
  void setImageOrietation(std::uint16_t value) { imageOrietation_ = value; }
  /// Seconds since 1970, UTC, as is the next.
  std::uint64_t captureDate_tvsec() const { return captureDate_tvsec_; }
  void setCaptureDate_tvsec(std::uint64_t value) { captureDate_tvsec_ = value; }
  std::uint64_t modificationDate_tvsec() const { return modificationDate_tvsec_; }
  void setModificationDate_tvsec(std::uint64_t value) { modificationDate_tvsec_ = value; }
  /// UTF-8.
  const std::string& filename() const { return filename_; }
  void setFilename(std::string value) { filename_ = std::move(value); }

 private:
  std::uint64_t objectCompressedSize_ = 0;
  std::uint64_t captureDate_tvsec_ = 0;
  std::uint64_t modificationDate_tvsec_ = 0;
  std::string filename_;
  std::uint32_t objectHandle_ = 0;
  Relaxed<std::uint32_t> thumbCompressedSize_;
  Relaxed<std::uint32_t> thumbOffset_;
  Relaxed<std::uint32_t> thumbPixWidth_;
  Relaxed<std::uint32_t> thumbPixHeight_;
  Relaxed<std::uint32_t> imagePixWidth_;
  Relaxed<std::uint32_t> imagePixHeight_;
  std::uint32_t imageBitDepth_ = 0;
  std::uint32_t parentObject_ = 0;
  std::uint16_t objectFormat_ = 0;
  std::uint16_t protectionStatus_ = 0;
  std::uint16_t thumbFormat_ = 0;
  std::uint16_t associationType_ = 0;
  Relaxed<std::uint16_t> imageOrietation_;
};

}  // namespace brivo
