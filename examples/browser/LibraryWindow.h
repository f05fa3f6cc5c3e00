// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <QMainWindow>
#include <memory>

#include "examples/browser/CollectionModel.h"
#include "examples/browser/ItemModel.h"
#include "examples/browser/LogLines.h"
#include "examples/browser/Operations.h"

class QAction;
class QLabel;
class QListView;

namespace browser {

class BrowserView;
class PropertyPanel;

/// A library: its collections at the left, the documents of one, or the items of an opened one, in the middle, and the
/// properties of what is selected at the right. Long operations run behind a progress dialog; one at a time.
class LibraryWindow : public QMainWindow {
  Q_OBJECT

 public:
  explicit LibraryWindow(std::shared_ptr<quilt::QuiltCollectionsController> library, QWidget* parent = nullptr);
  ~LibraryWindow() override;

  /// Loads the folder, made when missing, and the installed themes.
  void load(const quilt::Path& folder);
  void select(const std::shared_ptr<quilt::QuiltCollection>& collection);
  void open(const std::shared_ptr<quilt::QuiltDocument>& document);
  void goBack();

  void importInto(const std::shared_ptr<quilt::QuiltCollection>& collection, const std::vector<quilt::Path>& files);
  void addTo(const std::shared_ptr<quilt::QuiltDocument>& document, const std::vector<quilt::Path>& files);
  /// What was made; empty when nothing was.
  quilt::Path exportTo(const std::shared_ptr<quilt::QuiltDocument>& document, const quilt::Path& folder,
                       const std::string& format);

  [[nodiscard]] BrowserView* browser() const { return _browser; }
  [[nodiscard]] QListView* sidebar() const { return _sidebar; }
  [[nodiscard]] PropertyPanel* panel() const { return _panel; }
  [[nodiscard]] const Posters& posters() const { return _posters; }

 private:
  void makeActions();
  void makeLayout();
  void connectViews();
  void showSelection();
  void updateHeader();
  void askForFiles();
  void askForExport(const std::string& format);
  void makeCollection();
  void tell(const QString& title, const Problems& problems);
  /// In a later turn of the loop, because a drop must be answered first.
  void later(const std::function<void()>& call);

  const std::shared_ptr<quilt::QuiltCollectionsController> _library;
  Posters _posters;
  CollectionModel _collections;
  ItemModel _items;
  QListView* _sidebar = nullptr;
  BrowserView* _browser = nullptr;
  PropertyPanel* _panel = nullptr;
  QLabel* _title = nullptr;
  QLabel* _subtitle = nullptr;
  QAction* _back = nullptr;
  QAction* _add = nullptr;
  QAction* _export = nullptr;
  std::shared_ptr<quilt::QuiltCollection> _collection;
  CriticalLines _criticalLines;  // last: stops to tell first
};

}  // namespace browser
