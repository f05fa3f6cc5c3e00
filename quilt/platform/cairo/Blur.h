// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

namespace quilt::platform::cairo {

/// Blurs a plane of 8-bit values in place with three box filters a direction, which together come close to a Gaussian
/// of that deviation. What lies outside counts as 0. Cost does not depend on the
/// deviation. `stride` is the distance of rows in bytes.
void blur(std::uint8_t* plane, std::size_t width, std::size_t height, std::size_t stride, double deviation);

}  // namespace quilt::platform::cairo
