// SPDX-License-Identifier: MIT
#pragma once

namespace brivo::imaging {

/// Has libheif decode all HEVC and AV1 of this process with Codec, from the first call on. The decoders
/// that it brings along start threads, and wait for ever where that is forbidden. *Thread-safe.*
void useOurCodecInLibheif();

}  // namespace brivo::imaging
