// SPDX-License-Identifier: MIT
// How fast thumbnails come, those that lie in files and those that have to be made, and what that costs.
#include "decoded_thumbnail_figures.h"
#include "device_thumbnail_figure.h"
#include "embedded_thumbnail_figures.h"
#include "heic_figures.h"
#include "movie_frame_figures.h"
#include "options.h"
#include "raw_preview_figures.h"
#include "worker_figures.h"

int main(int count, char** words) {
  using namespace brivo::bench;
  return runBenchmark(count, words, [](const Options& options) {
    printEmbeddedThumbnailFigures(options);
    printRawPreviewFigures(options);
    printDecodedThumbnailFigures(options);
    printDeviceThumbnailFigure(options);
    printWorkerFigures(options);
    printHeicFigures(options);
    printMovieFrameFigures(options);
  });
}
