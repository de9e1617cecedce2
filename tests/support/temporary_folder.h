// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <string_view>

namespace brivo::test {

/// A fresh folder that goes, with all in it, when this goes.
class TemporaryFolder {
 public:
  TemporaryFolder();
  ~TemporaryFolder();
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;

  /// Canonical: no component is a symbolic link.
  const std::string& path() const { return path_; }
  std::string operator/(std::string_view name) const;

 private:
  std::string path_;
};

/// Makes a folder and those above it.
void makeFolder(const std::string& path);
/// Writes a file, making its folder when needed.
void writeFile(const std::string& path, std::string_view content);
std::string readFile(const std::string& path);

}  // namespace brivo::test
