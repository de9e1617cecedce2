// SPDX-License-Identifier: MIT
#include "brivoctl/output_file.h"

#include <cerrno>
#include <filesystem>

#include "platform/base/paths.h"
#include "platform/digest/sha256.h"
#include "platform/files/part_file.h"

namespace brivoctl {

namespace {

namespace fs = std::filesystem;

/// A link to a file stays a link.
std::string withoutLinks(const std::string& path) {
  std::error_code error;
  const fs::path target = fs::canonical(path, error);
  return error ? path : target.string();
}

std::string folderOf(const std::string& path) {
  return path.find('/') == std::string::npos ? "." : std::string(brivo::parentPath(path));
}

std::string partPath(const std::string& path) {
  return brivo::appendingPathComponent(folderOf(path),
                                       ".orvid-" + brivo::sha256Of(path).substr(0, 16) + ".part");
}

std::optional<brivo::SystemError> fill(brivo::PartFile& part, std::span<const std::byte> bytes,
                                       const std::string& path) {
  if (auto error = part.truncate(0)) return error;
  if (auto error = part.append(bytes)) return error;
  if (auto error = part.synchronize()) return error;
  return part.publish(path);
}

}  // namespace

std::optional<std::string> outputObstacle(const std::string& path) {
  std::error_code error;
  if (fs::is_directory(path, error)) return path + " is a folder";
  if (fs::exists(path, error) && !fs::is_regular_file(path, error)) return path + " is no ordinary file";
  const std::string folder = folderOf(path);
  if (!fs::is_directory(folder, error)) return "there is no folder " + folder;
  return std::nullopt;
}

std::optional<std::string> writeOutput(const std::string& path, std::span<const std::byte> bytes) {
  if (auto obstacle = outputObstacle(path)) return obstacle;
  const std::string target = withoutLinks(path);
  const auto part = brivo::PartFile::open(partPath(target));
  if (!part.ok()) {
    return part.error().code == EWOULDBLOCK ? path + " is being written by somebody else"
                                            : part.error().text();
  }
  const auto error = fill(**part, bytes, target);
  if (!error) return std::nullopt;
  (*part)->discard();
  return error->text();
}

}  // namespace brivoctl
