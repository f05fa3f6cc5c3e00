// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Geometry.h"

#include <algorithm>

namespace quilt::platform {

namespace {

bool isEmpty(Size size) { return size.width <= 0 || size.height <= 0; }

}  // namespace

Size FDYFitSizeToSize(Size size, Size container) {
  if (isEmpty(size) || isEmpty(container)) return {};
  const double scale = std::min(container.width / size.width, container.height / size.height);
  return {size.width * scale, size.height * scale};
}

Rect FDYFillSizeToSize(Size size, Size container) {
  if (isEmpty(size) || isEmpty(container)) return {};
  const Size part = FDYFitSizeToSize(container, size);
  return {(size.width - part.width) / 2, (size.height - part.height) / 2, part.width, part.height};
}

}  // namespace quilt::platform
