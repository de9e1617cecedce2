// SPDX-License-Identifier: MIT
// Pictures that are really coded, for tests.
#pragma once

#include <string>

#include "imaging/picture.h"

namespace brivo::test {

/// A frame of 8-bit YCbCr 4:2:0 over the full range: luma rises from left to right from 16 to 240, from top
/// to bottom chroma goes from blue to red.
imaging::Frame madeFrame(std::uint32_t width, std::uint32_t height);
/// It as a JPEG file.
std::string madeJpeg(std::uint32_t width, std::uint32_t height, std::string_view iccProfile = {});
/// `jpeg` with an EXIF block that holds `thumbnail`, and `orientation` when it is not 0.
std::string withExifThumbnail(const std::string& jpeg, std::string thumbnail, unsigned orientation = 0);

/// Mean difference of the samples of the first plane of two frames of one size, 0 to 255.
double meanDifference(const AVFrame& a, const AVFrame& b);

}  // namespace brivo::test
