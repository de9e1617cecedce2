// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "card.h"
#include "figures.h"

namespace brivo::bench {

/// Another program or library that tells what is in pictures.
struct PicturePeer {
  std::string name;
  /// Lists or reads a card.
  std::function<void(const std::string& card)> read;
  /// The target for the ratio of the service's time to the peer's; none when there is none.
  std::optional<double> mostRatio;
};

/// Those that are there, each with a note when it is not.
std::vector<PicturePeer> picturePeers();

/// `exiftool`, which takes seconds for a thousand files; none, with a note, when it is not installed.
std::optional<PicturePeer> exiftool();

}  // namespace brivo::bench
