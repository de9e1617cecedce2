// SPDX-License-Identifier: MIT
#include "content/media/metadata_archive.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>

namespace brivo {
namespace {

using images::ExifGroup;

ImageMetadata shot(const std::string& date, std::uint32_t thumbnailLength = 8000,
                   const char* make = "Maker") {
  ImageMetadata metadata;
  metadata.width = 3000;
  metadata.height = 4000;
  metadata.orientation = 6;
  metadata.properties.size = {4000, 3000};
  metadata.properties.depth = 8;
  metadata.properties.orientation = 6;
  metadata.properties.thumbnail = {1234, thumbnailLength, {160, 120}, 0};
  const auto add = [&](ExifGroup group, std::uint16_t tag, const std::string& text) {
    metadata.properties.entries.add(group, tag, 2, std::as_bytes(std::span(text)), std::endian::little);
  };
  add(ExifGroup::tiff, 0x010F, make);
  add(ExifGroup::exif, 0x9003, date);
  add(ExifGroup::exif, 0xA434, std::string(200, 'L'));
  add(ExifGroup::makerNote, 17, "8C5A");
  return metadata;
}

TEST(MetadataArchive, WhatIsArchivedIsRestored) {
  MetadataArchive archive;
  for (int i = 0; i < 10; ++i) {
    const ImageMetadata metadata = shot("2021:06:01 10:00:0" + std::to_string(i), 8000 + 300 * i);
    const ImageMetadata restored = archive.archive(metadata).restored();
    EXPECT_EQ(restored.dictionary(), metadata.dictionary());
    EXPECT_EQ(restored.properties.thumbnail.length, metadata.properties.thumbnail.length);
    EXPECT_EQ(restored.creationDateTime(), metadata.creationDateTime());
  }
}

TEST(MetadataArchive, AMissingOrientationStaysMissing) {
  MetadataArchive archive;
  ImageMetadata metadata = shot("2021:06:01 10:00:00");
  metadata.orientation.reset();
  EXPECT_FALSE(archive.archive(metadata).restored().orientation);
  metadata.orientation = 0;
  EXPECT_EQ(archive.archive(metadata).restored().orientation, 0);
}

TEST(MetadataArchive, PicturesOfSeveralCamerasDoNotMix) {
  MetadataArchive archive;
  std::vector<ArchivedMetadata> archived;
  const std::vector<const char*> makes{"Aaaaa", "Bbbbb", "Longer name"};
  for (int i = 0; i < 300; ++i) archived.push_back(archive.archive(shot(std::to_string(i), 1, makes[i % 3])));
  for (int i = 0; i < 300; ++i) {
    const ImageMetadata restored = archived[i].restored();
    EXPECT_EQ(restored.dictionary(), shot(std::to_string(i), 1, makes[i % 3]).dictionary()) << i;
  }
}

TEST(MetadataArchive, ArchivedMetadataOutliveTheArchive) {
  auto archive = std::make_unique<MetadataArchive>();
  archive->archive(shot("2021:06:01 10:00:00"));
  const ArchivedMetadata archived = archive->archive(shot("2021:06:01 10:00:01"));
  archive.reset();
  EXPECT_EQ(archived.restored().creationDateTime(), "2021:06:01 10:00:01");
}

TEST(MetadataArchive, OfAMakerNoteOnlyEntry17IsKept) {
  MetadataArchive archive;
  ImageMetadata metadata = shot("2021:06:01 10:00:00");
  const std::string other = "other";
  metadata.properties.entries.add(ExifGroup::makerNote, 8, 2, std::as_bytes(std::span(other)),
                                  std::endian::little);
  EXPECT_EQ(archive.archive(metadata).restored().properties.entries.dictionary(ExifGroup::makerNote),
            (Dictionary{{"17", "8C5A"}}));
}

TEST(MetadataArchive, ManyThreadsArchiveAtOnce) {
  MetadataArchive archive;
  std::vector<std::thread> threads;
  std::atomic<int> wrong = 0;
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 500; ++i) {
        const ImageMetadata metadata = shot(std::to_string(i * t), 1, std::string(t + i % 70, 'm').c_str());
        if (archive.archive(metadata).restored().dictionary() != metadata.dictionary()) ++wrong;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(wrong, 0);
}

}  // namespace
}  // namespace brivo
