// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QAbstractListModel>
#include <memory>
#include <vector>

#include "examples/browser/Posters.h"
#include "examples/browser/Watch.h"
#include "quilt/collections/QuiltCollection.h"

namespace browser {

/// The documents of a collection or the items of a document, as rows for the image browser. The rows are a copy of the
/// model's list, renewed when the list announces a change, so that painting and scrolling never take a lock that a long
/// operation may hold.
class ItemModel : public QAbstractListModel {
  Q_OBJECT

 public:
  enum Role { SubtitleRole = Qt::UserRole, PosterRole };

  explicit ItemModel(Posters& posters, QObject* parent = nullptr);

  void showNothing();
  void show(const std::shared_ptr<quilt::QuiltCollection>& collection);
  void show(const std::shared_ptr<quilt::QuiltDocument>& document);

  [[nodiscard]] std::shared_ptr<quilt::QuiltCollection> collection() const { return _collection; }
  /// Null while documents are shown.
  [[nodiscard]] std::shared_ptr<quilt::QuiltDocument> document() const { return _document; }
  /// Null for a row of the other kind, or none.
  [[nodiscard]] std::shared_ptr<quilt::QuiltDocument> documentAt(const QModelIndex& index) const;
  [[nodiscard]] std::shared_ptr<quilt::QuiltMedia> mediaAt(const QModelIndex& index) const;
  [[nodiscard]] QModelIndex indexOf(const std::string& uuid) const;

  [[nodiscard]] int rowCount(const QModelIndex& parent = {}) const override;
  [[nodiscard]] QVariant data(const QModelIndex& index, int role) const override;
  [[nodiscard]] Qt::ItemFlags flags(const QModelIndex& index) const override;
  [[nodiscard]] QStringList mimeTypes() const override;
  [[nodiscard]] QMimeData* mimeData(const QModelIndexList& indexes) const override;
  [[nodiscard]] Qt::DropActions supportedDropActions() const override { return Qt::MoveAction | Qt::CopyAction; }
  [[nodiscard]] bool canDropMimeData(const QMimeData* data, Qt::DropAction action, int row, int column,
                                     const QModelIndex& parent) const override;
  /// Items of the shown document are put before `row`; files are handed on.
  bool dropMimeData(const QMimeData* data, Qt::DropAction action, int row, int column,
                    const QModelIndex& parent) override;

 signals:
  void filesDropped(const std::vector<quilt::Path>& files);

 private:
  struct Row {
    std::shared_ptr<quilt::platform::Object> object;
    std::shared_ptr<quilt::ImageBrowserItem> item;
    std::shared_ptr<quilt::platform::PasteboardItem> dragged;
    QString kind;  ///< of an item
    std::shared_ptr<Watch> watch;
    bool operator==(const Row& other) const { return object == other.object; }
  };

  /// Renews the rows now and whenever `owner` announces its list `key`.
  void follow(const std::shared_ptr<quilt::platform::Object>& owner, std::string_view key);
  [[nodiscard]] std::vector<Row> currentRows() const;
  void setRows(std::vector<Row> rows);
  /// Paints the object's row again when the object changes.
  std::shared_ptr<Watch> watch(const std::shared_ptr<quilt::platform::Object>& object);
  [[nodiscard]] QString titleOf(const Row& row) const;

  Posters& _posters;
  std::shared_ptr<quilt::QuiltCollection> _collection;
  std::shared_ptr<quilt::QuiltDocument> _document;
  std::vector<Row> _rows;
  quilt::platform::Observation _listObservation;
};

}  // namespace browser
