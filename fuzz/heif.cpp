// SPDX-License-Identifier: MIT
#include "platform/images/heif.h"
#include "image_check.h"

// A HEIF is read within bounds; where it has a primary picture with a size, it says how that is shown.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace brivo::images;
  checkReader(readHeifFile, data, size);
  const MemorySource source(std::as_bytes(std::span(data, size)));
  Parse parse(source, Scope::all);
  (void)readHeifFile(parse);
  if (parse.found.depth != 0) check(parse.found.orientation != 0);
  return 0;
}
