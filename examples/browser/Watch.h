// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QObject>
#include <atomic>
#include <functional>
#include <memory>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Object.h"

namespace browser {

/// Hears of changes of an object's properties, whoever makes them, and calls `changed` on the main thread.
///
/// A property announces itself on the thread that sets it, so the call is posted to Qt's loop: several changes at once
/// become one call, and no worker waits for the view. A list announces itself on the main thread, while the worker that
/// changes it waits; observe it with Object::observe() and read it there and then (see ItemModel::follow).
class Watch : public QObject {
 public:
  Watch(const std::shared_ptr<quilt::platform::Object>& object, std::initializer_list<std::string_view> keys,
        std::function<void()> changed)
      : _changed(std::move(changed)) {
    for (const std::string_view key : keys)
      _observations.push_back(object->observe(key, [this](const quilt::platform::ChangeNotice&) { post(); }));
  }
  // The observations end first: once the destructor runs, nobody posts any more.
  ~Watch() override { _observations.clear(); }

 private:
  void post() {
    if (_isPosted.exchange(true)) return;
    QMetaObject::invokeMethod(
        this,
        [this] {
          _isPosted = false;
          _changed();
        },
        Qt::QueuedConnection);
  }

  const std::function<void()> _changed;
  std::atomic<bool> _isPosted = false;
  std::vector<quilt::platform::Observation> _observations;
};

}  // namespace browser
