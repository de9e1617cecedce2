// SPDX-License-Identifier: MIT
#include "picture_peers.h"

#include "command.h"
#ifdef BENCH_LIBEXIF
#include "libexif_loop.h"
#endif
#ifdef BENCH_EXIV2
#include "libexiv2_loop.h"
#endif

namespace brivo::bench {

namespace {

void listWithGphoto2(const std::string& card) {
  runOrThrow({"gphoto2", "--camera", "Mass Storage Camera", "--port", "disk:" + card, "--list-files"});
}

void readWithExiftool(const std::string& card) {
  runOrThrow({"exiftool", "-fast2", "-json", "-n", "-q", "-ImageWidth", "-ImageHeight", "-Orientation",
              "-DateTimeOriginal", "-ThumbnailOffset", "-ThumbnailLength", "-r", "-ext", "JPG",
              card + "/DCIM"});
}

}  // namespace

std::vector<PicturePeer> picturePeers() {
  std::vector<PicturePeer> peers;
  if (isInstalled("gphoto2")) {
    peers.push_back({"gphoto2 --list-files, which reads no picture", listWithGphoto2, 1.0});
  } else {
    printNote("no comparison with gphoto2, which is not installed");
  }
#ifdef BENCH_LIBEXIF
  peers.push_back({"libexif in one thread", readWithLibexif, 0.4});
#else
  printNote("no comparison with libexif, without which this was built");
#endif
#ifdef BENCH_EXIV2
  peers.push_back({"libexiv2 in one thread", readWithLibexiv2, std::nullopt});
#else
  printNote("no comparison with libexiv2, without which this was built");
#endif
  return peers;
}

std::optional<PicturePeer> exiftool() {
  if (run({"exiftool", "-ver"}).exitCode == 0)
    return PicturePeer{"exiftool -fast2", readWithExiftool, std::nullopt};
  printNote("no comparison with exiftool, which is not installed");
  return std::nullopt;
}

}  // namespace brivo::bench
