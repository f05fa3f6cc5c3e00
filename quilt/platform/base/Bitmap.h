// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace quilt::platform {

/// Decoded pixels: sRGB, 8 bits a channel, red green blue alpha, alpha not premultiplied, rows from the top,
/// no padding: pixels.size() is width × height × 4.
struct Bitmap {
  std::size_t width = 0;             ///< pixels
  std::size_t height = 0;            ///< pixels
  std::vector<std::uint8_t> pixels;  ///< four bytes each
};

}  // namespace quilt::platform
