// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>

#include "quilt/platform/base/Geometry.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/vips/ImageBytes.h"
#include "quilt/platform/vips/Vips.h"

namespace quilt::platform::vips {

/// Limits. A picture beyond them is refused as Damaged before any of its pixels is decoded.
inline constexpr double kMaximumSide = 100'000;                ///< pixels
inline constexpr double kMaximumStreamedPixels = 500e6;        ///< of formats that are decoded row by row
inline constexpr double kMaximumHeldPixels = 100e6;            ///< of pictures that a decoder must hold whole
inline constexpr std::uint64_t kMaximumHeldBytes = 512 << 20;  ///< of files that are read into memory whole

/// What the first part of a file tells about the picture in it.
struct ImageHeader {
  ImageFormat format = ImageFormat::JPEG;
  Size size;               ///< displayed pixels
  bool isTurned = false;   ///< the camera's orientation differs from the stored one
  bool isPlainRGB = true;  ///< may be shown as it is: grey or RGB, without a profile other than sRGB
  std::string colour;      ///< for people
  std::optional<std::string> title;
  std::optional<std::string> information;
  std::optional<std::string> author;
};

/// Reads the header with libvips' loader for the format, never decoding; for every format but BMP and ICNS.
Result<ImageHeader> readHeader(const ImageBytes& bytes, ImageFormat format);

/// Opens the picture for one pass from the top. `reduction`: how many times smaller it may be decoded, at most; JPEG
/// and JPEG 2000 decode fewer pixels then. `source` is what bytes.open() answered.
Image openPixels(::VipsSource* source, ImageFormat format, double reduction);

/// Damaged when the size is beyond the limits.
Result<void> checkSize(Size size, double maximumPixels, const std::filesystem::path& file);

}  // namespace quilt::platform::vips
