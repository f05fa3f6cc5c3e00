// SPDX-License-Identifier: Apache-2.0
#include "quilt/hosts/GLibMainLoop.h"

#include "tests/hosts/MainLoopTests.h"

namespace quilt::hosts {
namespace {

class GLib {
 public:
  using Adapter = GLibMainLoop;
  class Loop {
   public:
    Loop() : _loop(g_main_loop_new(nullptr, FALSE)) {}
    Loop(const Loop&) = delete;
    Loop& operator=(const Loop&) = delete;
    ~Loop() { g_main_loop_unref(_loop); }
    void run() { g_main_loop_run(_loop); }
    // By a source: a quit before run() would be lost.
    void quit() {
      g_idle_add_full(
          G_PRIORITY_DEFAULT,
          [](gpointer loop) -> gboolean {
            g_main_loop_quit(static_cast<GMainLoop*>(loop));
            return G_SOURCE_REMOVE;
          },
          _loop, nullptr);
    }

   private:
    GMainLoop* const _loop;
  };

  GLib() = default;
  GLib(const GLib&) = delete;
  GLib& operator=(const GLib&) = delete;
  ~GLib() {
    if (_timer != 0) g_source_remove(_timer);
  }
  std::unique_ptr<Adapter> makeAdapter() { return std::make_unique<Adapter>(); }
  void callOften(std::function<void()> call) {
    _call = std::move(call);
    _timer = g_timeout_add(
        1,
        [](gpointer calls) -> gboolean {
          static_cast<GLib*>(calls)->_call();
          return G_SOURCE_CONTINUE;
        },
        this);
  }

 private:
  std::function<void()> _call;
  guint _timer = 0;
};

}  // namespace

INSTANTIATE_TYPED_TEST_SUITE_P(GLib, MainLoopThreadTest, GLib);

namespace {

using GLibMainLoopThreadTest = support::ModelFixture;

TEST_F(GLibMainLoopThreadTest, TurnsAContextOfItsOwnAndHoldsIt) {
  GMainContext* const context = g_main_context_new();
  auto adapter = std::make_unique<GLibMainLoop>(context);
  g_main_context_unref(context);
  std::atomic<bool> done = false;
  std::thread worker([&] {
    platform::performBlockOnMainThread([] {});
    done = true;
    adapter->wake();
  });
  adapter->runUntil([&] { return done.load(); });
  worker.join();
}

// The context of a dead adapter is turned by a worker of the host's.
TEST_F(GLibMainLoopThreadTest, RunsNoBlockOnAnotherThread) {
  GMainContext* const context = g_main_context_new();
  auto adapter = std::make_unique<GLibMainLoop>(context);
  adapter->wake();
  adapter.reset();
  std::atomic<bool> queued = false;
  platform::MainThread::setWakeFunction([&] { queued = true; });
  bool ranOnMainThread = false;
  std::thread worker(
      [&] { platform::performBlockOnMainThread([&] { ranOnMainThread = platform::MainThread::isCurrent(); }); });
  while (!queued) std::this_thread::yield();
  std::thread turner([&] {
    while (g_main_context_iteration(context, FALSE) != FALSE) {
    }
  });
  turner.join();
  EXPECT_FALSE(ranOnMainThread);
  platform::MainThread::runQueuedBlocks();
  worker.join();
  EXPECT_TRUE(ranOnMainThread);
  platform::MainThread::setWakeFunction({});
  g_main_context_unref(context);
}

}  // namespace
}  // namespace quilt::hosts
