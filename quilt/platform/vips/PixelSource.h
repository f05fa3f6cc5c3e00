// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "quilt/platform/base/Bitmap.h"
#include "quilt/platform/base/Geometry.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/vips/ImageBytes.h"
#include "quilt/platform/vips/ImageHeader.h"
#include "quilt/platform/vips/Vips.h"

namespace quilt::platform::vips {

/// Pixels that can be had in any smaller size. Immutable; any thread; nothing that was decoded is kept.
class PixelSource {
 public:
  virtual ~PixelSource() = default;

  /// A picture in memory. Damaged when the pixels do not fill its size.
  static Result<std::shared_ptr<const PixelSource>> ofBitmap(Bitmap bitmap);
  /// A picture in an encoded image, of which the header is read.
  static Result<std::shared_ptr<const PixelSource>> ofImage(const ImageBytes& bytes);

  /// Displayed pixels.
  [[nodiscard]] virtual Size size() const = 0;
  /// The whole picture in `fitted` pixels, upright, sRGB, 8 bits, with a fourth channel if it may be transparent.
  /// Decoded, row by row where the format can, while the answer is read, which this object must outlive. Parts of a
  /// damaged picture that cannot be decoded are blank.
  [[nodiscard]] virtual Result<Image> pixels(Size fitted) const = 0;
  /// The bytes of a JPEG that may stand for the whole picture as it is, or none.
  [[nodiscard]] virtual Result<std::optional<std::string>> plainJPEG() const { return std::optional<std::string>(); }
  /// What the header told; null for pixels that were never encoded.
  [[nodiscard]] virtual const ImageHeader* header() const { return nullptr; }
};

/// `image` fitted into `box`: never enlarged, the ratio kept, both sides rounded to the nearest pixel and at least 1.
Size fittedSize(Size image, Size box);

}  // namespace quilt::platform::vips
