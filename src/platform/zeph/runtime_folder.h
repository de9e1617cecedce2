// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"

namespace brivo::zeph {

/// The folder that holds the sockets, claimed by one running service at a time. *Immutable.*
class RuntimeFolder {
 public:
  /// Makes the folder when it is missing (not those above it), insists that it belongs to this user
  /// and sets it to mode 0700, locks it, and removes sockets that a service which died left behind.
  /// An error when another service runs there and has not ended after `patience`.
  static Result<std::unique_ptr<RuntimeFolder>> claim(const std::string& path,
                                                      std::chrono::milliseconds patience = {});

  const std::string& path() const { return path_; }
  std::string pathOf(const std::string& name) const { return path_ + "/" + name; }

 private:
  RuntimeFolder(std::string path, UniqueFd lock) : path_(std::move(path)), lock_(std::move(lock)) {}

  const std::string path_;
  const UniqueFd lock_;  // the lock goes with the descriptor, however the process ends
};

}  // namespace brivo::zeph
