// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gmock/gmock.h>

#include <array>
#include <atomic>
#include <chrono>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/MainThread.h"
#include "tests/support/ModelFixture.h"

namespace quilt::hosts {

/// What every adapter to a toolkit's loop does, once for each toolkit. A toolkit says:
///
///     struct Toolkit {                  // the toolkit, up and running, on the calling thread
///       using Adapter = …;              // made with makeAdapter()
///       std::unique_ptr<Adapter> makeAdapter();
///       class Loop { void run(); void quit(); };  // one of its own loops, which may be nested; quit() on any thread
///       void callOften(std::function<void()> call);  // from every turn of its loop, until it dies
///     };
template <class Toolkit>
class MainLoopThreadTest : public support::ModelFixture {
 protected:
  using Adapter = typename Toolkit::Adapter;
  using Loop = typename Toolkit::Loop;

  MainLoopThreadTest() : adapter(toolkit.makeAdapter()) {}
  ~MainLoopThreadTest() override {
    adapter.reset();
    for (std::thread& worker : workers) worker.join();
  }

  void startWorker(std::function<void()> job) { workers.emplace_back(std::move(job)); }
  /// A worker has the main thread count to `count` in blocks, one after the other, and then does `atTheEnd`.
  template <class Count>
  void startCounting(int count, Count& blocks, std::function<void()> atTheEnd) {
    startWorker([count, &blocks, atTheEnd = std::move(atTheEnd)] {
      for (int i = 0; i < count; ++i) platform::performBlockOnMainThread([&] { ++blocks; });
      atTheEnd();
    });
  }
  /// What ends a runUntil() that waits for `done`.
  static std::function<void()> finishing(std::atomic<bool>& done) {
    return [&done] {
      done = true;
      platform::services().runLoop->wake();
    };
  }
  void joinWorkers() {
    for (std::thread& worker : workers) worker.join();
    workers.clear();
  }

  /// From now on the test knows how many blocks are queued, and the toolkit has heard of them.
  void countQueuedBlocks() {
    platform::MainThread::setWakeFunction([this] {
      adapter->wake();
      ++queued;
    });
  }
  void waitForQueuedBlocks(int count) const {
    while (queued < count) std::this_thread::yield();
  }

  Toolkit toolkit;
  std::unique_ptr<Adapter> adapter;
  std::atomic<int> queued = 0;
  std::vector<std::thread> workers;
};

TYPED_TEST_SUITE_P(MainLoopThreadTest);

TYPED_TEST_P(MainLoopThreadTest, RunsTheBlocksOfAWorkerInTheToolkitsOwnLoop) {
  typename TypeParam::Loop loop;
  int blocks = 0;
  this->startCounting(100, blocks, [&] { loop.quit(); });
  loop.run();
  EXPECT_EQ(100, blocks);
}

TYPED_TEST_P(MainLoopThreadTest, TurnsTheLoopUntilTheWorkIsDone) {
  std::atomic<bool> done = false;
  int blocks = 0;
  this->startCounting(100, blocks, this->finishing(done));
  platform::services().runLoop->runUntil([&] { return done.load(); });
  EXPECT_EQ(100, blocks);
}

TYPED_TEST_P(MainLoopThreadTest, WhatABlockThrowsReachesItsCallerAndNotTheToolkit) {
  typename TypeParam::Loop loop;
  std::string caught;
  this->startWorker([&] {
    try {
      platform::performBlockOnMainThread([] { throw std::runtime_error("from the block"); });
    } catch (const std::runtime_error& error) {
      caught = error.what();
    }
    loop.quit();
  });
  loop.run();
  this->joinWorkers();
  EXPECT_EQ("from the block", caught);
}

TYPED_TEST_P(MainLoopThreadTest, IsWokenByEightThreads) {
  constexpr int kThreads = 8;
  constexpr int kBlocks = 200;
  std::atomic<int> left = kThreads;
  int blocks = 0;
  for (int thread = 0; thread < kThreads; ++thread) {
    this->startWorker([&] {
      for (int i = 0; i < kBlocks; ++i) {
        platform::performBlockOnMainThread([&] { ++blocks; });
        this->adapter->wake();
      }
      --left;
      this->adapter->wake();
    });
  }
  this->adapter->runUntil([&] { return left == 0; });
  EXPECT_EQ(kThreads * kBlocks, blocks);
  this->joinWorkers();
}

// The first block shows a modal dialog that stays until the second block has run. Both were queued before the loop
// turned.
TYPED_TEST_P(MainLoopThreadTest, ANestedLoopRunsWhatWasQueuedBesideTheBlockThatOpenedIt) {
  this->countQueuedBlocks();
  typename TypeParam::Loop dialog;
  std::vector<std::string> order;
  std::atomic<int> left = 3;
  const auto finish = [&] {
    --left;
    this->adapter->wake();
  };
  this->startWorker([&] {
    platform::performBlockOnMainThread([&] {
      dialog.run();
      order.emplace_back("dialog closed");
    });
    finish();
  });
  this->waitForQueuedBlocks(1);
  this->startWorker([&] {
    platform::performBlockOnMainThread([&] { order.emplace_back("second"); });
    finish();
  });
  this->waitForQueuedBlocks(2);
  this->startWorker([&] {
    platform::performBlockOnMainThread([&] {
      order.emplace_back("third");
      dialog.quit();
    });
    finish();
  });
  this->waitForQueuedBlocks(3);
  this->adapter->runUntil([&] { return left == 0; });
  EXPECT_THAT(order, ::testing::ElementsAre("second", "third", "dialog closed"));
  this->joinWorkers();
}

// Three dialogs, each opened by a block that comes while the one before is open.
TYPED_TEST_P(MainLoopThreadTest, ANestedLoopRunsWhatIsQueuedWhileItTurns) {
  std::array<typename TypeParam::Loop, 3> dialogs;
  std::atomic<bool> done = false;
  std::size_t open = 0;
  std::size_t deepest = 0;
  std::function<void()> openNext = [&] {
    const std::size_t mine = open++;
    deepest = std::max(deepest, open);
    this->startWorker([&] {
      platform::performBlockOnMainThread([&] {
        if (open < dialogs.size()) {
          openNext();
        } else {
          for (auto& dialog : dialogs) dialog.quit();
        }
      });
      this->adapter->wake();
    });
    dialogs[mine].run();
    --open;
  };
  this->startWorker([&] {
    platform::performBlockOnMainThread(openNext);
    done = true;
    this->adapter->wake();
  });
  this->adapter->runUntil([&] { return done.load(); });
  EXPECT_EQ(3U, deepest);
  EXPECT_EQ(0U, open);
  this->joinWorkers();
}

// A worker adds and moves items while the main thread observes the list and reads it at every turn of its loop.
TYPED_TEST_P(MainLoopThreadTest, TheMainThreadReadsListsThatWorkersChange) {
  const auto document = QuiltDocument::initWithPath(this->folder() / "talk.qpk");
  document->setIsProcessing(true);  // the lists are what is looked at here, not the saves
  int announced = 0;
  int reads = 0;
  std::size_t most = 0;
  const platform::Observation observation =
      document->observe("media", [&](const platform::ChangeNotice&) { announced += document->mediaCount() > 0; });
  this->toolkit.callOften([&] {
    ++reads;
    for (const auto& item : document->media()) EXPECT_EQ(document, item->documentOwner());
    most = std::max(most, document->mediaCount());
  });
  std::atomic<int> left = 2;
  for (int worker = 0; worker < 2; ++worker) {
    this->startWorker([&] {
      for (int i = 0; i < 100; ++i) {
        document->addMedia(QuiltMedia::init(), 0);
        document->moveMediaAtIndexes({0}, 1);
      }
      --left;
      this->adapter->wake();
    });
  }
  this->adapter->runUntil([&] { return left == 0 && reads > 0; });
  this->joinWorkers();
  EXPECT_EQ(200U, document->mediaCount());
  EXPECT_EQ(400, announced);
  EXPECT_LE(most, 200U);
}

TYPED_TEST_P(MainLoopThreadTest, WorkersThatWaitWhenTheAdapterDiesGetTheirBlocksRun) {
  this->countQueuedBlocks();
  int blocks = 0;
  for (int worker = 0; worker < 4; ++worker)
    this->startWorker([&] { platform::performBlockOnMainThread([&] { ++blocks; }); });
  this->waitForQueuedBlocks(4);
  this->adapter.reset();
  this->joinWorkers();
  EXPECT_EQ(4, blocks);
}

// The process ends its loop while a worker is in the middle of its work.
TYPED_TEST_P(MainLoopThreadTest, AfterTheAdapterTheMainThreadStillRunsBlocks) {
  std::atomic<bool> done = false;
  int blocks = 0;
  this->startCounting(50, blocks, this->finishing(done));
  this->adapter->runUntil([&] { return blocks > 10; });
  this->adapter.reset();
  platform::services().runLoop->runUntil([&] { return done.load(); });
  EXPECT_EQ(50, blocks);
}

TYPED_TEST_P(MainLoopThreadTest, AWakeThatComesLateTouchesNothing) {
  std::atomic<bool> stop = false;
  const std::shared_ptr<platform::RunLoop> loop = platform::services().runLoop;
  for (int worker = 0; worker < 4; ++worker) {
    this->startWorker([&] {
      while (!stop) {
        loop->wake();
        std::this_thread::sleep_for(std::chrono::microseconds(50));  // or the loop would do nothing else
      }
    });
  }
  this->adapter->runUntil([turns = 0]() mutable { return ++turns > 20; });
  this->adapter.reset();
  stop = true;
  this->joinWorkers();
  // What is left of their events runs no block of anyone.
  this->adapter = this->toolkit.makeAdapter();
  this->adapter->runUntil([this, turns = 0]() mutable {
    this->adapter->wake();
    return ++turns > 20;
  });
}

TYPED_TEST_P(MainLoopThreadTest, AnotherAdapterMayFollow) {
  std::atomic<bool> done = false;
  std::atomic<int> blocks = 0;
  this->startCounting(50, blocks, this->finishing(done));
  this->adapter->runUntil([&] { return blocks > 10; });
  this->adapter.reset();
  platform::services().runLoop->runUntil([&] { return done.load(); });
  this->joinWorkers();

  this->adapter = this->toolkit.makeAdapter();
  typename TypeParam::Loop loop;
  this->startWorker([&] {
    platform::performBlockOnMainThread([&] { ++blocks; });
    loop.quit();
  });
  loop.run();
  EXPECT_EQ(51, blocks);
}

REGISTER_TYPED_TEST_SUITE_P(MainLoopThreadTest, RunsTheBlocksOfAWorkerInTheToolkitsOwnLoop,
                            TurnsTheLoopUntilTheWorkIsDone, WhatABlockThrowsReachesItsCallerAndNotTheToolkit,
                            IsWokenByEightThreads, ANestedLoopRunsWhatWasQueuedBesideTheBlockThatOpenedIt,
                            ANestedLoopRunsWhatIsQueuedWhileItTurns, TheMainThreadReadsListsThatWorkersChange,
                            WorkersThatWaitWhenTheAdapterDiesGetTheirBlocksRun,
                            AfterTheAdapterTheMainThreadStillRunsBlocks, AWakeThatComesLateTouchesNothing,
                            AnotherAdapterMayFollow);

}  // namespace quilt::hosts
