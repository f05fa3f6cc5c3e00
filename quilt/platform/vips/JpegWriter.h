// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>

#include "quilt/platform/base/Bitmap.h"

namespace quilt::platform::vips {

/// Of 100. At 85 a still from a movie and its JPEG cannot be told apart at viewing distance, at a tenth of the size of
/// 100.
inline constexpr int kJPEGQuality = 85;

/// An opaque picture as JPEG, a grey one without colours; none when it is not opaque or libjpeg cannot. Straight from
/// the pixels and on the calling thread: for a page, libvips' pipeline and its threads take longer than the encoding
/// itself.
std::optional<std::string> jpegOf(const Bitmap& bitmap);

}  // namespace quilt::platform::vips
