// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <utility>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/interfaces/Services.h"

namespace quilt::hosts {

/// A toolkit's loop as the loop of the library's main thread: what the adapters to Qt and GLib share, and what an
/// adapter to another toolkit derives from. docs/hosts.md shows one.
///
/// The toolkit gets one event for each queued block, and never fewer. So a block that opens a nested loop (a modal
/// dialog) leaves enough events behind for the blocks that are queued beside it: the nested loop runs them.
///
/// The service stays installed after close(), when the toolkit has gone, and then is what the built-in loop is.
/// Workers may go on meanwhile: nothing that they read is replaced.
class ToolkitLoop : public platform::RunLoop {
 public:
  /// Makes the calling thread the main thread and the loop the one of the process. While no other thread uses the
  /// library, and while no other adapter is open.
  static void install(const std::shared_ptr<ToolkitLoop>& loop) {
    platform::MainThread::adopt();
    platform::Services set = platform::services();
    set.runLoop = loop;
    platform::installServices(std::move(set));
    platform::MainThread::setWakeFunction([loop] { loop->wake(); });
    loop->wake();  // for what was queued before
  }

  /// Main thread only, outside of the blocks that it runs: lets go of the toolkit, then runs what is queued, so that
  /// the workers that wait get on. What they queue later waits until the main thread runs blocks again, in runUntil(),
  /// or in another adapter's loop.
  void close() {
    platform::MainThread::setWakeFunction({});
    {
      const std::lock_guard guard(_mutex);
      _isOpen = false;
    }
    detach();
    platform::MainThread::runQueuedBlocks();
  }

  void wake() final {
    {
      const std::lock_guard guard(_mutex);  // a worker may come late: the toolkit's objects stay until it has left
      if (_isOpen) {
        post();
        return;
      }
    }
    platform::MainThread::signal();
  }

  void runUntil(const std::function<bool()>& isDone) final {
    while (!isDone()) {
      if (_isOpen) {  // written on this thread alone
        turn();
      } else {
        platform::MainThread::waitAndRunQueuedBlocks();
      }
    }
  }

 protected:
  /// Any thread, one at a time: makes the toolkit call MainThread::runQueuedBlocks() once on the main thread, also from
  /// a nested loop. Neither runs it itself nor merges it with a call that is still to come.
  virtual void post() = 0;
  /// Main thread: waits until the toolkit has something to do and does it.
  virtual void turn() = 0;
  /// Main thread, once: no post() is running or will come.
  virtual void detach() = 0;

  /// For what post() writes and the main thread reads: post() runs under it.
  std::mutex& mutex() { return _mutex; }

 private:
  std::mutex _mutex;
  bool _isOpen = true;  // changed under the mutex
};

}  // namespace quilt::hosts
