// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::bench {

/// Has libexiv2 read size, orientation and thumbnail of every picture on a card, in this thread. Throws when
/// one has none.
void readWithLibexiv2(const std::string& card);

}  // namespace brivo::bench
