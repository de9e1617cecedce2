// SPDX-License-Identifier: MIT
#include "platform/images/container.h"

#include <algorithm>
#include <array>

#include "platform/images/bmp.h"
#include "platform/images/cr3.h"
#include "platform/images/crw.h"
#include "platform/images/gif.h"
#include "platform/images/heif.h"
#include "platform/images/jpeg.h"
#include "platform/images/mrw.h"
#include "platform/images/png.h"
#include "platform/images/raf.h"
#include "platform/images/tiff.h"
#include "platform/images/webp.h"
#include "platform/images/x3f.h"

namespace brivo::images {

namespace {

/// Reads if the bytes are in its container; false, with nothing found, when they are not.
using Reader = bool (*)(Parse&);

constexpr std::array kReaders{readJpegFile, readTiffFile, readHeifFile, readCr3File, readPng, readWebp,
                              readGif,      readBmp,      readRaf,      readCrw,     readMrw, readX3f};

}  // namespace

bool readContainer(Parse& parse) {
  return std::ranges::any_of(kReaders, [&](Reader reader) { return reader(parse); });
}

}  // namespace brivo::images
