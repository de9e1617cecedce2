// SPDX-License-Identifier: MIT
#include "ptp/object_info_dataset.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

unsigned at(const Data& data, std::size_t offset) { return std::to_integer<unsigned>(data.bytes()[offset]); }

TEST(ObjectInfoDatasetTest, WithoutAFileNameItIs84Bytes) {
  const Data content = MSObjectInfoDataset().content();
  ASSERT_EQ(content.size(), 84u);
  for (std::size_t i = 0; i < content.size(); ++i) EXPECT_EQ(at(content, i), i == 4 ? 76u : 0u) << i;
}

TEST(ObjectInfoDatasetTest, NamedDcimItIs94Bytes) {
  MSObjectInfoDataset dataset;
  dataset.setFilename("DCIM");
  const Data content = dataset.content();
  ASSERT_EQ(content.size(), 94u);
  EXPECT_EQ(at(content, 4), 86u);
  EXPECT_EQ(at(content, 74), 5u) << "four units and the terminator";
  EXPECT_EQ(at(content, 75), unsigned{'D'});
  EXPECT_EQ(at(content, 81), unsigned{'M'});
  EXPECT_EQ(at(content, 83), 0u);
  EXPECT_EQ(at(content, 84), 0u);
  EXPECT_EQ(dataset.contentLength().content, 86u);
  EXPECT_EQ(dataset.contentLength().buffer, 94u);
}

MSObjectInfoDataset filled() {
  MSObjectInfoDataset dataset;
  dataset.setObjectHandle(0x01020304);
  dataset.setObjectFormat(0x3801);
  dataset.setProtectionStatus(1);
  dataset.setObjectCompressedSize(0x1122334455667788);
  dataset.setThumbFormat(0x3808);
  dataset.setThumbCompressedSize(8400);
  dataset.setThumbOffset(0x2000);
  dataset.setThumbPixWidth(160);
  dataset.setThumbPixHeight(120);
  dataset.setImagePixWidth(6000);
  dataset.setImagePixHeight(4000);
  dataset.setImageBitDepth(24);
  dataset.setParentObject(0xFFFFFFFE);
  dataset.setAssociationType(1);
  dataset.setImageOrietation(6);
  dataset.setCaptureDate_tvsec(1'700'000'000);
  dataset.setModificationDate_tvsec(1'700'000'001);
  dataset.setFilename("IMG_0001.JPG");
  return dataset;
}

TEST(ObjectInfoDatasetTest, ParsingWhatWasSerialisedGivesBackEveryField) {
  const MSObjectInfoDataset expected = filled();
  const MSObjectInfoDataset dataset(expected.content());
  EXPECT_EQ(dataset.objectHandle(), expected.objectHandle());
  EXPECT_EQ(dataset.objectFormat(), expected.objectFormat());
  EXPECT_EQ(dataset.protectionStatus(), expected.protectionStatus());
  EXPECT_EQ(dataset.objectCompressedSize(), expected.objectCompressedSize());
  EXPECT_EQ(dataset.thumbFormat(), expected.thumbFormat());
  EXPECT_EQ(dataset.thumbCompressedSize(), expected.thumbCompressedSize());
  EXPECT_EQ(dataset.thumbOffset(), expected.thumbOffset());
  EXPECT_EQ(dataset.thumbPixWidth(), expected.thumbPixWidth());
  EXPECT_EQ(dataset.thumbPixHeight(), expected.thumbPixHeight());
  EXPECT_EQ(dataset.imagePixWidth(), expected.imagePixWidth());
  EXPECT_EQ(dataset.imagePixHeight(), expected.imagePixHeight());
  EXPECT_EQ(dataset.imageBitDepth(), expected.imageBitDepth());
  EXPECT_EQ(dataset.parentObject(), expected.parentObject());
  EXPECT_EQ(dataset.associationType(), expected.associationType());
  EXPECT_EQ(dataset.imageOrietation(), expected.imageOrietation());
  EXPECT_EQ(dataset.captureDate_tvsec(), expected.captureDate_tvsec());
  EXPECT_EQ(dataset.modificationDate_tvsec(), expected.modificationDate_tvsec());
  EXPECT_EQ(dataset.filename(), expected.filename());
}

TEST(ObjectInfoDatasetTest, EveryFieldSitsAtItsOffset) {
  const Data content = filled().content();
  const auto little = [&](std::size_t offset, std::size_t width) {
    std::uint64_t value = 0;
    for (std::size_t i = 0; i < width; ++i) value |= std::uint64_t{at(content, offset + i)} << (8 * i);
    return value;
  };
  EXPECT_EQ(little(0, 4), 0x01020304u);
  EXPECT_EQ(little(4, 4), 2 * 12 + 78u);
  EXPECT_EQ(little(8, 2), 0x3801u);
  EXPECT_EQ(little(10, 2), 1u);
  EXPECT_EQ(little(12, 8), 0x1122334455667788u);
  EXPECT_EQ(little(20, 2), 0x3808u);
  EXPECT_EQ(little(22, 4), 8400u);
  EXPECT_EQ(little(26, 4), 0x2000u);
  EXPECT_EQ(little(30, 4), 160u);
  EXPECT_EQ(little(34, 4), 120u);
  EXPECT_EQ(little(38, 4), 6000u);
  EXPECT_EQ(little(42, 4), 4000u);
  EXPECT_EQ(little(46, 4), 24u);
  EXPECT_EQ(little(50, 4), 0xFFFFFFFEu);
  EXPECT_EQ(little(54, 2), 1u);
  EXPECT_EQ(little(58, 8), 1'700'000'000u);
  EXPECT_EQ(little(66, 8), 1'700'000'001u);
  EXPECT_EQ(little(74, 1), 13u);
}

TEST(ObjectInfoDatasetTest, TheOrientationIsBetweenTheAssociationTypeAndTheCaptureDate) {
  const Data content = filled().content();
  EXPECT_EQ(at(content, 56), 6u);
  EXPECT_EQ(at(content, 57), 0u);
}

TEST(ObjectInfoDatasetTest, ANameThatTheLooseCheckRefusesStaysEmpty) {
  const Data content = filled().content();
  std::vector<std::byte> bytes(content.bytes().begin(), content.bytes().end());
  bytes[74] = std::byte{200};  // far beyond the end
  bytes.resize(74 + 1 + 2 * 200);
  const Data whole(bytes);
  const Data cut(whole.bytes().first(100), std::make_shared<const Data>(whole));
  EXPECT_EQ(MSObjectInfoDataset(cut).filename(), "");
  EXPECT_EQ(MSObjectInfoDataset(cut).objectHandle(), 0x01020304u);
}

TEST(ObjectInfoDatasetTest, OnlyCompleteBytesAreCalledComplete) {
  const Data content = filled().content();
  constexpr std::size_t written = 74 + 1 + 2 * 13;
  for (std::size_t size = 0; size <= content.size(); ++size) {
    EXPECT_EQ(MSObjectInfoDataset::isComplete(content.bytes().first(size)), size >= written) << size;
  }
}

TEST(ObjectInfoDatasetTest, NamesCountInUtf16Units) {
  MSObjectInfoDataset dataset;
  dataset.setFilename("\xF0\x9F\x93\xB7");  // one character, two units
  EXPECT_EQ(dataset.contentLength().content, 82u);
  EXPECT_EQ(MSObjectInfoDataset(dataset.content()).filename(), "\xF0\x9F\x93\xB7");
}

}  // namespace
}  // namespace brivo
