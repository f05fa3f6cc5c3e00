// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/runloop/BuiltInRunLoop.h"

#include "quilt/platform/base/MainThread.h"

namespace quilt::platform {

void BuiltInRunLoop::wake() { MainThread::signal(); }

void BuiltInRunLoop::runUntil(const std::function<bool()>& isDone) {
  while (!isDone()) MainThread::waitAndRunQueuedBlocks();
}

}  // namespace quilt::platform
