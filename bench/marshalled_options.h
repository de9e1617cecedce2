// SPDX-License-Identifier: MIT
// The body of a request for an object, as D-Bus lays it out.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace brivo::bench {

/// A number of 64 bits.
std::string marshalled(std::uint64_t number);

/// A dictionary of options ("a{sv}"). *Thread-bound.*
class MarshalledOptions {
 public:
  MarshalledOptions& setNumber(std::string_view key, std::uint64_t value);
  MarshalledOptions& setTrue(std::string_view key);
  /// The first descriptor that the message brings along, and how many bytes of it count.
  MarshalledOptions& setMemory(std::string_view key, std::uint64_t size);

  /// For a place in the body that 8 divides.
  std::string bytes() const;

 private:
  /// Begins an entry, up to its value of the type `signature`.
  void beginEntry(std::string_view key, std::string_view signature);
  void align(std::size_t boundary);
  void append(std::uint32_t number);

  std::string entries_;
};

}  // namespace brivo::bench
