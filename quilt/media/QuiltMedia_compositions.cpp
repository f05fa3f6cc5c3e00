// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/interfaces/Services.h"

// The posters of items with several sources. Rectangles are x, y, width, height from the lower left.

namespace quilt {

using platform::Bitmap;
using platform::Canvas;
using platform::Rect;
using platform::services;
using platform::Shadow;
using platform::Size;

namespace {

constexpr Size kCanvas{512, 512};

Size sizeOf(const Bitmap& image) { return {static_cast<double>(image.width), static_cast<double>(image.height)}; }
Rect wholeOf(Size size) { return {0, 0, size.width, size.height}; }

/// The source's poster in pixels; empty without one, and after a warning when it cannot be drawn.
Bitmap posterOf(const std::shared_ptr<QuiltMediaSource>& source) {
  const auto poster = source ? source->posterImage() : nullptr;
  auto pixels = poster ? poster->bitmap() : platform::Result<Bitmap>(Bitmap());
  if (pixels) return *std::move(pixels);
  source->leaveOutPreview(0, pixels.error());
  source->invalidatePosterImage();
  return Bitmap();
}

std::unique_ptr<Canvas> blackCanvas(Size size) {
  auto canvas = services().drawing->makeCanvas(size);
  if (!canvas) return nullptr;
  (*canvas)->fill(platform::kBlack);
  return *std::move(canvas);
}

/// The canvas in its black frame, as an image of standard definition.
std::shared_ptr<ImageWrapper> finished(const Canvas& canvas) {
  const auto image = services().images->imageWithBitmap(canvas.bitmap());
  return image ? (*image)->convertToSD() : nullptr;
}

void frame(Canvas& canvas, Size size) { canvas.strokeRect(wholeOf(size), platform::kBlack, 2); }

void drawFilling(Canvas& canvas, const Bitmap& image, Size crop, Rect to) {
  canvas.drawImage(image, platform::FDYFillSizeToSize(sizeOf(image), crop), to);
}

/// Up to four posters in a grid.
void drawGrid(Canvas& canvas, const std::vector<Bitmap>& posters) {
  constexpr Size square{256, 256};
  const auto draw = [&](std::size_t index, Size crop, Rect to) { drawFilling(canvas, posters[index], crop, to); };
  switch (posters.size()) {
    case 0:
      return;
    case 1:
      return draw(0, kCanvas, {0, 0, 512, 512});
    case 2:
      draw(0, {256, 512}, {0, 0, 256, 512});
      return draw(1, {256, 512}, {256, 0, 256, 512});
    case 3:
      draw(0, {512, 256}, {0, 256, 512, 256});
      draw(1, square, {0, 0, 256, 256});
      return draw(2, square, {256, 0, 256, 256});
    default:
      // The first is stretched over the whole top; the second covers its right half.
      draw(0, square, {0, 256, 512, 256});
      draw(1, square, {256, 256, 256, 256});
      draw(2, square, {0, 0, 256, 256});
      return draw(3, square, {256, 0, 256, 256});
  }
}

/// A third of the canvas high twice over: 1024 ÷ 3 and 256 ÷ 3, in single precision.
void drawBadge(Canvas& canvas) {
  constexpr auto height = static_cast<double>(1024.0F / 3.0F);
  constexpr auto bottom = static_cast<double>(256.0F / 3.0F);
  const auto image = services().images->imageWithData(services().resources->artwork("montageBadge", "tif"));
  const auto badge = image ? (*image)->bitmap() : platform::Result<Bitmap>(image.error());
  if (!badge) return;
  const Size size = sizeOf(*badge);
  const double width = size.width / size.height * height;
  canvas.drawImage(*badge, wholeOf(size), {(kCanvas.width - width) * 0.5, bottom, width, height},
                   Shadow{70, {0, 0, 0, static_cast<double>(0.9F)}});
}

}  // namespace

std::shared_ptr<ImageWrapper> QuiltMedia::dualSourcePoster() {
  const Bitmap inset = posterOf(sourceAtIndex(0));
  const Bitmap ground = posterOf(sourceAtIndex(1));
  const Size size = platform::FDYFitSizeToSize(sizeOf(ground), kCanvas);
  const auto canvas = blackCanvas(size);
  if (!canvas) return nullptr;
  canvas->drawImage(ground, wholeOf(sizeOf(ground)), wholeOf(size));
  if (inset.height > 0) {
    const Size insetSize = sizeOf(inset);
    const double width = size.width / 3;
    const Rect place{20, 20, width, width / (insetSize.width / insetSize.height)};
    constexpr auto grey = static_cast<double>(0.1F);
    canvas->fillRoundedRect(place, 8, platform::kBlack, 1, Shadow{10, {grey, grey, grey, static_cast<double>(0.8F)}});
    canvas->drawImage(inset, wholeOf(insetSize), place, std::nullopt, 8);
  }
  frame(*canvas, size);
  return finished(*canvas);
}

std::shared_ptr<ImageWrapper> QuiltMedia::montagePoster() {
  const auto canvas = blackCanvas(kCanvas);
  if (!canvas) return nullptr;
  std::vector<Bitmap> posters;
  for (std::size_t i = 0; i < std::min<std::size_t>(sourcesCount(), 4); ++i)
    posters.push_back(posterOf(sourceAtIndex(i)));
  drawGrid(*canvas, posters);
  frame(*canvas, kCanvas);
  drawBadge(*canvas);
  return finished(*canvas);
}

}  // namespace quilt
