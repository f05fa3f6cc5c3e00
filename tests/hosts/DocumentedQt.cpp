// SPDX-License-Identifier: Apache-2.0
// The program of docs/hosts.md for Qt, word for word, with a window that ends it.
#include <QApplication>
#include <QTimer>
#include <QWidget>

#include "quilt/platform/install.h"

namespace {

class LibraryWindow : public QWidget {
 public:
  LibraryWindow() { QTimer::singleShot(0, qApp, &QApplication::quit); }
};

}  // namespace

#include <documented/qt.cpp>
