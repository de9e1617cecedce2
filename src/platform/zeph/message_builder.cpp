// SPDX-License-Identifier: MIT
#include "platform/zeph/message_builder.h"

#include <cerrno>
#include <cstring>

namespace brivo::zeph {

namespace {

constexpr std::size_t kLongestArray = 67'108'864;

template <class Number>
Number valueAt(const void* value) {
  Number number{};
  std::memcpy(&number, value, sizeof number);
  return number;
}

std::size_t alignmentOf(char type) {
  switch (type) {
    case 'y':
    case 'g':
    case 'v':
      return 1;
    case 'n':
    case 'q':
      return 2;
    case 'x':
    case 't':
    case 'd':
    case '(':
    case '{':
      return 8;
    default:
      return 4;
  }
}

}  // namespace

void MessageBuilder::integer(std::uint64_t value, std::size_t width) {
  pad(width);
  for (std::size_t i = 0; i < width; ++i) bytes_.push_back(static_cast<std::byte>(value >> 8 * i & 0xFF));
}

void MessageBuilder::pad(std::size_t alignment) {
  bytes_.resize(start_ + (size() + alignment - 1) / alignment * alignment);
}

void MessageBuilder::text(std::string_view value) {
  u32(static_cast<std::uint32_t>(value.size()));
  const auto bytes = std::as_bytes(std::span(value));
  bytes_.insert(bytes_.end(), bytes.begin(), bytes.end());
  bytes_.push_back(std::byte{0});
}

void MessageBuilder::signature(std::string_view value) {
  u8(static_cast<std::uint8_t>(value.size()));
  const auto bytes = std::as_bytes(std::span(value));
  bytes_.insert(bytes_.end(), bytes.begin(), bytes.end());
  bytes_.push_back(std::byte{0});
}

void MessageBuilder::patch(std::size_t offset, std::uint32_t value) {
  for (std::size_t i = 0; i < 4; ++i)
    bytes_[start_ + offset + i] = static_cast<std::byte>(value >> 8 * i & 0xFF);
}

int MessageBuilder::appendBasic(char type, const void* value) {
  switch (type) {
    case 's':
      text(static_cast<const char*>(value));
      return 0;
    case 'b':
    case 'i':
    case 'u':
      integer(valueAt<std::uint32_t>(value), 4);
      return 0;
    case 'x':
    case 't':
    case 'd':
      integer(valueAt<std::uint64_t>(value), 8);
      return 0;
    default:
      return -EINVAL;
  }
}

int MessageBuilder::appendBytes(std::span<const std::byte> bytes) {
  if (bytes.size() > kLongestArray) return -EMSGSIZE;
  u32(static_cast<std::uint32_t>(bytes.size()));
  bytes_.insert(bytes_.end(), bytes.begin(), bytes.end());
  return 0;
}

int MessageBuilder::open(char type, const char* contents) {
  Container container{type};
  if (type == 'a') {
    u32(0);
    container.lengthAt = size() - 4;
    pad(alignmentOf(*contents));
    container.contentsAt = size();
  } else if (type == 'v') {
    signature(contents);
  } else {
    pad(8);
  }
  open_.push_back(container);
  return 0;
}

int MessageBuilder::close() {
  const Container container = open_.back();
  open_.pop_back();
  if (container.type != 'a') return 0;
  const std::size_t length = size() - container.contentsAt;
  if (length > kLongestArray) return -EMSGSIZE;
  patch(container.lengthAt, static_cast<std::uint32_t>(length));
  return 0;
}

}  // namespace brivo::zeph
