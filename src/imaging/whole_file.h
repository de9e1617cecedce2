// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <vector>

#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// All bytes of `source`; empty when it has more than 512 MiB, or when the medium fails.
std::vector<std::byte> wholeFile(const images::ByteSource& source);

}  // namespace brivo::imaging
