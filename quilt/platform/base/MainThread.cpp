// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/MainThread.h"

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <deque>
#include <exception>
#include <mutex>
#include <vector>

#include "quilt/platform/base/MonitorWait.h"
#include "quilt/platform/base/Uninterrupted.h"

namespace quilt::platform {

namespace {

// Lives on the stack of the thread that waits for it.
struct QueuedBlock {
  const std::function<void()>* block;
  ThreadIdentity caller;
  std::exception_ptr thrown;
  bool done = false;
};

struct Queue {
  std::mutex mutex;
  std::condition_variable mainMayRun;
  std::condition_variable blockDone;
  std::deque<QueuedBlock*> blocks;
  bool signalled = false;     // for the loop
  bool monitorFreed = false;  // for a wait inside RecursiveMonitor, which must not use up the loop's signal
  std::function<void()> wake;
};

// Never destroyed: a worker may still be leaving performBlock while the process ends.
Queue& queue() {
  static Queue& instance = *new Queue;
  return instance;
}

std::atomic<ThreadIdentity> mainIdentity{currentThreadIdentity()};

// The threads whose blocks the main thread is running now, innermost last. Touched by the main thread alone.
std::vector<ThreadIdentity>& actingFor() {
  static std::vector<ThreadIdentity>& stack = *new std::vector<ThreadIdentity>;
  return stack;
}

void run(QueuedBlock& queued) {
  actingFor().push_back(queued.caller);
  try {
    const Uninterrupted::Suspended anew;  // it belongs to another thread's operation, not to what this one waits in
    (*queued.block)();
  } catch (...) {
    queued.thrown = std::current_exception();
  }
  actingFor().pop_back();
  {
    const std::lock_guard guard(queue().mutex);
    queued.done = true;
  }
  queue().blockDone.notify_all();
}

// Runs as many blocks as are queued now: those queued meanwhile wait for the next call, so that a busy worker cannot
// keep the main thread here. Each is taken from the queue only when its turn comes: a block that has to wait for a lock
// may have to run the ones behind it first.
void runBatch(std::unique_lock<std::mutex>& lock) {
  for (std::size_t left = queue().blocks.size(); left > 0 && !queue().blocks.empty(); --left) {
    QueuedBlock* next = queue().blocks.front();
    queue().blocks.pop_front();
    lock.unlock();
    run(*next);
    lock.lock();
  }
}

void waitAndRun(bool& flag) {
  std::unique_lock lock(queue().mutex);
  queue().mainMayRun.wait(lock, [&flag] { return flag || !queue().blocks.empty(); });
  flag = false;
  runBatch(lock);
}

void raise(bool& flag) {
  {
    const std::lock_guard guard(queue().mutex);
    flag = true;
  }
  queue().mainMayRun.notify_all();
}

}  // namespace

ThreadIdentity currentThreadIdentity() {
  thread_local const char identity = 0;
  return &identity;
}

void MainThread::adopt() { mainIdentity = currentThreadIdentity(); }

bool MainThread::isCurrent() { return mainIdentity == currentThreadIdentity(); }

void MainThread::performBlock(const std::function<void()>& block) {
  if (isCurrent()) {
    block();
    return;
  }
  QueuedBlock queued{&block, currentThreadIdentity(), nullptr};
  std::function<void()> wake;
  {
    const std::lock_guard guard(queue().mutex);
    queue().blocks.push_back(&queued);
    wake = queue().wake;
  }
  queue().mainMayRun.notify_all();
  std::exception_ptr thrown;
  try {
    if (wake) wake();
  } catch (...) {
    thrown = std::current_exception();
  }
  {
    std::unique_lock lock(queue().mutex);
    // Without its wake the main thread may never come: the block is taken back, unless it runs already.
    if (thrown && std::erase(queue().blocks, &queued) > 0) std::rethrow_exception(thrown);
    queue().blockDone.wait(lock, [&queued] { return queued.done; });
  }
  if (queued.thrown) std::rethrow_exception(queued.thrown);
  if (thrown) std::rethrow_exception(thrown);
}

void MainThread::setWakeFunction(std::function<void()> wake) {
  const std::lock_guard guard(queue().mutex);
  queue().wake = std::move(wake);
}

void MainThread::runQueuedBlocks() {
  std::unique_lock lock(queue().mutex);
  runBatch(lock);
}

void MainThread::waitAndRunQueuedBlocks() { waitAndRun(queue().signalled); }
void MainThread::signal() { raise(queue().signalled); }
void waitForFreedMonitor() { waitAndRun(queue().monitorFreed); }
void signalFreedMonitor() { raise(queue().monitorFreed); }

bool MainThread::isActingFor(ThreadIdentity thread) {
  return std::find(actingFor().begin(), actingFor().end(), thread) != actingFor().end();
}

void performBlockOnMainThread(const std::function<void()>& block) { MainThread::performBlock(block); }

}  // namespace quilt::platform
