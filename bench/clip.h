// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::bench {

/// Makes a movie as cameras write it: H.264 of 1080p at 24 Mbit/s, moving shapes under the noise of a sensor,
/// with sound, and its index at the end. The extension of `path` says in which container. `ffmpeg` makes it.
void makeClip(const std::string& path, unsigned seconds);

/// Whether clips can be made; a note when not.
bool canMakeClips();

}  // namespace brivo::bench
