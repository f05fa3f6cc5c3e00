// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/base/Object.h"
#include "quilt/platform/base/Observation.h"
#include "quilt/platform/base/Property.h"
#include "quilt/platform/base/RecursiveMonitor.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class Book : public Object {
 public:
  [[nodiscard]] std::string title() const { return _title.get(); }
  void setTitle(std::string title) { _title.set(std::move(title)); }
  std::string exchangeTitle(std::string title) { return _title.exchange(std::move(title)); }
  void cacheTitle(std::string title) { _title.store(std::move(title)); }
  void beginWith(std::string title, const std::shared_ptr<Book>& sequel) {
    _title.initialize(std::move(title));
    _sequel.initialize(sequel);
  }
  [[nodiscard]] std::size_t titleLength() const {
    return _title.with([](const std::string& title) { return title.size(); });
  }
  [[nodiscard]] std::shared_ptr<Book> sequel() const { return _sequel.get(); }
  void setSequel(const std::shared_ptr<Book>& sequel) { _sequel.set(sequel); }

 protected:
  [[nodiscard]] std::vector<std::string_view> keysDependingOn(std::string_view key) const override {
    if (key == "title") return {"label", "spine"};
    return {};
  }

 private:
  Property<std::string> _title{*this, "title", "Untitled"};
  WeakProperty<Book> _sequel{*this, "sequel"};
};

class ObservationTest : public ::testing::Test {
 protected:
  ChangeObserver note(const std::string& who) {
    return [this, who](const ChangeNotice& notice) {
      heard.push_back(who + (notice.phase == ChangePhase::Will ? " will " : " did ") + std::string(notice.key));
    };
  }

  std::shared_ptr<Book> book = std::make_shared<Book>();
  std::vector<std::string> heard;
};

TEST_F(ObservationTest, HearsOfEachChangeOfItsKey) {
  const Observation observation = book->observe("title", note("A"));
  book->setTitle("One");
  book->setSequel(nullptr);
  book->setTitle("Two");
  EXPECT_THAT(heard, ElementsAre("A did title", "A did title"));
}

TEST_F(ObservationTest, HearsNothingOfTheValuesThatAnObjectBeginsWith) {
  const Observation observations[] = {book->observe("title", note("A"), ObservationOptions::Prior),
                                      book->observe("sequel", note("B"), ObservationOptions::Prior)};
  const auto sequel = std::make_shared<Book>();
  book->beginWith("One", sequel);
  EXPECT_THAT(heard, IsEmpty());
  EXPECT_EQ("One", book->title());
  EXPECT_EQ(3U, book->titleLength());
  EXPECT_EQ(sequel, book->sequel());
}

TEST_F(ObservationTest, HearsAlsoWhenTheValueStaysTheSame) {
  const Observation observation = book->observe("title", note("A"));
  book->setTitle("Untitled");
  EXPECT_THAT(heard, ElementsAre("A did title"));
}

TEST_F(ObservationTest, PriorHearsBeforeTheChangeToo) {
  std::vector<std::string> values;
  const Observation observation = book->observe(
      "title", [&](const ChangeNotice& notice) { values.push_back(static_cast<Book&>(notice.object).title()); },
      ObservationOptions::Prior);
  const Observation noter = book->observe("title", note("A"), ObservationOptions::Prior);
  book->setTitle("New");
  EXPECT_THAT(values, ElementsAre("Untitled", "New"));
  EXPECT_THAT(heard, ElementsAre("A will title", "A did title"));
}

TEST_F(ObservationTest, DependentKeysChangeWithTheirSource) {
  const Observation label = book->observe("label", note("A"), ObservationOptions::Prior);
  const Observation title = book->observe("title", note("B"));
  const Observation spine = book->observe("spine", note("C"));
  EXPECT_TRUE(book->isObserved("title"));
  book->setTitle("New");
  EXPECT_THAT(heard, ElementsAre("A will label", "B did title", "A did label", "C did spine"));
}

TEST_F(ObservationTest, AKeyIsObservedAlsoThroughOneThatDependsOnIt) {
  EXPECT_FALSE(book->isObserved("title"));
  Observation label = book->observe("label", note("A"));
  EXPECT_TRUE(book->isObserved("title"));
  EXPECT_FALSE(book->isObserved("sequel"));
  label.reset();
  EXPECT_FALSE(book->isObserved("title"));
}

TEST_F(ObservationTest, EndsWithItsHandle) {
  {
    const Observation observation = book->observe("title", note("A"));
    EXPECT_TRUE(observation);
  }
  book->setTitle("New");
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(ObservationTest, MovesWithItsHandle) {
  Observation first = book->observe("title", note("A"));
  Observation second = std::move(first);
  EXPECT_FALSE(first);  // NOLINT(bugprone-use-after-move): a moved handle observes nothing
  book->setTitle("One");
  second = book->observe("title", note("B"));
  book->setTitle("Two");
  EXPECT_THAT(heard, ElementsAre("A did title", "B did title"));
}

TEST_F(ObservationTest, MayEndItselfInItsOwnNotice) {
  Observation observation;
  observation = book->observe("title", [&](const ChangeNotice&) {
    heard.emplace_back("once");
    observation.reset();
  });
  book->setTitle("One");
  book->setTitle("Two");
  EXPECT_THAT(heard, ElementsAre("once"));
}

TEST_F(ObservationTest, OneEndedByAnEarlierNoticeHearsNothing) {
  Observation victim;
  const Observation first = book->observe("title", [&](const ChangeNotice&) { victim.reset(); });
  victim = book->observe("title", note("victim"));
  book->setTitle("New");
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(ObservationTest, OneAddedDuringANoticeHearsOfTheNextChange) {
  std::vector<Observation> added;
  const Observation first = book->observe("title", [&](const ChangeNotice&) {
    if (added.empty()) added.push_back(book->observe("title", note("added")));
  });
  book->setTitle("One");
  EXPECT_THAT(heard, IsEmpty());
  book->setTitle("Two");
  EXPECT_THAT(heard, ElementsAre("added did title"));
}

TEST_F(ObservationTest, OutlivesTheObservedObject) {
  Observation observation = book->observe("title", note("A"));
  book.reset();
  EXPECT_TRUE(observation);
  observation.reset();
  EXPECT_FALSE(observation);
}

TEST_F(ObservationTest, WhatItHoldsOnToIsGivenUpAtItsEnd) {
  const auto held = std::make_shared<int>();
  Observation observation = book->observe("title", [held](const ChangeNotice&) {});
  EXPECT_EQ(2, held.use_count());
  observation.reset();
  EXPECT_EQ(1, held.use_count());
}

TEST_F(ObservationTest, AnObserverMayChangeTheObjectAgain) {
  const Observation observation = book->observe("title", [&](const ChangeNotice&) {
    if (book->title() != "Settled") book->setTitle("Settled");
  });
  const Observation noter = book->observe("title", note("A"));
  book->setTitle("New");
  EXPECT_EQ("Settled", book->title());
  EXPECT_THAT(heard, ElementsAre("A did title", "A did title"));
}

TEST_F(ObservationTest, ExchangeAnswersTheOldValueAndAnnounces) {
  const Observation observation = book->observe("title", note("A"), ObservationOptions::Prior);
  EXPECT_EQ("Untitled", book->exchangeTitle("New"));
  EXPECT_EQ("New", book->title());
  EXPECT_THAT(heard, ElementsAre("A will title", "A did title"));
}

TEST_F(ObservationTest, ACacheFillsInSilence) {
  const Observation observation = book->observe("title", note("A"), ObservationOptions::Prior);
  book->cacheTitle("Filled");
  EXPECT_EQ("Filled", book->title());
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(ObservationTest, ABackPointerKeepsNothingAlive) {
  auto sequel = std::make_shared<Book>();
  book->setSequel(sequel);
  EXPECT_EQ(sequel, book->sequel());
  sequel.reset();
  EXPECT_EQ(nullptr, book->sequel());
}

// A value whose end announces a change of the very object that gave it up.
class Announcer {
 public:
  explicit Announcer(Object* object) : _object(object) {}
  Announcer(const Announcer&) = delete;
  Announcer& operator=(const Announcer&) = delete;
  ~Announcer() { _object->didChangeValueForKey("end"); }

 private:
  Object* _object;
};

TEST_F(ObservationTest, TheOldValueEndsOutsideTheLock) {
  class Shelf : public Object {
   public:
    Property<std::shared_ptr<Announcer>> content{*this, "content"};
  };
  Shelf shelf;
  const Observation observation = shelf.observe("end", note("A"));
  shelf.content.set(std::make_shared<Announcer>(&shelf));
  shelf.content.set(nullptr);
  EXPECT_THAT(heard, ElementsAre("A did end"));
}

class ObservationThreadTest : public ObservationTest {};

TEST_F(ObservationThreadTest, APropertyIsAnnouncedOnTheThreadThatSetsIt) {
  std::thread::id thread;
  const Observation observation =
      book->observe("title", [&](const ChangeNotice&) { thread = std::this_thread::get_id(); });
  std::thread::id worker;
  runOnWorker([&] {
    worker = std::this_thread::get_id();
    book->setTitle("New");
  });
  EXPECT_EQ(worker, thread);
}

TEST_F(ObservationThreadTest, AfterItsEndItDoesNotRunAnywhere) {
  for (int round = 0; round < 200; ++round) {
    std::atomic<bool> stop = false;
    std::atomic<bool> running = false;
    auto alive = std::make_unique<int>(1);
    std::atomic<int> sum = 0;
    Observation observation = book->observe("title", [&](const ChangeNotice&) {
      running = true;
      sum += *alive;
    });
    std::thread worker([&] {
      while (!stop) book->setTitle("again");
    });
    while (!running) std::this_thread::yield();
    observation.reset();
    alive.reset();  // a notice still running would read it
    const int heardUntilNow = sum;
    stop = true;
    worker.join();
    EXPECT_EQ(heardUntilNow, sum);
  }
}

TEST_F(ObservationThreadTest, TheMainThreadEndsAnObservationWhoseNoticeWaitsForIt) {
  std::atomic<bool> inNotice = false;
  bool blockRan = false;
  Observation observation = book->observe("title", [&](const ChangeNotice&) {
    inNotice = true;
    MainThread::performBlock([&] { blockRan = true; });
  });
  std::thread worker([&] { book->setTitle("New"); });
  while (!inNotice) std::this_thread::yield();
  observation.reset();
  EXPECT_TRUE(blockRan);
  worker.join();
}

// As a document that saves itself does: its observer wants the list, whose holder sets the title.
TEST_F(ObservationThreadTest, AnObserverMayWaitForALockWhoseHolderSetsTheProperty) {
  RecursiveMonitor list;
  std::atomic<int> entered = 0;
  int heardUnderTheLock = 0;
  const Observation observation = book->observe("title", [&](const ChangeNotice&) {
    ++entered;
    const MonitorLock lock(list);
    ++heardUnderTheLock;
  });
  MonitorLock held(list);
  std::thread worker([&] { book->setTitle("From the worker"); });
  while (entered == 0) std::this_thread::yield();
  book->setTitle("From the holder");
  held.unlock();
  worker.join();
  EXPECT_EQ(2, heardUnderTheLock);
}

TEST_F(ObservationThreadTest, TwoThreadsSetAndTwoObserve) {
  std::atomic<int> notices = 0;
  const Observation steady = book->observe("title", [&](const ChangeNotice&) { ++notices; });
  constexpr int rounds = 2000;
  const auto setter = [&] {
    for (int i = 0; i < rounds; ++i) book->setTitle(std::to_string(i));
  };
  const auto observer = [&] {
    for (int i = 0; i < rounds; ++i) {
      const Observation passing =
          book->observe("title", [&](const ChangeNotice&) { static_cast<void>(book->title()); });
    }
  };
  std::vector<std::thread> threads;
  threads.emplace_back(setter);
  threads.emplace_back(setter);
  threads.emplace_back(observer);
  threads.emplace_back(observer);
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(2 * rounds, notices);
}

TEST_F(ObservationThreadTest, ExchangeHandsEachValueToOneThread) {
  class Tickets : public Object {
   public:
    Property<int> next{*this, "next", 0};
  };
  const auto tickets = std::make_shared<Tickets>();
  std::vector<std::vector<int>> taken(4);
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t)
    threads.emplace_back([&, t] {
      for (int i = 1; i <= 1000; ++i)
        taken[static_cast<std::size_t>(t)].push_back(tickets->next.exchange(t * 1000 + i));
    });
  for (std::thread& thread : threads) thread.join();
  std::vector<int> all{tickets->next.get()};
  for (const auto& part : taken) all.insert(all.end(), part.begin(), part.end());
  std::sort(all.begin(), all.end());
  std::vector<int> expected(4001);
  for (int i = 0; i <= 4000; ++i) expected[static_cast<std::size_t>(i)] = i;
  EXPECT_EQ(expected, all);
}

}  // namespace
}  // namespace quilt::platform
