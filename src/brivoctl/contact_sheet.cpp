// SPDX-License-Identifier: MIT
#include "brivoctl/contact_sheet.h"

#include <cairo.h>
#include <pango/pangocairo.h>

#include <algorithm>
#include <memory>

namespace brivoctl {

namespace {

constexpr std::uint64_t kLongestPngSide = 32'767;  // of cairo's images
constexpr std::uint32_t kWhite = 0xFFFFFFFF;
// Shades of grey: 0 is black.
constexpr double kTileShade = 0.96;
constexpr double kNeutralTextShade = 0.62;
constexpr double kCaptionShade = 0.42;
constexpr double kHeadingShade = 0.25;

template <auto release>
struct Releasing {
  template <class T>
  void operator()(T* thing) const {
    release(thing);
  }
};
using Surface = std::unique_ptr<cairo_surface_t, Releasing<cairo_surface_destroy>>;
using Context = std::unique_ptr<cairo_t, Releasing<cairo_destroy>>;
using TextContext = std::unique_ptr<PangoContext, Releasing<g_object_unref>>;
using TextLayout = std::unique_ptr<PangoLayout, Releasing<g_object_unref>>;
using Font = std::unique_ptr<PangoFontDescription, Releasing<pango_font_description_free>>;

/// Pixels of a picture from `first` on, lent to cairo, which writes through a constant picture only when it
/// is drawn on.
Surface surfaceOn(const std::uint32_t* first, PictureSize size, std::uint32_t rowPixels) {
  auto* bytes = reinterpret_cast<unsigned char*>(const_cast<std::uint32_t*>(first));
  return Surface(cairo_image_surface_create_for_data(bytes, CAIRO_FORMAT_RGB24, static_cast<int>(size.width),
                                                     static_cast<int>(size.height),
                                                     static_cast<int>(rowPixels * sizeof(std::uint32_t))));
}

/// What brings a stored picture of `size` into the position that EXIF 2.32, tag 274, describes.
cairo_matrix_t turning(std::uint64_t orientation, PictureSize size) {
  const double width = size.width;
  const double height = size.height;
  switch (orientation) {
    case 2:
      return {-1, 0, 0, 1, width, 0};
    case 3:
      return {-1, 0, 0, -1, width, height};
    case 4:
      return {1, 0, 0, -1, 0, height};
    case 5:
      return {0, 1, 1, 0, 0, 0};
    case 6:
      return {0, 1, -1, 0, height, 0};
    case 7:
      return {0, -1, -1, 0, height, width};
    case 8:
      return {0, -1, 1, 0, 0, width};
    default:
      return {1, 0, 0, 1, 0, 0};
  }
}

bool isTurned(std::uint64_t orientation) { return orientation >= 5 && orientation <= 8; }

cairo_status_t append(void* closure, const unsigned char* bytes, unsigned int count) {
  const auto piece = std::as_bytes(std::span(bytes, count));
  auto& all = *static_cast<std::vector<std::byte>*>(closure);
  all.insert(all.end(), piece.begin(), piece.end());
  return CAIRO_STATUS_SUCCESS;
}

std::optional<brivo::Data> encodePng(const Picture& picture) {
  const Surface surface = surfaceOn(picture.pixels.data(), picture.size, picture.size.width);
  std::vector<std::byte> bytes;
  if (cairo_surface_write_to_png_stream(surface.get(), append, &bytes) != CAIRO_STATUS_SUCCESS)
    return std::nullopt;
  return brivo::Data(std::move(bytes));
}

}  // namespace

// --------------------------------------------------------------------------------------------------- drawing

/// The fonts of this machine, loaded when the first text is drawn and released with the sheet; the library's
/// own would stay for good.
class ContactSheet::Fonts {
 public:
  Fonts() {
    const std::unique_ptr<PangoFontMap, Releasing<g_object_unref>> map(pango_cairo_font_map_new());
    context_.reset(pango_font_map_create_context(map.get()));
  }

  TextLayout layoutFor(cairo_t* target) const {
    pango_cairo_update_context(target, context_.get());
    return TextLayout(pango_layout_new(context_.get()));
  }

 private:
  TextContext context_;
};

/// Draws inside one box of the sheet and nowhere else. A surface of the whole sheet could not be as tall as a
/// JPEG.
class ContactSheet::Canvas {
 public:
  Canvas(Picture& sheet, const Fonts& fonts, const Box& box)
      : fonts_(fonts),
        box_(box),
        surface_(surfaceOn(std::span(sheet.pixels).subspan(box.y * sheet.size.width + box.x).data(),
                           {static_cast<std::uint32_t>(box.width), static_cast<std::uint32_t>(box.height)},
                           sheet.size.width)),
        context_(cairo_create(surface_.get())) {}

  void fill(double shade) {
    setShade(shade);
    cairo_paint(context_.get());
  }

  void write(const std::string& text, std::uint32_t letters, double shade, PangoAlignment alignment);
  void place(const Picture& picture, std::uint64_t orientation);

 private:
  void setShade(double shade) { cairo_set_source_rgb(context_.get(), shade, shade, shade); }

  const Fonts& fonts_;
  const Box box_;
  const Surface surface_;
  const Context context_;
};

/// In the middle of the box's height.
void ContactSheet::Canvas::write(const std::string& text, std::uint32_t letters, double shade,
                                 PangoAlignment alignment) {
  const TextLayout layout = fonts_.layoutFor(context_.get());
  const Font font(pango_font_description_from_string("Sans"));
  pango_font_description_set_absolute_size(font.get(), static_cast<double>(letters) * PANGO_SCALE);
  pango_layout_set_font_description(layout.get(), font.get());
  pango_layout_set_single_paragraph_mode(layout.get(), TRUE);
  pango_layout_set_width(layout.get(), static_cast<int>(box_.width) * PANGO_SCALE);
  pango_layout_set_ellipsize(layout.get(), PANGO_ELLIPSIZE_MIDDLE);
  pango_layout_set_alignment(layout.get(), alignment);
  pango_layout_set_text(layout.get(), text.data(), static_cast<int>(text.size()));
  int height = 0;
  pango_layout_get_pixel_size(layout.get(), nullptr, &height);
  setShade(shade);
  cairo_move_to(context_.get(), 0, (static_cast<double>(box_.height) - height) / 2);
  pango_cairo_show_layout(context_.get(), layout.get());
}

/// In the middle of the box.
void ContactSheet::Canvas::place(const Picture& picture, std::uint64_t orientation) {
  const Surface stored = surfaceOn(picture.pixels.data(), picture.size, picture.size.width);
  const auto [width, height] =
      isTurned(orientation) ? PictureSize{picture.size.height, picture.size.width} : picture.size;
  const auto boxWidth = static_cast<double>(box_.width);
  const auto boxHeight = static_cast<double>(box_.height);
  const double scale = std::min({1.0, boxWidth / width, boxHeight / height});
  cairo_t* context = context_.get();
  cairo_translate(context, (boxWidth - width * scale) / 2, (boxHeight - height * scale) / 2);
  cairo_scale(context, scale, scale);
  const cairo_matrix_t turned = turning(orientation, picture.size);
  cairo_transform(context, &turned);
  cairo_set_source_surface(context, stored.get(), 0, 0);
  cairo_pattern_set_extend(cairo_get_source(context), CAIRO_EXTEND_PAD);  // no soft edge
  cairo_rectangle(context, 0, 0, picture.size.width, picture.size.height);
  cairo_fill(context);
}

// ----------------------------------------------------------------------------------------------------- sheet

std::uint64_t ContactSheet::longestSide(SheetFormat format) {
  return format == SheetFormat::jpeg ? kLongestJpegSide : kLongestPngSide;
}

SheetObstacle ContactSheet::obstacle(const SheetLayout& layout, SheetFormat format) {
  if (layout.width() > longestSide(format)) return SheetObstacle::tooWide;
  if (layout.height() > longestSide(format)) return SheetObstacle::tooTall;
  return layout.width() * layout.height() > kMostPixels ? SheetObstacle::tooManyPixels : SheetObstacle::none;
}

ContactSheet::ContactSheet(SheetLayout layout)
    : layout_(std::move(layout)),
      fonts_(std::make_unique<Fonts>()),
      sheet_{{static_cast<std::uint32_t>(layout_.width()), static_cast<std::uint32_t>(layout_.height())},
             std::vector<std::uint32_t>(layout_.width() * layout_.height(), kWhite)} {}

ContactSheet::~ContactSheet() = default;

ContactSheet::Canvas ContactSheet::canvasOn(const Box& box) { return {sheet_, *fonts_, box}; }

void ContactSheet::drawHeading(std::size_t section, const std::string& text) {
  canvasOn(layout_.heading(section)).write(text, layout_.headingLetters(), kHeadingShade, PANGO_ALIGN_LEFT);
}

void ContactSheet::drawCaption(std::size_t index, const std::string& text) {
  canvasOn(layout_.caption(index)).write(text, layout_.captionLetters(), kCaptionShade, PANGO_ALIGN_CENTER);
}

bool ContactSheet::drawPicture(std::size_t index, std::span<const std::byte> jpeg,
                               std::uint64_t orientation) {
  const Box& box = layout_.tile(index);
  const auto side = static_cast<std::uint32_t>(box.width);
  const auto picture = decodeJpeg(jpeg, side);
  if (!picture) return false;
  Canvas canvas = canvasOn(box);
  canvas.fill(kTileShade);
  canvas.place(*picture, orientation);
  return true;
}

void ContactSheet::drawNeutral(std::size_t index, const std::string& text) {
  Canvas canvas = canvasOn(layout_.tile(index));
  canvas.fill(kTileShade);
  canvas.write(text, layout_.captionLetters(), kNeutralTextShade, PANGO_ALIGN_CENTER);
}

std::optional<brivo::Data> ContactSheet::encode(SheetFormat format) const {
  return format == SheetFormat::jpeg ? encodeJpeg(sheet_) : encodePng(sheet_);
}

}  // namespace brivoctl
