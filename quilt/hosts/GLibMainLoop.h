// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <glib.h>

#include <memory>

#include "quilt/hosts/ToolkitLoop.h"

namespace quilt::hosts {

/// Runs what the library does on the main thread in a GLib main context, for as long as it lives: for GTK, and for any
/// host that turns a GMainLoop. Needs GLib only.
///
///     quilt::platform::install();
///     const quilt::hosts::GLibMainLoop mainLoop;
///     …
///     g_main_loop_run(loop);
///
/// Made on the thread that turns the context, before the first worker. Nested loops (gtk_dialog_run(), another
/// GMainLoop on the context) run the library's blocks too. End the workers first: ask them to stop, then runUntil()
/// they have. A worker that still waits for the main thread when the adapter dies gets its block run then; see
/// ToolkitLoop::close().
class GLibMainLoop {
 public:
  /// Null is the default context, GTK's. The context is held until the adapter dies.
  explicit GLibMainLoop(GMainContext* context = nullptr) : _loop(std::make_shared<Loop>(context)) {
    ToolkitLoop::install(_loop);
  }
  GLibMainLoop(const GLibMainLoop&) = delete;
  GLibMainLoop& operator=(const GLibMainLoop&) = delete;
  ~GLibMainLoop() { _loop->close(); }

  /// Turns the context until `isDone` answers true; it is asked after every turn. Any thread ends a turn with wake().
  void runUntil(const std::function<bool()>& isDone) const { _loop->runUntil(isDone); }
  /// Ends the turn of runUntil() that waits now, or the next one. Any thread.
  void wake() const { _loop->wake(); }

 private:
  class Loop final : public ToolkitLoop {
   public:
    explicit Loop(GMainContext* context)
        : _context(context != nullptr ? g_main_context_ref(context) : g_main_context_ref(g_main_context_default())) {}

   private:
    static gboolean runOnce(gpointer) {
      // A context that outlives its adapter may be turned by any thread.
      if (platform::MainThread::isCurrent()) platform::MainThread::runQueuedBlocks();
      return G_SOURCE_REMOVE;
    }

    // Not g_main_context_invoke(), which calls the function on this very thread while the context is not being turned.
    // A source for each call, because a source that is being dispatched does not run again in a nested loop.
    void post() override {
      GSource* source = g_idle_source_new();
      g_source_set_priority(source, G_PRIORITY_DEFAULT);
      g_source_set_callback(source, runOnce, nullptr, nullptr);
      g_source_attach(source, _context);
      g_source_unref(source);
    }

    void turn() override { g_main_context_iteration(_context, TRUE); }
    void detach() override { g_main_context_unref(_context); }

    GMainContext* const _context;
  };

  std::shared_ptr<Loop> _loop;
};

}  // namespace quilt::hosts
