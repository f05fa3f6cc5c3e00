// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// The loop of the main thread. A host with a loop of its own (a toolkit's) installs an adapter that calls
/// MainThread::runQueuedBlocks() when it is woken.
class QUILT_EXPORT RunLoop {
 public:
  virtual ~RunLoop() = default;

  /// Any thread: makes the loop call MainThread::runQueuedBlocks() soon.
  virtual void wake() = 0;

  /// Main thread only: turns the loop until `isDone` answers true. The question is asked after every wake.
  virtual void runUntil(const std::function<bool()>& isDone) = 0;
};

}  // namespace quilt::platform
