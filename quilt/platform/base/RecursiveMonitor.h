// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <condition_variable>
#include <cstddef>
#include <mutex>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/MainThread.h"

namespace quilt::platform {

/// A recursive lock that a thread may hold while it waits for the main thread.
///
/// - The thread that holds it may enter it again.
/// - While the main thread runs a block for a thread that holds it, the main thread may enter it too: the holder is
///   waiting for that block, so an observer that reads the changing list from inside the block cannot deadlock.
/// - When the main thread has to wait for it, it runs the blocks queued for it meanwhile.
///
/// Meets the standard's Lockable requirements; use it with std::unique_lock.
class QUILT_EXPORT RecursiveMonitor {
 public:
  RecursiveMonitor() = default;
  RecursiveMonitor(const RecursiveMonitor&) = delete;
  RecursiveMonitor& operator=(const RecursiveMonitor&) = delete;

  /// @{
  /// Enters, waiting as long as it takes; enters when that is possible at once, and answers whether; leaves, once for
  /// each time entered.
  void lock();
  bool try_lock();
  void unlock();
  /// @}

 private:
  bool enterIfPossible();

  std::mutex _mutex;
  std::condition_variable _freed;
  ThreadIdentity _owner = nullptr;
  std::size_t _depth = 0;
  bool _mainThreadWaits = false;
};

/// Holds a monitor for its own life.
using MonitorLock = std::unique_lock<RecursiveMonitor>;

}  // namespace quilt::platform
