// SPDX-License-Identifier: MIT
// Property reading for still images of every container that cameras write. Nothing is decoded; what is read
// is bounded, whatever the file says; nothing fails but by leaving things out. Pure and *thread-safe*.
#pragma once

#include <optional>

#include "platform/images/byte_source.h"
#include "platform/images/image_properties.h"

namespace brivo::images {

/// The cheap call, for JPEG and HEIF: 16 KiB of a JPEG, and further ranges only where its headers point to
/// them. None when the bytes are of no known kind.
std::optional<ImageProperties> copySequentialProperties(const ByteSource& source);

/// The full call: the properties of the first image. None when the bytes are of no known kind.
std::optional<ImageProperties> copyImageProperties(const ByteSource& source);

/// The container call: sizes, orientation and every embedded JPEG. None when the bytes are of no known kind.
std::optional<ImageProperties> copyContainerProperties(const ByteSource& source);

}  // namespace brivo::images
