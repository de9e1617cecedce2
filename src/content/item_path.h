// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <string_view>

namespace brivo {

/// Where an item is. A file in a folder shares the folder's path: a card has very many files and few folders.
/// *Immutable.*
class ItemPath {
 public:
  /// `whole` is absolute, as bytes.
  explicit ItemPath(std::string whole) : base_(std::make_shared<const std::string>(std::move(whole))) {}
  /// The same for the item with this name whose parent is at `folder`.
  ItemPath(std::string whole, const ItemPath& folder, std::string_view name)
      : isInFolder_(!folder.isInFolder_ && isNameIn(*folder.base_, whole, name)) {
    base_ = isInFolder_ ? folder.base_ : std::make_shared<const std::string>(std::move(whole));
  }

  /// The whole path of the item with this name.
  std::string of(std::string_view name) const { return isInFolder_ ? (*base_ + "/").append(name) : *base_; }

 private:
  static bool isNameIn(std::string_view folder, std::string_view whole, std::string_view name) {
    return whole.size() == folder.size() + 1 + name.size() && whole.starts_with(folder) &&
           whole[folder.size()] == '/' && whole.ends_with(name);
  }

  std::shared_ptr<const std::string> base_;
  bool isInFolder_ = false;
};

}  // namespace brivo
