// SPDX-License-Identifier: MIT
#include "platform/types/file_types.h"

#include <algorithm>
#include <array>

namespace brivo {

namespace {

/// Sorted, so that a look-up is a binary search.
template <std::size_t N>
constexpr bool contains(const std::array<std::string_view, N>& sorted, std::string_view extension) {
  return std::ranges::binary_search(sorted, extension);
}

constexpr std::array<std::string_view, 21> kCameraRaw{"3fr", "arw", "cr2", "cr3", "crw", "dcr", "dng",
                                                      "erf", "fff", "iiq", "k25", "kdc", "mef", "mos",
                                                      "mrw", "nef", "nrw", "orf", "pef", "raf", "raw"};
constexpr std::array<std::string_view, 7> kMoreCameraRaw{"rw2", "rwl", "sr2", "srf", "srw", "tif", "x3f"};

constexpr std::array<std::string_view, 23> kImages{"avif", "bmp",  "dib", "gif", "heic", "heif", "hif", "j2c",
                                                   "j2k",  "jfif", "jp2", "jpc", "jpe",  "jpeg", "jpf", "jpg",
                                                   "jpx",  "mpo",  "png", "thm", "tif",  "tiff", "webp"};

constexpr std::array<std::string_view, 30> kMovies{"3g2", "3ga", "3gp", "3gpp", "asf",  "avi", "divx", "dv",
                                                   "flv", "m1v", "m2t", "m2ts", "m2v",  "m4v", "mkv",  "mod",
                                                   "mov", "mp4", "mpe", "mpeg", "mpg",  "mts", "mxf",  "ogv",
                                                   "qt",  "tod", "ts",  "vob",  "webm", "wmv"};

constexpr std::array<std::string_view, 16> kAudio{"aac", "aif", "aifc", "aiff", "amr", "caf", "flac", "m4a",
                                                  "m4b", "mka", "mp2",  "mp3",  "oga", "ogg", "wav",  "wma"};

static_assert(std::ranges::is_sorted(kCameraRaw) && std::ranges::is_sorted(kMoreCameraRaw));
static_assert(std::ranges::is_sorted(kImages) && std::ranges::is_sorted(kMovies) &&
              std::ranges::is_sorted(kAudio));

}  // namespace

bool isCameraRawExtension(std::string_view extension) {
  return contains(kCameraRaw, extension) || contains(kMoreCameraRaw, extension);
}

bool isDecodableImageExtension(std::string_view extension) {
  return contains(kImages, extension) || isCameraRawExtension(extension);
}

bool isMovieExtension(std::string_view extension) { return contains(kMovies, extension); }

bool isAudioExtension(std::string_view extension) { return contains(kAudio, extension); }

}  // namespace brivo
