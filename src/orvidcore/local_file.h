// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>

#include "orvidcore/result.h"
#include "platform/base/unique_fd.h"

namespace orvid {

/// A file that appears under its name only when it is whole. *Thread-bound.*
class LocalFile {
 public:
  /// Makes a temporary file beside `path`.
  static Result<std::unique_ptr<LocalFile>> create(const std::string& path);
  /// Removes the temporary file unless it was committed.
  ~LocalFile();
  LocalFile(const LocalFile&) = delete;
  LocalFile& operator=(const LocalFile&) = delete;

  Result<Done> append(std::span<const std::byte> bytes);
  /// Puts the file on disk and gives it its name.
  Result<Done> commit();

 private:
  LocalFile(std::string path, std::string temporary, brivo::UniqueFd fd)
      : path_(std::move(path)), temporary_(std::move(temporary)), fd_(std::move(fd)) {}

  const std::string path_;
  std::string temporary_;  // empty when there is none any more
  brivo::UniqueFd fd_;
};

}  // namespace orvid
