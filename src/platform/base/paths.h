// SPDX-License-Identifier: MIT
// Pure functions over path strings. Paths are bytes; "/" separates components. *Thread-safe.*
#pragma once

#include <string>
#include <string_view>

namespace brivo {

/// The part after the last "/", trailing slashes aside; "/" for the root, "" for "".
std::string_view lastPathComponent(std::string_view path);
/// The part after the last dot of the last component; "" when there is none, when nothing follows
/// the dot, or when the dot comes first (".profile").
std::string_view pathExtension(std::string_view path);
/// The path without its extension and the dot before it.
std::string_view deletingPathExtension(std::string_view path);
/// The path of the folder that holds `path`; "/" for a component of the root.
std::string_view parentPath(std::string_view path);
/// `path` and `component` with exactly one "/" between them.
std::string appendingPathComponent(std::string_view path, std::string_view component);
/// True when `path` is `folder` or lies below it, by whole components.
bool isAtOrBelow(std::string_view path, std::string_view folder);

}  // namespace brivo
