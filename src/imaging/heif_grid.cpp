// SPDX-License-Identifier: MIT
#include "imaging/heif_grid.h"

extern "C" {
#include <libavutil/imgutils.h>
#include <libavutil/pixdesc.h>
}

#include <algorithm>

namespace brivo::imaging {

namespace {

/// Where a tile comes to lie in the whole, in pixels, cut off at the borders of the whole.
struct Cell {
  int x, y, width, height;
};

AVPixelFormat formatOf(const AVFrame& frame) { return static_cast<AVPixelFormat>(frame.format); }

/// Rows of a plane among `rows` of the picture.
int rowsOf(const AVPixFmtDescriptor& format, int plane, int rows) {
  const bool isChroma = plane == 1 || plane == 2;
  return isChroma ? AV_CEIL_RSHIFT(rows, format.log2_chroma_h) : rows;
}

void copyPlane(AVFrame& whole, const AVFrame& tile, const Cell& cell, int plane) {
  const AVPixFmtDescriptor& format = *av_pix_fmt_desc_get(formatOf(whole));
  const int before = av_image_get_linesize(formatOf(whole), cell.x, plane);
  const int width = av_image_get_linesize(formatOf(whole), cell.width, plane);
  const std::ptrdiff_t above = rowsOf(format, plane, cell.y);
  const auto index = static_cast<std::size_t>(plane);
  av_image_copy_plane(whole.data[index] + above * whole.linesize[index] + before, whole.linesize[index],
                      tile.data[index], tile.linesize[index], width, rowsOf(format, plane, cell.height));
}

/// A tile that does not end where its chroma samples end could not be followed by another.
bool isDivisible(const AVFrame& tile) {
  const AVPixFmtDescriptor* format = av_pix_fmt_desc_get(formatOf(tile));
  return format && tile.width % (1 << format->log2_chroma_w) == 0 &&
         tile.height % (1 << format->log2_chroma_h) == 0;
}

}  // namespace

std::optional<GridLayout> gridLayout(ByteCursor cursor) {
  cursor.setOrder(std::endian::big);
  cursor.skip(1);  // version
  const bool isWide = (cursor.u8() & 1) != 0;
  GridLayout layout;
  layout.rows = cursor.u8() + 1U;
  layout.columns = cursor.u8() + 1U;
  layout.size.width = isWide ? cursor.u32() : cursor.u16();
  layout.size.height = isWide ? cursor.u32() : cursor.u16();
  if (!cursor.ok() || !isWithinLimits(layout.size.width, layout.size.height)) return std::nullopt;
  return layout;
}

bool GridFrame::begin(const AVFrame& tile) {
  tile_ = {static_cast<std::uint32_t>(tile.width), static_cast<std::uint32_t>(tile.height)};
  const std::uint64_t width = std::uint64_t{tile_.width} * layout_.columns;
  const std::uint64_t height = std::uint64_t{tile_.height} * layout_.rows;
  // Rows and columns that lie outside are not worth their time.
  if (width < layout_.size.width || width - layout_.size.width >= tile_.width) return false;
  if (height < layout_.size.height || height - layout_.size.height >= tile_.height) return false;
  if (layout_.tiles() > 1 && !isDivisible(tile)) return false;
  whole_ = makeFrame(tile.format, layout_.size.width, layout_.size.height);
  return whole_ && av_frame_copy_props(whole_.get(), &tile) == 0;
}

bool GridFrame::isLikeFirst(const AVFrame& tile) const {
  return tile.format == whole_->format && static_cast<std::uint32_t>(tile.width) == tile_.width &&
         static_cast<std::uint32_t>(tile.height) == tile_.height;
}

bool GridFrame::place(const AVFrame& tile, std::uint32_t index) {
  if (!whole_ && !begin(tile)) return false;
  if (!isLikeFirst(tile)) return false;
  Cell cell{static_cast<int>(index % layout_.columns) * tile.width,
            static_cast<int>(index / layout_.columns) * tile.height, 0, 0};
  cell.width = std::min(tile.width, whole_->width - cell.x);
  cell.height = std::min(tile.height, whole_->height - cell.y);
  for (int plane = 0; plane < av_pix_fmt_count_planes(formatOf(tile)); ++plane)
    copyPlane(*whole_, tile, cell, plane);
  return true;
}

}  // namespace brivo::imaging
