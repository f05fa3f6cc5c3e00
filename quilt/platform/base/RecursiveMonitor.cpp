// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/RecursiveMonitor.h"

#include <utility>

#include "quilt/platform/base/MonitorWait.h"

namespace quilt::platform {

bool RecursiveMonitor::enterIfPossible() {
  if (_owner == nullptr) _owner = currentThreadIdentity();
  const bool mayEnter =
      _owner == currentThreadIdentity() || (MainThread::isCurrent() && MainThread::isActingFor(_owner));
  if (mayEnter) ++_depth;
  return mayEnter;
}

void RecursiveMonitor::lock() {
  std::unique_lock guard(_mutex);
  if (!MainThread::isCurrent()) {
    _freed.wait(guard, [this] { return enterIfPossible(); });
    return;
  }
  while (!enterIfPossible()) {
    _mainThreadWaits = true;
    guard.unlock();
    waitForFreedMonitor();
    guard.lock();
  }
}

bool RecursiveMonitor::try_lock() {
  const std::lock_guard guard(_mutex);
  return enterIfPossible();
}

void RecursiveMonitor::unlock() {
  bool signalMain = false;
  {
    const std::lock_guard guard(_mutex);
    if (--_depth > 0) return;
    _owner = nullptr;
    signalMain = std::exchange(_mainThreadWaits, false);
    // Inside the guard: once the owner is cleared and the mutex free, another thread may destroy this monitor.
    _freed.notify_one();
  }
  if (signalMain) signalFreedMonitor();
}

}  // namespace quilt::platform
