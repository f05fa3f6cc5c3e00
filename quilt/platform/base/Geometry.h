// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// A width and a height, in the unit of whoever answers them: pixels for images, points for pages.
struct Size {
  /// @{
  /// The two sides; 0 by 0 when nothing was set.
  double width = 0;
  double height = 0;
  bool operator==(const Size&) const = default;
  /// @}
};

/// Origin at the lower left, y growing upwards.
struct Rect {
  /// @{
  /// The corner at the lower left, and the sides.
  double x = 0;
  double y = 0;
  double width = 0;
  double height = 0;
  bool operator==(const Rect&) const = default;
  /// @}
};

/// The largest size with the aspect ratio of `size` that fits inside `container`; also enlarges.
/// An empty size gives an empty size.
QUILT_EXPORT Size FDYFitSizeToSize(Size size, Size container);

/// The largest centred part of an image of `size` that has the aspect ratio of `container`.
/// An empty size gives an empty rectangle.
QUILT_EXPORT Rect FDYFillSizeToSize(Size size, Size container);

}  // namespace quilt::platform
