// SPDX-License-Identifier: MIT
#pragma once

#include "platform/base/unique_fd.h"
#include "platform/decoding/image_decoder.h"
#include "platform/movies/movie_reader.h"

namespace brivo::imaging {

/// The worker's whole life: confines this process, says hello on `socket`, and has `decoder` and
/// `movies` serve one request after the other until the service hangs up (see
/// platform/decoding/worker_protocol.h). An allocation that fails costs its request alone. Gives the exit
/// status; 1 with a line on standard error when the process cannot be confined or the service breaks the
/// protocol. The process stays confined.
int runWorker(UniqueFd socket, ImageDecoder& decoder, MovieReader& movies);

}  // namespace brivo::imaging
