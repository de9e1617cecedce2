// SPDX-License-Identifier: MIT
// Facts about a photo that containers without EXIF state in forms of their own, kept as EXIF would have them.
#pragma once

#include <string_view>

#include "platform/images/parse.h"

namespace brivo::images {

/// Keep a camera's maker and model, up to their first NUL; an empty text is none.
void keepMake(Parse& parse, std::string_view make);
void keepModel(Parse& parse, std::string_view model);
/// Keeps the time of capture: seconds from 1970 on by the camera's own clock; 0 is none.
void keepCaptureTime(Parse& parse, std::uint32_t seconds);

/// The orientation (EXIF, 1 to 8) of a picture that is shown turned clockwise; 0 when it is no quarter turn.
std::uint16_t orientationOfDegrees(std::int32_t degrees);

}  // namespace brivo::images
