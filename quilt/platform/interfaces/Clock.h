// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Date.h"
#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// The time of day. May be called on any thread.
class QUILT_EXPORT Clock {
 public:
  virtual ~Clock() = default;
  /// The present.
  [[nodiscard]] virtual Date now() const = 0;
};

}  // namespace quilt::platform
