// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/cairo/CairoDrawing.h"

#include <cairo.h>

#include <cmath>
#include <cstring>
#include <functional>
#include <numbers>

#include "quilt/platform/cairo/Blur.h"

namespace quilt::platform {

namespace {

constexpr double kLargest = 16384;

struct DestroyContext {
  void operator()(cairo_t* context) const { cairo_destroy(context); }
};
struct DestroySurface {
  void operator()(cairo_surface_t* surface) const { cairo_surface_destroy(surface); }
};
using Context = std::unique_ptr<cairo_t, DestroyContext>;
using Surface = std::unique_ptr<cairo_surface_t, DestroySurface>;

Surface makeSurface(cairo_format_t format, int width, int height) {
  return Surface(cairo_image_surface_create(format, width, height));
}

std::uint32_t premultiplied(const std::uint8_t* pixel) {
  const std::uint32_t alpha = pixel[3];
  const auto scaled = [alpha](std::uint32_t value) { return (value * alpha + 127) / 255; };
  return alpha << 24U | scaled(pixel[0]) << 16U | scaled(pixel[1]) << 8U | scaled(pixel[2]);
}

Surface surfaceOf(const Bitmap& image) {
  Surface surface = makeSurface(CAIRO_FORMAT_ARGB32, static_cast<int>(image.width), static_cast<int>(image.height));
  unsigned char* rows = cairo_image_surface_get_data(surface.get());
  if (!rows) return surface;
  const auto stride = static_cast<std::size_t>(cairo_image_surface_get_stride(surface.get()));
  const std::uint8_t* pixel = image.pixels.data();
  for (std::size_t y = 0; y < image.height; ++y)
    for (std::size_t x = 0; x < image.width; ++x, pixel += 4) {
      const std::uint32_t value = premultiplied(pixel);
      std::memcpy(rows + y * stride + x * 4, &value, 4);
    }
  cairo_surface_mark_dirty(surface.get());
  return surface;
}

void setColor(cairo_t* context, Color color) {
  cairo_set_source_rgba(context, color.red, color.green, color.blue, color.alpha);
}

/// Cairo's origin is at the upper left: positions are turned over here and nowhere else.
class CairoCanvas final : public Canvas {
 public:
  CairoCanvas(int width, int height)
      : _width(width),
        _height(height),
        _surface(makeSurface(CAIRO_FORMAT_ARGB32, width, height)),
        _context(cairo_create(_surface.get())) {}

  [[nodiscard]] bool isUsable() const { return cairo_status(_context.get()) == CAIRO_STATUS_SUCCESS; }

  void fill(Color color) override {
    setColor(_context.get(), color);
    cairo_paint(_context.get());
  }

  void drawImage(const Bitmap& image, Rect from, Rect to, std::optional<Shadow> shadow, double cornerRadius) override {
    if (image.pixels.empty() || from.width <= 0 || from.height <= 0 || to.width <= 0 || to.height <= 0) return;
    const Surface pixels = surfaceOf(image);
    const Rect place = turned(to, _height);
    const Rect cut = turned(from, static_cast<double>(image.height));
    // A surface of its own, so that scaling takes in nothing from beyond the part's edges.
    const Surface part(cairo_surface_create_for_rectangle(pixels.get(), cut.x, cut.y, cut.width, cut.height));
    draw(shadow, [&](cairo_t* context) {
      outline(context, place, cornerRadius);
      cairo_clip(context);
      cairo_translate(context, place.x, place.y);
      cairo_scale(context, place.width / cut.width, place.height / cut.height);
      cairo_set_source_surface(context, part.get(), 0, 0);
      cairo_pattern_set_filter(cairo_get_source(context), CAIRO_FILTER_BEST);
      cairo_pattern_set_extend(cairo_get_source(context), CAIRO_EXTEND_PAD);  // no transparent seam at the edges
      cairo_paint(context);
    });
  }

  void fillRoundedRect(Rect rect, double cornerRadius, Color color, double lineWidth,
                       std::optional<Shadow> shadow) override {
    draw(shadow, [&](cairo_t* context) {
      setColor(context, color);
      outline(context, turned(rect, _height), cornerRadius);
      cairo_fill_preserve(context);
      cairo_set_line_width(context, lineWidth);
      cairo_stroke(context);
    });
  }

  void strokeRect(Rect rect, Color color, double lineWidth) override {
    draw(std::nullopt, [&](cairo_t* context) {
      setColor(context, color);
      outline(context, turned(rect, _height), 0);
      cairo_set_line_width(context, lineWidth);
      cairo_stroke(context);
    });
  }

  [[nodiscard]] Bitmap bitmap() const override {
    Bitmap result{static_cast<std::size_t>(_width), static_cast<std::size_t>(_height), {}};
    cairo_surface_flush(_surface.get());
    const unsigned char* rows = cairo_image_surface_get_data(_surface.get());
    if (!rows) return {};
    const auto stride = static_cast<std::size_t>(cairo_image_surface_get_stride(_surface.get()));
    result.pixels.reserve(result.width * result.height * 4);
    for (std::size_t y = 0; y < result.height; ++y)
      for (std::size_t x = 0; x < result.width; ++x) {
        std::uint32_t value = 0;
        std::memcpy(&value, rows + y * stride + x * 4, 4);
        const std::uint32_t alpha = value >> 24U;
        const auto plain = [alpha](std::uint32_t part) {
          part &= 0xFFU;
          return static_cast<std::uint8_t>(alpha == 0 ? 0
                                                      : std::min<std::uint32_t>(255, (part * 255 + alpha / 2) / alpha));
        };
        for (const std::uint8_t part :
             {plain(value >> 16U), plain(value >> 8U), plain(value), static_cast<std::uint8_t>(alpha)})
          result.pixels.push_back(part);
      }
    return result;
  }

 private:
  static Rect turned(Rect rect, double height) {
    return {rect.x, height - rect.y - rect.height, rect.width, rect.height};
  }

  static void outline(cairo_t* context, Rect rect, double radius) {
    if (radius <= 0) {
      cairo_rectangle(context, rect.x, rect.y, rect.width, rect.height);
      return;
    }
    const double r = std::min({radius, rect.width / 2, rect.height / 2});
    constexpr double quarter = std::numbers::pi / 2;
    cairo_new_sub_path(context);
    cairo_arc(context, rect.x + rect.width - r, rect.y + r, r, -quarter, 0);
    cairo_arc(context, rect.x + rect.width - r, rect.y + rect.height - r, r, 0, quarter);
    cairo_arc(context, rect.x + r, rect.y + rect.height - r, r, quarter, 2 * quarter);
    cairo_arc(context, rect.x + r, rect.y + r, r, 2 * quarter, 3 * quarter);
    cairo_close_path(context);
  }

  /// Draws the shape's shadow, then the shape, with the state of the context kept.
  void draw(const std::optional<Shadow>& shadow, const std::function<void(cairo_t*)>& shape) {
    if (shadow) drawShadow(*shadow, shape);
    cairo_save(_context.get());
    shape(_context.get());
    cairo_restore(_context.get());
  }

  /// The shape's opacity, blurred, as a mask for the shadow's colour. The mask reaches beyond the canvas, so that what
  /// lies at its edge throws its whole shadow.
  void drawShadow(const Shadow& shadow, const std::function<void(cairo_t*)>& shape) {
    const int margin = static_cast<int>(std::ceil(shadow.blurRadius * 1.5));
    const int width = _width + 2 * margin;
    const int height = _height + 2 * margin;
    const Surface mask = makeSurface(CAIRO_FORMAT_A8, width, height);
    {
      const Context context(cairo_create(mask.get()));
      cairo_translate(context.get(), margin, margin);
      shape(context.get());
    }
    cairo_surface_flush(mask.get());
    unsigned char* plane = cairo_image_surface_get_data(mask.get());
    if (!plane) return;
    cairo::blur(plane, static_cast<std::size_t>(width), static_cast<std::size_t>(height),
                static_cast<std::size_t>(cairo_image_surface_get_stride(mask.get())), shadow.blurRadius / 2);
    cairo_surface_mark_dirty(mask.get());
    setColor(_context.get(), shadow.color);
    cairo_mask_surface(_context.get(), mask.get(), -margin, -margin);
  }

  const int _width;
  const int _height;
  const Surface _surface;
  const Context _context;
};

}  // namespace

Result<std::unique_ptr<Canvas>> CairoDrawing::makeCanvas(Size size) const {
  const double width = std::round(size.width);
  const double height = std::round(size.height);
  // Written so that a size that is no number is refused too.
  if (!(width >= 1 && width <= kLargest && height >= 1 && height <= kLargest))
    return Error{ErrorKind::Unsupported, "A picture of this size cannot be drawn", {}};
  auto canvas = std::make_unique<CairoCanvas>(static_cast<int>(width), static_cast<int>(height));
  if (!canvas->isUsable()) return Error{ErrorKind::InputOutput, "There is not enough memory to draw a picture", {}};
  return std::unique_ptr<Canvas>(std::move(canvas));
}

std::string CairoDrawing::version() { return cairo_version_string(); }

}  // namespace quilt::platform
