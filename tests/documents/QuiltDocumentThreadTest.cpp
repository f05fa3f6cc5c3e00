// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <set>
#include <thread>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/base/MainThread.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using platform::MainThread;
using ::testing::Each;
using ::testing::IsEmpty;

/// Meant to be run with the thread sanitizer too.
class QuiltDocumentThreadTest : public support::DocumentFixture {
 protected:
  /// Runs the jobs on a thread each while this, the main thread, runs what they queue and calls `meanwhile`.
  static void run(const std::vector<std::function<void()>>& jobs, const std::function<void()>& meanwhile) {
    std::atomic<std::size_t> running = jobs.size();
    std::vector<std::thread> threads;
    for (const auto& job : jobs) {
      threads.emplace_back([&running, &job] {
        job();
        --running;
      });
    }
    while (running > 0) {
      MainThread::runQueuedBlocks();
      meanwhile();
      std::this_thread::yield();  // the jobs may have to share a core with this loop
    }
    for (std::thread& thread : threads) thread.join();
  }
};

TEST_F(QuiltDocumentThreadTest, SavesOfTwoThreadsLoseNoChange) {
  const auto document = made();
  constexpr int count = 150;
  run({[&document] {
         for (int i = 0; i <= count; ++i) document->setTitle(std::to_string(i));
       },
       [&document] {
         for (int i = 0; i <= count; ++i) document->setAuthor(std::to_string(i));
       }},
      [] {});
  EXPECT_EQ(saved(*document).string("Title"), std::to_string(count));
  EXPECT_EQ(saved(*document).string("Author"), std::to_string(count));
  EXPECT_THAT(takeProblems(), IsEmpty()) << "a save waits for the other, it is not refused";
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentThreadTest, ItemsAddedByTwoThreadsAreAllSaved) {
  const auto document = made();
  constexpr std::size_t count = 40;
  const auto addMany = [&document] {
    for (std::size_t i = 0; i < count; ++i) document->addMedia(QuiltMedia::init());
  };
  run({addMany, addMany}, [&document] { document->mediaCount(); });
  EXPECT_EQ(document->mediaCount(), 2 * count);
  EXPECT_EQ(saved(*document).array("Media")->size(), 2 * count);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentThreadTest, ASourceAddedDuringAnotherThreadsSaveIsSaved) {
  const auto document = made();
  const auto item = addItem(*document);
  addItem(*document);
  for (std::size_t round = 1; round <= 40; ++round) {
    run({[&item] { item->addSource(QuiltMediaSource::init()); },
         [&document] { document->setTitle(std::string("Title")); }},
        [] {});
    const Dictionary record = saved(*document);
    ASSERT_EQ(record.array("Media")->front().as<Dictionary>()->array("Sources")->size(), round);
  }
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentThreadTest, TheMainThreadReadsAndObservesWhileAWorkerChangesTheListTenThousandTimes) {
  const auto document = made();
  document->setIsProcessing(true);
  std::vector<std::shared_ptr<QuiltMedia>> items;
  for (int i = 0; i < 8; ++i) items.push_back(QuiltMedia::init());

  int announced = 0;
  bool onMainThread = true;
  const auto observation = document->observe("media", [&](const auto&) {
    ++announced;
    onMainThread = onMainThread && MainThread::isCurrent();
    document->mediaCount();  // an observer may read the list that changes
  });

  constexpr int count = 10000;
  std::size_t most = 0;
  bool owned = true;
  run({[&] {
        for (int i = 0; i < count; ++i) {
          const auto& item = items[static_cast<std::size_t>(i) % items.size()];
          switch (i % 4) {
            case 0:
            case 1:
              document->addMedia(item, 0);
              break;
            case 2:
              document->moveMediaAtIndexes({0}, document->mediaCount());
              break;
            case 3:
              document->removeMedia(item);
              break;
          }
        }
      }},
      [&] {
        most = std::max(most, document->mediaCount());
        document->performBlockOnMedia([&](const auto& item) {
          owned = owned && item->documentOwner() == document;
          return true;
        });
        if (const auto first = document->mediaAtIndex(0)) document->mediaWithUUID(first->uuid());
        document->duration();
      });
  EXPECT_EQ(announced, count);
  EXPECT_TRUE(onMainThread);
  EXPECT_TRUE(owned) << "an item in the list knows its document";
  EXPECT_GT(most, 0u);
}

TEST_F(QuiltDocumentThreadTest, TheMainThreadEditsWhileAWorkerFinalizes) {
  const auto document = made();
  for (int i = 0; i < 5; ++i) addWebItem(*document, std::to_string(i));
  takeLines();
  std::atomic<int> failures = 0;
  int edits = 0;
  run({[&] {
        for (int i = 0; i < 5; ++i)
          if (!document->finalizeWithProgressionBlock([](double) { return true; })) ++failures;
      }},
      [&] {
        document->setType(std::to_string(++edits));
        document->mediaAtIndex(0)->setTitle(std::to_string(edits));
        document->dictionary();
      });
  EXPECT_EQ(failures, 0);
  EXPECT_FALSE(document->isProcessing());
  EXPECT_TRUE(document->update());
  EXPECT_EQ(saved(*document).string("Type"), std::to_string(edits));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentThreadTest, AWorkerLoadsWhileTheMainThreadReads) {
  Array items;
  for (int i = 0; i < 200; ++i) items.push_back(Dictionary{{"UUID", "ITEM" + std::to_string(i)}});
  const auto document = opened({{"Media", items}});
  ASSERT_NE(document, nullptr);
  run({[&document] { document->loadDictionary(); }}, [&document] {
    document->performBlockOnMedia([](const auto& item) { return !item->uuid().empty(); });
    document->duration();
  });
  EXPECT_EQ(document->mediaCount(), 400u);
}

TEST_F(QuiltDocumentThreadTest, OnlyOneOfTwoLongOperationsRunsAtATime) {
  const auto document = made();
  for (int i = 0; i < 3; ++i) addWebItem(*document);
  std::atomic<int> inside = 0;
  std::atomic<int> most = 0;
  std::atomic<int> done = 0;
  const auto work = [&] {
    for (int i = 0; i < 20; ++i) {
      int calls = 0;
      const auto block = [&](double percentage) {
        // The first report comes before the document is taken; the last, 100, while it still is.
        if (++calls == 2) most = std::max(most.load(), ++inside);
        if (percentage == 100) --inside;
        return true;
      };
      const bool succeeded =
          i % 2 == 0 ? document->flattenWithProgressionBlock(block) : document->finalizeWithProgressionBlock(block);
      if (succeeded) ++done;
    }
  };
  run({work, work}, [] {});
  EXPECT_GT(done, 0);
  EXPECT_EQ(most, 1);
  EXPECT_FALSE(document->isProcessing());
}

}  // namespace
}  // namespace quilt
