// SPDX-License-Identifier: MIT
#include "platform/types/file_types.h"

#include "platform/types/file_type_tables.h"

namespace brivo {

bool isCameraRawExtension(std::string_view extension) {
  return std::ranges::binary_search(types::kCameraRaw, extension);
}

bool isDecodableImageExtension(std::string_view extension) {
  return std::ranges::binary_search(types::kImages, extension) || isCameraRawExtension(extension);
}

bool isMovieExtension(std::string_view extension) {
  return std::ranges::binary_search(types::kMovies, extension);
}

bool isAudioExtension(std::string_view extension) {
  return std::ranges::binary_search(types::kSounds, extension);
}

}  // namespace brivo
