// SPDX-License-Identifier: MIT
#include "imaging/jpeg_errors.h"

namespace brivo::imaging {

namespace {

[[noreturn]] void jump(j_common_ptr codec) {
  std::longjmp(reinterpret_cast<JpegErrors*>(codec->err)->escape, 1);
}

void stayQuiet(j_common_ptr /*codec*/) {}

}  // namespace

jpeg_error_mgr* prepare(JpegErrors& errors) {
  jpeg_error_mgr* manager = jpeg_std_error(&errors.manager);
  manager->error_exit = jump;
  manager->output_message = stayQuiet;
  return manager;
}

}  // namespace brivo::imaging
