// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

#include "quilt/platform/base/Bitmap.h"

/// Windows bitmaps, which libvips reads through no loader fit for files from strangers: 1, 4, 8, 16, 24 and 32 bits,
/// palettes, bit fields and run lengths, all versions of the header.
namespace quilt::platform::vips {

struct BmpHeader {
  std::size_t width = 0;
  std::size_t height = 0;
};

/// None for what is no bitmap of these kinds. The first 26 bytes are enough. Any size up to 2³¹ is answered.
std::optional<BmpHeader> readBmpHeader(std::string_view bytes);

/// None when the header is wrong. Rows that a short file lacks stay transparent black. The caller has checked the size.
std::optional<Bitmap> readBmp(std::string_view bytes);

}  // namespace quilt::platform::vips
