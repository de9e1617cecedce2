// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "card.h"
#include "options.h"

namespace brivo::bench {

/// JPEGs of 24 megapixels with the headers that cameras write, each an inode of its own; behind its headers a
/// file may be a hole.
class Pictures {
 public:
  /// At least `count` pictures: those of the card that the command line names, else of one made now by
  /// make_card.py beside the source, which goes afterwards. None, with a note, when neither can be had.
  static std::optional<Pictures> find(const Options& options, std::size_t count);

  /// Puts a link to another picture at each path, in order, from the first one on. This must outlive it.
  FileMaker inOrder() const;

 private:
  Pictures(std::unique_ptr<test::TemporaryFolder> folder, const std::string& card);

  std::unique_ptr<test::TemporaryFolder> folder_;  // of a card that was made here
  std::vector<std::string> paths_;
};

}  // namespace brivo::bench
