// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "orvidcore/orvidcore.h"

namespace brivoctl {

/// The thumbnails of many objects, several on their way at a time. *Thread-bound.*
class ThumbnailStream {
 public:
  /// As many as keep the service busy while one of them is drawn.
  static constexpr std::size_t kOutstanding = 8;

  struct Answer {
    std::size_t index;  ///< of the object
    orvid::Result<orvid::Dictionary> reply;
  };

  /// `objects` must outlive this.
  ThumbnailStream(const std::vector<orvid::Object>& objects, std::uint32_t maximumPixelSize,
                  orvid::Timeout timeout);

  /// The next answer that arrives, in any order; none after the last. Waits for it.
  std::optional<Answer> next();

 private:
  class Arrivals;

  void ask();

  const std::vector<orvid::Object>& objects_;
  const std::uint32_t maximumPixelSize_;
  const orvid::Timeout timeout_;
  /// Answers that are still on their way share it.
  const std::shared_ptr<Arrivals> arrivals_;
  std::size_t asked_ = 0;
  std::size_t given_ = 0;
};

}  // namespace brivoctl
