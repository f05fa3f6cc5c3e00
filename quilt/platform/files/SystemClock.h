// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/Clock.h"

namespace quilt::platform {

/// The machine's clock.
class SystemClock final : public Clock {
 public:
  [[nodiscard]] Date now() const override { return std::chrono::system_clock::now(); }
};

}  // namespace quilt::platform
