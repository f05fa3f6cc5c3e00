// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <thread>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/base/MainThread.h"
#include "tests/support/ModelFixture.h"

namespace quilt {
namespace {

using platform::MainThread;
using ::testing::IsEmpty;

/// A worker changes a library while the main thread shows it. Meant to be run with the thread sanitizer too.
class QuiltLibraryThreadTest : public support::ModelFixture {
 protected:
  QuiltLibraryThreadTest() : controller(QuiltCollectionsController::init()) {
    controller->loadLibraryPath(folder() / "library", [](const auto&, double) { return true; });
    collection = controller->newCollection();
    plainFile = writeFile(folder() / "notes.txt", "Plain text is imported as an empty document.");
  }

  /// Adds, moves and removes items, imports and removes documents: `count` operations in all.
  void change(int count) {
    std::shared_ptr<QuiltDocument> document;
    std::vector<std::shared_ptr<QuiltMedia>> items;
    for (int i = 0; i < 4; ++i) items.push_back(QuiltMedia::init());
    for (int i = 0; i < count; ++i) {
      if (i % 100 == 0) {
        if (document) collection->removeDocument(document, true);
        document = collection->importDocumentFromPath(plainFile, [](double) { return true; });
        document->setIsProcessing(true);  // the lists are what is looked at here; saves have tests of their own
        continue;
      }
      const auto& item = items[static_cast<std::size_t>(i / 4) % items.size()];
      switch (i % 4) {
        case 1:
          document->addMedia(item, 0);
          item->addSource(QuiltMediaSource::init());
          break;
        case 2:
          document->moveMediaAtIndexes({0}, document->mediaCount());
          break;
        case 3:
          document->removeMedia(item);
          break;
        default:
          collection->setTitle(std::to_string(i));
      }
    }
  }

  const std::shared_ptr<QuiltCollectionsController> controller;
  std::shared_ptr<QuiltCollection> collection;
  Path plainFile;
};

TEST_F(QuiltLibraryThreadTest, TheMainThreadReadsAndObservesWhileAWorkerMakesTenThousandChanges) {
  int announced = 0;
  bool onMainThread = true;
  std::vector<platform::Observation> observations;
  observations.push_back(collection->observe("documents", [&](const platform::ChangeNotice&) {
    ++announced;
    onMainThread = onMainThread && MainThread::isCurrent();
    collection->performBlockOnDocuments([&](const std::shared_ptr<QuiltDocument>& document) {
      document->mediaCount();  // an observer may read what changes
      return true;
    });
  }));

  takeLines();
  std::atomic<bool> done = false;
  std::thread worker([&] {
    change(10000);
    done = true;
    MainThread::signal();
  });
  std::size_t read = 0;
  while (!done) {
    MainThread::runQueuedBlocks();
    controller->performBlockOnCollections([&](const std::shared_ptr<QuiltCollection>& each) {
      each->title();
      each->modifiedDate();
      for (const auto& document : each->documents()) {
        document->performBlockOnMedia([&](const std::shared_ptr<QuiltMedia>& item) {
          item->sourcesCount();
          item->title();
          ++read;
          return true;
        });
        document->type();
        document->dictionary();
      }
      return true;
    });
  }
  worker.join();

  EXPECT_EQ(announced, 100 + 99) << "imports and removals";
  EXPECT_TRUE(onMainThread);
  EXPECT_GT(read, 0u);
  EXPECT_THAT(takeProblems(), IsEmpty());
  EXPECT_EQ(collection->documentsCount(), 1u);
}

}  // namespace
}  // namespace quilt
