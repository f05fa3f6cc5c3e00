// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <stdexcept>
#include <thread>

#include "quilt/platform/base/ChildList.h"
#include "quilt/platform/base/CleanUp.h"
#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

struct Leaf;

struct Tree : Object {
  Property<int> height{*this, "height", 1};
  Property<bool> isBusy{*this, "isBusy"};
  ChildList<Leaf, Tree> leaves;
  Tree();
};

struct Leaf : Object {
  WeakProperty<Tree> tree{*this, "tree"};
  void setTree(const std::shared_ptr<Tree>& owner) { tree.set(owner); }
};

Tree::Tree() : leaves(*this, "leaves", &Leaf::setTree) {}

/// An observer that throws its own text.
ChangeObserver throwing(const char* text) {
  return [text](const ChangeNotice&) { throw std::runtime_error(text); };
}

/// The text of what the work throws; empty when it throws nothing.
template <class Work>
std::string thrownBy(const Work& work) {
  try {
    work();
  } catch (const std::exception& error) {
    return error.what();
  }
  return {};
}

std::shared_ptr<Tree> newTree() { return std::make_shared<Tree>(); }

TEST(UninterruptedTest, AValueIsSetAndEveryObserverToldWhateverOneThrows) {
  const auto tree = newTree();
  int told = 0;
  const auto first = tree->observe("height", throwing("first"), ObservationOptions::Prior);
  const auto second = tree->observe("height", throwing("second"));
  const auto third = tree->observe(
      "height", [&](const auto&) { ++told; }, ObservationOptions::Prior);
  EXPECT_EQ("first", thrownBy([&] { tree->height.set(2); }));
  EXPECT_EQ(2, tree->height.get());
  EXPECT_EQ(2, told) << "before and after";
  EXPECT_EQ("first", thrownBy([&] { tree->height.exchange(3); }));
  EXPECT_EQ(3, tree->height.get());
}

TEST(UninterruptedTest, AListAndItsBackPointersAgreeWhateverAnObserverThrows) {
  const auto tree = newTree();
  const auto leaf = std::make_shared<Leaf>();
  const auto ofTheList = tree->observe("leaves", throwing("leaves"), ObservationOptions::Prior);
  const auto ofTheLeaf = leaf->observe("tree", throwing("tree"));
  EXPECT_EQ("tree", thrownBy([&] { tree->leaves.append(leaf); }));
  EXPECT_EQ(1u, tree->leaves.count());
  EXPECT_EQ(tree, leaf->tree.get());
  EXPECT_EQ("leaves", thrownBy([&] { tree->leaves.move({0}, 1); }));
  EXPECT_EQ("tree", thrownBy([&] { tree->leaves.remove(leaf); }));
  EXPECT_EQ(0u, tree->leaves.count());
  EXPECT_EQ(nullptr, leaf->tree.get());
  EXPECT_EQ("leaves", thrownBy([&] { tree->leaves.assign({leaf, leaf}); }));
  EXPECT_EQ(2u, tree->leaves.count());
}

TEST(UninterruptedTest, SeveralChangesEndAsOneAndTheFirstExceptionComes) {
  const auto tree = newTree();
  const auto observation = tree->observe("height", [](const ChangeNotice& notice) {
    throw std::runtime_error(std::to_string(static_cast<Tree&>(notice.object).height.get()));
  });
  const auto work = [&] {
    const Uninterrupted whole;
    tree->height.set(2);
    tree->height.set(3);
  };
  EXPECT_EQ("2", thrownBy(work));
  EXPECT_EQ(3, tree->height.get());
  EXPECT_EQ("2", thrownBy(work)) << "nothing is left of the first time";
}

TEST(UninterruptedTest, AnExceptionThatIsOnItsWayGoesFirst) {
  const auto tree = newTree();
  const auto observation = tree->observe("height", throwing("observer"));
  const auto work = [&] {
    const Uninterrupted whole;
    tree->height.set(2);
    throw std::runtime_error("work");
  };
  EXPECT_EQ("work", thrownBy(work));
  EXPECT_EQ("", thrownBy([] { const Uninterrupted later; }));
}

TEST(UninterruptedTest, WhatAnObserverCallsThrowsToTheObserver) {
  const auto tree = newTree();
  const auto other = newTree();
  const auto inner = other->observe("height", throwing("inner"));
  std::string caught;
  const auto outer = tree->observe("height", [&](const auto&) { caught = thrownBy([&] { other->height.set(5); }); });
  EXPECT_EQ("", thrownBy([&] { tree->height.set(2); }));
  EXPECT_EQ("inner", caught);
}

TEST(UninterruptedThreadTest, WhatAnObserverThrowsOnTheMainThreadComesToTheWorkerThatChanges) {
  const auto tree = newTree();
  std::string caught;
  std::thread::id where;
  const auto observation = tree->observe("leaves", [&](const auto&) {
    where = std::this_thread::get_id();
    throw std::runtime_error("main");
  });
  runOnWorker([&] { caught = thrownBy([&] { tree->leaves.append(std::make_shared<Leaf>()); }); });
  EXPECT_EQ("main", caught);
  EXPECT_EQ(std::this_thread::get_id(), where);
  EXPECT_EQ(1u, tree->leaves.count());
}

TEST(UninterruptedThreadTest, AWakeFunctionThatThrowsLeavesNoBlockBehind) {
  MainThread::setWakeFunction([] { throw std::runtime_error("wake"); });
  std::string caught;
  bool hasRun = false;
  std::thread([&] { caught = thrownBy([&] { MainThread::performBlock([&] { hasRun = true; }); }); }).join();
  MainThread::setWakeFunction({});
  MainThread::runQueuedBlocks();
  EXPECT_EQ("wake", caught);
  EXPECT_FALSE(hasRun);
}

TEST(CleanUpTest, WhatIsHalfMadeGoesOnlyWhenAnExceptionPasses) {
  std::vector<std::string> done;
  const auto work = [&](bool throws) {
    const OnException removeHalf([&] {
      done.emplace_back("removed");
      throw std::runtime_error("removal");
    });
    if (throws) throw std::runtime_error("work");
  };
  EXPECT_EQ("", thrownBy([&] { work(false); }));
  EXPECT_THAT(done, ElementsAre());
  EXPECT_EQ("work", thrownBy([&] { work(true); }));
  EXPECT_THAT(done, ElementsAre("removed"));
}

TEST(CleanUpTest, TheFlagOfAnOperationIsClearedHoweverItEnds) {
  const auto tree = newTree();
  EXPECT_EQ(7, whileSet(tree->isBusy, [&] { return tree->isBusy.get() ? 7 : 0; }));
  EXPECT_EQ("work", thrownBy([&] { whileSet(tree->isBusy, []() -> int { throw std::runtime_error("work"); }); }));
  EXPECT_FALSE(tree->isBusy.get());
  const auto observation = tree->observe("isBusy", throwing("observer"));
  EXPECT_EQ("observer", thrownBy([&] { whileSet(tree->isBusy, [] { return 1; }); }));
  EXPECT_FALSE(tree->isBusy.get());
}

TEST(CleanUpTest, AnOperationWhoseFlagIsSetDoesNotRun) {
  const auto tree = newTree();
  const auto nested = whileSet(tree->isBusy, [&] { return whileSet(tree->isBusy, [] { return 1; }); });
  ASSERT_TRUE(nested);
  EXPECT_EQ(std::nullopt, *nested);
}

TEST(CleanUpTest, ABlockThatThrowsInsideAServiceIsAskedNoMore) {
  CarriedException thrown;
  int asked = 0;
  const auto block = [&]() -> bool {
    ++asked;
    throw std::runtime_error("block");
  };
  EXPECT_TRUE(thrown.ask([] { return true; }));
  EXPECT_FALSE(thrown.ask(block));
  EXPECT_FALSE(thrown.ask(block));
  EXPECT_EQ(1, asked);
  EXPECT_EQ("block", thrownBy([&] { thrown.rethrow(); }));
  EXPECT_EQ("", thrownBy([&] { thrown.rethrow(); }));
}

TEST(ProgressionTest, AWalkThatFindsMoreThanWasCountedStaysWithinItsBounds) {
  EXPECT_EQ(33, integerPercentage(1, 3));
  EXPECT_EQ(100, integerPercentage(4, 3));
  EXPECT_EQ(0, integerPercentage(0, 0));
  EXPECT_EQ(100, integerPercentage(1, 0));
  EXPECT_EQ(66 + 50.0 / 3, percentageInStep(66, 50, 3, false));
  EXPECT_EQ(100, percentageInStep(100, 50, 3, true));
  EXPECT_EQ(50, percentageInStep(0, 50, 0, true)) << "the first of none is the whole";
}

}  // namespace
}  // namespace quilt::platform
