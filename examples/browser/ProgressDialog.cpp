// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/ProgressDialog.h"

#include <QProgressDialog>
#include <QPushButton>
#include <QTimer>
#include <atomic>
#include <thread>

#include "quilt/platform/interfaces/Services.h"

namespace browser {

namespace {

constexpr int kMomentBeforeItShows = 400;  // milliseconds

}  // namespace

bool runWithProgress(QWidget* window, const QString& label,
                     const std::function<void(const quilt::platform::ProgressionBlock& block)>& job) {
  // What both threads see. The worker never touches the dialog.
  std::atomic<int> percent = 0;
  std::atomic<bool> isCancelled = false;

  QProgressDialog dialog(label, QProgressDialog::tr("Cancel"), 0, 100, window);
  dialog.setWindowModality(Qt::WindowModal);
  dialog.setWindowTitle(QProgressDialog::tr("Quilt Browser"));
  dialog.setAutoClose(false);
  dialog.setAutoReset(false);
  dialog.setMinimumSize(420, 120);
  dialog.setMinimumDuration(kMomentBeforeItShows);
  QObject::connect(&dialog, &QProgressDialog::canceled, [&] {
    isCancelled = true;
    dialog.setLabelText(QProgressDialog::tr("Stopping…"));
    dialog.show();  // it hides itself on cancel, but the job has still to put away what it made
  });
  QTimer refresh;
  QObject::connect(&refresh, &QTimer::timeout, [&] {
    if (!isCancelled) dialog.setValue(percent);
  });
  refresh.start(100);

  std::atomic<bool> isDone = false;
  std::thread worker([&] {
    job([&](double percentage) {
      percent = static_cast<int>(percentage);
      return !isCancelled;
    });
    isDone = true;
    quilt::platform::services().runLoop->wake();
  });
  // Turns Qt's loop, and goes on when the application is asked to quit: a worker must not be left waiting.
  quilt::platform::services().runLoop->runUntil([&isDone] { return isDone.load(); });
  worker.join();
  return !isCancelled;
}

}  // namespace browser
