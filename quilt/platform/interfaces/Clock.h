// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Date.h"

namespace quilt::platform {

/// The time of day. May be called on any thread.
class Clock {
 public:
  virtual ~Clock() = default;
  [[nodiscard]] virtual Date now() const = 0;
};

}  // namespace quilt::platform
