// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/interfaces/Drawing.h"

namespace quilt::platform {

/// Drawing with cairo.
class CairoDrawing final : public Drawing {
 public:
  [[nodiscard]] Result<std::unique_ptr<Canvas>> makeCanvas(Size size) const override;

  /// The version of the library.
  static std::string version();
};

}  // namespace quilt::platform
