// SPDX-License-Identifier: MIT
#pragma once

#include <cstdio>  // jpeglib.h needs it

#include <jpeglib.h>

#include <csetjmp>

namespace brivo::imaging {

/// How the JPEG library's errors come back: it calls no function that returns, so it jumps. Whoever calls the
/// library does so below a setjmp(escape) in a function that has nothing to destroy.
struct JpegErrors {
  jpeg_error_mgr manager;  // first: the library knows this part alone
  std::jmp_buf escape;
};

/// Makes `errors` silent and jumping; what jpeg_common_struct::err points to.
jpeg_error_mgr* prepare(JpegErrors& errors);

}  // namespace brivo::imaging
