// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <thread>
#include <vector>

#include "quilt/platform/base/RecursiveMonitor.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::platform {
namespace {

TEST(RecursiveMonitorThreadTest, ItsHolderMayEnterAgain) {
  RecursiveMonitor monitor;
  const MonitorLock outer(monitor);
  const MonitorLock inner(monitor);
  EXPECT_TRUE(monitor.try_lock());
  monitor.unlock();
}

TEST(RecursiveMonitorThreadTest, WaitingForItLosesNoSignalToTheLoop) {
  RecursiveMonitor monitor;
  std::atomic<bool> locked = false;
  std::thread worker([&] {
    const MonitorLock lock(monitor);
    locked = true;
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  });
  while (!locked) std::this_thread::yield();
  MainThread::signal();
  monitor.lock();
  monitor.unlock();
  MainThread::waitAndRunQueuedBlocks();  // would wait for ever if the lock had used the signal up
  worker.join();
}

TEST(RecursiveMonitorThreadTest, ShutsOtherThreadsOutUntilTheLastExit) {
  RecursiveMonitor monitor;
  monitor.lock();
  monitor.lock();
  const auto isFree = [&] {
    bool entered = false;
    std::thread other([&] {
      entered = monitor.try_lock();
      if (entered) monitor.unlock();
    });
    other.join();
    return entered;
  };
  EXPECT_FALSE(isFree());
  monitor.unlock();
  EXPECT_FALSE(isFree());
  monitor.unlock();
  EXPECT_TRUE(isFree());
}

TEST(RecursiveMonitorThreadTest, IsLentToTheMainThreadWhileItRunsTheHoldersBlock) {
  RecursiveMonitor monitor;
  bool entered = false;
  runOnWorker([&] {
    const MonitorLock lock(monitor);
    MainThread::performBlock([&] {
      const MonitorLock lent(monitor);
      entered = true;
    });
    std::thread other([&] { EXPECT_FALSE(monitor.try_lock()); });
    other.join();
  });
  EXPECT_TRUE(entered);
  EXPECT_TRUE(monitor.try_lock());
  monitor.unlock();
}

TEST(RecursiveMonitorThreadTest, IsNotLentForAnotherThreadsBlock) {
  RecursiveMonitor monitor;
  std::atomic<bool> held = false;
  std::atomic<bool> release = false;
  std::thread holder([&] {
    const MonitorLock lock(monitor);
    held = true;
    while (!release) std::this_thread::yield();
  });
  while (!held) std::this_thread::yield();
  runOnWorker([&] { MainThread::performBlock([&] { EXPECT_FALSE(monitor.try_lock()); }); });
  release = true;
  holder.join();
}

// The main thread wants what a worker holds that itself waits for the main thread.
TEST(RecursiveMonitorThreadTest, TheMainThreadRunsTheHoldersBlockWhileItWaits) {
  RecursiveMonitor monitor;
  std::atomic<bool> held = false;
  bool blockRan = false;
  std::thread holder([&] {
    const MonitorLock lock(monitor);
    held = true;
    MainThread::performBlock([&] { blockRan = true; });
  });
  while (!held) std::this_thread::yield();
  {
    const MonitorLock lock(monitor);
    EXPECT_TRUE(blockRan);
  }
  holder.join();
}

TEST(RecursiveMonitorThreadTest, CountsRightUnderContention) {
  RecursiveMonitor monitor;
  int count = 0;
  constexpr int rounds = 5000;
  const auto add = [&] {
    for (int i = 0; i < rounds; ++i) {
      const MonitorLock outer(monitor);
      const MonitorLock inner(monitor);
      ++count;
    }
  };
  std::thread first(add);
  std::thread second(add);
  add();
  first.join();
  second.join();
  EXPECT_EQ(3 * rounds, count);
}

// Its last holder may free it as soon as nobody else can be in it.
TEST(RecursiveMonitorThreadTest, MayBeDestroyedByTheThreadThatEntersLast) {
  for (int round = 0; round < 500; ++round) {
    auto monitor = std::make_unique<RecursiveMonitor>();
    std::atomic<bool> held = false;
    std::thread holder([&] {
      const MonitorLock lock(*monitor);
      held = true;
    });
    while (!held) std::this_thread::yield();
    { const MonitorLock lock(*monitor); }
    monitor.reset();
    holder.join();
  }
}

}  // namespace
}  // namespace quilt::platform
