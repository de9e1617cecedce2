// SPDX-License-Identifier: MIT
#pragma once

#include <dirent.h>

#include <memory>
#include <string>

#include "platform/base/unique_fd.h"

namespace brivo {

struct DirectoryCloser {
  void operator()(DIR* directory) const { ::closedir(directory); }
};

/// A directory that is being listed. Null when it could not be opened; errno says why.
using Directory = std::unique_ptr<DIR, DirectoryCloser>;

/// Takes the descriptor of a directory.
Directory listDirectory(UniqueFd directory);
/// Follows symbolic links.
Directory listDirectory(const std::string& path);

}  // namespace brivo
