// SPDX-License-Identifier: MIT
#include "ptp/codec.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <random>

#include "support/standard_error.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

/// A buffer that is read and written from its start, with room behind whatever a limit says.
struct Buffer {
  std::array<std::uint8_t, 2048> bytes{};

  Buffer() = default;
  Buffer(std::initializer_list<std::uint8_t> start) { std::copy(start.begin(), start.end(), bytes.begin()); }

  PTPReadCursor reading() const { return bytes.data(); }
  PTPWriteCursor writing() { return bytes.data(); }
  std::vector<std::uint8_t> first(std::size_t count) const {
    return {bytes.begin(), bytes.begin() + static_cast<long>(count)};
  }
};

TEST(CodecTest, ASignedReadOfFFFFIsMinus1AndAnUnsignedOne65535) {
  const Buffer buffer{0xFF, 0xFF};
  PTPReadCursor cursor = buffer.reading();
  EXPECT_EQ(ReadSInt16(cursor), -1);
  EXPECT_EQ(cursor, buffer.reading() + 2);
  cursor = buffer.reading();
  EXPECT_EQ(ReadUInt16(cursor), 65535u);
}

TEST(CodecTest, IntegersAreLittleEndianAndNeedNoAlignment) {
  const Buffer buffer{0, 1, 2, 3, 4, 5, 6, 7, 8};
  PTPReadCursor cursor = buffer.reading() + 1;
  EXPECT_EQ(ReadUInt64(cursor), 0x0807060504030201u);
  cursor = buffer.reading() + 1;
  EXPECT_EQ(ReadUInt32(cursor), 0x04030201u);
  EXPECT_EQ(cursor, buffer.reading() + 5);
}

TEST(CodecTest, A16BitCheckedReadWithExactly2BytesLeftSucceedsAndWith1DoesNotMove) {
  const Buffer buffer{0x34, 0x12};
  PTPReadCursor cursor = buffer.reading();
  EXPECT_EQ(ReadUInt16MaxSize(cursor, buffer.reading() + 2), 0x1234u);
  EXPECT_EQ(cursor, buffer.reading() + 2);
  cursor = buffer.reading();
  EXPECT_EQ(ReadUInt16MaxSize(cursor, buffer.reading() + 1), 0u);
  EXPECT_EQ(cursor, buffer.reading());
}

/// Every checked integer reader at every limit from nothing to more than enough.
template <class Value>
void checkAtEveryLimit(Value (*readChecked)(PTPReadCursor&, PTPReadCursor), Value (*read)(PTPReadCursor&),
                       std::ptrdiff_t width) {
  const Buffer buffer{0x81, 0x92, 0xA3, 0xB4, 0xC5, 0xD6, 0xE7, 0xF8};
  PTPReadCursor plain = buffer.reading();
  const Value expected = read(plain);
  EXPECT_EQ(plain - buffer.reading(), width);
  for (std::ptrdiff_t limit = 0; limit <= 10; ++limit) {
    PTPReadCursor cursor = buffer.reading();
    const bool fits = limit >= width;
    EXPECT_EQ(readChecked(cursor, buffer.reading() + limit), fits ? expected : 0) << limit;
    EXPECT_EQ(cursor - buffer.reading(), fits ? width : 0) << limit;
  }
}

TEST(CodecTest, CheckedIntegerReadersAtEveryLimit) {
  checkAtEveryLimit(ReadSInt16MaxSize, ReadSInt16, 2);
  checkAtEveryLimit(ReadUInt16MaxSize, ReadUInt16, 2);
  checkAtEveryLimit(ReadSInt32MaxSize, ReadSInt32, 4);
  checkAtEveryLimit(ReadUInt32MaxSize, ReadUInt32, 4);
  checkAtEveryLimit(ReadSInt64MaxSize, ReadSInt64, 8);
  checkAtEveryLimit(ReadUInt64MaxSize, ReadUInt64, 8);
}

TEST(CodecTest, ACursorBeyondTheLimitIsAShortage) {
  const Buffer buffer{1, 2, 3, 4};
  PTPReadCursor cursor = buffer.reading() + 3;
  EXPECT_EQ(ReadUInt16MaxSize(cursor, buffer.reading() + 2), 0u);
}

TEST(CodecTest, WhatIsWrittenReadsBackForRandomIntegers) {
  std::mt19937_64 random(1);
  for (int i = 0; i < 1000; ++i) {
    const std::uint64_t value = random();
    Buffer buffer;
    PTPWriteCursor out = buffer.writing();
    WriteSInt16(out, static_cast<std::int32_t>(value));
    WriteUInt16(out, static_cast<std::uint32_t>(value));
    WriteSInt32(out, static_cast<std::int32_t>(value));
    WriteUInt32(out, static_cast<std::uint32_t>(value));
    WriteSInt64(out, static_cast<std::int64_t>(value));
    WriteUInt64(out, value);
    PTPReadCursor in = buffer.reading();
    EXPECT_EQ(ReadSInt16(in), static_cast<std::int16_t>(value));
    EXPECT_EQ(ReadUInt16(in), static_cast<std::uint16_t>(value));
    EXPECT_EQ(ReadSInt32(in), static_cast<std::int32_t>(value));
    EXPECT_EQ(ReadUInt32(in), static_cast<std::uint32_t>(value));
    EXPECT_EQ(ReadSInt64(in), static_cast<std::int64_t>(value));
    EXPECT_EQ(ReadUInt64(in), value);
    EXPECT_EQ(in, out);
  }
}

TEST(CodecTest, AnEmptyStringWritesOneZeroByteAndReadsBackEmpty) {
  Buffer buffer{0xAA, 0xAA};
  PTPWriteCursor out = buffer.writing();
  WriteUnicodeStringWithLengthByteToBuffer(out, u"");
  EXPECT_EQ(out - buffer.writing(), 1);
  EXPECT_THAT(buffer.first(2), ElementsAre(0, 0xAA));
  PTPReadCursor in = buffer.reading();
  EXPECT_EQ(CopyUnicodeStringWithLengthByteFromBuffer(in), u"");
  EXPECT_EQ(in - buffer.reading(), 1);
}

TEST(CodecTest, TheStringAWritesItsCountTheUnitAndATerminator) {
  Buffer buffer;
  PTPWriteCursor out = buffer.writing();
  WriteUnicodeStringWithLengthByteToBuffer(out, u"A");
  EXPECT_EQ(out - buffer.writing(), 5);
  EXPECT_THAT(buffer.first(5), ElementsAre(0x02, 0x41, 0x00, 0x00, 0x00));
}

TEST(CodecTest, ACountByteOf1ReadsAsAnEmptyStringAndMovesBy3) {
  const Buffer buffer{1, 0, 0};
  PTPReadCursor in = buffer.reading();
  EXPECT_EQ(CopyUnicodeStringWithLengthByteFromBuffer(in), u"");
  EXPECT_EQ(in - buffer.reading(), 3);
}

TEST(CodecTest, AStringOf255UnitsWritesTheCountByte0AndAllItsUnits) {
  Buffer buffer;
  PTPWriteCursor out = buffer.writing();
  const std::u16string string(255, u'x');
  WriteUnicodeStringWithLengthByteToBuffer(out, string);
  EXPECT_EQ(out - buffer.writing(), 1 + 512);
  EXPECT_EQ(buffer.bytes[0], 0);
  EXPECT_EQ(buffer.bytes[509], 'x');
  EXPECT_EQ(buffer.bytes[511], 0);
}

TEST(CodecTest, TheTerminatorIsDroppedWithoutBeingLookedAt) {
  const Buffer buffer{2, 'A', 0, 'B', 0};
  PTPReadCursor in = buffer.reading();
  EXPECT_EQ(CopyUnicodeStringWithLengthByteFromBuffer(in), u"A");
  EXPECT_EQ(in - buffer.reading(), 5);
}

TEST(CodecTest, TheCheckedStringReaderComparesTheCountByteItself) {
  const Buffer buffer{3, 'A', 0, 'B', 0, 0, 0};
  for (std::ptrdiff_t limit = 0; limit <= 8; ++limit) {
    PTPReadCursor in = buffer.reading();
    const auto string = CopyUnicodeStringWithLengthByteFromBufferMaxSize(in, buffer.reading() + limit);
    if (limit >= 3) {  // and not 7, where the string ends
      EXPECT_EQ(string, u"AB") << limit;
      EXPECT_EQ(in - buffer.reading(), 7);
    } else {
      EXPECT_EQ(string, std::nullopt) << limit;
      EXPECT_EQ(in, buffer.reading());
    }
  }
}

TEST(CodecTest, ZeroTerminatedStringsReadPastTheirTerminator) {
  Buffer buffer;
  PTPWriteCursor out = buffer.writing();
  WriteUnicodeStringToBuffer(out, u"");
  WriteUnicodeStringToBuffer(out, u"A\u00E4");
  EXPECT_THAT(buffer.first(8), ElementsAre(0, 0, 0x41, 0, 0xE4, 0, 0, 0));
  PTPReadCursor in = buffer.reading();
  EXPECT_EQ(CopyUnicodeStringFromBuffer(in), u"");
  EXPECT_EQ(in - buffer.reading(), 2);
  EXPECT_EQ(CopyUnicodeStringFromBuffer(in), u"A\u00E4");
  EXPECT_EQ(in, out);
}

TEST(CodecTest, WhatIsWrittenReadsBackForRandomStrings) {
  std::mt19937 random(2);
  for (int i = 0; i < 500; ++i) {
    std::u16string string(random() % 255, u'\0');
    for (char16_t& unit : string) unit = static_cast<char16_t>(1 + random() % 0xFFFF);
    Buffer buffer;
    PTPWriteCursor out = buffer.writing();
    WriteUnicodeStringWithLengthByteToBuffer(out, string);
    WriteUnicodeStringToBuffer(out, string);
    PTPReadCursor in = buffer.reading();
    EXPECT_EQ(CopyUnicodeStringWithLengthByteFromBuffer(in), string);
    EXPECT_EQ(CopyUnicodeStringFromBuffer(in), string);
    EXPECT_EQ(in, out);
  }
}

TEST(CodecTest, ArraysReadBackAndACountOf0IsAnEmptyArray) {
  Buffer buffer;
  PTPWriteCursor out = buffer.writing();
  WriteArrayOfUnsignedShortsToBuffer(out, {0x1001, 0xFFFF});
  WriteArrayOfHandlesToBuffer(out, {1, 0xFFFFFFFE});
  WriteArrayOfHandlesToBuffer(out, {});
  PTPReadCursor in = buffer.reading();
  EXPECT_THAT(CopyArrayOfUnsignedShortsFromBuffer(in), ElementsAre(0x1001, 0xFFFF));
  EXPECT_THAT(CopyArrayOfHandlesFromBuffer(in), ElementsAre(1u, 0xFFFFFFFEu));
  EXPECT_THAT(CopyArrayOfHandlesFromBuffer(in), IsEmpty());
  EXPECT_EQ(in, out);
}

TEST(CodecTest, CheckedArrayReadersAtEveryLimit) {
  const Buffer shorts{2, 0, 0, 0, 1, 0, 2, 0};
  const Buffer handles{1, 0, 0, 0, 7, 0, 0, 0};
  const test::StandardErrorCapture capture;
  for (std::ptrdiff_t limit = 0; limit <= 10; ++limit) {
    PTPReadCursor in = shorts.reading();
    EXPECT_EQ(CopyArrayOfUnsignedShortsFromBufferMaxSize(in, shorts.reading() + limit).has_value(),
              limit >= 8);
    EXPECT_EQ(in - shorts.reading(), limit >= 8 ? 8 : 0);
    in = handles.reading();
    EXPECT_EQ(CopyArrayOfHandlesFromBufferMaxSize(in, handles.reading() + limit).has_value(), limit >= 8);
    EXPECT_EQ(in - handles.reading(), limit >= 8 ? 8 : 0);
  }
  EXPECT_THAT(capture.text(), HasSubstr("invalid buffer for object handles"));
}

TEST(CodecTest, WhatIsWrittenReadsBackForRandomArrays) {
  std::mt19937 random(3);
  for (int i = 0; i < 300; ++i) {
    std::vector<std::uint16_t> shorts(random() % 200);
    for (auto& element : shorts) element = static_cast<std::uint16_t>(random());
    std::vector<std::uint32_t> handles(random() % 200);
    for (auto& element : handles) element = static_cast<std::uint32_t>(random());
    Buffer buffer;
    PTPWriteCursor out = buffer.writing();
    WriteArrayOfUnsignedShortsToBuffer(out, shorts);
    WriteArrayOfHandlesToBuffer(out, handles);
    PTPReadCursor in = buffer.reading();
    EXPECT_EQ(CopyArrayOfUnsignedShortsFromBuffer(in), shorts);
    EXPECT_EQ(CopyArrayOfHandlesFromBuffer(in), handles);
    EXPECT_EQ(in, out);
    in = buffer.reading();
    EXPECT_EQ(CopyArrayOfUnsignedShortsFromBufferMaxSize(in, out), shorts);
    EXPECT_EQ(CopyArrayOfHandlesFromBufferMaxSize(in, out), handles);
    EXPECT_EQ(in, out);
  }
}

TEST(CodecTest, CheckedStringReadersAtEveryLimitForRandomStrings) {
  std::mt19937 random(4);
  for (int i = 0; i < 30; ++i) {
    const std::u16string string(1 + random() % 60, u'x');
    Buffer buffer;
    PTPWriteCursor out = buffer.writing();
    WriteUnicodeStringWithLengthByteToBuffer(out, string);
    for (std::ptrdiff_t limit = 0; limit <= out - buffer.writing(); ++limit) {
      PTPReadCursor in = buffer.reading();
      const bool passes = limit >= static_cast<std::ptrdiff_t>(string.size() + 1);
      const auto read = CopyUnicodeStringWithLengthByteFromBufferMaxSize(in, buffer.reading() + limit);
      EXPECT_EQ(read, passes ? std::optional(string) : std::nullopt);
      EXPECT_EQ(in, passes ? out : buffer.reading());
    }
  }
}

TEST(CodecTest, ACheckedArraySizeIsComputedIn32Bits) {
  // The products of these counts wrap, to more than there is.
  const Buffer shorts{0xFF, 0xFF, 0xFF, 0x80};
  PTPReadCursor in = shorts.reading();
  EXPECT_EQ(CopyArrayOfUnsignedShortsFromBufferMaxSize(in, shorts.reading() + 100), std::nullopt);
  EXPECT_EQ(in, shorts.reading());
  const Buffer handles{0xFF, 0xFF, 0xFF, 0x40};
  in = handles.reading();
  const test::StandardErrorCapture capture;
  EXPECT_EQ(CopyArrayOfHandlesFromBufferMaxSize(in, handles.reading() + 100), std::nullopt);
  EXPECT_EQ(in, handles.reading());
}

}  // namespace
}  // namespace brivo
