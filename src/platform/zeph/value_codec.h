// SPDX-License-Identifier: MIT
// Values as D-Bus types (D-Bus Specification, "Type System") and back. docs/wire.md has the table
// for authors of clients.
#pragma once

#include <cstddef>
#include <optional>
#include <span>

#include "platform/zeph/connection.h"

struct sd_bus_message;

namespace brivo::zeph {

/// Data from this size on travels as a descriptor when the peer takes descriptors.
inline constexpr std::size_t kDescriptorThreshold = 65536;

/// What becomes of descriptors in a message that arrives.
enum class Descriptors {
  refused,
  asData,     ///< a sealed memory file is mapped and read
  asBuffers,  ///< anything becomes a SharedBuffer, unlooked at
};

/// Appends one value per complete type of `signature`. Negative errno on failure: a value of a
/// wrong kind, a message that grew beyond what D-Bus allows, or no more descriptors; the message is
/// unusable then. I/O thread.
int appendArguments(sd_bus_message* message, const char* signature, std::span<const Value> values,
                    bool descriptors);

/// The values of a whole message. None when it holds a type that has no value, is nested too deeply, holds
/// more values than any honest message, or descriptors that are not taken. I/O thread.
std::optional<Arguments> readArguments(sd_bus_message* message, Descriptors descriptors);

/// About how many bytes `values` occupy while they wait to be sent, the memory behind data
/// included.
std::size_t weight(std::span<const Value> values);

}  // namespace brivo::zeph
