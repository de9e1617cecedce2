// SPDX-License-Identifier: MIT
// What kind of file a file-name extension stands for. The tables follow the globs of the shared MIME database
// (freedesktop.org). Extensions are given in lower case without the dot. Pure and *thread-safe*.
#pragma once

#include <string_view>

namespace brivo {

/// True when the image decoders read files with this extension.
bool isDecodableImageExtension(std::string_view extension);
/// True for the extensions registered for camera raw images.
bool isCameraRawExtension(std::string_view extension);
bool isMovieExtension(std::string_view extension);
bool isAudioExtension(std::string_view extension);

// Identifiers of the generic type classes.
inline constexpr std::string_view kGenericImageType = "public.image";
inline constexpr std::string_view kGenericMovieType = "public.movie";
inline constexpr std::string_view kGenericAudioType = "public.audio";
inline constexpr std::string_view kGenericDataType = "public.data";

}  // namespace brivo
