// SPDX-License-Identifier: MIT
#include "imaging/raw_stream.h"

#include <algorithm>
#include <cstdio>
#include <limits>
#include <string>

namespace brivo::imaging {

namespace {

constexpr std::size_t kLongestNumber = 63;
constexpr std::uint64_t kLargestFile = std::numeric_limits<INT64>::max();

bool isSpace(int character) { return character == ' ' || (character >= '\t' && character <= '\r'); }

/// `base` + `offset`, kept between 0 and `end`; `base` is not behind the end.
std::uint64_t moved(std::uint64_t base, INT64 offset, std::uint64_t end) {
  const auto distance = static_cast<std::uint64_t>(offset);
  if (offset < 0) return base - std::min(base, 0 - distance);
  return base + std::min(distance, end - base);
}

}  // namespace

RawStream::RawStream(const images::ByteSource& source)
    : source_(source), size_(std::min(source.size(), kLargestFile)) {}

std::span<const std::byte> RawStream::ahead() {
  if (position_ < windowStart_ || position_ - windowStart_ >= windowLength_) {
    const auto length = static_cast<std::size_t>(std::min<std::uint64_t>(window_.size(), size_ - position_));
    windowStart_ = position_;
    windowLength_ = source_.read(std::span(window_).first(length), position_);
  }
  return std::span(window_).first(windowLength_).subspan(static_cast<std::size_t>(position_ - windowStart_));
}

std::size_t RawStream::readBytes(std::span<std::byte> buffer) {
  std::size_t done = 0;
  while (done < buffer.size() && position_ < size_) {
    const auto rest = buffer.subspan(done);
    const bool isLarge = rest.size() >= window_.size();
    const auto bytes = isLarge ? std::span<const std::byte>() : ahead();
    const std::size_t count = isLarge ? source_.read(rest, position_) : std::min(rest.size(), bytes.size());
    if (count == 0) break;
    if (!isLarge) std::ranges::copy(bytes.first(count), rest.begin());
    done += count;
    position_ += count;
  }
  return done;
}

int RawStream::read(void* items, std::size_t size, std::size_t count) {
  if (size == 0) return 0;
  const std::uint64_t most = std::min<std::uint64_t>(size_ - position_, std::numeric_limits<int>::max());
  const auto whole = static_cast<std::size_t>(std::min<std::uint64_t>(count, most / size));
  // As fread() does, the bytes of the item that is cut off by the end are read too.
  const std::size_t bytes = whole < count ? static_cast<std::size_t>(most) : whole * size;
  return static_cast<int>(readBytes({static_cast<std::byte*>(items), bytes}) / size);
}

int RawStream::seek(INT64 offset, int whence) {
  const std::uint64_t base = whence == SEEK_CUR ? position_ : whence == SEEK_END ? size_ : 0;
  position_ = moved(base, offset, size_);
  return 0;
}

int RawStream::get_char() {
  const auto bytes = ahead();
  if (bytes.empty()) return EOF;
  ++position_;
  return std::to_integer<int>(bytes.front());
}

char* RawStream::gets(char* line, int size) {
  if (size < 1) return nullptr;
  const std::span text(line, static_cast<std::size_t>(size));
  std::size_t length = 0;
  while (length + 1 < text.size() && (length == 0 || text[length - 1] != '\n')) {
    const int character = get_char();
    if (character == EOF) break;
    text[length++] = static_cast<char>(character);
  }
  text[length] = '\0';
  return length == 0 ? nullptr : line;
}

void RawStream::skipSpaces() {
  for (auto bytes = ahead(); !bytes.empty() && isSpace(std::to_integer<int>(bytes.front())); bytes = ahead())
    ++position_;
}

int RawStream::scanf_one(const char* format, void* value) {
  skipSpaces();
  std::string number;
  for (auto bytes = ahead(); !bytes.empty() && number.size() < kLongestNumber; bytes = ahead()) {
    const int character = std::to_integer<int>(bytes.front());
    if (isSpace(character)) break;
    number.push_back(static_cast<char>(character));
    ++position_;
  }
  return number.empty() ? EOF : std::sscanf(number.c_str(), format, value);
}

}  // namespace brivo::imaging
