// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Catalogues of cards with pictures, with what is in the pictures: time against bare loops and against
/// others that read pictures, growth, bytes read and memory.
void printPictureFigures(const Options& options);

}  // namespace brivo::bench
