// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "platform/base/result.h"
#include "platform/base/value.h"

namespace brivo {

/// Persistent preferences: one property-list file per domain in one folder. *Thread-safe*; of two
/// writers at once the last wins, and a reader sees either the old or the new file.
class PreferencesStore {
 public:
  /// `folder` is made, for this user alone, when a domain is first written.
  explicit PreferencesStore(std::string folder) : folder_(std::move(folder)) {}

  /// Empty when the domain has no file or the file is no property list.
  Dictionary read(const std::string& domain) const;
  /// Replaces the domain's file in one step, on disk when it returns. None on success.
  [[nodiscard]] std::optional<SystemError> write(const std::string& domain,
                                                 const Dictionary& preferences) const;

 private:
  std::string pathOf(const std::string& domain) const;

  const std::string folder_;
};

/// The dictionary in the property-list file at `path`; none when it is missing, unreadable, larger
/// than 1 MiB or no property list.
std::optional<Dictionary> readPropertyListFile(const std::string& path);

}  // namespace brivo
