// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <string_view>

namespace brivo {

/// A URL as text (RFC 3986), with the path of a file URL at hand. *Immutable.*
class Url {
 public:
  /// Takes the text as it is.
  explicit Url(std::string text) : text_(std::move(text)) {}
  /// The file URL (RFC 8089) of an absolute path; bytes that a URL may not hold are
  /// percent-encoded.
  static Url file(std::string_view path);

  const std::string& text() const { return text_; }
  bool isFile() const { return text_.starts_with("file:"); }
  /// The decoded path without a trailing slash; "" for anything but a file URL.
  std::string path() const;

  friend auto operator<=>(const Url&, const Url&) = default;

 private:
  std::string text_;
};

}  // namespace brivo
