// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "quilt/platform/base/ChildList.h"
#include "quilt/platform/base/Property.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/testing/RecordingLogSink.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class Shelf;

class Volume : public Object {
 public:
  explicit Volume(std::string name) : _name(std::move(name)) {}
  [[nodiscard]] const std::string& name() const { return _name; }
  [[nodiscard]] std::shared_ptr<Shelf> shelf() const { return _shelf.get(); }
  void setShelf(const std::shared_ptr<Shelf>& shelf) { _shelf.set(shelf); }

 private:
  const std::string _name;
  WeakProperty<Shelf> _shelf{*this, "shelf"};
};

class Shelf : public Object {
 public:
  ChildList<Volume, Shelf> volumes{*this, "volumes", &Volume::setShelf};
};

using Pointer = std::shared_ptr<Volume>;

class ChildListTest : public ::testing::Test {
 protected:
  static Pointer volume(const std::string& name) { return std::make_shared<Volume>(name); }
  void fill(const std::string& names) {
    for (const char name : names) shelf->volumes.append(volume(std::string(1, name)));
  }
  [[nodiscard]] std::string names() const {
    std::string names;
    for (const Pointer& child : shelf->volumes.copy()) names += child->name();
    return names;
  }
  [[nodiscard]] std::string moved(const IndexSet& indexes, std::size_t target) {
    shelf->volumes.assign({});
    fill("ABCD");
    shelf->volumes.move(indexes, target);
    return names();
  }
  [[nodiscard]] Observation observe() {
    return shelf->observe(
        "volumes",
        [this](const ChangeNotice& notice) {
          EXPECT_TRUE(MainThread::isCurrent());
          heard.push_back((notice.phase == ChangePhase::Will ? "will " : "did ") + names());
        },
        ObservationOptions::Prior);
  }

  const std::shared_ptr<Shelf> shelf = std::make_shared<Shelf>();
  std::vector<std::string> heard;
};

TEST_F(ChildListTest, AppendsInsertsAndAnswersByIndex) {
  fill("AC");
  shelf->volumes.insert(volume("B"), 1);
  EXPECT_EQ("ABC", names());
  EXPECT_EQ(3U, shelf->volumes.count());
  EXPECT_EQ("B", shelf->volumes.at(1)->name());
  EXPECT_EQ(nullptr, shelf->volumes.at(3));
}

TEST_F(ChildListTest, FindsTheFirstForWhichATestHolds) {
  fill("ABB");
  EXPECT_EQ(shelf->volumes.at(1), shelf->volumes.first([](const Pointer& child) { return child->name() == "B"; }));
  EXPECT_EQ(nullptr, shelf->volumes.first([](const Pointer&) { return false; }));
}

TEST_F(ChildListTest, SetsAndClearsTheOwner) {
  const Pointer child = volume("A");
  shelf->volumes.append(child);
  EXPECT_EQ(shelf, child->shelf());
  shelf->volumes.remove(child);
  EXPECT_EQ(nullptr, child->shelf());
  EXPECT_EQ("", names());
}

TEST_F(ChildListTest, AssigningLeavesTheOwnersAsTheyAre) {
  const Pointer old = volume("A");
  const Pointer fresh = volume("B");
  shelf->volumes.append(old);
  shelf->volumes.assign({fresh});
  EXPECT_EQ(shelf, old->shelf());
  EXPECT_EQ(nullptr, fresh->shelf());
  EXPECT_EQ("B", names());
}

TEST_F(ChildListTest, RemovesEveryOccurrence) {
  const Pointer twice = volume("X");
  shelf->volumes.append(twice);
  fill("A");
  shelf->volumes.append(twice);
  shelf->volumes.remove(twice);
  EXPECT_EQ("A", names());
}

TEST_F(ChildListTest, AnnouncesEveryChange) {
  const Observation observation = observe();
  const Pointer a = volume("A");
  shelf->volumes.append(a);
  shelf->volumes.insert(volume("B"), 0);
  shelf->volumes.move({0}, 2);
  shelf->volumes.remove(a);
  shelf->volumes.remove(volume("stranger"));
  shelf->volumes.assign({});
  EXPECT_THAT(heard, ElementsAre("will ", "did A", "will A", "did BA", "will BA", "did AB", "will AB", "did B",
                                 "will B", "did B", "will B", "did "));
}

TEST_F(ChildListTest, NullIsIgnored) {
  const Observation observation = observe();
  shelf->volumes.append(nullptr);
  shelf->volumes.insert(nullptr, 7);
  shelf->volumes.remove(nullptr);
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(ChildListTest, MovesGroupsToAPositionCountedBeforeTheMove) {
  EXPECT_EQ("CABD", moved({0, 1}, 3));
  EXPECT_EQ("DABC", moved({3}, 0));
  EXPECT_EQ("BDAC", moved({0, 2}, 4));
  EXPECT_EQ("ABCD", moved({1, 2}, 2));
  EXPECT_EQ("BCDA", moved({0}, 4));
  EXPECT_EQ("ABCD", moved({0, 1, 2, 3}, 2));
  EXPECT_EQ("ABCD", moved({}, 2));
}

TEST_F(ChildListTest, EveryGroupMovesToWhereItsTargetSays) {
  for (unsigned bits = 0; bits < 16; ++bits)
    for (std::size_t target = 0; target <= 4; ++target) {
      IndexSet indexes;
      std::string before;
      std::string group;
      std::string after;
      for (std::size_t i = 0; i < 4; ++i) {
        if ((bits >> i & 1) != 0) indexes.insert(i);
        ((bits >> i & 1) != 0 ? group : i < target ? before : after) += "ABCD"[i];
      }
      EXPECT_EQ(before + group + after, moved(indexes, target)) << bits << " to " << target;
    }
}

TEST_F(ChildListTest, RefusesWhatLiesOutside) {
  fill("ABCD");
  const Observation observation = observe();
  const ScopedLog log;
  const Pointer stranger = volume("X");
  shelf->volumes.insert(stranger, 5);
  shelf->volumes.move({4}, 0);
  shelf->volumes.move({0, 9}, 0);
  shelf->volumes.move({0}, 5);
  EXPECT_EQ("ABCD", names());
  EXPECT_EQ(nullptr, stranger->shelf());
  EXPECT_THAT(heard, IsEmpty());
  EXPECT_THAT(
      log->messages(LogLevel::Critical),
      ElementsAre("Index 5 is beyond the 4 items of \"volumes\"", "Index 5 is beyond the 4 items of \"volumes\"",
                  "Index 10 is beyond the 4 items of \"volumes\"", "Index 5 is beyond the 4 items of \"volumes\""));
}

TEST_F(ChildListTest, AWalkStopsAtTheFirstFalse) {
  fill("ABCD");
  std::string seen;
  EXPECT_FALSE(shelf->volumes.walk([&](const Pointer& child) {
    seen += child->name();
    return child->name() != "B";
  }));
  EXPECT_EQ("AB", seen);
  EXPECT_TRUE(shelf->volumes.walk([](const Pointer&) { return true; }));
}

TEST_F(ChildListTest, AWalkVisitsWhatItsBlockAddsAheadAndSurvivesWhatItRemoves) {
  fill("AB");
  std::string seen;
  shelf->volumes.walk([&](const Pointer& child) {
    seen += child->name();
    if (child->name() == "A") shelf->volumes.append(volume("C"));
    if (child->name() == "C") shelf->volumes.remove(child);
    return true;
  });
  EXPECT_EQ("ABC", seen);
  EXPECT_EQ("AB", names());
}

TEST_F(ChildListTest, ChildrenOutliveTheirShelf) {
  const Pointer child = volume("A");
  {
    const auto other = std::make_shared<Shelf>();
    other->volumes.append(child);
  }
  EXPECT_EQ(nullptr, child->shelf());
}

class ChildListThreadTest : public ChildListTest {};

TEST_F(ChildListThreadTest, AnUnobservedChangeIsMadeWhereItIs) {
  std::thread worker([&] { fill("AB"); });  // no loop turns: a change on the main thread would never happen
  worker.join();
  EXPECT_EQ("AB", names());
}

TEST_F(ChildListThreadTest, AnObserverReadsTheListThatAWorkerIsChanging) {
  const Observation observation = observe();
  runOnWorker([&] { fill("AB"); });
  EXPECT_THAT(heard, ElementsAre("will ", "did A", "will A", "did AB"));
}

// Seen from a third thread, the list is not free though the main thread is the one that works on it.
TEST_F(ChildListThreadTest, AWorkerKeepsTheListLockedOverItsChange) {
  std::atomic<bool> entered = false;
  std::thread other;
  const Observation observation = shelf->observe("volumes", [&](const ChangeNotice&) {
    other = std::thread([&] {
      const MonitorLock lock = shelf->volumes.lock();
      entered = true;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    EXPECT_FALSE(entered);
  });
  runOnWorker([&] { fill("A"); });
  ASSERT_TRUE(other.joinable());
  other.join();
  EXPECT_TRUE(entered);
}

TEST_F(ChildListThreadTest, TheMainThreadWaitsForAListWhoseWorkerWaitsForTheMainThread) {
  fill("A");
  std::atomic<bool> locked = false;
  std::thread worker([&] {
    const MonitorLock lock = shelf->volumes.lock();
    locked = true;
    MainThread::performBlock([&] { heard.push_back("block saw " + names()); });
    shelf->volumes.append(volume("B"));
  });
  while (!locked) std::this_thread::yield();
  const std::string seen = names();
  EXPECT_THAT(heard, ElementsAre("block saw A"));
  EXPECT_EQ("AB", seen);
  worker.join();
}

TEST_F(ChildListThreadTest, WorkersChangeWhileTheMainThreadReadsAndObserves) {
  constexpr int workers = 4;
  constexpr int operations = 2500;
  std::atomic<int> running = workers;
  std::size_t notices = 0;
  bool inChange = false;
  const Observation observation = shelf->observe(
      "volumes",
      [&](const ChangeNotice& notice) {
        EXPECT_TRUE(MainThread::isCurrent());
        EXPECT_EQ(notice.phase == ChangePhase::Did, inChange);
        inChange = !inChange;
        ++notices;
        shelf->volumes.walk([](const Pointer& child) { return child != nullptr; });
      },
      ObservationOptions::Prior);
  std::vector<std::thread> threads;
  for (unsigned t = 0; t < workers; ++t)
    threads.emplace_back([&, t] {
      std::mt19937 random(t);
      for (int i = 0; i < operations; ++i) {
        const MonitorLock lock = shelf->volumes.lock();
        const std::size_t count = shelf->volumes.count();
        const std::size_t index = count == 0 ? 0 : random() % count;
        switch (count < 3 ? 0 : count > 12 ? 1 : random() % 3) {
          case 0:
            shelf->volumes.insert(volume(std::to_string(i)), index);
            break;
          case 1:
            shelf->volumes.remove(shelf->volumes.at(index));
            break;
          case 2:
            shelf->volumes.move({index, count - 1}, random() % (count + 1));
            break;
        }
      }
      if (--running == 0) MainThread::signal();
    });
  std::size_t seen = 0;
  while (running > 0) {
    shelf->volumes.walk([&](const Pointer& child) {
      EXPECT_EQ(shelf, child->shelf());
      ++seen;
      return true;
    });
    MainThread::waitAndRunQueuedBlocks();
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(std::size_t{2} * workers * operations, notices);
  EXPECT_GT(seen, 0U);
  EXPECT_EQ(shelf->volumes.count(), shelf->volumes.copy().size());
}

TEST_F(ChildListThreadTest, WorkersChangeWhatNobodyObservesWhileTheMainThreadReads) {
  constexpr int operations = 5000;
  std::atomic<int> running = 2;
  const auto work = [&](const std::string& name) {
    for (int i = 0; i < operations; ++i) {
      const Pointer child = volume(name);
      shelf->volumes.append(child);
      if (i % 2 == 0) shelf->volumes.remove(child);
    }
    --running;
  };
  std::thread first(work, "A");
  std::thread second(work, "B");
  while (running > 0) static_cast<void>(shelf->volumes.copy());
  first.join();
  second.join();
  EXPECT_EQ(std::size_t{operations}, shelf->volumes.count());
}

}  // namespace
}  // namespace quilt::platform
