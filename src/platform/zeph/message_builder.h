// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

namespace brivo::zeph {

/// Builds one D-Bus message at the end of a run of bytes, in little-endian order (D-Bus Specification,
/// "Marshalling"). A sink for Writer: its functions give 0, or -EMSGSIZE when the message has grown beyond
/// what D-Bus allows; it takes no descriptors. *Thread-bound.*
class MessageBuilder {
 public:
  /// The message begins at the end of `bytes`, which is borrowed.
  explicit MessageBuilder(std::vector<std::byte>& bytes) : bytes_(bytes), start_(bytes.size()) {}

  int appendBasic(char type, const void* value);
  int appendBytes(std::span<const std::byte> bytes);
  /// An array ('a'), a variant ('v') or a dictionary entry ('e').
  int open(char type, const char* contents);
  int close();

  void u8(std::uint8_t value) { integer(value, 1); }
  void u32(std::uint32_t value) { integer(value, 4); }
  void text(std::string_view value);
  void signature(std::string_view value);
  /// Zero bytes up to a multiple of `alignment` from the start of the message.
  void pad(std::size_t alignment);

  /// Bytes of the message so far.
  std::size_t size() const { return bytes_.size() - start_; }
  /// Overwrites four bytes of the message.
  void patch(std::size_t offset, std::uint32_t value);

 private:
  struct Container {
    char type = 0;
    std::size_t lengthAt = 0;
    std::size_t contentsAt = 0;
  };

  void integer(std::uint64_t value, std::size_t width);

  std::vector<std::byte>& bytes_;
  const std::size_t start_;
  std::vector<Container> open_;
};

}  // namespace brivo::zeph
