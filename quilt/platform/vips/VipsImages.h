// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <vector>

#include "quilt/platform/interfaces/Diagnostics.h"
#include "quilt/platform/interfaces/ImageWrapper.h"

namespace quilt::platform {

/// Images through libvips: JPEG, PNG, TIFF, GIF, WebP, JPEG 2000, HEIF, BMP and ICNS, whatever the file is called; of
/// files with several pictures the first, of icon files the largest. A picture of more than 100,000 pixels a side, or
/// of more than 500 million in all (100 million in formats that have to be held whole), is refused as Damaged. What is
/// missing at the end of a cut file is blank. A file must stay in place while an image made from it is used; one that
/// was replaced by a picture of another size is refused. JPEG is written at quality 85, without the camera's notes.
/// Any thread.
class VipsImages final : public Images {
 public:
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithPath(const std::filesystem::path& path) const override;
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithData(std::span<const unsigned char> data) const override;
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithBitmap(Bitmap bitmap) const override;

  /// A line for each format, and one for the library.
  static std::vector<Capability> capabilities();
};

}  // namespace quilt::platform
