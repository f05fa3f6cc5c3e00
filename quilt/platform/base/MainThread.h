// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// Who is running: one address for each thread, valid while the thread lives.
using ThreadIdentity = const void*;
/// The calling thread's.
QUILT_EXPORT ThreadIdentity currentThreadIdentity();

/// The main thread and the blocks that other threads have queued for it.
///
/// The main thread is the one on which the process started, until another calls adopt(). It runs queued blocks whenever
/// the host's loop calls runQueuedBlocks(), and while it waits for a RecursiveMonitor. A thread that queues a block
/// waits for it, so a host must keep its loop turning, or join its workers from a loop that does.
class QUILT_EXPORT MainThread {
 public:
  MainThread() = delete;

  /// Makes the calling thread the main thread. Only while no other thread uses the library.
  static void adopt();
  /// Whether the caller runs on the main thread.
  static bool isCurrent();

  /// Runs the block on the main thread and returns after it has run: at once when called there, otherwise queued.
  /// The block may enter every monitor that the waiting thread holds. What the block throws is thrown to the caller.
  static void performBlock(const std::function<void()>& block);

  /// Called, on any thread, after a block has been queued; a host's loop answers by calling runQueuedBlocks() on the
  /// main thread soon. Replaces the previous function; an empty one removes it.
  static void setWakeFunction(std::function<void()> wake);

  /// Main thread only: runs what is queued now and returns at once.
  static void runQueuedBlocks();

  /// Main thread only: waits until a block is queued or signal() is called, then runs what is queued.
  static void waitAndRunQueuedBlocks();

  /// Ends a wait of waitAndRunQueuedBlocks(), now or the next one.
  static void signal();

  /// Whether the main thread is running a block for this waiting thread. Main thread only.
  static bool isActingFor(ThreadIdentity thread);
};

/// MainThread::performBlock, under the name that model objects use.
QUILT_EXPORT void performBlockOnMainThread(const std::function<void()>& block);

}  // namespace quilt::platform
