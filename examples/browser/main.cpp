// SPDX-License-Identifier: Apache-2.0
#include <QApplication>
#include <QDir>

#include "examples/browser/LibraryWindow.h"
#include "examples/browser/Text.h"
#include "quilt/hosts/QtMainLoop.h"
#include "quilt/platform/install.h"

// browser [LIBRARY]: shows the library folder, $HOME/Quilt when none is named.
int main(int count, char** arguments) {
  QApplication application(count, arguments);
  QApplication::setApplicationName("Quilt Browser");
  quilt::platform::install();
  // After the application and the library, before the first worker.
  const quilt::hosts::QtMainLoop mainLoop;

  const QStringList words = QApplication::arguments();
  const QString folder = words.size() > 1 ? QDir(words[1]).absolutePath() : QDir::home().filePath("Quilt");
  browser::LibraryWindow window(quilt::QuiltCollectionsController::defaultController());
  window.resize(1140, 744);
  window.show();
  window.load(browser::toPath(folder));
  return QApplication::exec();
}
