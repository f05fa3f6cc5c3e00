// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <span>

#include "quilt/platform/base/Bitmap.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Geometry.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/base/Url.h"

namespace quilt::platform {

/// @{
/// The sizes that convertToSD and convertToHD fit into.
inline constexpr Size kStandardDefinition{640, 480};
inline constexpr Size kHighDefinition{1280, 720};
/// @}

/// An image: immutable, shared, and lazy. One made from a file knows its size from the header and decodes when pixels
/// are first needed, at no more than the size then needed. Sizes are displayed sizes: the orientation that a camera
/// recorded is applied. Any thread.
class QUILT_EXPORT ImageWrapper {
 public:
  virtual ~ImageWrapper() = default;

  /// @{
  /// Loads with the installed service. Null when there is no file or it is no image.
  static std::shared_ptr<ImageWrapper> imageWithPath(const std::filesystem::path& path);
  static std::shared_ptr<ImageWrapper> imageWithURL(const Url& url);
  /// @}

  /// Pixels.
  [[nodiscard]] virtual Size size() const = 0;

  /// @{
  /// The image fitted into the size, never enlarged, in sRGB. Null when the image is known to be unusable.
  [[nodiscard]] virtual std::shared_ptr<ImageWrapper> convertToSD() const = 0;
  [[nodiscard]] virtual std::shared_ptr<ImageWrapper> convertToHD() const = 0;
  /// @}

  /// @{
  /// Writes the file whole, replacing one that is there, or leaves what was there. An unscaled JPEG file saved as JPEG
  /// is copied byte for byte. Transparency is laid on white in a JPEG.
  [[nodiscard]] virtual Result<void> saveAsJPGAtPath(const std::filesystem::path& path) const = 0;
  [[nodiscard]] virtual Result<void> saveAsPNGAtURL(const Url& url) const = 0;
  /// @}

  /// The drawable pixels. Decodes.
  [[nodiscard]] virtual Result<Bitmap> bitmap() const = 0;
};

/// Makes images.
class QUILT_EXPORT Images {
 public:
  virtual ~Images() = default;

  /// Reads the header only.
  [[nodiscard]] virtual Result<std::shared_ptr<ImageWrapper>> imageWithPath(
      const std::filesystem::path& path) const = 0;
  /// An encoded image in memory, copied.
  [[nodiscard]] virtual Result<std::shared_ptr<ImageWrapper>> imageWithData(
      std::span<const unsigned char> data) const = 0;
  /// An image of pixels, which it takes over.
  [[nodiscard]] virtual Result<std::shared_ptr<ImageWrapper>> imageWithBitmap(Bitmap bitmap) const = 0;
};

}  // namespace quilt::platform
