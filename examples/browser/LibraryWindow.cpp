// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/LibraryWindow.h"

#include <QAction>
#include <QFileDialog>
#include <QLabel>
#include <QListView>
#include <QMenu>
#include <QMessageBox>
#include <QPainter>
#include <QSplitter>
#include <QStatusBar>
#include <QStyledItemDelegate>
#include <QTimer>
#include <QToolBar>
#include <QToolButton>
#include <QVBoxLayout>

#include "examples/browser/BrowserView.h"
#include "examples/browser/ProgressDialog.h"
#include "examples/browser/PropertyPanel.h"
#include "examples/browser/Text.h"
#include "quilt/collections/LibraryLock.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/themes/QuiltThemesController.h"

namespace browser {

using quilt::ProgressionBlock;
using quilt::QuiltCollection;
using quilt::QuiltDocument;

namespace {

/// A collection's title, and its number of documents at the right.
class SidebarDelegate : public QStyledItemDelegate {
 public:
  using QStyledItemDelegate::QStyledItemDelegate;

  [[nodiscard]] QSize sizeHint(const QStyleOptionViewItem& option, const QModelIndex&) const override {
    return {160, option.fontMetrics.height() + 14};
  }
  void paint(QPainter* painter, const QStyleOptionViewItem& option, const QModelIndex& index) const override {
    QStyleOptionViewItem cell = option;
    initStyleOption(&cell, index);
    const QString count = index.data(CollectionModel::CountRole).toString();
    const int width = cell.fontMetrics.horizontalAdvance(count);
    cell.text = "  " + cell.fontMetrics.elidedText(cell.text, Qt::ElideRight, cell.rect.width() - width - 34);
    cell.state &= ~QStyle::State_HasFocus;
    const QWidget* const widget = option.widget;
    widget->style()->drawControl(QStyle::CE_ItemViewItem, &cell, painter, widget);
    const bool isSelected = option.state.testFlag(QStyle::State_Selected);
    painter->setPen(option.palette.color(isSelected ? QPalette::HighlightedText : QPalette::PlaceholderText));
    painter->drawText(option.rect.adjusted(0, 0, -12, 0), Qt::AlignRight | Qt::AlignVCenter, count);
  }
};

QLabel* label(qreal scale, bool isFaint, QWidget* parent) {
  auto* const made = new QLabel(parent);
  QFont font = made->font();
  font.setPointSizeF(font.pointSizeF() * scale);
  font.setBold(!isFaint);
  made->setFont(font);
  if (isFaint) made->setForegroundRole(QPalette::PlaceholderText);
  made->setTextFormat(Qt::PlainText);  // a title is no markup
  return made;
}

}  // namespace

LibraryWindow::LibraryWindow(std::shared_ptr<quilt::QuiltCollectionsController> library, QWidget* parent)
    : QMainWindow(parent),
      _library(std::move(library)),
      _collections(_library),
      _items(_posters),
      // A document that cannot save itself after a change has nobody to answer to but the log.
      _criticalLines([this](const std::string& line) {
        QMetaObject::invokeMethod(this, [this, line] { statusBar()->showMessage(toQt(line), 10000); });
      }) {
  setWindowTitle(tr("Quilt Browser"));
  makeActions();
  makeLayout();
  connectViews();
  updateHeader();
}

LibraryWindow::~LibraryWindow() {
  _posters.close();
  delete takeCentralWidget();  // the views go before the models that they show
}

void LibraryWindow::makeActions() {
  auto* const bar = addToolBar(tr("Library"));
  bar->setMovable(false);
  bar->setToolButtonStyle(Qt::ToolButtonTextBesideIcon);
  bar->setIconSize({18, 18});
  bar->setStyleSheet("QToolBar { padding: 4px 8px; spacing: 6px; }");
  _back = bar->addAction(style()->standardIcon(QStyle::SP_ArrowBack), tr("Back"), this, &LibraryWindow::goBack);
  _back->setShortcut(QKeySequence::Back);
  bar->addSeparator();
  bar->addAction(style()->standardIcon(QStyle::SP_FileDialogNewFolder), tr("New Collection"), this,
                 &LibraryWindow::makeCollection);
  _add = bar->addAction(style()->standardIcon(QStyle::SP_DialogOpenButton), tr("Add Files…"), this,
                        &LibraryWindow::askForFiles);
  auto* const formats = new QMenu(this);
  formats->addAction(tr("In Full Quality…"), this,
                     [this] { askForExport(quilt::kQuiltMediaDerivativeCompatibilityTagDesktop); });
  formats->addAction(tr("For Tablets (720p)…"), this,
                     [this] { askForExport(quilt::kQuiltMediaDerivativeCompatibilityTag720p); });
  formats->addAction(tr("For Phones (480p)…"), this,
                     [this] { askForExport(quilt::kQuiltMediaDerivativeCompatibilityTag480p); });
  _export = bar->addAction(style()->standardIcon(QStyle::SP_DialogSaveButton), tr("Export"));
  _export->setMenu(formats);
  qobject_cast<QToolButton*>(bar->widgetForAction(_export))->setPopupMode(QToolButton::InstantPopup);
}

void LibraryWindow::makeLayout() {
  auto* const splitter = new QSplitter(this);
  splitter->setHandleWidth(1);
  splitter->setChildrenCollapsible(false);

  auto* const left = new QWidget(splitter);
  left->setAutoFillBackground(true);
  left->setBackgroundRole(QPalette::Base);
  left->setMinimumWidth(180);
  auto* const leftColumn = new QVBoxLayout(left);
  leftColumn->setContentsMargins(0, 0, 0, 0);
  leftColumn->setSpacing(8);
  auto* const heading = label(0.9, true, left);
  heading->setText(tr("Collections"));
  heading->setContentsMargins(12, 20, 12, 0);
  _sidebar = new QListView(left);
  leftColumn->addWidget(heading);
  leftColumn->addWidget(_sidebar, 1);
  _sidebar->setModel(&_collections);
  _sidebar->setItemDelegate(new SidebarDelegate(_sidebar));
  _sidebar->setFrameShape(QFrame::NoFrame);
  _sidebar->setAcceptDrops(true);
  _sidebar->setDropIndicatorShown(true);
  _sidebar->setDragDropOverwriteMode(true);  // a drop goes onto a collection, not between two
  _sidebar->setEditTriggers(QAbstractItemView::EditKeyPressed);

  auto* const middle = new QWidget(splitter);
  middle->setAutoFillBackground(true);
  middle->setBackgroundRole(QPalette::Base);
  auto* const column = new QVBoxLayout(middle);
  column->setContentsMargins(0, 0, 0, 0);
  column->setSpacing(2);
  _title = label(1.35, false, middle);
  _subtitle = label(1, true, middle);
  _title->setContentsMargins(17, 16, 17, 0);
  _subtitle->setContentsMargins(17, 0, 17, 4);
  _browser = new BrowserView(middle);
  _browser->setModel(&_items);
  column->addWidget(_title);
  column->addWidget(_subtitle);
  column->addWidget(_browser, 1);

  _panel = new PropertyPanel(splitter);
  _panel->setMinimumWidth(240);
  splitter->setStretchFactor(1, 1);
  splitter->setSizes({200, 700, 260});
  setCentralWidget(splitter);
  (void)statusBar();
}

void LibraryWindow::connectViews() {
  connect(_sidebar->selectionModel(), &QItemSelectionModel::currentChanged, this,
          [this](const QModelIndex& index) { select(_collections.collectionAt(index)); });
  connect(&_collections, &QAbstractItemModel::rowsInserted, this, [this] {
    if (!_collection) _sidebar->setCurrentIndex(_collections.index(0));
  });
  connect(_browser->selectionModel(), &QItemSelectionModel::selectionChanged, this, [this] { showSelection(); });
  connect(_browser, &QAbstractItemView::doubleClicked, this, [this](const QModelIndex& index) {
    if (const auto document = _items.documentAt(index)) open(document);
  });
  for (const auto changed : {&QAbstractItemModel::rowsInserted, &QAbstractItemModel::rowsRemoved})
    connect(&_items, changed, this, [this] { updateHeader(); });
  connect(&_items, &QAbstractItemModel::modelReset, this, [this] { updateHeader(); });
  connect(&_items, &QAbstractItemModel::dataChanged, this, [this] { updateHeader(); });

  connect(&_collections, &CollectionModel::documentsDropped, this, [this](const auto& uuids, const auto& onto) {
    later([=, this] { tell(tr("Not everything was moved"), moveDocuments(*_library, uuids, onto)); });
  });
  connect(&_collections, &CollectionModel::filesDropped, this,
          [this](const auto& files, const auto& onto) { later([=, this] { importInto(onto, files); }); });
  connect(&_items, &ItemModel::filesDropped, this, [this](const auto& files) {
    later([=, this] {
      if (_items.document()) {
        addTo(_items.document(), files);
      } else {
        importInto(_collection, files);
      }
    });
  });
}

// ---- Navigation

void LibraryWindow::load(const quilt::Path& folder) {
  bool isLoaded = false;
  std::string inUse;
  const LogLines log;
  const bool wentOn = runWithProgress(this, tr("Opening the library…"), [&](const ProgressionBlock& block) {
    (void)quilt::platform::services().files->createDirectoryAtPath(folder / "Collections");
    (void)quilt::QuiltThemesController::defaultController()->loadWithProgressionBlock({});
    // Loading cleans up: nobody else may be at work in the library. Who is so now is waited for a little.
    const auto lock = quilt::LibraryLock::ofLibrary(
        folder, {std::chrono::seconds(10), [&block](const auto&) { return quilt::platform::report(block, 0); }});
    if (!lock) return inUse = lock.error().text, void();
    isLoaded =
        _library->loadLibraryPath(folder, [&block](const auto&, double percentage) { return block(percentage); });
  });
  if (!isLoaded && wentOn)
    tell(tr("The library was not opened"),
         {{tr("“%1” cannot be opened: %2").arg(toQt(folder), toQt(inUse.empty() ? log.cause() : inUse)),
           tr("Check that the folder is there and that you may read it, or start with another one.")}});
  if (isLoaded && _library->collectionsCount() == 0) makeCollection();
}

void LibraryWindow::select(const std::shared_ptr<QuiltCollection>& collection) {
  _collection = collection;
  _sidebar->setCurrentIndex(_collections.indexOf(collection));
  if (collection) {
    _items.show(collection);
  } else {
    _items.showNothing();
  }
  showSelection();
}

void LibraryWindow::open(const std::shared_ptr<QuiltDocument>& document) {
  _items.show(document);
  showSelection();
}

void LibraryWindow::goBack() {
  const auto document = _items.document();
  if (!document) return;
  select(_collection);
  _browser->setCurrentIndex(_items.indexOf(document->uuid()));
}

void LibraryWindow::showSelection() {
  const QModelIndexList selected = _browser->selectionModel()->selectedIndexes();
  const QModelIndex only = selected.size() == 1 ? selected.front() : QModelIndex();
  if (const auto document = _items.documentAt(only)) {
    _panel->show(document);
  } else if (const auto item = _items.mediaAt(only)) {
    _panel->show(item);
  } else if (_items.document()) {
    _panel->show(_items.document());
  } else if (_collection) {
    _panel->show(_collection);
  } else {
    _panel->showNothing();
  }
  updateHeader();
}

void LibraryWindow::updateHeader() {
  const auto document = _items.document();
  const int count = _items.rowCount();
  if (document) {
    const QString title = toQt(document->imageTitle());
    _title->setText(title);
    _subtitle->setText(count == 1 ? tr("1 item") : tr("%1 items").arg(count));
    _browser->setEmptyText(tr("Drop movies, pictures or documents here"), tr("Each becomes an item of this document."));
  } else {
    const QString title = _collection ? toQt(_collection->title()) : QString();
    _title->setText(title.isEmpty() ? tr("Untitled Collection") : title);
    _subtitle->setText(count == 1 ? tr("1 document") : tr("%1 documents").arg(count));
    _browser->setEmptyText(tr("Drop movies, pictures or documents here"),
                           tr("Or use “Add Files…”. Quilt keeps a copy of its own."));
  }
  const bool isOneSelected = _browser->selectionModel()->selectedIndexes().size() == 1;
  _back->setEnabled(document != nullptr);
  _add->setEnabled(_collection != nullptr);
  _export->setEnabled(document || isOneSelected);
}

// ---- Operations

void LibraryWindow::later(const std::function<void()>& call) { QTimer::singleShot(0, this, call); }

void LibraryWindow::makeCollection() {
  const auto made = _library->newCollection();
  if (!made) {
    tell(tr("No collection was made"),
         {{tr("There is no folder for it in “%1”.").arg(toQt(_library->libraryPath())),
           tr("Check that the disk is not full and that you may write to the library folder.")}});
    return;
  }
  made->setTitle(tr("New Collection").toStdString());
  select(made);
}

void LibraryWindow::askForFiles() {
  std::vector<quilt::Path> files;
  for (const QString& name : QFileDialog::getOpenFileNames(this, tr("Add Files"))) files.push_back(toPath(name));
  if (files.empty()) return;
  if (_items.document()) {
    addTo(_items.document(), files);
  } else {
    importInto(_collection, files);
  }
}

void LibraryWindow::askForExport(const std::string& format) {
  const QModelIndexList selected = _browser->selectionModel()->selectedIndexes();
  const auto document = _items.document() ? _items.document() : _items.documentAt(selected.value(0));
  if (!document) return;
  const QString folder = QFileDialog::getExistingDirectory(this, tr("Export to"));
  if (!folder.isEmpty()) (void)exportTo(document, toPath(folder), format);
}

void LibraryWindow::importInto(const std::shared_ptr<QuiltCollection>& collection,
                               const std::vector<quilt::Path>& files) {
  Problems problems;
  const QString what = files.size() == 1 ? toQt(files.front().filename()) : tr("%1 files").arg(files.size());
  const bool wentOn = runWithProgress(this, tr("Importing %1…").arg(what), [&](const ProgressionBlock& block) {
    problems = importFiles(collection, files, block);
  });
  statusBar()->showMessage(wentOn ? QString() : tr("The import was stopped."), 5000);
  tell(tr("Not everything was imported"), problems);
}

void LibraryWindow::addTo(const std::shared_ptr<QuiltDocument>& document, const std::vector<quilt::Path>& files) {
  Problems problems;
  const bool wentOn = runWithProgress(
      this, tr("Adding files…"), [&](const ProgressionBlock& block) { problems = addFiles(document, files, block); });
  statusBar()->showMessage(wentOn ? QString() : tr("Stopped; the rest was not added."), 5000);
  tell(tr("Not everything was added"), problems);
}

quilt::Path LibraryWindow::exportTo(const std::shared_ptr<QuiltDocument>& document, const quilt::Path& folder,
                                    const std::string& format) {
  _panel->setWhatWasTyped();  // while the document is exported it does not save itself
  Exported exported;
  const bool wentOn = runWithProgress(
      this, tr("Exporting “%1”…").arg(toQt(document->imageTitle())),
      [&](const ProgressionBlock& block) { exported = exportDocument(document, folder, format, block); });
  if (!exported.path.empty()) {
    statusBar()->showMessage(tr("Exported to “%1”").arg(toQt(exported.path)), 10000);
  } else if (!wentOn) {
    statusBar()->showMessage(tr("The export was stopped; nothing was left behind."), 5000);
  }
  tell(tr("Nothing was exported"), exported.problems);
  return exported.path;
}

void LibraryWindow::tell(const QString& title, const Problems& problems) {
  if (problems.empty()) return;
  constexpr std::size_t kShown = 5;
  QStringList lines;
  for (std::size_t i = 0; i < std::min(kShown, problems.size()); ++i)
    lines += problems[i].what + "\n" + problems[i].advice;
  if (problems.size() > kShown) lines += tr("… and %1 more.").arg(problems.size() - kShown);
  // Not exec(): whoever reads a message need not stop the window's own work.
  auto* const box = new QMessageBox(QMessageBox::Warning, tr("Quilt Browser"), title, QMessageBox::Ok, this);
  box->setTextFormat(Qt::PlainText);
  box->setInformativeText(lines.join("\n\n"));
  box->setStyleSheet(
      "QLabel#qt_msgbox_label { font-weight: bold; } QLabel#qt_msgbox_informativelabel { min-width: 380px; }");
  box->setAttribute(Qt::WA_DeleteOnClose);
  box->open();
}

}  // namespace browser
