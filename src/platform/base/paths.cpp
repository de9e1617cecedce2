// SPDX-License-Identifier: MIT
#include "platform/base/paths.h"

namespace brivo {

namespace {

std::string_view withoutTrailingSlashes(std::string_view path) {
  while (path.size() > 1 && path.ends_with('/')) path.remove_suffix(1);
  return path;
}

}  // namespace

std::string_view lastPathComponent(std::string_view path) {
  path = withoutTrailingSlashes(path);
  if (path == "/") return path;
  return path.substr(path.rfind('/') + 1);  // npos + 1 is 0
}

std::string_view pathExtension(std::string_view path) {
  const std::string_view name = lastPathComponent(path);
  const auto dot = name.rfind('.');
  if (dot == std::string_view::npos || dot == 0) return {};
  return name.substr(dot + 1);
}

std::string_view deletingPathExtension(std::string_view path) {
  path = withoutTrailingSlashes(path);
  const std::string_view extension = pathExtension(path);
  return extension.empty() ? path : path.substr(0, path.size() - extension.size() - 1);
}

std::string_view parentPath(std::string_view path) {
  path = withoutTrailingSlashes(path);
  const auto slash = path.rfind('/');
  if (slash == std::string_view::npos) return {};
  return slash == 0 ? path.substr(0, 1) : path.substr(0, slash);
}

std::string appendingPathComponent(std::string_view path, std::string_view component) {
  std::string joined(path);
  if (!joined.empty() && !joined.ends_with('/')) joined += '/';
  joined += component;
  return joined;
}

bool isAtOrBelow(std::string_view path, std::string_view folder) {
  folder = withoutTrailingSlashes(folder);
  if (!path.starts_with(folder)) return false;
  return path.size() == folder.size() || folder == "/" || path[folder.size()] == '/';
}

}  // namespace brivo
