// SPDX-License-Identifier: MIT
// The result codes of the image-capture family with their names and texts.
#pragma once

#include <cstdint>
#include <span>

namespace brivo {

/// A result code: an older and a newer name, each of which may be empty, and a text for people.
struct ErrorDescription {
  std::int32_t code;
  const char* legacy;
  const char* modern;
  const char* text;
};

/// All codes, each once: success, the family's own codes from -9900 down, and codes that are borrowed from
/// other families. *Immutable.*
std::span<const ErrorDescription> errorTable();

}  // namespace brivo
