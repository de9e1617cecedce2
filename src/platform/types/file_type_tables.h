// SPDX-License-Identifier: MIT
// File-name extensions by kind, in lower case and sorted. The source is the shared MIME database of
// freedesktop.org (version 2.2): every glob of a kind's types that is one plain extension. What differs from
// it is said at each table.
#pragma once

#include <algorithm>
#include <array>
#include <string_view>

namespace brivo::types {

/// The types below image/x-dcraw. The database does not know 3fr (Hasselblad), erf (Epson), fff (Imacon),
/// gpr (GoPro), iiq (Phase One), mef (Mamiya), mos (Leaf), ori (Olympus), ptx (Pentax), rwl (Leica), srw
/// (Samsung) and tif, which Canon and Kodak gave to raw files.
inline constexpr auto kCameraRaw = std::to_array<std::string_view>(
    {"3fr", "arw", "cr2", "cr3", "crw", "dcr", "dng", "erf", "fff", "gpr", "iiq",
     "k25", "kdc", "mef", "mos", "mrw", "nef", "nrw", "orf", "ori", "pef", "ptx",
     "raf", "raw", "rw2", "rwl", "sr2", "srf", "srw", "tif", "x3f"});

/// JPEG, HEIF, AVIF, PNG, TIFF, WebP, GIF, BMP and JPEG 2000. The database does not know jfif, mpo (several
/// JPEGs in a file, CIPA DC-007) and thm (the JPEG beside a movie or a raw file, DCF).
inline constexpr auto kImages = std::to_array<std::string_view>(
    {"avif", "avifs", "bmp", "dib", "gif",  "heic", "heif", "hif", "j2c", "j2k", "jfif", "jp2", "jpc",
     "jpe",  "jpeg",  "jpf", "jpg", "jpg2", "jpx",  "mpo",  "png", "thm", "tif", "tiff", "webp"});

/// Types of video. Left out: lists and indexes of movies, and sounds. The database has asf and mxf among
/// applications, mod as music (camcorders write MPEG-2 under it), and does not know m1v, m2v and tod.
inline constexpr auto kMovies = std::to_array<std::string_view>(
    {"3g2",  "3ga", "3gp",  "3gp2",  "3gpp", "3gpp2", "asf", "avf",  "avi", "axv",  "bik",  "bk2",
     "divx", "dv",  "f4v",  "flc",   "fli",  "flv",   "fxm", "lrv",  "m1v", "m2t",  "m2ts", "m2v",
     "m4v",  "mj2", "mjp2", "mjpeg", "mjpg", "mk3d",  "mkv", "mng",  "mod", "moov", "mov",  "movie",
     "mp4",  "mpe", "mpeg", "mpg",   "mts",  "mxf",   "nsv", "ogm",  "ogv", "qt",   "qtvr", "rv",
     "rvx",  "smk", "tod",  "ts",    "viv",  "vivo",  "vob", "webm", "wmv"});

/// Types of audio. Left out: lists of sounds, and subtitles. The database does not know caf (Core Audio).
inline constexpr auto kSounds = std::to_array<std::string_view>(
    {"669", "aa",     "aac",  "aax", "ac3", "adts", "aif", "aifc",  "aiff", "aiffc", "amr",     "ape",
     "au",  "awb",    "axa",  "caf", "dff", "dsf",  "dts", "dtshd", "f4a",  "f4b",   "flac",    "gsm",
     "it",  "kar",    "loas", "m15", "m4a", "m4b",  "m4r", "med",   "mid",  "midi",  "minipsf", "mka",
     "mo3", "mp+",    "mp2",  "mp3", "mpc", "mpga", "mpp", "mtm",   "mxmf", "oga",   "ogg",     "opus",
     "psf", "psflib", "psid", "ra",  "rax", "s3m",  "sid", "snd",   "spx",  "stm",   "tta",     "ult",
     "uni", "voc",    "wav",  "wma", "wv",  "wvc",  "wvp", "xhe",   "xi",   "xm",    "xmf"});

static_assert(std::ranges::is_sorted(kCameraRaw) && std::ranges::is_sorted(kImages) &&
              std::ranges::is_sorted(kMovies) && std::ranges::is_sorted(kSounds));

}  // namespace brivo::types
