// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/CollectionModel.h"

#include <QMimeData>
#include <algorithm>

#include "examples/browser/DragData.h"
#include "examples/browser/Text.h"

namespace browser {

using quilt::QuiltCollection;
using quilt::platform::ChangeNotice;

CollectionModel::CollectionModel(std::shared_ptr<quilt::QuiltCollectionsController> library, QObject* parent)
    : QAbstractListModel(parent), _library(std::move(library)) {
  // A list announces itself on the main thread: see ItemModel::follow.
  _listObservation = _library->observe("collections", [this](const ChangeNotice&) { readRows(); });
  readRows();
}

void CollectionModel::readRows() {
  const auto collections = _library->collections();
  std::vector<Row> rows;
  for (const auto& collection : collections) {
    const auto known = std::find_if(_rows.begin(), _rows.end(),
                                    [&collection](const Row& row) { return row.collection == collection; });
    if (known != _rows.end()) {
      rows.push_back(*known);
      continue;
    }
    QuiltCollection* const shown = collection.get();
    Row row{collection, collection->documentsCount(), nullptr, nullptr};
    row.title = std::make_shared<Watch>(collection, std::initializer_list<std::string_view>{"title"},
                                        [this, shown] { renew(shown); });
    row.documents = std::make_shared<quilt::platform::Observation>(
        collection->observe("documents", [this, shown](const ChangeNotice&) { renew(shown); }));
    rows.push_back(std::move(row));
  }
  const bool isLonger = rows.size() == _rows.size() + 1 &&
                        std::equal(_rows.begin(), _rows.end(), rows.begin(), rows.end() - 1,
                                   [](const Row& one, const Row& other) { return one.collection == other.collection; });
  if (isLonger) {  // so that the selection stays while a library loads
    beginInsertRows({}, rowCount(), rowCount());
    _rows = std::move(rows);
    endInsertRows();
  } else {
    beginResetModel();
    _rows = std::move(rows);
    endResetModel();
  }
}

void CollectionModel::renew(const QuiltCollection* collection) {
  for (std::size_t row = 0; row < _rows.size(); ++row) {
    if (_rows[row].collection.get() != collection) continue;
    _rows[row].count = collection->documentsCount();
    const QModelIndex changed = index(static_cast<int>(row));
    emit dataChanged(changed, changed);
  }
}

std::shared_ptr<QuiltCollection> CollectionModel::collectionAt(const QModelIndex& index) const {
  return index.isValid() ? _rows[static_cast<std::size_t>(index.row())].collection : nullptr;
}

QModelIndex CollectionModel::indexOf(const std::shared_ptr<QuiltCollection>& collection) const {
  for (std::size_t row = 0; row < _rows.size(); ++row)
    if (_rows[row].collection == collection) return index(static_cast<int>(row));
  return {};
}

int CollectionModel::rowCount(const QModelIndex& parent) const {
  return parent.isValid() ? 0 : static_cast<int>(_rows.size());
}

QVariant CollectionModel::data(const QModelIndex& index, int role) const {
  const Row& row = _rows[static_cast<std::size_t>(index.row())];
  switch (role) {
    case Qt::DisplayRole:
    case Qt::EditRole: {
      const QString title = toQt(row.collection->title());
      return title.isEmpty() ? tr("Untitled Collection") : title;
    }
    case CountRole:
      return static_cast<qulonglong>(row.count);
    default:
      return {};
  }
}

bool CollectionModel::setData(const QModelIndex& index, const QVariant& value, int role) {
  if (role != Qt::EditRole || !index.isValid()) return false;
  collectionAt(index)->setTitle(toText(value.toString()));  // saves itself, and is announced back to the view
  return true;
}

Qt::ItemFlags CollectionModel::flags(const QModelIndex& index) const {
  if (!index.isValid()) return Qt::NoItemFlags;
  return Qt::ItemIsEnabled | Qt::ItemIsSelectable | Qt::ItemIsDropEnabled | Qt::ItemIsEditable;
}

QStringList CollectionModel::mimeTypes() const { return {quilt::kQuiltDocumentDragType, "text/uri-list"}; }

bool CollectionModel::canDropMimeData(const QMimeData* data, Qt::DropAction, int, int,
                                      const QModelIndex& parent) const {
  return parent.isValid() && (data->hasUrls() || data->hasFormat(quilt::kQuiltDocumentDragType));
}

bool CollectionModel::dropMimeData(const QMimeData* data, Qt::DropAction action, int row, int column,
                                   const QModelIndex& parent) {
  if (!canDropMimeData(data, action, row, column, parent)) return false;
  const auto onto = collectionAt(parent);
  if (data->hasUrls()) {
    emit filesDropped(filesIn(*data), onto);
  } else {
    emit documentsDropped(uuidsIn(*data, quilt::kQuiltDocumentDragType), onto);
  }
  return true;
}

}  // namespace browser
