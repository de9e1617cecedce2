// SPDX-License-Identifier: MIT
#include "support/image_bytes.h"

#include <algorithm>

namespace brivo::test {

namespace {

constexpr std::uint16_t kByte = 1, kAscii = 2, kShort = 3, kLong = 4, kRational = 5, kUndefined = 7,
                        kLong8 = 16;

}  // namespace

std::string integer(std::uint64_t value, std::size_t width, std::endian order) {
  std::string text;
  for (std::size_t i = 0; i < width; ++i, value >>= 8) text += static_cast<char>(value & 0xFF);
  if (order == std::endian::big) std::ranges::reverse(text);
  return text;
}

std::size_t TiffBytes::beginDirectory() {
  directories_.emplace_back();
  return directories_.size() - 1;
}

void TiffBytes::raw(std::uint16_t tag, std::uint16_t type, std::uint64_t count, std::string value) {
  directories_.back().fields.push_back({tag, type, count, std::move(value)});
}

void TiffBytes::ascii(std::uint16_t tag, std::string_view text) {
  raw(tag, kAscii, text.size() + 1, std::string(text) + '\0');
}

void TiffBytes::bytes(std::uint16_t tag, std::initializer_list<unsigned> values) {
  std::string value;
  for (const unsigned element : values) value += static_cast<char>(element);
  raw(tag, kByte, values.size(), value);
}

void TiffBytes::undefined(std::uint16_t tag, std::string_view value) {
  raw(tag, kUndefined, value.size(), std::string(value));
}

void TiffBytes::shorts(std::uint16_t tag, std::initializer_list<unsigned> values) {
  std::string value;
  for (const unsigned element : values) value += number(element, 2);
  raw(tag, kShort, values.size(), value);
}

void TiffBytes::longs(std::uint16_t tag, std::initializer_list<std::uint64_t> values) {
  std::string value;
  for (const std::uint64_t element : values) value += number(element, 4);
  raw(tag, kLong, values.size(), value);
}

void TiffBytes::rationals(std::uint16_t tag,
                          std::initializer_list<std::pair<std::uint32_t, std::uint32_t>> values) {
  std::string value;
  for (const auto& [numerator, denominator] : values) value += number(numerator, 4) + number(denominator, 4);
  raw(tag, kRational, values.size(), value);
}

void TiffBytes::directories(std::uint16_t tag, std::initializer_list<std::size_t> to) {
  raw(tag, big_ ? kLong8 : kLong, to.size(), {});
  directories_.back().fields.back().targets = to;
}

void TiffBytes::offsetOf(std::uint16_t tag, std::string content) {
  raw(tag, kLong, 1, std::move(content));
  directories_.back().fields.back().placed = true;
}

void TiffBytes::placed(std::uint16_t offsetTag, std::uint16_t lengthTag, std::string content) {
  const std::size_t length = content.size();
  offsetOf(offsetTag, std::move(content));
  longs(lengthTag, {length});
}

std::size_t TiffBytes::sizeOf(const Directory& directory) const {
  return big_ ? 8 + 20 * directory.fields.size() + 8 : 2 + 12 * directory.fields.size() + 4;
}

std::string TiffBytes::build(std::uint16_t magic, std::size_t gap) const {
  const std::size_t offsetBytes = big_ ? 8 : 4;
  std::vector<std::size_t> places;
  std::size_t end = (big_ ? 16 : 8) + gap;
  const std::size_t first = end;
  for (const Directory& directory : directories_) {
    places.push_back(end);
    end += sizeOf(directory);
  }
  std::string header = order_ == std::endian::little ? "II" : "MM";
  header += number(big_ ? 43 : magic, 2);
  if (big_) header += number(8, 2) + number(0, 2);
  header += number(first, offsetBytes) + std::string(gap, '\0');
  std::string directories, values;
  for (const Directory& directory : directories_) {
    directories += number(directory.fields.size(), big_ ? 8 : 2);
    for (const Field& field : directory.fields) {
      directories += number(field.tag, 2) + number(field.type, 2) + number(field.count, offsetBytes);
      const std::size_t width = field.type == kLong8 ? 8 : 4;
      std::string value = field.placed ? number(end + values.size(), width) : field.value;
      for (const std::size_t target : field.targets) value += number(places[target], width);
      if (field.placed) values += field.value;
      if (value.size() > offsetBytes) {
        const std::string offset = number(end + values.size(), offsetBytes);
        values += value;
        value = offset;
      }
      value.resize(offsetBytes, '\0');
      directories += value;
    }
    directories += number(directory.next != 0 ? places[directory.next - 1] : 0, offsetBytes);
  }
  return header + directories + values;
}

std::string jpegSegment(unsigned marker, std::string_view parameters) {
  return std::string("\xFF") + static_cast<char>(marker) +
         integer(parameters.size() + 2, 2, std::endian::big) + std::string(parameters);
}

std::string jpegFrame(unsigned width, unsigned height, unsigned components) {
  std::string frame = "\x08" + integer(height, 2, std::endian::big) + integer(width, 2, std::endian::big) +
                      static_cast<char>(components);
  for (unsigned i = 1; i <= components; ++i) frame += static_cast<char>(i) + std::string("\x11\0", 2);
  return jpegSegment(0xC0, frame);
}

std::string exifSegment(std::string_view tiff) {
  return jpegSegment(0xE1, std::string("Exif\0\0", 6) + std::string(tiff));
}

std::string jpeg(unsigned width, unsigned height, std::string_view segments) {
  return "\xFF\xD8" + std::string(segments) + jpegFrame(width, height) +
         jpegSegment(0xDA, std::string("\1\1\0\0\x3F\0", 6)) + "\xFF\xD9";
}

}  // namespace brivo::test
