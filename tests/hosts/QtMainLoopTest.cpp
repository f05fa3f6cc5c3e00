// SPDX-License-Identifier: Apache-2.0
#include "quilt/hosts/QtMainLoop.h"

#include <QTimer>

#include "tests/hosts/MainLoopTests.h"

namespace quilt::hosts {
namespace {

class Qt6 {
 public:
  using Adapter = QtMainLoop;
  class Loop {
   public:
    void run() { _loop.exec(); }
    // At once and from any thread, as QThread::quit() does it; and no event that a checker of threads misunderstands.
    void quit() { _loop.quit(); }

   private:
    QEventLoop _loop;
  };

  Qt6() : _application(_argumentCount, _arguments.data()) {}
  std::unique_ptr<Adapter> makeAdapter() { return std::make_unique<Adapter>(); }
  void callOften(std::function<void()> call) {
    QObject::connect(&_timer, &QTimer::timeout, std::move(call));
    _timer.start(0);
  }

 private:
  int _argumentCount = 1;
  std::string _name = "QtMainLoopTest";
  std::array<char*, 2> _arguments{_name.data(), nullptr};
  QCoreApplication _application;
  QTimer _timer;
};

}  // namespace

INSTANTIATE_TYPED_TEST_SUITE_P(Qt, MainLoopThreadTest, Qt6);

namespace {

using QtMainLoopThreadTest = MainLoopThreadTest<Qt6>;

// A slot of the host's shows a modal dialog. The block was queued before the slot was called and behind its event.
TEST_F(QtMainLoopThreadTest, ADialogOfTheHostsRunsTheBlocksBehindIt) {
  QCoreApplication::sendPostedEvents();
  countQueuedBlocks();
  QEventLoop dialog;
  bool closed = false;
  QMetaObject::invokeMethod(
      &dialog,
      [&] {
        dialog.exec();
        closed = true;
      },
      Qt::QueuedConnection);
  startWorker([&] { platform::performBlockOnMainThread([&] { dialog.quit(); }); });
  waitForQueuedBlocks(1);
  adapter->runUntil([&] { return closed; });
  joinWorkers();
}

}  // namespace

}  // namespace quilt::hosts
