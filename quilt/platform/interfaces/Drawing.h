// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <optional>

#include "quilt/platform/base/Bitmap.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Geometry.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// sRGB, each part from 0 to 1.
struct Color {
  /// @{
  /// From 0 to 1; alpha 1 is opaque.
  double red = 0;
  double green = 0;
  double blue = 0;
  double alpha = 1;
  /// @}
};

/// Opaque black.
inline constexpr Color kBlack{0, 0, 0, 1};

/// A shadow that falls straight down: no offset, only blur.
struct Shadow {
  double blurRadius = 0;  ///< pixels; a Gaussian of half this deviation
  Color color;            ///< with the alpha of its darkest place
};

/// An offscreen picture in the making: origin at the lower left, y growing upwards, images with their own upper edge
/// upwards. What lies outside of it is cut off. One thread at a time.
class QUILT_EXPORT Canvas {
 public:
  virtual ~Canvas() = default;

  /// Lays the colour over the whole canvas.
  virtual void fill(Color color) = 0;
  /// Draws the part `from` of the image, in its pixels with the origin at its lower left, over what is there into `to`,
  /// scaled with high quality; its shadow first. With a corner radius the image is cut to a rounded `to`.
  virtual void drawImage(const Bitmap& image, Rect from, Rect to, std::optional<Shadow> shadow = std::nullopt,
                         double cornerRadius = 0) = 0;
  /// Fills a rounded rectangle and draws its outline, which lies half inside and half outside; the shadow of both
  /// first.
  virtual void fillRoundedRect(Rect rect, double cornerRadius, Color color, double lineWidth,
                               std::optional<Shadow> shadow = std::nullopt) = 0;
  /// Draws the outline of a rectangle, half inside and half outside.
  virtual void strokeRect(Rect rect, Color color, double lineWidth) = 0;

  /// What was drawn.
  [[nodiscard]] virtual Bitmap bitmap() const = 0;
};

/// Makes canvases. Any thread.
class QUILT_EXPORT Drawing {
 public:
  virtual ~Drawing() = default;

  /// A transparent canvas; sizes are rounded to whole pixels. Fails when one is below 1 or above 16,384.
  [[nodiscard]] virtual Result<std::unique_ptr<Canvas>> makeCanvas(Size size) const = 0;
};

}  // namespace quilt::platform
