// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/PropertyPanel.h"

#include <QFormLayout>
#include <QLabel>
#include <QLineEdit>
#include <QPlainTextEdit>
#include <QVBoxLayout>

#include "examples/browser/Text.h"

namespace browser {

using quilt::QuiltCollection;
using quilt::QuiltDocument;
using quilt::QuiltMedia;

namespace {

constexpr int kPause = 700;  // milliseconds

QString textOf(const QWidget* editor) {
  if (const auto* line = qobject_cast<const QLineEdit*>(editor)) return line->text();
  return qobject_cast<const QPlainTextEdit*>(editor)->toPlainText();
}

void setTextOf(QWidget* editor, const QString& text) {
  const QSignalBlocker quiet(editor);
  if (auto* line = qobject_cast<QLineEdit*>(editor)) {
    line->setText(text);
  } else {
    qobject_cast<QPlainTextEdit*>(editor)->setPlainText(text);
  }
}

}  // namespace

PropertyPanel::PropertyPanel(QWidget* parent) : QWidget(parent), _heading(new QLabel(this)), _form(new QFormLayout) {
  QFont bold = font();
  bold.setBold(true);
  _heading->setFont(bold);
  _form->setRowWrapPolicy(QFormLayout::WrapAllRows);
  _form->setVerticalSpacing(4);
  auto* const layout = new QVBoxLayout(this);
  layout->setContentsMargins(16, 16, 16, 16);
  layout->setSpacing(14);
  layout->addWidget(_heading);
  layout->addLayout(_form);
  layout->addStretch();
  _pause.setSingleShot(true);
  _pause.setInterval(kPause);
  connect(&_pause, &QTimer::timeout, this, &PropertyPanel::setWhatWasTyped);
  showNothing();
}

void PropertyPanel::showNothing() { clear(tr("Nothing selected")); }

void PropertyPanel::show(const std::shared_ptr<QuiltCollection>& collection) {
  clear(tr("Collection"));
  add("title", tr("Title"), collection, &QuiltCollection::title, &QuiltCollection::setTitle);
  add("author", tr("Author of new documents"), collection, &QuiltCollection::author, &QuiltCollection::setAuthor);
  add("description", tr("Description"), collection, &QuiltCollection::description, &QuiltCollection::setDescription,
      true);
  watch(collection, {"title", "author", "description"});
}

void PropertyPanel::show(const std::shared_ptr<QuiltDocument>& document) {
  clear(tr("Document"));
  add("title", tr("Title"), document, &QuiltDocument::title, &QuiltDocument::setTitle);
  add("author", tr("Author"), document, &QuiltDocument::author, &QuiltDocument::setAuthor);
  add("description", tr("Description"), document, &QuiltDocument::description, &QuiltDocument::setDescription, true);
  add("keywords", tr("Keywords"), document, &QuiltDocument::keywords, &QuiltDocument::setKeywords);
  add("category", tr("Category"), document, &QuiltDocument::category, &QuiltDocument::setCategory);
  watch(document, {"title", "author", "description", "keywords", "category"});
}

void PropertyPanel::show(const std::shared_ptr<QuiltMedia>& item) {
  clear(tr("Item"));
  // An item does not save itself; its document does it for it.
  const auto save = [item] {
    if (const auto document = item->documentOwner()) document->saveChange();
  };
  add("title", tr("Title"), item, &QuiltMedia::title, &QuiltMedia::setTitle);
  add("description", tr("Description"), item, &QuiltMedia::description, &QuiltMedia::setDescription, true);
  for (Field& field : _fields) {
    field.set = [set = field.set, save](quilt::Text text) {
      set(std::move(text));
      save();
    };
  }
  watch(item, {"title", "description"});
}

void PropertyPanel::clear(const QString& heading) {
  setWhatWasTyped();
  _watch.reset();
  _fields.clear();
  while (_form->rowCount() > 0) _form->removeRow(0);
  _heading->setText(heading);
}

template <class T>
void PropertyPanel::add(const char* name, const QString& label, const std::shared_ptr<T>& object,
                        quilt::Text (T::*get)() const, void (T::*set)(quilt::Text), bool isLong) {
  const std::size_t index = _fields.size();
  const auto typed = [this, index] {
    _fields[index].isTyped = true;
    _pause.start();
  };
  QWidget* editor = nullptr;
  if (isLong) {
    auto* const text = new QPlainTextEdit(this);
    text->setTabChangesFocus(true);
    text->setFixedHeight(96);
    connect(text, &QPlainTextEdit::textChanged, this, typed);
    editor = text;
  } else {
    auto* const line = new QLineEdit(this);
    connect(line, &QLineEdit::textEdited, this, typed);
    connect(line, &QLineEdit::editingFinished, this, &PropertyPanel::setWhatWasTyped);
    editor = line;
  }
  editor->setObjectName(name);
  auto* const caption = new QLabel(label, this);
  caption->setBuddy(editor);
  caption->setContentsMargins(0, index == 0 ? 0 : 8, 0, 0);
  _form->addRow(caption, editor);
  _fields.push_back({editor, [object, get] { return (object.get()->*get)(); },
                     [object, set](quilt::Text text) { (object.get()->*set)(std::move(text)); }});
}

void PropertyPanel::watch(const std::shared_ptr<quilt::platform::Object>& object,
                          std::initializer_list<std::string_view> keys) {
  _watch = std::make_unique<Watch>(object, keys, [this] { refresh(); });
  refresh();
}

void PropertyPanel::refresh() {
  for (Field& field : _fields) {
    const QString value = toQt(field.get());
    if (!field.isTyped && textOf(field.editor) != value) setTextOf(field.editor, value);
  }
}

void PropertyPanel::setWhatWasTyped() {
  _pause.stop();
  for (Field& field : _fields) {
    if (!field.isTyped) continue;
    field.isTyped = false;
    quilt::Text text = toText(textOf(field.editor));
    // A setter saves also what is equal.
    if (text != field.get()) field.set(std::move(text));
  }
}

}  // namespace browser
