// SPDX-License-Identifier: MIT
#include <sys/socket.h>
#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>

#include "imaging/local_image_decoder.h"
#include "imaging/local_movie_reader.h"
#include "imaging/worker.h"
#include "platform/decoding/worker_protocol.h"

namespace {

bool isSocket(int fd) {
  struct stat status {};
  return ::fstat(fd, &status) == 0 && S_ISSOCK(status.st_mode);
}

}  // namespace

int main(int argc, char**) {
  using brivo::LocalImageDecoder;
  if (argc > 1 || !isSocket(brivo::kWorkerSocket)) {
    std::fputs(
        "brivod-imaging decodes pictures and movies for brivod, which starts it; it does nothing by "
        "itself.\n",
        stderr);
    return 2;
  }
  LocalImageDecoder::prepare();
  LocalImageDecoder decoder;
  brivo::LocalMovieReader movies;
  // Without the usual end: what a sanitizer does there needs rights that are gone.
  std::_Exit(brivo::imaging::runWorker(brivo::UniqueFd(brivo::kWorkerSocket), decoder, movies));
}
