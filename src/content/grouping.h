// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

namespace brivo {

/// The elements by key: one group for each key in the order in which the keys first appear, the elements of a
/// group in their own order. Elements without a key are left out. `key` maps an element to an optional key.
template <class Element, class Key>
auto copyGroupIntoDictionary(std::vector<Element> elements, Key key) {
  using KeyType = typename decltype(key(elements.front()))::value_type;
  std::vector<std::vector<Element>> groups;
  std::unordered_map<KeyType, std::size_t> places;
  places.reserve(elements.size());
  for (Element& element : elements) {
    auto keyOfElement = key(element);
    if (!keyOfElement) continue;
    const auto [place, isNew] = places.try_emplace(std::move(*keyOfElement), groups.size());
    if (isNew) groups.emplace_back();
    groups[place->second].push_back(std::move(element));
  }
  return groups;
}

}  // namespace brivo
