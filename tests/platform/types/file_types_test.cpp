// SPDX-License-Identifier: MIT
#include "platform/types/file_types.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(FileTypesTest, KnowsTheKindsOnCards) {
  for (const char* extension :
       {"jpg", "jpeg", "heic", "heif", "png", "tif", "tiff", "webp", "gif", "bmp", "avif"}) {
    EXPECT_TRUE(isDecodableImageExtension(extension)) << extension;
  }
  for (const char* extension :
       {"cr2", "cr3", "crw", "nef", "nrw", "arw", "sr2", "orf", "rw2", "pef", "srw",
        "rwl", "dcr", "kdc", "mef", "mos", "raf", "mrw", "x3f", "dng", "3fr", "tif"}) {
    EXPECT_TRUE(isCameraRawExtension(extension)) << extension;
    EXPECT_TRUE(isDecodableImageExtension(extension)) << extension;
  }
  for (const char* extension :
       {"mov", "mp4", "m4v", "3gp", "avi", "mts", "m2ts", "mpg", "mkv", "webm", "mxf"}) {
    EXPECT_TRUE(isMovieExtension(extension)) << extension;
  }
  for (const char* extension : {"wav", "mp3", "aif", "m4a"})
    EXPECT_TRUE(isAudioExtension(extension)) << extension;
}

TEST(FileTypesTest, AnythingElseIsNone) {
  for (const char* extension : {"", "txt", "JPG", "jpgx", "ctg", "xmp"}) {
    EXPECT_FALSE(isDecodableImageExtension(extension)) << extension;
    EXPECT_FALSE(isCameraRawExtension(extension)) << extension;
    EXPECT_FALSE(isMovieExtension(extension)) << extension;
    EXPECT_FALSE(isAudioExtension(extension)) << extension;
  }
}

}  // namespace
}  // namespace brivo
