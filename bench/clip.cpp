// SPDX-License-Identifier: MIT
#include "clip.h"

#include <filesystem>

#include "command.h"
#include "figures.h"
#include "support/temporary_folder.h"

namespace brivo::bench {

namespace {

/// What is coded once, and then repeated as it is.
constexpr unsigned kPieceSeconds = 2;

void makePiece(const std::string& path) {
  const std::string duration = ":duration=" + std::to_string(kPieceSeconds);
  runOrThrow({"ffmpeg",   "-nostdin",
              "-v",       "error",
              "-f",       "lavfi",
              "-i",       "testsrc2=size=1920x1080:rate=25" + duration,
              "-f",       "lavfi",
              "-i",       "sine=sample_rate=48000" + duration,
              "-vf",      "noise=alls=4:allf=t",
              "-c:v",     "libx264",
              "-preset",  "superfast",
              "-pix_fmt", "yuv420p",
              "-b:v",     "24M",
              "-maxrate", "24M",
              "-bufsize", "6M",
              "-g",       "12",
              "-c:a",     "aac",
              path});
}

}  // namespace

void makeClip(const std::string& path, unsigned seconds) {
  const test::TemporaryFolder folder;
  const std::string piece = folder / "piece" + std::filesystem::path(path).extension().string();
  makePiece(piece);
  const std::string repeats = std::to_string(seconds / kPieceSeconds - 1);
  runOrThrow({"ffmpeg", "-nostdin", "-v", "error", "-stream_loop", repeats, "-i", piece, "-c", "copy", path});
}

bool canMakeClips() {
  if (isInstalled("ffmpeg")) return true;
  printNote("no movies: ffmpeg is not installed");
  return false;
}

}  // namespace brivo::bench
