// SPDX-License-Identifier: MIT
// A picture that is put together from tiles (ISO/IEC 23008-12 section 6.6.2.3).
#pragma once

#include <optional>

#include "imaging/decode_request.h"
#include "platform/base/byte_cursor.h"

namespace brivo::imaging {

struct GridLayout {
  std::uint32_t rows = 0;  ///< at most 256, as is the next
  std::uint32_t columns = 0;
  Extent size;  ///< of the whole; tiles reach beyond it on the right and below

  std::uint32_t tiles() const { return rows * columns; }
};

/// What the bytes of a grid item say; none when they are broken, or it is beyond the limits.
std::optional<GridLayout> gridLayout(ByteCursor cursor);

/// Puts tiles of one size into one frame. *Thread-bound.*
class GridFrame {
 public:
  explicit GridFrame(const GridLayout& layout) : layout_(layout) {}

  /// Copies tile `index`, counted by rows from the top left. False when it has another size or format than
  /// the first one, when the tiles do not cover the whole, or memory runs out.
  bool place(const AVFrame& tile, std::uint32_t index);
  /// The whole, after every tile was placed.
  Frame take() { return std::move(whole_); }

 private:
  bool begin(const AVFrame& tile);
  bool isLikeFirst(const AVFrame& tile) const;

  const GridLayout layout_;
  Extent tile_;
  Frame whole_;
};

}  // namespace brivo::imaging
