// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QAbstractListModel>
#include <memory>
#include <vector>

#include "examples/browser/Watch.h"
#include "quilt/collections/QuiltCollectionsController.h"

namespace browser {

/// The library's collections, by title and number of documents. Takes drops of documents and files.
class CollectionModel : public QAbstractListModel {
  Q_OBJECT

 public:
  enum Role { CountRole = Qt::UserRole };

  explicit CollectionModel(std::shared_ptr<quilt::QuiltCollectionsController> library, QObject* parent = nullptr);

  [[nodiscard]] std::shared_ptr<quilt::QuiltCollection> collectionAt(const QModelIndex& index) const;
  [[nodiscard]] QModelIndex indexOf(const std::shared_ptr<quilt::QuiltCollection>& collection) const;

  [[nodiscard]] int rowCount(const QModelIndex& parent = {}) const override;
  [[nodiscard]] QVariant data(const QModelIndex& index, int role) const override;
  bool setData(const QModelIndex& index, const QVariant& value, int role) override;
  [[nodiscard]] Qt::ItemFlags flags(const QModelIndex& index) const override;
  [[nodiscard]] QStringList mimeTypes() const override;
  [[nodiscard]] Qt::DropActions supportedDropActions() const override { return Qt::MoveAction | Qt::CopyAction; }
  [[nodiscard]] bool canDropMimeData(const QMimeData* data, Qt::DropAction action, int row, int column,
                                     const QModelIndex& parent) const override;
  bool dropMimeData(const QMimeData* data, Qt::DropAction action, int row, int column,
                    const QModelIndex& parent) override;

 signals:
  void documentsDropped(const std::vector<std::string>& uuids, const std::shared_ptr<quilt::QuiltCollection>& onto);
  void filesDropped(const std::vector<quilt::Path>& files, const std::shared_ptr<quilt::QuiltCollection>& onto);

 private:
  struct Row {
    std::shared_ptr<quilt::QuiltCollection> collection;
    std::size_t count = 0;
    std::shared_ptr<Watch> title;
    std::shared_ptr<quilt::platform::Observation> documents;
  };

  void readRows();
  void renew(const quilt::QuiltCollection* collection);

  const std::shared_ptr<quilt::QuiltCollectionsController> _library;
  std::vector<Row> _rows;
  quilt::platform::Observation _listObservation;
};

}  // namespace browser
