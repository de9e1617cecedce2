// SPDX-License-Identifier: MIT
// Arrays that are kept sorted by insertion: where a new object belongs, and putting it there.
#pragma once

#include <cstddef>
#include <limits>
#include <span>
#include <vector>

namespace brivo {

/// Compares a new object with an element: negative, 0 or positive as the new object comes before, equals or
/// comes after the element in the comparison's own sense.
template <class Object, class Context>
using SortFunction = int (*)(const Object& object, const Object& element, Context context);

/// The same as a method of the new object.
template <class Object>
using SortSelector = int (Object::*)(const Object& element) const;

/// One of several comparisons that decide in turn; a descending one counts the other way round.
template <class Object>
struct SortDescriptor {
  int (*compareObjects)(const Object& object, const Object& element);
  bool ascending = true;
};

/// Descriptors in the order in which they decide, borrowed for the call.
template <class Object>
using SortDescriptors = std::span<const SortDescriptor<Object>>;

template <class Object>
int _sSelectorCompare(const Object& object, const Object& element, SortSelector<Object> selector) {
  return (object.*selector)(element);
}

/// `result` with the other sign; the smallest number becomes the largest.
constexpr int negated(int result) {
  return result == std::numeric_limits<int>::min() ? std::numeric_limits<int>::max() : -result;
}

/// The first result that is not 0, negated when its descriptor is descending; 0 when there is none.
template <class Object>
int _sDescriptorCompare(const Object& object, const Object& element, SortDescriptors<Object> descriptors) {
  for (const auto& descriptor : descriptors) {
    const int result = descriptor.compareObjects(object, element);
    if (result != 0) return descriptor.ascending ? result : negated(result);
  }
  return 0;
}

/// The index at which `object` is to be inserted into `array`. An element moves in front of the new object
/// when the new object compares below it, so that the array's order is the opposite of the comparison's
/// sense: largest first for `object - element`. A new object goes before all that equal it. Takes a number
/// of comparisons that grows with the logarithm of the size. *Thread-safe*, as are all of these, while
/// nothing changes the array.
template <class Object, class Context>
std::size_t indexForInsertingObject(const std::vector<Object>& array, const Object& object,
                                    SortFunction<Object, Context> sortFunction, Context context) {
  std::size_t low = 0;
  std::size_t high = array.size();
  while (low < high) {
    const std::size_t middle = (low + high) >> 1U;
    if (sortFunction(object, array[middle], context) < 0) {
      low = middle + 1;
    } else {
      high = middle;
    }
  }
  return low;
}

template <class Object>
std::size_t indexForInsertingObject(const std::vector<Object>& array, const Object& object,
                                    SortSelector<Object> sortSelector) {
  return indexForInsertingObject<Object, SortSelector<Object>>(array, object, _sSelectorCompare<Object>,
                                                               sortSelector);
}

template <class Object>
std::size_t indexForInsertingObject(const std::vector<Object>& array, const Object& object,
                                    const std::vector<SortDescriptor<Object>>& sortDescriptor) {
  return indexForInsertingObject<Object, SortDescriptors<Object>>(array, object, _sDescriptorCompare<Object>,
                                                                  SortDescriptors<Object>(sortDescriptor));
}

/// Inserts `object` at the index that indexForInsertingObject() gives for the same comparison.
template <class Object, class... Comparison>
void insertObject(std::vector<Object>& array, const Object& object, const Comparison&... comparison) {
  const std::size_t index = indexForInsertingObject(array, object, comparison...);
  array.insert(array.begin() + static_cast<std::ptrdiff_t>(index), object);
}

}  // namespace brivo
