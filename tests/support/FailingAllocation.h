// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>

namespace quilt::support {

/// While it lives, the `nth` allocation (from 1) with `new` on this thread fails; all others succeed.
class FailingAllocation {
 public:
  explicit FailingAllocation(std::size_t nth);
  FailingAllocation(const FailingAllocation&) = delete;
  FailingAllocation& operator=(const FailingAllocation&) = delete;
  ~FailingAllocation();

  /// Whether the allocation was reached.
  [[nodiscard]] bool hasFailed() const;
};

}  // namespace quilt::support
