// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QListView>
#include <QStyledItemDelegate>

namespace browser {

/// Cells with a poster, a title and a line below it, in rows from the left. A drag shows the gap that it would be
/// dropped into; without cells, the view says what to do.
class BrowserView : public QListView {
  Q_OBJECT

 public:
  explicit BrowserView(QWidget* parent = nullptr);

  void setEmptyText(const QString& headline, const QString& hint);
  /// The row before which something dropped at the position goes.
  [[nodiscard]] int gapAt(const QPoint& position) const;

 protected:
  void paintEvent(QPaintEvent* event) override;
  void startDrag(Qt::DropActions supportedActions) override;
  void dragEnterEvent(QDragEnterEvent* event) override;
  void dragMoveEvent(QDragMoveEvent* event) override;
  void dragLeaveEvent(QDragLeaveEvent* event) override;
  void dropEvent(QDropEvent* event) override;

 private:
  void showGap(int gap);
  [[nodiscard]] bool accepts(const QDropEvent& event) const;
  void paintEmpty();
  void paintGap();

  QString _headline;
  QString _hint;
  int _gap = -1;  // while something is dragged over the view
  bool _isDropTarget = false;
};

class CellDelegate : public QStyledItemDelegate {
 public:
  using QStyledItemDelegate::QStyledItemDelegate;

  [[nodiscard]] QSize sizeHint(const QStyleOptionViewItem& option, const QModelIndex& index) const override;
  void paint(QPainter* painter, const QStyleOptionViewItem& option, const QModelIndex& index) const override;
};

}  // namespace browser
