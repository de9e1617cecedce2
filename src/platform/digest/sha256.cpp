// SPDX-License-Identifier: MIT
#include "platform/digest/sha256.h"

#include <fmt/format.h>
#include <openssl/evp.h>

#include <array>
#include <new>

namespace brivo {

struct Sha256::State {
  State() : context(EVP_MD_CTX_new()) {
    if (!context || EVP_DigestInit_ex(context, EVP_sha256(), nullptr) != 1) throw std::bad_alloc();
  }
  ~State() { EVP_MD_CTX_free(context); }
  State(const State&) = delete;
  State& operator=(const State&) = delete;

  EVP_MD_CTX* context;
};

Sha256::Sha256() : state_(std::make_unique<State>()) {}
Sha256::~Sha256() = default;
Sha256::Sha256(Sha256&&) noexcept = default;
Sha256& Sha256::operator=(Sha256&&) noexcept = default;

void Sha256::add(std::span<const std::byte> bytes) {
  EVP_DigestUpdate(state_->context, bytes.data(), bytes.size());
}

std::string Sha256::hexDigest() {
  std::array<unsigned char, 32> digest{};
  EVP_DigestFinal_ex(state_->context, digest.data(), nullptr);
  std::string text;
  for (const unsigned char byte : digest) text += fmt::format("{:02x}", byte);
  return text;
}

std::string sha256Of(std::span<const std::byte> bytes) {
  Sha256 digest;
  digest.add(bytes);
  return digest.hexDigest();
}

std::string sha256Of(std::string_view text) { return sha256Of(std::as_bytes(std::span(text))); }

}  // namespace brivo
