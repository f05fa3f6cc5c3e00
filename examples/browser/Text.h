// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QString>

#include "quilt/sources/ModelTypes.h"

namespace browser {

// The library's texts are UTF-8, its paths bytes; Qt's are UTF-16.

inline QString toQt(const std::string& text) { return QString::fromStdString(text); }
inline QString toQt(const quilt::Text& text) { return text ? toQt(*text) : QString(); }
inline QString toQt(const quilt::Path& path) { return toQt(path.native()); }
inline quilt::Path toPath(const QString& path) { return path.toStdString(); }

/// An empty field of a form is a property without a value.
inline quilt::Text toText(const QString& text) {
  return text.isEmpty() ? quilt::Text() : quilt::Text(text.toStdString());
}

}  // namespace browser
