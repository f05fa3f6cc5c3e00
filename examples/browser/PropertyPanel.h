// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QTimer>
#include <QWidget>
#include <functional>
#include <memory>
#include <vector>

#include "examples/browser/Watch.h"
#include "quilt/collections/QuiltCollection.h"

class QFormLayout;
class QLabel;

namespace browser {

/// The descriptive properties of one object as a form. There is no Save button: a property is set a moment after the
/// last key, or when its field is left, and the model saves itself then. A change made elsewhere shows at once, unless
/// the user is just typing in that field.
class PropertyPanel : public QWidget {
  Q_OBJECT

 public:
  explicit PropertyPanel(QWidget* parent = nullptr);
  ~PropertyPanel() override { setWhatWasTyped(); }

  void showNothing();
  void show(const std::shared_ptr<quilt::QuiltCollection>& collection);
  void show(const std::shared_ptr<quilt::QuiltDocument>& document);
  void show(const std::shared_ptr<quilt::QuiltMedia>& item);

  /// What is typed and not set yet.
  void setWhatWasTyped();

 private:
  struct Field {
    QWidget* editor;
    std::function<quilt::Text()> get;
    std::function<void(quilt::Text)> set;
    bool isTyped = false;
  };

  void clear(const QString& heading);
  template <class T>
  void add(const char* name, const QString& label, const std::shared_ptr<T>& object, quilt::Text (T::*get)() const,
           void (T::*set)(quilt::Text), bool isLong = false);
  void watch(const std::shared_ptr<quilt::platform::Object>& object, std::initializer_list<std::string_view> keys);
  void refresh();

  QLabel* _heading;
  QFormLayout* _form;
  std::vector<Field> _fields;
  std::unique_ptr<Watch> _watch;
  QTimer _pause;  // since the last key
};

}  // namespace browser
