// SPDX-License-Identifier: MIT
// SHA-256 (FIPS 180-4).
#pragma once

#include <cstddef>
#include <memory>
#include <span>
#include <string>
#include <string_view>

namespace brivo {

/// The digest of bytes that come piece by piece. *Thread-bound.*
class Sha256 {
 public:
  Sha256();
  ~Sha256();
  Sha256(Sha256&&) noexcept;
  Sha256& operator=(Sha256&&) noexcept;

  void add(std::span<const std::byte> bytes);
  /// 64 lower-case hexadecimal digits. Once; nothing may be added after it.
  std::string hexDigest();

 private:
  struct State;
  std::unique_ptr<State> state_;
};

/// The digest of `bytes`, as Sha256::hexDigest() gives it.
std::string sha256Of(std::span<const std::byte> bytes);
std::string sha256Of(std::string_view text);

}  // namespace brivo
