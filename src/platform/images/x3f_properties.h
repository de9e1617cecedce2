// SPDX-License-Identifier: MIT
// The property list of X3F files: names and values in UTF-16.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Keeps maker, model and time of capture from the property list in bytes `start` to `start` + `length`.
void readX3fProperties(Parse& parse, std::uint64_t start, std::uint64_t length);

}  // namespace brivo::images
