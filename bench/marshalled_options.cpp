// SPDX-License-Identifier: MIT
#include "marshalled_options.h"

namespace brivo::bench {

namespace {

constexpr std::size_t kLargestAlignment = 8;

template <class Number>
std::string littleEndian(Number number) {
  std::string bytes(sizeof number, '\0');
  for (std::size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<char>(number >> 8 * i & 0xFF);
  return bytes;
}

}  // namespace

std::string marshalled(std::uint64_t number) { return littleEndian(number); }

MarshalledOptions& MarshalledOptions::setNumber(std::string_view key, std::uint64_t value) {
  beginEntry(key, "t");
  align(sizeof value);
  entries_ += marshalled(value);
  return *this;
}

MarshalledOptions& MarshalledOptions::setTrue(std::string_view key) {
  beginEntry(key, "b");
  append(1);
  return *this;
}

MarshalledOptions& MarshalledOptions::setMemory(std::string_view key, std::uint64_t size) {
  beginEntry(key, "(ht)");
  align(kLargestAlignment);
  append(0);
  align(sizeof size);
  entries_ += marshalled(size);
  return *this;
}

std::string MarshalledOptions::bytes() const {
  const std::string length = littleEndian(static_cast<std::uint32_t>(entries_.size()));
  return length + std::string(kLargestAlignment - length.size(), '\0') + entries_;
}

void MarshalledOptions::beginEntry(std::string_view key, std::string_view signature) {
  align(kLargestAlignment);
  append(static_cast<std::uint32_t>(key.size()));
  entries_.append(key) += '\0';
  entries_ += static_cast<char>(signature.size());
  entries_.append(signature) += '\0';
}

void MarshalledOptions::align(std::size_t boundary) {
  while (entries_.size() % boundary != 0) entries_ += '\0';
}

void MarshalledOptions::append(std::uint32_t number) {
  align(sizeof number);
  entries_ += littleEndian(number);
}

}  // namespace brivo::bench
