// SPDX-License-Identifier: MIT
#pragma once

#include <libraw/libraw.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// A ByteSource as LibRaw reads files, through a window, because LibRaw asks for single bytes. What lies
/// outside the file, and what the medium does not give, is its end. *Thread-bound.*
class RawStream final : public LibRaw_abstract_datastream {
 public:
  /// `source` must outlive this.
  explicit RawStream(const images::ByteSource& source);

  int valid() override { return 1; }
  /// Whole items that were read, as fread() counts them.
  int read(void* items, std::size_t size, std::size_t count) override;
  /// A place outside the file becomes the nearer end of it.
  int seek(INT64 offset, int whence) override;
  INT64 tell() override { return static_cast<INT64>(position_); }
  INT64 size() override { return static_cast<INT64>(size_); }
  int get_char() override;
  char* gets(char* line, int size) override;
  /// One number, as fscanf() reads it.
  int scanf_one(const char* format, void* value) override;
  int eof() override { return position_ >= size_ ? 1 : 0; }
  void* make_jas_stream() override { return nullptr; }

 private:
  std::size_t readBytes(std::span<std::byte> buffer);
  /// The bytes of the window from the position on; the window is moved there when it lies elsewhere.
  std::span<const std::byte> ahead();
  void skipSpaces();

  const images::ByteSource& source_;
  const std::uint64_t size_;
  std::uint64_t position_ = 0;  ///< never behind the end
  std::uint64_t windowStart_ = 0;
  std::size_t windowLength_ = 0;
  std::array<std::byte, 16'384> window_{};
};

}  // namespace brivo::imaging
