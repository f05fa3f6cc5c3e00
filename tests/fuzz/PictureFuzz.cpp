// SPDX-License-Identifier: Apache-2.0
// Pictures from strangers, as small as they are shown in lists.
#include <cstddef>
#include <cstdint>
#include <stdexcept>

#include "quilt/platform/vips/VipsImages.h"

using namespace quilt::platform;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t most = 1U << 20U;
  if (size > most) return 0;
  const auto image = VipsImages().imageWithData({data, size});
  if (!image) return 0;
  const Size whole = (*image)->size();
  if (!(whole.width >= 1) || !(whole.height >= 1)) throw std::logic_error("a picture without a size");
  const auto shown = (*image)->convertToSD();
  if (!shown) return 0;
  const auto bitmap = shown->bitmap();
  if (bitmap && bitmap->pixels.size() != bitmap->width * bitmap->height * 4) {
    throw std::logic_error("a bitmap of the wrong size");
  }
  return 0;
}
