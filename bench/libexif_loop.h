// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::bench {

/// Has libexif read size, orientation and thumbnail of every picture on a card, in this thread. Throws when
/// one has none.
void readWithLibexif(const std::string& card);

}  // namespace brivo::bench
