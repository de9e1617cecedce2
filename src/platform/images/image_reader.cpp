// SPDX-License-Identifier: MIT
#include "platform/images/image_reader.h"

#include "platform/images/container.h"
#include "platform/images/parse.h"

namespace brivo::images {

namespace {

std::optional<ImageProperties> read(const ByteSource& source, Scope scope) {
  Parse parse(source, scope);
  if (!readContainer(parse)) return std::nullopt;
  return std::move(parse.found);
}

}  // namespace

std::optional<ImageProperties> copySequentialProperties(const ByteSource& source) {
  return read(source, Scope::basics);
}

std::optional<ImageProperties> copyImageProperties(const ByteSource& source) {
  return read(source, Scope::all);
}

std::optional<ImageProperties> copyContainerProperties(const ByteSource& source) {
  return read(source, Scope::previews);
}

}  // namespace brivo::images
