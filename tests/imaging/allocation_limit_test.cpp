// SPDX-License-Identifier: MIT
#include "imaging/allocation_limit.h"

extern "C" {
#include <libavutil/mem.h>
}

#include <gtest/gtest.h>

#include <memory>
#include <optional>

#include "imaging/made_movies.h"
#include "imaging/movie_input.h"

namespace brivo::imaging {
namespace {

constexpr std::size_t kMiB = 1 << 20;

bool canAllocate(std::size_t size) {
  void* const memory = av_malloc(size);
  av_free(memory);
  return memory != nullptr;
}

TEST(AllocationLimitTest, NothingLargerIsAllocatedWhileItLives) {
  EXPECT_TRUE(canAllocate(2 * kMiB));
  {
    const AllocationLimit limit(kMiB);
    EXPECT_FALSE(canAllocate(2 * kMiB));
    EXPECT_TRUE(canAllocate(kMiB / 2));
  }
  EXPECT_TRUE(canAllocate(2 * kMiB));
}

TEST(AllocationLimitTest, TheLowestHoldsInWhateverOrderTheyEnd) {
  std::optional<AllocationLimit> low(std::in_place, kMiB);
  std::optional<AllocationLimit> high(std::in_place, 3 * kMiB);
  EXPECT_FALSE(canAllocate(2 * kMiB));
  low.reset();
  EXPECT_TRUE(canAllocate(2 * kMiB));
  EXPECT_FALSE(canAllocate(4 * kMiB));
  low.emplace(kMiB);
  high.reset();
  EXPECT_FALSE(canAllocate(2 * kMiB));
}

TEST(AllocationLimitTest, AMovieThatIsClosedLiftsNoOtherLimit) {
  const std::string file = test::madeMovie({});
  const images::MemorySource source(std::as_bytes(std::span(file)));
  auto open = MovieInput::open(source);
  ASSERT_TRUE(open);
  ASSERT_TRUE(MovieInput::open(source)) << "and closed again";
  EXPECT_FALSE(canAllocate(300 * kMiB));
  const AllocationLimit limit(kMiB);
  open.reset();
  EXPECT_FALSE(canAllocate(2 * kMiB));
}

}  // namespace
}  // namespace brivo::imaging
