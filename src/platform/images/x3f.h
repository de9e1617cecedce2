// SPDX-License-Identifier: MIT
// X3F files: a header, sections, and a directory of them at the end of the file.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads an X3F file; false, with nothing found, for any other.
bool readX3f(Parse& parse);

}  // namespace brivo::images
