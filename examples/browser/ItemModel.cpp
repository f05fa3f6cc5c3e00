// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/ItemModel.h"

#include <algorithm>

#include "examples/browser/DragData.h"
#include "examples/browser/Operations.h"
#include "examples/browser/Text.h"

namespace browser {

using quilt::QuiltCollection;
using quilt::QuiltDocument;
using quilt::QuiltMedia;

namespace {

/// "Movie · 1:05". Asks the item's sources, and so is asked when the item joins and not while it is painted.
QString kindOf(const QuiltMedia& item) {
  const QString category = toQt(item.contentCategory());
  const auto seconds = static_cast<int>(item.duration());
  return seconds == 0 ? category
                      : category + QString(" · %1:%2").arg(seconds / 60).arg(seconds % 60, 2, 10, QLatin1Char('0'));
}

}  // namespace

ItemModel::ItemModel(Posters& posters, QObject* parent) : QAbstractListModel(parent), _posters(posters) {
  connect(&posters, &Posters::ready, this, [this](const QString& uid) {
    if (const QModelIndex index = indexOf(uid.toStdString()); index.isValid())
      emit dataChanged(index, index, {PosterRole});
  });
}

void ItemModel::showNothing() {
  _listObservation.reset();
  _collection = nullptr;
  _document = nullptr;
  setRows({});
}

void ItemModel::show(const std::shared_ptr<QuiltCollection>& collection) {
  _collection = collection;
  _document = nullptr;
  follow(collection, "documents");
}

void ItemModel::show(const std::shared_ptr<QuiltDocument>& document) {
  _document = document;
  follow(document, "media");
}

void ItemModel::follow(const std::shared_ptr<quilt::platform::Object>& owner, std::string_view key) {
  // The notice comes on the main thread while whoever changes the list waits, so the list can be read here at once. Put
  // off to a later turn of the loop, the reading might wait for a long operation that holds the list.
  _listObservation = owner->observe(key, [this](const quilt::platform::ChangeNotice&) { setRows(currentRows()); });
  setRows(currentRows());
}

std::vector<ItemModel::Row> ItemModel::currentRows() const {
  std::vector<Row> rows;
  if (_document) {
    for (const auto& item : _document->media()) rows.push_back({item, item, item, kindOf(*item), nullptr});
  } else if (_collection) {
    for (const auto& document : _collection->documents()) rows.push_back({document, document, document, {}, nullptr});
  }
  return rows;
}

// Tells the view what changed as narrowly as it can, so that scrolling and selection stay.
void ItemModel::setRows(std::vector<Row> rows) {
  for (Row& row : rows) {
    const auto known = std::find(_rows.begin(), _rows.end(), row);
    row.watch = known != _rows.end() ? known->watch : watch(row.object);
  }
  const auto differs = std::mismatch(_rows.begin(), _rows.end(), rows.begin(), rows.end());
  const auto first = static_cast<int>(differs.first - _rows.begin());
  const auto same = std::mismatch(_rows.rbegin(), std::make_reverse_iterator(differs.first), rows.rbegin(),
                                  std::make_reverse_iterator(differs.second));
  const auto oldEnd = static_cast<int>(_rows.size()) - static_cast<int>(same.first - _rows.rbegin());
  const auto newEnd = static_cast<int>(rows.size()) - static_cast<int>(same.second - rows.rbegin());
  if (first == oldEnd && first == newEnd) return;
  if (first == oldEnd) {
    beginInsertRows({}, first, newEnd - 1);
    _rows = std::move(rows);
    endInsertRows();
  } else if (first == newEnd) {
    beginRemoveRows({}, first, oldEnd - 1);
    _rows = std::move(rows);
    endRemoveRows();
  } else if (std::is_permutation(_rows.begin(), _rows.end(), rows.begin(), rows.end())) {
    emit layoutAboutToBeChanged();
    const QModelIndexList before = persistentIndexList();
    QModelIndexList after;
    for (const QModelIndex& old : before) {
      const auto now = std::find(rows.begin(), rows.end(), _rows[static_cast<std::size_t>(old.row())]);
      after.append(index(static_cast<int>(now - rows.begin())));
    }
    _rows = std::move(rows);
    changePersistentIndexList(before, after);
    emit layoutChanged();
  } else {
    beginResetModel();
    _rows = std::move(rows);
    endResetModel();
  }
}

std::shared_ptr<Watch> ItemModel::watch(const std::shared_ptr<quilt::platform::Object>& object) {
  const auto renew = [this, shown = object.get()] {
    for (int row = 0; row < rowCount(); ++row)
      if (_rows[static_cast<std::size_t>(row)].object.get() == shown) emit dataChanged(index(row), index(row));
  };
  return std::make_shared<Watch>(
      object, std::initializer_list<std::string_view>{"title", "creationDate", "isProcessing", "posterImageVersion"},
      renew);
}

std::shared_ptr<QuiltDocument> ItemModel::documentAt(const QModelIndex& index) const {
  if (!index.isValid() || _document) return nullptr;
  return std::dynamic_pointer_cast<QuiltDocument>(_rows[static_cast<std::size_t>(index.row())].object);
}

std::shared_ptr<QuiltMedia> ItemModel::mediaAt(const QModelIndex& index) const {
  if (!index.isValid() || !_document) return nullptr;
  return std::dynamic_pointer_cast<QuiltMedia>(_rows[static_cast<std::size_t>(index.row())].object);
}

QModelIndex ItemModel::indexOf(const std::string& uuid) const {
  for (std::size_t row = 0; row < _rows.size(); ++row)
    if (_rows[row].item->imageUID() == uuid) return index(static_cast<int>(row));
  return {};
}

int ItemModel::rowCount(const QModelIndex& parent) const {
  return parent.isValid() ? 0 : static_cast<int>(_rows.size());
}

QString ItemModel::titleOf(const Row& row) const {
  QString title = toQt(row.item->imageTitle());
  // An item answers no title to an image browser: it has its own.
  if (const auto item = std::dynamic_pointer_cast<QuiltMedia>(row.object)) title = toQt(item->title());
  return title.isEmpty() ? tr("Untitled") : title;
}

QVariant ItemModel::data(const QModelIndex& index, int role) const {
  const Row& row = _rows[static_cast<std::size_t>(index.row())];
  switch (role) {
    case Qt::DisplayRole:
    case Qt::ToolTipRole:
      return titleOf(row);
    case SubtitleRole: {
      const auto document = std::dynamic_pointer_cast<QuiltDocument>(row.object);
      if (document && document->isProcessing()) return tr("Working…");
      return document ? toQt(row.item->imageSubtitle()) : row.kind;
    }
    case PosterRole:
      return _posters.poster(row.item);
    default:
      return {};
  }
}

Qt::ItemFlags ItemModel::flags(const QModelIndex& index) const {
  if (!index.isValid()) return Qt::ItemIsDropEnabled;
  return Qt::ItemIsEnabled | Qt::ItemIsSelectable | Qt::ItemIsDragEnabled;
}

// ---- Drag and drop

QStringList ItemModel::mimeTypes() const {
  return {quilt::kQuiltDocumentDragType, quilt::kQuiltMediaDragType, "text/uri-list"};
}

QMimeData* ItemModel::mimeData(const QModelIndexList& indexes) const {
  std::vector<int> rows;
  for (const QModelIndex& index : indexes) rows.push_back(index.row());
  std::sort(rows.begin(), rows.end());  // in list order, not in that of clicking
  std::vector<std::shared_ptr<quilt::platform::PasteboardItem>> items;
  for (const int row : rows) items.push_back(_rows[static_cast<std::size_t>(row)].dragged);
  return dragDataOf(items).release();
}

bool ItemModel::canDropMimeData(const QMimeData* data, Qt::DropAction, int, int, const QModelIndex&) const {
  if (data->hasUrls()) return _collection || _document;
  if (!_document) return false;
  const std::vector<std::string> uuids = uuidsIn(*data, quilt::kQuiltMediaDragType);
  return !uuids.empty() &&
         std::all_of(uuids.begin(), uuids.end(), [this](const auto& uuid) { return indexOf(uuid).isValid(); });
}

bool ItemModel::dropMimeData(const QMimeData* data, Qt::DropAction action, int row, int column,
                             const QModelIndex& parent) {
  if (!canDropMimeData(data, action, row, column, parent)) return false;
  if (data->hasUrls()) {
    emit filesDropped(filesIn(*data));
    return true;
  }
  const int gap = row < 0 ? rowCount() : row;
  return moveItems(*_document, uuidsIn(*data, quilt::kQuiltMediaDragType), static_cast<std::size_t>(gap));
}

}  // namespace browser
