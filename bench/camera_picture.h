// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::bench {

/// `jpeg` with an EXIF block as cameras write it: the usual facts, a maker note of 8 KiB, and `thumbnail`.
std::string withCameraExif(const std::string& jpeg, std::string thumbnail);

}  // namespace brivo::bench
