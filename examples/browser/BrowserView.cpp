// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/BrowserView.h"

#include <QDrag>
#include <QDropEvent>
#include <QMimeData>
#include <QPainter>
#include <QPainterPath>
#include <QPixmap>

#include "examples/browser/ItemModel.h"

namespace browser {

namespace {

constexpr QSize kPoster{184, 138};
constexpr int kMargin = 10;  // around the poster, inside the cell
constexpr int kGap = 6;      // between cells
constexpr qreal kRounding = 6;

QColor mixed(const QColor& one, const QColor& other, qreal share) {
  const auto channel = [share](int a, int b) { return static_cast<int>(a * (1 - share) + b * share); };
  return {channel(one.red(), other.red()), channel(one.green(), other.green()), channel(one.blue(), other.blue())};
}

}  // namespace

// ---- The view

BrowserView::BrowserView(QWidget* parent) : QListView(parent) {
  // A list that wraps, and not Qt's icon mode, whose cells the user may move about freely.
  setFlow(QListView::LeftToRight);
  setWrapping(true);
  setResizeMode(QListView::Adjust);
  setUniformItemSizes(true);
  setSpacing(kGap);
  setItemDelegate(new CellDelegate(this));
  setSelectionMode(QAbstractItemView::ExtendedSelection);
  setVerticalScrollMode(QAbstractItemView::ScrollPerPixel);
  setHorizontalScrollBarPolicy(Qt::ScrollBarAlwaysOff);
  setDragEnabled(true);
  setAcceptDrops(true);
  setDropIndicatorShown(false);  // it draws its own
  setDefaultDropAction(Qt::MoveAction);
  setFrameShape(QFrame::NoFrame);
}

void BrowserView::setEmptyText(const QString& headline, const QString& hint) {
  _headline = headline;
  _hint = hint;
  viewport()->update();
}

int BrowserView::gapAt(const QPoint& position) const {
  const int count = model()->rowCount();
  for (int row = 0; row < count; ++row) {
    const QRect cell = visualRect(model()->index(row, 0));
    if (position.y() > cell.bottom() + kGap) continue;  // a line further up
    if (position.x() < cell.center().x() || position.y() < cell.top()) return row;
  }
  return count;
}

void BrowserView::paintEvent(QPaintEvent* event) {
  QListView::paintEvent(event);
  if (model() && model()->rowCount() == 0) paintEmpty();
  if (_gap >= 0) paintGap();
}

void BrowserView::paintEmpty() {
  QPainter painter(viewport());
  painter.setRenderHint(QPainter::Antialiasing);
  const QColor text = palette().color(QPalette::Text);
  const QColor faint = mixed(text, palette().color(QPalette::Base), 0.55);
  const QRectF box = QRectF(viewport()->rect()).adjusted(24, 24, -24, -24);
  const QColor edge = _isDropTarget ? palette().color(QPalette::Highlight) : mixed(faint, Qt::white, 0.4);
  painter.setPen(QPen(edge, 2, Qt::DashLine));
  painter.drawRoundedRect(box, 12, 12);

  // An arrow into a tray.
  const QPointF middle = box.center() - QPointF(0, 46);
  painter.setPen(QPen(faint, 3, Qt::SolidLine, Qt::RoundCap, Qt::RoundJoin));
  painter.drawLine(middle + QPointF(0, -30), middle + QPointF(0, 8));
  painter.drawPolyline(QPolygonF({middle + QPointF(-12, -4), middle + QPointF(0, 8), middle + QPointF(12, -4)}));
  painter.drawPolyline(QPolygonF(
      {middle + QPointF(-28, 6), middle + QPointF(-28, 22), middle + QPointF(28, 22), middle + QPointF(28, 6)}));

  QFont large = font();
  large.setPointSizeF(large.pointSizeF() * 1.4);
  painter.setFont(large);
  painter.setPen(text);
  const QRectF line(box.left(), middle.y() + 44, box.width(), 32);
  painter.drawText(line, Qt::AlignCenter, _headline);
  painter.setFont(font());
  painter.setPen(faint);
  painter.drawText(line.translated(0, 32), Qt::AlignCenter, _hint);
}

void BrowserView::paintGap() {
  const int count = model()->rowCount();
  if (count == 0) return;
  const QRect cell = visualRect(model()->index(std::min(_gap, count - 1), 0));
  const int x = _gap < count ? cell.left() - kGap / 2 : cell.right() + kGap / 2;
  QPainter painter(viewport());
  painter.setRenderHint(QPainter::Antialiasing);
  painter.setPen(QPen(palette().color(QPalette::Highlight), 3, Qt::SolidLine, Qt::RoundCap));
  painter.drawLine(x, cell.top() + 4, x, cell.bottom() - 4);
}

// With a small picture: one as large as the cells would hide where they are dropped.
void BrowserView::startDrag(Qt::DropActions supportedActions) {
  const QModelIndexList dragged = selectedIndexes();
  if (dragged.isEmpty()) return;
  constexpr int kWidth = 96;
  QPixmap picture = dragged.front().data(ItemModel::PosterRole).value<QPixmap>();
  if (picture.isNull()) {
    picture = QPixmap(kWidth, kWidth * 3 / 4);
    picture.fill(palette().color(QPalette::Mid));
  }
  picture = picture.scaledToWidth(kWidth, Qt::SmoothTransformation);
  if (dragged.size() > 1) {
    QPainter painter(&picture);
    painter.setRenderHint(QPainter::Antialiasing);
    const QRect badge(kWidth - 34, 4, 30, 20);
    painter.setPen(Qt::NoPen);
    painter.setBrush(palette().color(QPalette::Highlight));
    painter.drawRoundedRect(badge, 10, 10);
    painter.setPen(palette().color(QPalette::HighlightedText));
    painter.drawText(badge, Qt::AlignCenter, QString::number(dragged.size()));
  }
  auto* const drag = new QDrag(this);  // Qt deletes it
  drag->setMimeData(model()->mimeData(dragged));
  drag->setPixmap(picture);
  drag->setHotSpot({-8, -8});
  drag->exec(supportedActions, defaultDropAction());
}

bool BrowserView::accepts(const QDropEvent& event) const {
  return model() && model()->canDropMimeData(event.mimeData(), event.dropAction(), -1, -1, {});
}

void BrowserView::showGap(int gap) {
  _gap = gap;
  viewport()->update();
}

void BrowserView::dragEnterEvent(QDragEnterEvent* event) {
  event->setAccepted(accepts(*event));
  _isDropTarget = event->isAccepted();
  viewport()->update();
}

void BrowserView::dragMoveEvent(QDragMoveEvent* event) {
  event->setAccepted(accepts(*event));
  if (event->isAccepted()) showGap(event->mimeData()->hasUrls() ? -1 : gapAt(event->position().toPoint()));
}

void BrowserView::dragLeaveEvent(QDragLeaveEvent* event) {
  _isDropTarget = false;
  showGap(-1);
  event->accept();
}

void BrowserView::dropEvent(QDropEvent* event) {
  _isDropTarget = false;
  showGap(-1);
  if (!accepts(*event)) return;
  // Copied, as far as the drag's source is concerned: a moved row would be removed by Qt, and ours already are.
  event->setDropAction(Qt::CopyAction);
  if (model()->dropMimeData(event->mimeData(), Qt::CopyAction, gapAt(event->position().toPoint()), 0, {}))
    event->accept();
}

// ---- A cell

QSize CellDelegate::sizeHint(const QStyleOptionViewItem& option, const QModelIndex&) const {
  return {kPoster.width() + 2 * kMargin, kPoster.height() + 3 * kMargin + 2 * option.fontMetrics.height()};
}

void CellDelegate::paint(QPainter* painter, const QStyleOptionViewItem& option, const QModelIndex& index) const {
  painter->save();
  painter->setRenderHints(QPainter::Antialiasing | QPainter::SmoothPixmapTransform);
  const QPalette& palette = option.palette;
  const QColor base = palette.color(QPalette::Base);
  const QColor text = palette.color(QPalette::Text);
  const bool isSelected = option.state.testFlag(QStyle::State_Selected);
  if (isSelected) {
    painter->setPen(Qt::NoPen);
    painter->setBrush(mixed(palette.color(QPalette::Highlight), base, 0.75));
    painter->drawRoundedRect(option.rect, kRounding + 2, kRounding + 2);
  }

  const QRect frame(option.rect.topLeft() + QPoint(kMargin, kMargin), kPoster);
  QPainterPath rounded;
  rounded.addRoundedRect(frame, kRounding, kRounding);
  painter->fillPath(rounded, mixed(base, text, 0.07));
  const auto poster = index.data(ItemModel::PosterRole).value<QPixmap>();
  if (!poster.isNull()) {
    // Filled to the frame, what is too much cut off on both sides.
    const QSize filled = poster.size().scaled(kPoster, Qt::KeepAspectRatioByExpanding);
    QRect place(QPoint(), filled);
    place.moveCenter(frame.center());
    painter->setClipPath(rounded);
    painter->drawPixmap(place, poster);
    painter->setClipping(false);
  }
  painter->setPen(QPen(isSelected ? palette.color(QPalette::Highlight) : mixed(base, text, 0.2), isSelected ? 2 : 1));
  painter->setBrush(Qt::NoBrush);
  painter->drawPath(rounded);

  const int height = option.fontMetrics.height();
  const QRect title(frame.left(), frame.bottom() + kMargin - 2, frame.width(), height);
  QFont bold = option.font;
  bold.setWeight(QFont::DemiBold);
  painter->setFont(bold);
  painter->setPen(text);
  painter->drawText(title, Qt::AlignLeft | Qt::AlignVCenter,
                    QFontMetrics(bold).elidedText(index.data().toString(), Qt::ElideRight, title.width()));
  painter->setFont(option.font);
  painter->setPen(mixed(text, base, 0.4));
  painter->drawText(
      title.translated(0, height), Qt::AlignLeft | Qt::AlignVCenter,
      option.fontMetrics.elidedText(index.data(ItemModel::SubtitleRole).toString(), Qt::ElideRight, title.width()));
  painter->restore();
}

}  // namespace browser
