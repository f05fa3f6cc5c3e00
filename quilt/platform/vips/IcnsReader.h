// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "quilt/platform/base/Bitmap.h"

/// Icon files: a list of one picture in several sizes, each an image file of its own (PNG, JPEG 2000) or run lengths.
namespace quilt::platform::vips {

/// One picture of an icon file.
struct IconPicture {
  std::size_t nominalSide = 0;                ///< pixels, by its type; an image file inside may say otherwise
  std::variant<std::string, Bitmap> content;  ///< the bytes of an image file, or pixels
};

/// The pictures that can be read, the largest first; bounded by the length of the file. Empty for what is no icon file.
std::vector<IconPicture> readIcns(std::string_view bytes);

}  // namespace quilt::platform::vips
