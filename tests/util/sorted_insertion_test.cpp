// SPDX-License-Identifier: MIT
#include "util/sorted_insertion.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <random>
#include <string>

namespace brivo {
namespace {

using testing::ElementsAre;

int byDifference(const int& object, const int& element, std::nullptr_t) { return object - element; }

void insert(std::vector<int>& array, int object) { insertObject(array, object, &byDifference, nullptr); }

/// An object with two things to sort by and a mark that no comparison looks at.
struct Entry {
  int size = 0;
  std::string name;
  int mark = 0;

  int compareSize(const Entry& other) const { return size - other.size; }
  friend bool operator==(const Entry&, const Entry&) = default;
};

int bySize(const Entry& object, const Entry& element) { return object.size - element.size; }
int byName(const Entry& object, const Entry& element) { return object.name.compare(element.name); }

TEST(SortedInsertionTest, Inserting2Into3And1GivesIndex1) {
  std::vector<int> array{3, 1};
  EXPECT_EQ(indexForInsertingObject(array, 2, &byDifference, nullptr), 1u);
  insert(array, 2);
  EXPECT_THAT(array, ElementsAre(3, 2, 1));
}

TEST(SortedInsertionTest, ANewElementPrecedesTheEqualOne) {
  EXPECT_EQ(indexForInsertingObject(std::vector<int>{3, 2, 1}, 2, &byDifference, nullptr), 1u);
  std::vector<Entry> array{{3, "", 0}, {2, "", 1}, {2, "", 2}, {1, "", 3}};
  insertObject(array, Entry{2, "", 9}, &Entry::compareSize);
  EXPECT_EQ(array[1].mark, 9);
  EXPECT_EQ(array[2].mark, 1);
}

TEST(SortedInsertionTest, InsertingIntoAnEmptyArrayGivesIndex0) {
  EXPECT_EQ(indexForInsertingObject(std::vector<int>{}, 7, &byDifference, nullptr), 0u);
  EXPECT_EQ(indexForInsertingObject(std::vector<Entry>{}, Entry{}, &Entry::compareSize), 0u);
  EXPECT_EQ(indexForInsertingObject(std::vector<Entry>{}, Entry{}, std::vector<SortDescriptor<Entry>>{}), 0u);
}

TEST(SortedInsertionTest, TheContextReachesTheFunctionWithTheNewObjectFirst) {
  struct Seen {
    std::vector<int> objects, elements;
  } seen;
  const auto note = [](const int& object, const int& element, Seen* context) {
    context->objects.push_back(object);
    context->elements.push_back(element);
    return 1;
  };
  const SortFunction<int, Seen*> function = note;
  EXPECT_EQ(indexForInsertingObject(std::vector<int>{10, 20, 30}, 5, function, &seen), 0u);
  EXPECT_THAT(seen.objects, ElementsAre(5, 5));
  EXPECT_THAT(seen.elements, ElementsAre(20, 10));
}

TEST(SortedInsertionTest, TheSelectorIsSentToTheNewObject) {
  std::vector<Entry> array{{3, "", 0}, {1, "", 0}};
  EXPECT_EQ(indexForInsertingObject(array, Entry{2, "", 0}, &Entry::compareSize), 1u);
}

TEST(SortedInsertionTest, TheFirstDescriptorThatTellsObjectsApartDecides) {
  const std::vector<SortDescriptor<Entry>> descriptors{{bySize, true}, {byName, true}};
  std::vector<Entry> array{{2, "b", 0}, {2, "a", 0}, {1, "c", 0}};
  EXPECT_EQ(indexForInsertingObject(array, Entry{1, "b", 0}, descriptors), 3u);
  EXPECT_EQ(indexForInsertingObject(array, Entry{1, "d", 0}, descriptors), 2u);
  EXPECT_EQ(indexForInsertingObject(array, Entry{2, "aa", 0}, descriptors), 1u);
  EXPECT_EQ(indexForInsertingObject(array, Entry{3, "a", 0}, descriptors), 0u);
}

TEST(SortedInsertionTest, ADescendingDescriptorCountsTheOtherWayRound) {
  std::vector<Entry> array;
  for (const int size : {2, 3, 1}) {
    insertObject(array, Entry{size, "", 0}, std::vector<SortDescriptor<Entry>>{{bySize, false}});
  }
  EXPECT_THAT(array, ElementsAre(Entry{1, "", 0}, Entry{2, "", 0}, Entry{3, "", 0}));
}

TEST(SortedInsertionTest, AResultIsReturnedUnchangedOrNegatedAsItIs) {
  const std::vector<SortDescriptor<int>> descriptors{
      {[](const int& object, const int& element) { return object - element; }, true},
      {[](const int&, const int&) { return 7; }, false}};
  EXPECT_EQ(_sDescriptorCompare(1, 6, SortDescriptors<int>(descriptors)), -5);
  EXPECT_EQ(_sDescriptorCompare(6, 6, SortDescriptors<int>(descriptors)), -7);
  EXPECT_EQ(_sDescriptorCompare(6, 6, SortDescriptors<int>()), 0);
}

TEST(SortedInsertionTest, TheSmallestResultOfADescendingDescriptorIsNegatedToo) {
  const SortDescriptor<int> smallest{[](const int&, const int&) { return std::numeric_limits<int>::min(); },
                                     false};
  EXPECT_GT(_sDescriptorCompare(1, 2, SortDescriptors<int>(&smallest, 1)), 0);
}

TEST(SortedInsertionTest, WithoutADescriptorThatDecidesTheNewObjectGoesFirst) {
  const std::vector<Entry> array{{3, "", 0}, {2, "", 0}};
  EXPECT_EQ(indexForInsertingObject(array, Entry{1, "", 0}, std::vector<SortDescriptor<Entry>>{}), 0u);
  EXPECT_EQ(
      indexForInsertingObject(array, Entry{1, "", 0}, std::vector<SortDescriptor<Entry>>{{byName, true}}),
      0u);
}

/// The index by looking at one element after the other.
std::size_t expectedIndex(const std::vector<Entry>& array, int size) {
  std::size_t index = 0;
  while (index < array.size() && array[index].size > size) ++index;
  return index;
}

TEST(SortedInsertionTest, RandomSequencesStayLargestFirstWithTheNewestOfEqualsFirst) {
  std::mt19937 random(3);
  for (int round = 0; round < 200; ++round) {
    std::vector<Entry> array;
    for (int mark = 0; mark < 60; ++mark) {
      const Entry entry{static_cast<int>(random() % 20), "", mark};
      EXPECT_EQ(indexForInsertingObject(array, entry, &Entry::compareSize), expectedIndex(array, entry.size));
      insertObject(array, entry, &Entry::compareSize);
    }
    EXPECT_TRUE(std::ranges::is_sorted(array, [](const Entry& a, const Entry& b) {
      return a.size != b.size ? a.size > b.size : a.mark > b.mark;
    }));
  }
}

TEST(SortedInsertionTest, TheThreeFormsAgreeOnRandomSequences) {
  std::mt19937 random(4);
  const SortFunction<Entry, int> function = [](const Entry& object, const Entry& element, int) {
    return bySize(object, element);
  };
  std::vector<Entry> array;
  for (int i = 0; i < 500; ++i) {
    const Entry entry{static_cast<int>(random() % 50), "", i};
    const std::size_t index = indexForInsertingObject(array, entry, function, 0);
    EXPECT_EQ(indexForInsertingObject(array, entry, &Entry::compareSize), index);
    EXPECT_EQ(indexForInsertingObject(array, entry, std::vector<SortDescriptor<Entry>>{{bySize, true}}),
              index);
    insertObject(array, entry, function, 0);
  }
}

}  // namespace
}  // namespace brivo
