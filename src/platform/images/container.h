// SPDX-License-Identifier: MIT
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Has the reader of the container that the bytes are in read them; false when they are in none that is
/// known. The bytes decide, not a name: names can lie.
bool readContainer(Parse& parse);

}  // namespace brivo::images
