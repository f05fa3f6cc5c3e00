// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/base/RecursiveMonitor.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

TEST(MainThreadTest, RunsABlockAtOnceOnTheMainThread) {
  ASSERT_TRUE(MainThread::isCurrent());
  bool ran = false;
  MainThread::performBlock([&] { ran = true; });
  EXPECT_TRUE(ran);
}

TEST(MainThreadTest, AWorkerWaitsForItsBlock) {
  std::vector<std::string> order;
  runOnWorker([&] {
    EXPECT_FALSE(MainThread::isCurrent());
    performBlockOnMainThread([&] {
      EXPECT_TRUE(MainThread::isCurrent());
      order.emplace_back("block");
    });
    order.emplace_back("after");
  });
  EXPECT_THAT(order, ElementsAre("block", "after"));
}

TEST(MainThreadTest, WhatABlockThrowsReachesItsCaller) {
  std::string caught;
  runOnWorker([&] {
    try {
      MainThread::performBlock([] { throw std::runtime_error("from the block"); });
    } catch (const std::runtime_error& error) {
      caught = error.what();
    }
  });
  EXPECT_EQ("from the block", caught);
}

TEST(MainThreadTest, CallsTheWakeFunctionAfterQueueing) {
  std::atomic<int> wakes = 0;
  MainThread::setWakeFunction([&] { ++wakes; });
  runOnWorker([] { MainThread::performBlock([] {}); });
  MainThread::setWakeFunction({});
  EXPECT_EQ(1, wakes);
}

TEST(MainThreadTest, AHostLoopRunsWhatIsQueued) {
  std::atomic<bool> queued = false;
  std::atomic<bool> ran = false;
  MainThread::setWakeFunction([&] { queued = true; });
  std::thread worker([&] { MainThread::performBlock([&] { ran = true; }); });
  while (!queued) std::this_thread::yield();
  EXPECT_FALSE(ran);
  MainThread::runQueuedBlocks();
  EXPECT_TRUE(ran);
  worker.join();
  MainThread::setWakeFunction({});
}

TEST(MainThreadTest, ABlockMayQueueOnItself) {
  int depth = 0;
  runOnWorker([&] { MainThread::performBlock([&] { MainThread::performBlock([&] { depth = 2; }); }); });
  EXPECT_EQ(2, depth);
}

// Two workers wait for their blocks; the first block needs what the second worker holds. The second block has to run
// inside the first.
TEST(MainThreadTest, ABlockThatWaitsForAMonitorLetsLaterBlocksRun) {
  RecursiveMonitor monitor;
  std::atomic<int> queued = 0;
  std::vector<std::string> order;
  MainThread::setWakeFunction([&] { ++queued; });
  std::thread first([&] {
    MainThread::performBlock([&] {
      const MonitorLock lock(monitor);
      order.emplace_back("first");
    });
  });
  while (queued < 1) std::this_thread::yield();
  std::thread second([&] {
    const MonitorLock lock(monitor);
    MainThread::performBlock([&] { order.emplace_back("second"); });
  });
  while (queued < 2) std::this_thread::yield();
  MainThread::runQueuedBlocks();
  first.join();
  second.join();
  MainThread::setWakeFunction({});
  EXPECT_THAT(order, ElementsAre("second", "first"));
}

TEST(MainThreadTest, WhatIsQueuedDuringATurnWaitsForTheNext) {
  std::atomic<int> queued = 0;
  std::vector<std::string> order;
  MainThread::setWakeFunction([&] { ++queued; });
  std::thread second;
  std::thread first([&] {
    MainThread::performBlock([&] {
      order.emplace_back("first");
      second = std::thread([&] { MainThread::performBlock([&] { order.emplace_back("second"); }); });
      while (queued < 2) std::this_thread::yield();
    });
  });
  while (queued < 1) std::this_thread::yield();
  MainThread::runQueuedBlocks();
  EXPECT_THAT(order, ElementsAre("first"));
  MainThread::runQueuedBlocks();
  EXPECT_THAT(order, ElementsAre("first", "second"));
  first.join();
  second.join();
  MainThread::setWakeFunction({});
}

TEST(MainThreadTest, ASignalEndsAWaitThatBeginsLater) {
  MainThread::signal();
  MainThread::waitAndRunQueuedBlocks();
}

TEST(MainThreadTest, AnotherThreadMayBecomeTheMainThread) {
  std::thread host([] {
    MainThread::adopt();
    EXPECT_TRUE(MainThread::isCurrent());
    bool ran = false;
    runOnWorker([&] { MainThread::performBlock([&] { ran = MainThread::isCurrent(); }); });
    EXPECT_TRUE(ran);
  });
  host.join();
  EXPECT_FALSE(MainThread::isCurrent());
  MainThread::adopt();
  EXPECT_TRUE(MainThread::isCurrent());
}

TEST(WorkerThreadTest, RunsTheJobOnAnotherThreadAndReturnsAfterIt) {
  std::thread::id thread;
  runOnWorker([&] { thread = std::this_thread::get_id(); });
  EXPECT_NE(std::thread::id(), thread);
  EXPECT_NE(std::this_thread::get_id(), thread);
}

TEST(WorkerThreadTest, WhatTheJobThrowsReachesTheCaller) {
  EXPECT_THROW(runOnWorker([] { throw std::runtime_error("from the job"); }), std::runtime_error);
}

TEST(WorkerThreadTest, AJobOfAWorkerRunsWhereItIs) {
  std::thread::id outer;
  std::thread::id inner;
  runOnWorker([&] {
    outer = std::this_thread::get_id();
    runOnWorker([&] { inner = std::this_thread::get_id(); });
  });
  EXPECT_EQ(outer, inner);
}

}  // namespace
}  // namespace quilt::platform
