// SPDX-License-Identifier: MIT
#pragma once

#include "imaging/decode_request.h"

namespace brivo::imaging {

/// `source` in the size `to`, as JPEG files hold pixels: 8 bits a sample over the full range, YCbCr of ITU-R
/// BT.601 with chroma at half width and height, or grey when it has neither colour nor alpha. What shows
/// through is white. Null when memory runs out or the pixel format is one that cannot be converted.
Frame scaledForJpeg(Frame source, Extent to);

/// `source` in its own size: alpha, red, green, blue with 8 bits each, premultiplied with alpha, or grey when
/// it has neither colour nor alpha. Null as above.
Frame unpacked(const AVFrame& source);

}  // namespace brivo::imaging
