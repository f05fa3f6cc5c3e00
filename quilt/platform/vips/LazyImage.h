// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "quilt/platform/interfaces/ImageWrapper.h"
#include "quilt/platform/vips/PixelSource.h"

namespace quilt::platform::vips {

/// An image as pixels somewhere and the size in which they are wanted. Converting only notes a smaller size, so a chain
/// of conversions decodes once, straight to the last size. Every use decodes again; nothing decoded is kept.
class LazyImage final : public ImageWrapper, public std::enable_shared_from_this<LazyImage> {
 public:
  explicit LazyImage(std::shared_ptr<const PixelSource> source);
  LazyImage(std::shared_ptr<const PixelSource> source, Size size);

  [[nodiscard]] Size size() const override { return _size; }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToSD() const override { return fitted(kStandardDefinition); }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToHD() const override { return fitted(kHighDefinition); }
  [[nodiscard]] Result<void> saveAsJPGAtPath(const std::filesystem::path& path) const override;
  [[nodiscard]] Result<void> saveAsPNGAtURL(const Url& url) const override;
  [[nodiscard]] Result<Bitmap> bitmap() const override;

 private:
  [[nodiscard]] std::shared_ptr<ImageWrapper> fitted(Size box) const;

  const std::shared_ptr<const PixelSource> _source;
  const Size _size;
};

}  // namespace quilt::platform::vips
