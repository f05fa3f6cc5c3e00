// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QAbstractEventDispatcher>
#include <QCoreApplication>
#include <QEvent>
#include <QEventLoop>
#include <QObject>
#include <atomic>
#include <memory>

#include "quilt/hosts/ToolkitLoop.h"

namespace quilt::hosts {

/// Runs what the library does on the main thread in Qt's event loop, for as long as it lives. Needs Qt 6 Core only, and
/// no moc.
///
///     QApplication application(argc, argv);
///     quilt::platform::install();
///     const quilt::hosts::QtMainLoop mainLoop;
///     …
///     return application.exec();
///
/// Made on the application's thread, after the application and before the first worker; dies before the application.
/// Nested loops (QDialog::exec(), QEventLoop) run the library's blocks too. End the workers first: ask them to stop,
/// then runUntil() they have. A worker that still waits for the main thread when the adapter dies gets its block run
/// then; see ToolkitLoop::close().
class QtMainLoop {
 public:
  QtMainLoop() : _loop(std::make_shared<Loop>()) { ToolkitLoop::install(_loop); }
  QtMainLoop(const QtMainLoop&) = delete;
  QtMainLoop& operator=(const QtMainLoop&) = delete;
  ~QtMainLoop() { _loop->close(); }

  /// Turns Qt's loop until `isDone` answers true; it is asked after every turn. Any thread ends a turn with wake().
  void runUntil(const std::function<bool()>& isDone) const { _loop->runUntil(isDone); }
  /// Ends the turn of runUntil() that waits now, or the next one. Any thread.
  void wake() const { _loop->wake(); }

 private:
  class Receiver final : public QObject {
   public:
    explicit Receiver(std::mutex& posting) : _posting(posting) {
      // Qt's dispatcher over GLib lets a nested loop sleep although events are posted: those that came before the one
      // whose handler opened the nested loop.
      QAbstractEventDispatcher* const dispatcher = QAbstractEventDispatcher::instance();
      connect(dispatcher, &QAbstractEventDispatcher::aboutToBlock, this, [this, dispatcher] {
        if (_posted > 0) dispatcher->wakeUp();
      });
    }

    void post() {
      ++_posted;
      QCoreApplication::postEvent(this, new QEvent(wakeEvent()));
    }

    bool event(QEvent* event) override {
      { const std::lock_guard orderedAfterPosting(_posting); }  // in words that every checker of threads understands
      if (event->type() != wakeEvent()) return QObject::event(event);
      --_posted;
      platform::MainThread::runQueuedBlocks();
      return true;
    }

   private:
    static QEvent::Type wakeEvent() {
      static const int type = QEvent::registerEventType();
      return static_cast<QEvent::Type>(type);
    }

    std::mutex& _posting;
    std::atomic<int> _posted = 0;
  };

  class Loop final : public ToolkitLoop {
   public:
    Loop() : _receiver(std::make_unique<Receiver>(mutex())) {}

   private:
    void post() override { _receiver->post(); }
    void turn() override { QCoreApplication::processEvents(QEventLoop::AllEvents | QEventLoop::WaitForMoreEvents); }
    void detach() override { _receiver.reset(); }

    std::unique_ptr<Receiver> _receiver;
  };

  std::shared_ptr<Loop> _loop;
};

}  // namespace quilt::hosts
