// SPDX-License-Identifier: MIT
#include "ptp/object_info_dataset.h"

#include <array>
#include <vector>

#include "platform/base/byte_cursor.h"
#include "platform/text/unicode.h"
#include "ptp/codec.h"

namespace brivo {

namespace {

/// Both lengths are one more than what is written before the padding.
MSObjectInfoDataset::Lengths lengthsFor(std::size_t nameUnits) {
  const auto units = static_cast<std::uint32_t>(nameUnits);
  const std::uint32_t content = units == 0 ? 76 : 2 * units + 78;
  return {content, content + 8};
}

}  // namespace

MSObjectInfoDataset::MSObjectInfoDataset(const Data& data) {
  const auto* start = reinterpret_cast<PTPReadCursor>(data.bytes().data());
  PTPReadCursor cursor = start;
  objectHandle_ = ReadUInt32(cursor);
  ReadUInt32(cursor);  // the content length
  objectFormat_ = static_cast<std::uint16_t>(ReadUInt16(cursor));
  protectionStatus_ = static_cast<std::uint16_t>(ReadUInt16(cursor));
  objectCompressedSize_ = ReadUInt64(cursor);
  thumbFormat_ = static_cast<std::uint16_t>(ReadUInt16(cursor));
  thumbCompressedSize_ = ReadUInt32(cursor);
  thumbOffset_ = ReadUInt32(cursor);
  thumbPixWidth_ = ReadUInt32(cursor);
  thumbPixHeight_ = ReadUInt32(cursor);
  imagePixWidth_ = ReadUInt32(cursor);
  imagePixHeight_ = ReadUInt32(cursor);
  imageBitDepth_ = ReadUInt32(cursor);
  parentObject_ = ReadUInt32(cursor);
  associationType_ = static_cast<std::uint16_t>(ReadUInt16(cursor));
  imageOrietation_ = static_cast<std::uint16_t>(ReadUInt16(cursor));
  captureDate_tvsec_ = ReadUInt64(cursor);
  modificationDate_tvsec_ = ReadUInt64(cursor);
  const PTPReadCursor limit = start + static_cast<std::uint32_t>(data.size());
  if (const auto name = CopyUnicodeStringWithLengthByteFromBufferMaxSize(cursor, limit)) {
    filename_ = toUtf8(*name);
  }
}

bool MSObjectInfoDataset::isComplete(std::span<const std::byte> bytes) {
  ByteCursor cursor(bytes);
  cursor.skip(kFixedSize);
  const std::size_t units = cursor.u8();
  cursor.skip(2 * units);
  return cursor.ok();
}

MSObjectInfoDataset::Lengths MSObjectInfoDataset::contentLength() const {
  return lengthsFor(toUtf16(filename_).size());
}

Data MSObjectInfoDataset::content() const {
  const std::u16string name = toUtf16(filename_);
  const Lengths lengths = lengthsFor(name.size());
  std::vector<std::byte> bytes(lengths.buffer);
  auto* cursor = reinterpret_cast<PTPWriteCursor>(bytes.data());
  WriteUInt32(cursor, objectHandle_);
  WriteUInt32(cursor, lengths.content);
  WriteUInt16(cursor, objectFormat_);
  WriteUInt16(cursor, protectionStatus_);
  WriteUInt64(cursor, objectCompressedSize_);
  WriteUInt16(cursor, thumbFormat_);
  const std::array<std::uint32_t, 8> fields{thumbCompressedSize_, thumbOffset_,   thumbPixWidth_,
                                            thumbPixHeight_,      imagePixWidth_, imagePixHeight_,
                                            imageBitDepth_,       parentObject_};
  for (const std::uint32_t field : fields) WriteUInt32(cursor, field);
  WriteUInt16(cursor, associationType_);
  WriteUInt16(cursor, imageOrietation_);
  WriteUInt64(cursor, captureDate_tvsec_);
  WriteUInt64(cursor, modificationDate_tvsec_);
  WriteUnicodeStringWithLengthByteToBuffer(cursor, name);
  return Data(std::move(bytes));
}

}  // namespace brivo
