// SPDX-License-Identifier: MIT
#include "platform/images/cr3.h"
#include "image_check.h"

// A CR3 is read within bounds, and its pictures are shown in the size in which they are stored.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace brivo::images;
  checkReader(readCr3File, data, size);
  const MemorySource source(std::as_bytes(std::span(data, size)));
  Parse parse(source, Scope::all);
  (void)readCr3File(parse);
  check(!parse.found.crop || parse.found.crop == parse.found.size);
  return 0;
}
