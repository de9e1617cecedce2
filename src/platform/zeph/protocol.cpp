// SPDX-License-Identifier: MIT
#include "platform/zeph/protocol.h"

#include <algorithm>

namespace brivo::zeph {

std::string Member::dbusName() const {
  std::string name(selector);
  if (name.ends_with(':')) name.pop_back();
  std::ranges::replace(name, ':', '_');
  return name;
}

bool Member::hasDBusName(std::string_view name) const {
  std::string_view stem = selector;
  if (stem.ends_with(':')) stem.remove_suffix(1);
  return std::ranges::equal(
      stem, name, [](char mine, char theirs) { return mine == ':' ? theirs == '_' : mine == theirs; });
}

const Member* Protocol::withSelector(std::string_view selector) const {
  const auto member = std::ranges::find(members, selector, &Member::selector);
  return member == members.end() ? nullptr : &*member;
}

const Member* Protocol::withDBusName(std::string_view name) const {
  const auto member = std::ranges::find_if(members, [&](const Member& one) { return one.hasDBusName(name); });
  return member == members.end() ? nullptr : &*member;
}

bool ClassSet::admits(const Value& value) const {
  if (!contains(value.valueClass())) return false;
  if (const auto* array = value.get<Array>()) {
    return std::ranges::all_of(*array, [&](const Value& element) { return admits(element); });
  }
  if (const auto* dictionary = value.get<Dictionary>()) {
    return std::ranges::all_of(*dictionary, [&](const auto& entry) { return admits(entry.second); });
  }
  return true;
}

void Interface::setClasses(const ClassSet& classes, std::string_view selector, Origin origin) {
  const Member* member = protocol_->withSelector(selector);
  if (member) classes_.insert_or_assign({member->selector, origin}, classes);
}

bool Interface::admits(const Value& value, std::string_view selector, Origin origin) const {
  const auto found = classes_.find({selector, origin});
  return found == classes_.end() || found->second.admits(value);
}

}  // namespace brivo::zeph
