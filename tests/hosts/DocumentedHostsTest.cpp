// SPDX-License-Identifier: Apache-2.0
// The programs of docs/hosts.md, word for word, with what they leave to their host around them.
#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <mutex>
#include <queue>
#include <thread>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/hosts/ToolkitLoop.h"
#include "quilt/platform/base/MainThread.h"
#include "quilt/platform/base/Worker.h"
#include "quilt/platform/install.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/ModelFixture.h"
#ifdef QUILT_HAS_GLIB
#include "quilt/hosts/GLibMainLoop.h"
#endif

namespace quilt {
namespace {

class DocumentedHostsThreadTest : public support::ModelFixture {
 protected:
  /// A document that can be exported: a link needs no files.
  std::shared_ptr<QuiltDocument> made() {
    auto document = QuiltDocument::initWithPath(folder() / "made.qpk");
    const auto item = QuiltMedia::init();
    item->addSource(QuiltMediaSource::initWithURL(*Url::parse("https://example.org/")));
    document->addMedia(item);
    document->setTitle("Made");
    return document;
  }
};

/// What a host has that draws its own frames.
struct Engine {
  void callOnMainThread(std::function<void()> call) {
    const std::lock_guard lock(mutex);
    calls.push(std::move(call));
  }
  void waitForEvent() {
    std::function<void()> call;
    {
      const std::lock_guard lock(mutex);
      if (calls.empty()) return;
      call = std::move(calls.front());
      calls.pop();
    }
    call();
  }
  std::mutex mutex;
  std::queue<std::function<void()>> calls;
};

TEST_F(DocumentedHostsThreadTest, AnotherToolkit) {
  static Engine engine;
  std::atomic<bool> isCalled = false;
  std::thread worker([&] { platform::MainThread::performBlock([&] { isCalled = true; }); });
#include <documented/another.cpp>
  platform::services().runLoop->runUntil([&] { return isCalled.load(); });
  worker.join();
  EXPECT_FALSE(engine.calls.empty()) << "the library woke the toolkit";
}

TEST_F(DocumentedHostsThreadTest, NoLoop) {
  const auto document = made();
  const Path folder = this->folder();
  const ProgressionBlock block;
#include <documented/no-loop.cpp>
  EXPECT_TRUE(std::filesystem::is_regular_file(folder / "Made.qpk.zip"));
}

TEST_F(DocumentedHostsThreadTest, TheEnd) {
  std::atomic<bool> isCancelled = false;
  std::atomic<bool> isDone = false;
  std::thread worker([&] {
    while (!isCancelled) std::this_thread::yield();
    isDone = true;
    platform::services().runLoop->wake();
  });
#include <documented/end.cpp>
  EXPECT_FALSE(worker.joinable());
}

#ifdef QUILT_HAS_GLIB
TEST_F(DocumentedHostsThreadTest, GLib) {
  GMainLoop* const loop = g_main_loop_new(nullptr, FALSE);
  const auto quit = [](gpointer running) -> gboolean {
    g_main_loop_quit(static_cast<GMainLoop*>(running));
    return G_SOURCE_REMOVE;
  };
  g_idle_add(quit, loop);
#include <documented/glib.cpp>
  g_main_loop_unref(loop);
}
#endif

}  // namespace
}  // namespace quilt
