// SPDX-License-Identifier: MIT
#pragma once

#include <fcntl.h>

#include <string>
#include <string_view>

#include "platform/base/unique_fd.h"
#include "support/temporary_folder.h"

namespace brivo::test {

/// A file with `content`, open for reading alone, and without a name.
inline UniqueFd fileWith(std::string_view content) {
  const TemporaryFolder folder;
  const std::string path = folder / "file";
  writeFile(path, content);
  return UniqueFd(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
}

}  // namespace brivo::test
