// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/runloop/BuiltInRunLoop.h"

namespace quilt::platform {
namespace {

TEST(BuiltInRunLoopThreadTest, RunsBlocksUntilTheWorkIsDone) {
  BuiltInRunLoop loop;
  std::atomic<bool> done = false;
  int blocks = 0;
  std::thread worker([&] {
    for (int i = 0; i < 100; ++i) MainThread::performBlock([&] { ++blocks; });
    done = true;
    loop.wake();
  });
  loop.runUntil([&] { return done.load(); });
  EXPECT_EQ(100, blocks);
  worker.join();
}

TEST(BuiltInRunLoopThreadTest, ReturnsAtOnceWhenTheWorkIsDone) {
  BuiltInRunLoop().runUntil([] { return true; });
}

TEST(BuiltInRunLoopThreadTest, AsksAfterEveryWake) {
  BuiltInRunLoop loop;
  std::atomic<int> asked = 0;
  std::thread waker([&] {
    for (int seen = 0; seen < 3; ++seen) {
      while (asked <= seen) std::this_thread::yield();
      loop.wake();
    }
  });
  loop.runUntil([&] { return ++asked > 3; });
  EXPECT_EQ(4, asked);
  waker.join();
}

}  // namespace
}  // namespace quilt::platform
