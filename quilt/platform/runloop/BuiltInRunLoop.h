// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/RunLoop.h"

namespace quilt::platform {

/// The loop of a process without a toolkit. It waits on the queue of MainThread itself, so it needs no wake function
/// and leaves one that is set alone.
class BuiltInRunLoop final : public RunLoop {
 public:
  void wake() override;
  void runUntil(const std::function<bool()>& isDone) override;
};

}  // namespace quilt::platform
