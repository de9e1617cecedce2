// SPDX-License-Identifier: MIT
#include "platform/base/directory.h"

#include <fcntl.h>

namespace brivo {

Directory listDirectory(UniqueFd directory) {
  DIR* listing = directory ? ::fdopendir(directory.get()) : nullptr;
  if (listing) (void)directory.release();  // the listing owns it now
  return Directory(listing);
}

Directory listDirectory(const std::string& path) {
  return listDirectory(UniqueFd(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NONBLOCK | O_CLOEXEC)));
}

}  // namespace brivo
