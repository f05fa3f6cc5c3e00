// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Worker.h"

#include <atomic>
#include <exception>
#include <thread>

#include "quilt/platform/base/MainThread.h"

namespace quilt::platform {

void runOnWorker(const std::function<void()>& job) {
  if (!MainThread::isCurrent()) {
    job();
    return;
  }
  std::atomic<bool> done = false;
  std::exception_ptr thrown;
  std::thread worker([&] {
    try {
      job();
    } catch (...) {
      thrown = std::current_exception();
    }
    done = true;
    MainThread::signal();
  });
  while (!done) MainThread::waitAndRunQueuedBlocks();
  worker.join();
  if (thrown) std::rethrow_exception(thrown);
}

}  // namespace quilt::platform
