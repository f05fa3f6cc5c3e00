// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <future>
#include <map>
#include <thread>

#include "quilt/media/QuiltMedia.h"
#include "quilt/platform/base/MainThread.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::MainThread;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// Meant to be run with the thread sanitizer too.
class QuiltMediaThreadTest : public support::PackageFixture {
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
    }
    for (std::thread& thread : threads) thread.join();
  }

  /// Which of the item's lists another thread can read at this moment: "S", "E", "SE" or "".
  std::string readableElsewhere() {
    std::string readable;
    if (endsSoon([this] { item()->sourcesCount(); })) readable += "S";
    if (endsSoon([this] { item()->extraCount(); })) readable += "E";
    return readable;
  }

  std::shared_ptr<QuiltMediaSource> addLink() {
    auto link = QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
    item()->addSource(link);
    return link;
  }
  std::shared_ptr<QuiltMediaExtra> addExtraLink() {
    auto link = QuiltMediaExtra::initWithURL(*Url::parse("https://example.org/"));
    item()->addExtra(link);
    return link;
  }

  /// Whether another thread gets through the job at this moment.
  bool endsSoon(const std::function<void()>& job) {
    auto started = std::make_shared<std::promise<void>>();
    _readers.push_back(std::async(std::launch::async, [job, started] {
      started->set_value();
      job();
    }));
    started->get_future().wait();
    return _readers.back().wait_for(std::chrono::milliseconds(100)) == std::future_status::ready;
  }

 private:
  std::vector<std::future<void>> _readers;  // a reader that waits for a list ends after the walk over it
};

TEST_F(QuiltMediaThreadTest, AWalkHoldsItsListAndLeavesTheOther) {
  addLink();
  addExtraLink();
  EXPECT_EQ(readableElsewhere(), "SE");
  item()->performBlockOnSources([this](const auto&) {
    EXPECT_EQ(readableElsewhere(), "E");
    return true;
  });
  item()->performBlockOnExtra([this](const auto&) {
    EXPECT_EQ(readableElsewhere(), "S");
    return true;
  });
}

TEST_F(QuiltMediaThreadTest, EveryReadOfAListWaitsForTheWalkOverIt) {
  item()->addSource(QuiltMediaSource::init());
  item()->addExtra(QuiltMediaExtra::init());
  using Reads = std::map<std::string, std::function<void()>>;
  const Reads ofBoth = {{"dictionary", [this] { item()->dictionary(); }},
                        {"totalSizeInMegaBytes", [this] { item()->totalSizeInMegaBytes(); }},
                        {"invalidateCaches", [this] { item()->invalidateCaches(); }},
                        {"availableFormats", [this] { item()->availableFormats(); }}};
  const Reads ofSources = {{"sources", [this] { item()->sources(); }},
                           {"sourceAtIndex", [this] { item()->sourceAtIndex(0); }},
                           {"sourceWithUUID", [this] { item()->sourceWithUUID("S"); }},
                           {"duration", [this] { item()->duration(); }},
                           {"isFlattened", [this] { item()->isFlattened(); }},
                           {"totalSourcesPreviewsCount", [this] { item()->totalSourcesPreviewsCount(); }}};
  const Reads ofExtras = {{"extras", [this] { item()->extras(); }},
                          {"extraAtIndex", [this] { item()->extraAtIndex(0); }}};
  const auto expectAllWait = [this](const Reads& reads) {
    for (const auto& [name, read] : reads) EXPECT_FALSE(endsSoon(read)) << name;
    return true;
  };
  item()->performBlockOnSources([&](const auto&) { return expectAllWait(ofBoth) && expectAllWait(ofSources); });
  item()->performBlockOnExtra([&](const auto&) { return expectAllWait(ofBoth) && expectAllWait(ofExtras); });
}

TEST_F(QuiltMediaThreadTest, ALongOperationHoldsTheListOfTheChildThatItDrivesAndNeverBoth) {
  keepDocumentBusy();
  addLink();
  addExtraLink();
  const auto stages = [this](const std::function<bool(const ProgressionBlock&)>& operation) {
    std::vector<std::string> readable;
    EXPECT_TRUE(operation([&](double) {
      readable.push_back(readableElsewhere());
      return true;
    }));
    return readable;
  };
  // Each is called at its start and its end without a list held; children report once or more in between.
  EXPECT_THAT(stages([this](const auto& block) { return item()->flattenWithProgressionBlock(block); }),
              ElementsAre("SE", "E", "S", "SE"));
  EXPECT_THAT(stages([this](const auto& block) { return item()->finalizeWithProgressionBlock(block); }),
              ElementsAre("SE", "E", "E", "E", "S", "S", "S", "SE"));
  EXPECT_THAT(stages([this](const auto& block) { return item()->convertToFormat("720p", block); }),
              ElementsAre("E", "E", "S", "S"));
}

TEST_F(QuiltMediaThreadTest, AnOperationThatFailsLeavesNoListLocked) {
  const auto source = addLink();
  const auto extra = addExtraLink();
  for (const auto& child : {std::shared_ptr<QuiltMediaSource>(extra), source}) {
    std::filesystem::remove_all(item()->path());
    writeFile(child->path(), "a file where the child's folder should be");
    EXPECT_FALSE(item()->flattenWithProgressionBlock({}));
    EXPECT_EQ(readableElsewhere(), "SE");
    EXPECT_FALSE(item()->finalizeWithProgressionBlock({}));
    EXPECT_EQ(readableElsewhere(), "SE");
  }
}

TEST_F(QuiltMediaThreadTest, AChangeMadeByAWorkerIsSeenOnTheMainThreadAndSavedAfterIt) {
  std::vector<bool> onMainThread;
  const auto observation = item()->observe(
      "sources", [&](const auto&) { onMainThread.push_back(MainThread::isCurrent()); },
      platform::ObservationOptions::Prior);
  std::size_t savedSources = 0;
  run({[&] {
        item()->addSource(QuiltMediaSource::init());
        const Dictionary record = readRecord(document()->propertiesPath());
        savedSources = record.array("Media")->front().as<Dictionary>()->array("Sources")->size();
      }},
      [] {});
  EXPECT_THAT(onMainThread, ElementsAre(true, true));
  EXPECT_EQ(savedSources, 1u);
}

TEST_F(QuiltMediaThreadTest, TheMainThreadReadsAndObservesWhileWorkersChangeBothLists) {
  std::vector<std::shared_ptr<QuiltMediaSource>> sources;
  std::vector<std::shared_ptr<QuiltMediaExtra>> extras;
  for (int i = 0; i < 6; ++i) {
    sources.push_back(QuiltMediaSource::init());
    extras.push_back(QuiltMediaExtra::init());
  }
  int announced = 0;
  const auto count = [&](const auto&) { ++announced; };
  const auto ofSources = item()->observe("sources", count);
  const auto ofExtras = item()->observe("extras", count);
  constexpr std::size_t rounds = 300;
  bool owned = true;
  run({[&] {
         for (std::size_t i = 0; i < rounds; ++i) {
           const auto& source = sources[i % sources.size()];
           item()->addSource(source, 0);
           item()->moveSourcesAtIndexes({0}, 1);
           item()->removeSource(source);
         }
       },
       [&] {
         for (std::size_t i = 0; i < rounds; ++i) {
           const auto& extra = extras[i % extras.size()];
           item()->addExtra(extra);
           item()->moveExtraAtIndexes({0}, 1);
           item()->removeExtra(extra);
         }
       }},
      [&] {
        item()->performBlockOnSources([&](const auto& source) {
          owned = owned && source->mediaOwner() == item();
          return true;
        });
        if (const auto first = item()->sourceAtIndex(0)) item()->sourceWithUUID(first->uuid());
        item()->extraAtIndex(0);
        item()->duration();
        item()->totalSizeInMegaBytes();
        item()->isFlattened();
        item()->availableFormats();
        item()->invalidateCaches();
      });
  EXPECT_EQ(announced, 6 * static_cast<int>(rounds));
  EXPECT_TRUE(owned) << "a source in the list knows its item";
  EXPECT_EQ(item()->sourcesCount(), 0u);
  EXPECT_EQ(item()->extraCount(), 0u);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltMediaThreadTest, TheMainThreadEditsWhileAWorkerFlattensAndFinalizes) {
  for (int i = 0; i < 3; ++i) addLink();
  addExtraLink();
  int failures = 0;
  int edits = 0;
  run({[&] {
        for (int i = 0; i < 5; ++i) {
          if (!item()->flattenWithProgressionBlock({})) ++failures;
          if (!item()->finalizeWithProgressionBlock({})) ++failures;
        }
      }},
      [&] {
        item()->setTitle(std::to_string(++edits));
        item()->moveSourcesAtIndexes({0}, 3);
        item()->dictionary();
      });
  EXPECT_EQ(item()->title(), std::to_string(edits));
  EXPECT_EQ(failures, 0);
  EXPECT_EQ(item()->sourcesCount(), 3u);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltMediaThreadTest, FirstReadsOfThePosterAtOnceAllHaveOne) {
  addSource(pictureFile(64, 48));
  std::vector<std::shared_ptr<ImageWrapper>> posters(4);
  std::vector<std::function<void()>> readers;
  for (auto& poster : posters) readers.emplace_back([this, &poster] { poster = item()->posterImage(); });
  run(readers, [] {});
  for (const auto& poster : posters) {
    ASSERT_NE(poster, nullptr);
    EXPECT_EQ(poster->size(), (platform::Size{64, 48}));
  }
  EXPECT_THAT(posters, ::testing::Contains(item()->posterImage())) << "one of them stays";
  ASSERT_NE(ImageWrapper::imageWithPath(item()->posterImagePath()), nullptr);
  EXPECT_THAT(namesIn(item()->path()), ElementsAre("poster.jpg"));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

}  // namespace
}  // namespace quilt
