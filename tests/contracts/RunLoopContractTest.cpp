// SPDX-License-Identifier: Apache-2.0
// What every RunLoop promises, on the main thread.
#include <atomic>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/runloop/BuiltInRunLoop.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using RunLoopContractThreadTest = support::ContractTest<RunLoop>;
INSTANTIATE_TEST_SUITE_P(Implementations, RunLoopContractThreadTest,
                         ::testing::Values(support::Candidate<RunLoop>{
                             "BuiltIn", [] { return std::make_shared<BuiltInRunLoop>(); }}),
                         support::candidateName);

TEST_P(RunLoopContractThreadTest, AWakeBeforeTheTurnIsNotLost) {
  service->wake();
  int asked = 0;
  service->runUntil([&] { return ++asked == 2; });
  EXPECT_EQ(2, asked);
}

TEST_P(RunLoopContractThreadTest, QueuedBlocksRunOnTheMainThread) {
  std::atomic<int> finished = 0;
  int blocks = 0;
  std::thread workers([&] {
    support::onThreads([&] {
      for (int i = 0; i < 50; ++i) {
        performBlockOnMainThread([&] {
          EXPECT_TRUE(MainThread::isCurrent());
          ++blocks;
        });
      }
      ++finished;
      service->wake();
    });
  });
  service->runUntil([&] { return finished == 4; });
  workers.join();
  EXPECT_EQ(200, blocks);
}

TEST_P(RunLoopContractThreadTest, ABlockMayTurnTheLoopItself) {
  std::atomic<bool> isInnerDone = false;
  std::atomic<bool> isDone = false;
  std::thread worker([&] {
    performBlockOnMainThread([&] {
      std::thread other([&] {
        performBlockOnMainThread([&] { isInnerDone = true; });
        service->wake();
      });
      service->runUntil([&] { return isInnerDone.load(); });
      other.join();
    });
    isDone = true;
    service->wake();
  });
  service->runUntil([&] { return isDone.load(); });
  worker.join();
  EXPECT_TRUE(isInnerDone);
}

}  // namespace
}  // namespace quilt::platform
