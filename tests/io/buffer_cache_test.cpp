// SPDX-License-Identifier: MIT
#include "io/buffer_cache.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstring>
#include <future>
#include <mutex>

#include "platform/work/pool.h"
#include "support/file_size_limit.h"
#include "support/standard_error.h"
#include "support/wait.h"

namespace brivo {
namespace {

constexpr std::uint64_t kSlot = OVBufferCache::kSlotSize;

/// A file of made-up bytes that fails, ends early or stalls where a test says so.
class MadeUpFile : public ReadAheadSource {
 public:
  explicit MadeUpFile(std::uint64_t size) : size_(size) {}

  const std::string& name() const override { return name_; }
  std::uint64_t size() const override { return size_; }
  std::int64_t readStream(std::span<std::byte> buffer, std::uint64_t offset) const override {
    ++reads;
    if (offset >= stallsAt) const std::lock_guard wait(gate);
    if (offset >= failsAt) return -1;
    const std::uint64_t end = std::min({size_, endsAt, failsAt});
    const std::uint64_t count = offset >= end ? 0 : std::min<std::uint64_t>(buffer.size(), end - offset);
    std::memset(buffer.data(), std::to_integer<int>(byteAt(offset)), count);
    return static_cast<std::int64_t>(count);
  }
  /// What a piece that begins at `offset` is full of.
  static std::byte byteAt(std::uint64_t offset) { return static_cast<std::byte>(offset / kSlot + 1); }

  std::uint64_t endsAt = UINT64_MAX;   ///< the file on the medium is shorter than its size
  std::uint64_t failsAt = UINT64_MAX;  ///< reads from here on fail, also the first
  std::uint64_t stallsAt = 0;          ///< reads from here on wait for the gate
  mutable std::mutex gate;             ///< held: the medium does not answer
  mutable std::atomic<int> reads = 0;

 private:
  std::string name_ = "MVI_0001.MOV";
  std::uint64_t size_;
};

class BufferCacheTest : public testing::Test {
 protected:
  std::unique_ptr<OVBufferCache> started(const MadeUpFile& file) {
    auto cache = OVBufferCache::initWithFile(file, SerialQueue::create(pool));
    cache->startReading();
    return cache;
  }
  /// Takes a piece as a request does: its size, none when there is no such piece.
  static std::optional<std::uint64_t> take(OVBufferCache& cache, std::uint64_t offset) {
    std::uint64_t size = 0;
    const auto piece = cache.consumeBufferAtOffset(offset, size);
    cache.setConsumedOffset(static_cast<std::int64_t>(offset));
    if (!piece) return std::nullopt;
    EXPECT_EQ(piece->size(), size);
    if (size > 0) {
      EXPECT_EQ(piece->bytes().front(), MadeUpFile::byteAt(offset));
      EXPECT_EQ(piece->bytes().back(), MadeUpFile::byteAt(offset));
      EXPECT_GE(piece->memfd(), 0);
    }
    return size;
  }
  static Data pieceAt(std::uint64_t offset) {
    return Data(std::vector<std::byte>(kSlot, MadeUpFile::byteAt(offset)));
  }
  /// Takes pieces in order until one is empty or missing: how many bytes there were.
  static std::uint64_t takeAll(OVBufferCache& cache) {
    std::uint64_t offset = 0;
    while (const auto size = take(cache, offset)) {
      if (*size == 0) break;
      offset += *size;
    }
    return offset;
  }

  Pool pool;
};

TEST_F(BufferCacheTest, AFileSmallerThanASlotIsOneStepAndTheNextStoresAnEmptyEntryAndStops) {
  const MadeUpFile file(1000);
  const auto cache = started(file);
  EXPECT_EQ(take(*cache, 0), 1000u);
  EXPECT_EQ(take(*cache, 1000), 0u);
  EXPECT_EQ(file.reads, 2);
}

TEST_F(BufferCacheTest, AnOffsetThatIsNotTheStartOfAFilledSlotGivesNoneAndLeavesTheSizeAlone) {
  const MadeUpFile file(3 * kSlot);
  const auto cache = started(file);
  std::uint64_t size = 77;
  EXPECT_FALSE(cache->consumeBufferAtOffset(1, size));
  EXPECT_EQ(size, 77u);
}

TEST_F(BufferCacheTest, FiveSlotsFilledAndNoneTakenPauseUntilATake) {
  const MadeUpFile file(20 * kSlot);
  const auto cache = started(file);
  ASSERT_TRUE(test::waitUntil([&] { return file.reads == 5; }));
  EXPECT_EQ(take(*cache, 0), kSlot);
  EXPECT_EQ(file.reads, 5) << "a piece keeps its slot until the next is asked for";
  EXPECT_EQ(take(*cache, kSlot), kSlot);
  EXPECT_TRUE(test::waitUntil([&] { return file.reads == 6; }));
}

TEST_F(BufferCacheTest, ASequentialClientGetsEveryByteOfALongFile) {
  const MadeUpFile file(100 * kSlot + 12'345);
  EXPECT_EQ(takeAll(*started(file)), file.size());
}

TEST_F(BufferCacheTest, EndOfFileExactlyOnASlotBorder) {
  for (const std::uint64_t slots : {1, 4, 5, 6}) {
    const MadeUpFile file(slots * kSlot);
    EXPECT_EQ(takeAll(*started(file)), file.size());
  }
}

TEST_F(BufferCacheTest, AFileOfNoneOrOneByte) {
  for (const std::uint64_t size : {0, 1}) {
    const MadeUpFile file(size);
    EXPECT_EQ(takeAll(*started(file)), size);
  }
}

TEST_F(BufferCacheTest, OffsetsBeyondFourGigabytes) {
  const MadeUpFile file((std::uint64_t{4} << 30) + 3 * kSlot);
  EXPECT_EQ(takeAll(*started(file)), file.size());
}

TEST_F(BufferCacheTest, AFailedOpenNeitherLoopsNorHangs) {
  MadeUpFile file(100 * kSlot);
  file.failsAt = 0;
  const auto cache = started(file);
  EXPECT_EQ(take(*cache, 0), 0u);
  EXPECT_EQ(take(*cache, 0), std::nullopt);
  EXPECT_EQ(file.reads, 1);
}

TEST_F(BufferCacheTest, AFileThatShrankEndsWhereItEndsNow) {
  MadeUpFile file(10 * kSlot);
  file.endsAt = 3 * kSlot + 7;
  EXPECT_EQ(takeAll(*started(file)), file.endsAt);
}

TEST_F(BufferCacheTest, AMediumThatFailsInTheMiddleGivesWhatCameBefore) {
  MadeUpFile file(10 * kSlot);
  file.failsAt = 2 * kSlot + 100;
  EXPECT_EQ(takeAll(*started(file)), file.failsAt);
}

TEST_F(BufferCacheTest, ATakeAgainAfterTheEndAnswersNone) {
  const MadeUpFile file(10);
  const auto cache = started(file);
  EXPECT_EQ(take(*cache, 0), 10u);
  EXPECT_EQ(take(*cache, 0), std::nullopt);
  EXPECT_EQ(take(*cache, 10), 0u);
  EXPECT_EQ(take(*cache, 0), std::nullopt);
  EXPECT_EQ(take(*cache, 10), std::nullopt) << "and does not wait for what will not come";
}

TEST_F(BufferCacheTest, ATakeWaitsForASlowMedium) {
  const MadeUpFile file(2 * kSlot);
  file.gate.lock();
  const auto cache = started(file);
  auto taken = std::async(std::launch::async, [&] { return take(*cache, 0); });
  EXPECT_EQ(taken.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
  file.gate.unlock();
  EXPECT_EQ(taken.get(), kSlot);
}

TEST_F(BufferCacheTest, WhatHasBeenReadIsTakenWhileTheNextPieceIsBeingRead) {
  MadeUpFile file(10 * kSlot);
  file.stallsAt = 3 * kSlot;
  file.gate.lock();
  const auto cache = started(file);
  for (std::uint64_t slot = 0; slot < 3; ++slot) EXPECT_EQ(take(*cache, slot * kSlot), kSlot);
  auto next = std::async(std::launch::async, [&] { return take(*cache, 3 * kSlot); });
  EXPECT_EQ(next.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
  file.gate.unlock();
  EXPECT_EQ(next.get(), kSlot);
}

TEST_F(BufferCacheTest, APieceThatWasPassedOverDoesNotKeepLaterOnesFromBeingWaitedFor) {
  MadeUpFile file(10 * kSlot);
  file.stallsAt = kSlot;
  file.gate.lock();
  const auto cache = started(file);
  auto second = std::async(std::launch::async, [&] { return take(*cache, kSlot); });
  ASSERT_TRUE(test::waitUntil([&] { return file.reads == 2; }));
  EXPECT_EQ(second.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
  file.gate.unlock();
  EXPECT_EQ(second.get(), kSlot);
  for (std::uint64_t slot = 2; slot < 10; ++slot) EXPECT_EQ(take(*cache, slot * kSlot), kSlot);
}

TEST_F(BufferCacheTest, ATakeBeforeReadingHasBegunWaitsForTheFirstSlot) {
  const MadeUpFile file(kSlot);
  const auto cache = OVBufferCache::initWithFile(file, SerialQueue::create(pool));
  auto taken = std::async(std::launch::async, [&] { return take(*cache, 0); });
  EXPECT_EQ(taken.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
  cache->startReading();
  EXPECT_EQ(taken.get(), kSlot);
}

TEST_F(BufferCacheTest, StoppingEndsTheReadingAndKeepsWhatWasRead) {
  const MadeUpFile file(100 * kSlot);
  const auto cache = started(file);
  ASSERT_TRUE(test::waitUntil([&] { return file.reads == 5; }));
  cache->stopReading();
  for (std::uint64_t slot = 0; slot < 5; ++slot) EXPECT_EQ(take(*cache, slot * kSlot), kSlot);
  EXPECT_EQ(take(*cache, 5 * kSlot), std::nullopt);
  EXPECT_EQ(file.reads, 5);
}

TEST_F(BufferCacheTest, ACacheThatGoesWaitsForTheReadUnderWay) {
  const MadeUpFile file(100 * kSlot);
  file.gate.lock();
  auto cache = started(file);
  ASSERT_TRUE(test::waitUntil([&] { return file.reads == 1; }));
  auto ended = std::async(std::launch::async, [&] { cache.reset(); });
  EXPECT_EQ(ended.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
  file.gate.unlock();
  ended.get();
  EXPECT_LE(file.reads, 2);
}

TEST_F(BufferCacheTest, APieceThatIsKeptIsNotReadOver) {
  const MadeUpFile file(30 * kSlot);
  const auto cache = started(file);
  std::vector<Data> kept;
  for (std::uint64_t slot = 0; slot < 30; ++slot) {
    std::uint64_t size = 0;
    auto piece = cache->consumeBufferAtOffset(slot * kSlot, size);
    cache->setConsumedOffset(static_cast<std::int64_t>(slot * kSlot));
    ASSERT_TRUE(piece);
    kept.push_back(*std::move(piece));
  }
  for (std::uint64_t slot = 0; slot < 30; ++slot) {
    EXPECT_EQ(kept[slot], pieceAt(slot * kSlot));
  }
}

TEST_F(BufferCacheTest, APieceOutlivesItsCache) {
  const MadeUpFile file(kSlot);
  auto cache = started(file);
  std::uint64_t size = 0;
  const auto piece = cache->consumeBufferAtOffset(0, size);
  cache.reset();
  EXPECT_EQ(*piece, pieceAt(0));
}

TEST_F(BufferCacheTest, DequeueingCopiesAPieceAndHasItsSlotFilledAgain) {
  const MadeUpFile file(7 * kSlot);
  const auto cache = started(file);
  std::vector<std::byte> buffer(kSlot);
  for (std::uint64_t slot = 0; slot < 7; ++slot) {
    std::uint64_t size = 0;
    cache->dequeueBufferAtOffset(slot * kSlot, size, buffer);
    EXPECT_EQ(size, kSlot);
    EXPECT_EQ(Data::copyOf(buffer), pieceAt(slot * kSlot));
  }
  std::uint64_t size = 77;
  cache->dequeueBufferAtOffset(1, size, buffer);
  EXPECT_EQ(size, 77u);
}

TEST_F(BufferCacheTest, DequeueingIntoASmallBufferStaysInsideIt) {
  const MadeUpFile file(kSlot);
  const auto cache = started(file);
  std::vector<std::byte> buffer(100);
  std::uint64_t size = 0;
  cache->dequeueBufferAtOffset(0, size, std::span(buffer).first(50));
  EXPECT_EQ(size, kSlot);
  EXPECT_EQ(buffer[49], MadeUpFile::byteAt(0));
  EXPECT_EQ(buffer[50], std::byte{0});
}

TEST_F(BufferCacheTest, WithoutMemoryForASlotThereIsNoCacheAndALineSaysWhy) {
  const MadeUpFile file(kSlot);
  const test::StandardErrorCapture log;
  const test::FileSizeLimit limit(kSlot - 1);
  EXPECT_EQ(OVBufferCache::initWithFile(file, SerialQueue::create(pool)), nullptr);
  EXPECT_THAT(log.text(), testing::HasSubstr("MVI_0001.MOV ! mmap failed for slot: 0 cause: File too large"));
}

TEST_F(BufferCacheTest, ASlotThatCannotBeMappedAgainIsLostAndTheOthersGoOn) {
  const MadeUpFile file(20 * kSlot);
  const auto cache = started(file);
  ASSERT_TRUE(test::waitUntil([&] { return file.reads == 5; }));
  std::uint64_t size = 0;
  const auto piece = cache->consumeBufferAtOffset(0, size);
  cache->setConsumedOffset(0);
  {
    const test::StandardErrorCapture log;
    const test::FileSizeLimit limit(kSlot - 1);
    cache->resetBufferAtOffset(0);
    EXPECT_THAT(log.text(), testing::HasSubstr("mmap failed for slot: 0"));
  }
  for (std::uint64_t slot = 1; slot < 20; ++slot) EXPECT_EQ(take(*cache, slot * kSlot), kSlot);
}

}  // namespace
}  // namespace brivo
