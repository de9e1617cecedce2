// SPDX-License-Identifier: MIT
#include "imaging/raw_stream.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <limits>
#include <string>
#include <string_view>

namespace brivo::imaging {
namespace {

/// Longer than the stream's window, each byte told by its place.
std::string longFile() {
  std::string bytes(100'000, '\0');
  for (std::size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<char>(i % 251);
  return bytes;
}

images::MemorySource sourceOf(std::string_view bytes) {
  return images::MemorySource(std::as_bytes(std::span(bytes)));
}

/// A medium that gives nothing behind its first `good` bytes.
class FailingSource final : public images::ByteSource {
 public:
  explicit FailingSource(std::uint64_t good) : good_(good) {}
  std::uint64_t size() const override { return 1'000'000; }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override {
    return offset >= good_ ? 0 : std::min<std::size_t>(buffer.size(), good_ - offset);
  }

 private:
  const std::uint64_t good_;
};

TEST(RawStream, PiecesOfAnySizeAndSingleBytesAreTheFile) {
  const std::string file = longFile();
  const auto source = sourceOf(file);
  RawStream stream(source);
  std::string seen;
  std::array<char, 40'000> piece{};
  for (const std::size_t size : {std::size_t{1}, std::size_t{5}, std::size_t{16'384}, std::size_t{40'000}}) {
    EXPECT_EQ(stream.read(piece.data(), 1, size), static_cast<int>(size));
    seen.append(piece.data(), size);
    seen.push_back(static_cast<char>(stream.get_char()));
    EXPECT_EQ(stream.tell(), static_cast<INT64>(seen.size()));
  }
  EXPECT_EQ(seen, file.substr(0, seen.size()));
}

TEST(RawStream, WholeItemsAreCountedAndTheRestIsReadToo) {
  const auto source = sourceOf("0123456789");
  RawStream stream(source);
  std::array<char, 12> items{};
  EXPECT_EQ(stream.read(items.data(), 4, 3), 2);
  EXPECT_EQ(std::string_view(items.data(), 10), "0123456789");
  EXPECT_EQ(stream.eof(), 1);
  EXPECT_EQ(stream.read(items.data(), 4, 1), 0);
  EXPECT_EQ(stream.read(items.data(), 0, 1), 0);
}

TEST(RawStream, ACountThatOverflowsReadsNoMoreThanThereIs) {
  const auto source = sourceOf("0123456789");
  RawStream stream(source);
  std::array<char, 10> items{};
  EXPECT_EQ(stream.read(items.data(), 5, std::numeric_limits<std::size_t>::max()), 2);
  EXPECT_EQ(stream.tell(), 10);
}

TEST(RawStream, SeekingStaysInTheFile) {
  const auto source = sourceOf("0123456789");
  RawStream stream(source);
  const auto at = [&](INT64 offset, int whence) {
    EXPECT_EQ(stream.seek(offset, whence), 0);
    return stream.tell();
  };
  EXPECT_EQ(at(4, SEEK_SET), 4);
  EXPECT_EQ(at(3, SEEK_CUR), 7);
  EXPECT_EQ(stream.get_char(), '7');
  EXPECT_EQ(at(-3, SEEK_CUR), 5);
  EXPECT_EQ(at(-1, SEEK_END), 9);
  EXPECT_EQ(at(-1, SEEK_SET), 0);
  EXPECT_EQ(at(11, SEEK_SET), 10);
  EXPECT_EQ(stream.get_char(), EOF);
  EXPECT_EQ(at(std::numeric_limits<INT64>::max(), SEEK_CUR), 10);
  EXPECT_EQ(at(std::numeric_limits<INT64>::min(), SEEK_END), 0);
}

TEST(RawStream, SeekingBackOutOfTheWindowReadsThereAgain) {
  const std::string file = longFile();
  const auto source = sourceOf(file);
  RawStream stream(source);
  stream.seek(90'000, SEEK_SET);
  EXPECT_EQ(stream.get_char(), 90'000 % 251);
  stream.seek(100, SEEK_SET);
  EXPECT_EQ(stream.get_char(), 100);
}

TEST(RawStream, LinesEndBehindTheirBreakOrWhereTheRoomEnds) {
  const auto source = sourceOf("one\ntwo three");
  RawStream stream(source);
  std::array<char, 6> line{};
  EXPECT_STREQ(stream.gets(line.data(), 6), "one\n");
  EXPECT_STREQ(stream.gets(line.data(), 6), "two t");
  EXPECT_STREQ(stream.gets(line.data(), 6), "hree");
  EXPECT_EQ(stream.gets(line.data(), 6), nullptr);
  EXPECT_EQ(stream.gets(line.data(), 0), nullptr);
}

TEST(RawStream, NumbersAreReadAsText) {
  const std::string file = " 42\n-1.5 x " + std::string(100, '9');
  const auto source = sourceOf(file);
  RawStream stream(source);
  int whole = 0;
  float broken = 0;
  EXPECT_EQ(stream.scanf_one("%d", &whole), 1);
  EXPECT_EQ(whole, 42);
  EXPECT_EQ(stream.scanf_one("%f", &broken), 1);
  EXPECT_EQ(broken, -1.5F);
  EXPECT_EQ(stream.scanf_one("%d", &whole), 0);
  EXPECT_EQ(whole, 42);
  EXPECT_EQ(stream.scanf_one("%f", &broken), 1);
  EXPECT_EQ(stream.tell(), 11 + 63);
  stream.seek(0, SEEK_END);
  EXPECT_EQ(stream.scanf_one("%d", &whole), EOF);
}

TEST(RawStream, WhereTheMediumFailsTheFileEnds) {
  const FailingSource source(20'000);
  RawStream stream(source);
  std::string bytes(50'000, '\0');
  EXPECT_EQ(stream.read(bytes.data(), 1, bytes.size()), 20'000);
  EXPECT_EQ(stream.get_char(), EOF);
  EXPECT_EQ(stream.read(bytes.data(), 1, 10), 0);
}

}  // namespace
}  // namespace brivo::imaging
