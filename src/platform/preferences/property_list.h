// SPDX-License-Identifier: MIT
// XML property lists (PropertyList-1.0). Pure and *thread-safe*.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/base/value.h"

namespace brivo {

/// The dictionary at the top of a property list; none for anything that is not one. Dates come as
/// their text; elements nested more than 64 deep, keys without a value and unknown elements make it
/// none.
std::optional<Dictionary> parsePropertyList(std::string_view xml);

/// `dictionary` as a property list. Values that the format cannot hold are left out.
std::string formatPropertyList(const Dictionary& dictionary);

}  // namespace brivo
