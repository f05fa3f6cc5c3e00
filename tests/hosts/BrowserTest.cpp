// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <QApplication>
#include <QDropEvent>
#include <QLabel>
#include <QLineEdit>
#include <QMessageBox>
#include <QMimeData>
#include <QPainter>
#include <QProgressDialog>
#include <QPushButton>
#include <QTest>
#include <QTimer>
#include <QUrl>
#include <atomic>
#include <filesystem>
#include <random>
#include <thread>

#include "examples/browser/BrowserView.h"
#include "examples/browser/DragData.h"
#include "examples/browser/LibraryWindow.h"
#include "examples/browser/PropertyPanel.h"
#include "examples/browser/Text.h"
#include "quilt/hosts/QtMainLoop.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ModelFixture.h"

namespace browser {
namespace {

namespace fs = std::filesystem;
using quilt::Path;
using quilt::QuiltCollection;
using quilt::QuiltDocument;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr int kPatience = 20000;  // milliseconds; what is waited for takes a fraction of it

/// A picture with some variety, for a poster or an item: hills under an evening sky.
QImage landscape(unsigned seed, int width, int height) {
  std::mt19937 random(seed);
  const auto pick = [&random](int from, int to) {
    return static_cast<int>(random() % static_cast<unsigned>(to - from)) + from;
  };
  QImage image(width, height, QImage::Format_RGB32);
  QPainter painter(&image);
  painter.setRenderHint(QPainter::Antialiasing);
  const int hue = pick(0, 360);
  QLinearGradient sky(0, 0, 0, height);
  sky.setColorAt(0, QColor::fromHsv(hue, 130, 160));
  sky.setColorAt(0.7, QColor::fromHsv((hue + 40) % 360, 70, 245));
  painter.fillRect(image.rect(), sky);
  painter.setPen(Qt::NoPen);
  painter.setBrush(QColor(255, 250, 230, 210));
  painter.drawEllipse(QPointF(pick(width / 5, width * 4 / 5), pick(height / 6, height / 2)), height / 11.0,
                      height / 11.0);
  for (int layer = 0; layer < 4; ++layer) {
    QPolygonF hill{QPointF(0, height)};
    const double ground = height * (0.5 + 0.13 * layer);
    const double length = pick(60, 140) * width / 320.0;
    const double phase = pick(0, 628) / 100.0;
    for (int x = 0; x <= width; x += 4)
      hill << QPointF(
          x, ground + height * 0.07 * std::sin(x / length * 3 + phase) + height * 0.025 * std::sin(x / length * 9));
    hill << QPointF(width, height);
    painter.setBrush(QColor::fromHsv((hue + 300) % 360, 90 + 25 * layer, 190 - 40 * layer));
    painter.drawPolygon(hill);
  }
  return image;
}

constexpr const char* kPlaces[] = {"Harbour", "Old Town", "Alps",  "Orchard", "Lighthouse", "Market",  "Workshop",
                                   "Garden",  "Museum",   "River", "Moor",    "Station",    "Library", "Glacier"};
constexpr const char* kKinds[] = {"A Walk through the %1", "The %1 at Dawn", "%1 in Winter", "Notes from the %1",
                                  "%1: an Interview"};

/// A window on a library of 500 documents in three collections. Driven through events, as a user would.
class BrowserTest : public quilt::support::ModelFixture {
 protected:
  BrowserTest() : mainLoop(std::make_unique<quilt::hosts::QtMainLoop>()) {}

  ~BrowserTest() override {
    window.reset();
    for (std::thread& worker : workers) worker.join();
  }

  /// Writes a library without the model: `counts` documents in a collection each.
  void writeLibrary(const std::vector<std::pair<std::string, int>>& collections) {
    const Path posters = folder() / "posters";
    fs::create_directories(posters);
    for (unsigned i = 0; i < kPosters; ++i)
      landscape(i * 7 + 3, 480, 360).save(toQt(posters / (std::to_string(i) + ".png")));
    int number = 0;
    for (const auto& [title, count] : collections) {
      const std::string uuid = quilt::platform::generateUUID();
      const Path place = library() / "Collections" / uuid;
      writeRecord(place / "collection.plist",
                  {{"UUID", uuid}, {"Title", title}, {"CreationDate", day(0)}, {"ModifiedDate", day(0)}});
      for (int i = 0; i < count; ++i) writeDocument(place, number++);
    }
  }

  void writeDocument(const Path& collection, int number) const {
    const std::string uuid = quilt::platform::generateUUID();
    const Path package = collection / (uuid + ".qpk");
    const auto index = static_cast<std::size_t>(number);
    const QString title =
        QString(kKinds[index / std::size(kPlaces) % std::size(kKinds)]).arg(kPlaces[index % std::size(kPlaces)]);
    writeRecord(package / "properties.plist",
                {{"Version", "1.0"},
                 {"UUID", uuid},
                 {"Title", title.toStdString()},
                 {"Author", "Ann Example"},
                 {"Description", "A quarter of an hour on foot, with the sound of the place."},
                 {"Keywords", "places, walks"},
                 {"Category", "Travel"},
                 {"Type", "Interactive"},
                 {"CreationDate", day(number)},
                 {"ModifiedDate", day(number)}});
    fs::copy_file(folder() / "posters" / (std::to_string(index % kPosters) + ".png"), package / "poster.png");
  }

  [[nodiscard]] Path library() const { return folder() / "library"; }
  static quilt::Date day(int number) {
    return quilt::support::dateOf("2026-03-01T10:00:00Z") - std::chrono::hours(24 * (number % 300));
  }

  /// Opens the window on the library and waits until it has loaded.
  void openWindow() {
    controller = quilt::QuiltCollectionsController::init();
    window = std::make_unique<LibraryWindow>(controller);
    window->resize(1140, 744);
    window->show();
    window->load(library());
  }

  std::shared_ptr<QuiltCollection> collectionNamed(const std::string& title) const {
    for (const auto& collection : controller->collections())
      if (collection->title() == title) return collection;
    ADD_FAILURE() << "no collection " << title;
    return nullptr;
  }

  /// A document of pictures in the collection.
  std::shared_ptr<QuiltDocument> makeAlbum(const std::shared_ptr<QuiltCollection>& collection, int pictures) {
    std::vector<Path> files;
    for (int i = 0; i < pictures; ++i)
      files.push_back(makePicture("picture " + std::to_string(i + 1), static_cast<unsigned>(i)));
    window->importInto(collection, files);
    return collection->documentAtIndex(collection->documentsCount() - 1);
  }
  Path makePicture(const std::string& name, unsigned seed) const {
    const Path file = folder() / (name + ".jpg");
    EXPECT_TRUE(landscape(100 + seed * 13, 800, 600).save(toQt(file)));
    return file;
  }

  static std::vector<std::string> titlesOf(const QuiltDocument& document) {
    std::vector<std::string> titles;
    for (const auto& item : document.media()) titles.push_back(item->title().value_or(""));
    return titles;
  }
  [[nodiscard]] std::vector<std::string> titlesShown() const {
    std::vector<std::string> titles;
    const QAbstractItemModel& model = *window->browser()->model();
    for (int row = 0; row < model.rowCount(); ++row)
      titles.push_back(model.index(row, 0).data().toString().toStdString());
    return titles;
  }
  [[nodiscard]] int countShown(const std::shared_ptr<QuiltCollection>& collection) const {
    const QAbstractItemModel& model = *window->sidebar()->model();
    for (int row = 0; row < model.rowCount(); ++row)
      if (model.index(row, 0).data().toString() == toQt(collection->title()))
        return model.index(row, 0).data(CollectionModel::CountRole).toInt();
    return -1;
  }
  [[nodiscard]] QModelIndex cell(int row) const { return window->browser()->model()->index(row, 0); }

  /// The whole way of a drop: what the dragging side carries enters the view, moves to the point and is dropped there.
  static void drop(QAbstractItemView& view, const QMimeData& data, const QPoint& at) {
    QDragEnterEvent enter(at, Qt::CopyAction | Qt::MoveAction, &data, Qt::LeftButton, Qt::NoModifier);
    QCoreApplication::sendEvent(view.viewport(), &enter);
    QDragMoveEvent move(at, Qt::CopyAction | Qt::MoveAction, &data, Qt::LeftButton, Qt::NoModifier);
    QCoreApplication::sendEvent(view.viewport(), &move);
    ASSERT_TRUE(move.isAccepted());
    QDropEvent drop(at, Qt::CopyAction | Qt::MoveAction, &data, Qt::LeftButton, Qt::NoModifier);
    QCoreApplication::sendEvent(view.viewport(), &drop);
    EXPECT_TRUE(drop.isAccepted());
  }
  static bool waitFor(const std::function<bool()>& condition) { return QTest::qWaitFor(condition, kPatience); }
  bool waitForPosters() {
    QTest::qWait(50);
    return waitFor([this] { return !window->posters().isBusy(); }) && (QTest::qWait(50), true);
  }

  void startWorker(std::function<void()> job) { workers.emplace_back(std::move(job)); }

  void saveScreenshot(QWidget& widget, const char* name) const {
    const fs::path screenshots = QUILT_SCREENSHOT_FOLDER;
    fs::create_directories(screenshots);
    QTest::qWait(100);
    EXPECT_TRUE(widget.grab().save(toQt(screenshots / (std::string(name) + ".png"))));
  }

  static constexpr unsigned kPosters = 24;
  std::unique_ptr<quilt::hosts::QtMainLoop> mainLoop;
  std::shared_ptr<quilt::QuiltCollectionsController> controller;
  std::unique_ptr<LibraryWindow> window;
  std::vector<std::thread> workers;
};

TEST_F(BrowserTest, ShowsALibraryOf500Documents) {
  writeLibrary({{"Travels", 320}, {"Lectures", 140}, {"Family", 40}});
  openWindow();
  EXPECT_EQ(3, window->sidebar()->model()->rowCount());
  EXPECT_EQ(320, countShown(collectionNamed("Travels")));
  EXPECT_EQ(140, countShown(collectionNamed("Lectures")));
  window->select(collectionNamed("Travels"));
  EXPECT_EQ(320, window->browser()->model()->rowCount());
  window->browser()->setCurrentIndex(cell(1));
  ASSERT_TRUE(waitForPosters());
  EXPECT_FALSE(cell(0).data(ItemModel::PosterRole).value<QPixmap>().isNull());
  saveScreenshot(*window, "library");
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(BrowserTest, AnEmptyCollectionSaysWhatToDo) {
  openWindow();
  ASSERT_EQ(1U, controller->collectionsCount());  // so that the first drop has somewhere to go
  EXPECT_EQ(0, window->browser()->model()->rowCount());
  saveScreenshot(*window, "empty");
}

TEST_F(BrowserTest, ADocumentIsDraggedToAnotherCollection) {
  writeLibrary({{"Travels", 12}, {"Lectures", 3}});
  openWindow();
  const auto from = collectionNamed("Travels");
  const auto to = collectionNamed("Lectures");
  window->select(from);
  const auto document = from->documentAtIndex(4);
  const auto* const items = qobject_cast<ItemModel*>(window->browser()->model());
  const std::unique_ptr<QMimeData> data(items->mimeData({items->indexOf(document->uuid())}));
  EXPECT_EQ(document->uuid() + "\n", data->data("org.quilt.QuiltDocument").toStdString());

  const QModelIndex target = window->sidebar()->model()->index(from == controller->collectionAtIndex(0) ? 1 : 0, 0);
  drop(*window->sidebar(), *data, window->sidebar()->visualRect(target).center());
  ASSERT_TRUE(waitFor([&] { return to->documentsCount() == 4; }));
  EXPECT_EQ(11U, from->documentsCount());
  EXPECT_EQ(11, window->browser()->model()->rowCount());
  EXPECT_EQ(4, countShown(to));
  const auto moved = to->documentWithUUID(document->uuid());
  ASSERT_TRUE(moved);
  EXPECT_EQ(document->title(), moved->title());
  EXPECT_FALSE(fs::exists(document->path()));
  EXPECT_EQ(*document->title(),
            *readRecord(to->path() / (document->uuid() + ".qpk") / "properties.plist").string("Title"));
}

TEST_F(BrowserTest, ItemsAreDraggedIntoANewOrder) {
  openWindow();
  const auto album = makeAlbum(controller->collectionAtIndex(0), 5);
  window->open(album);
  ASSERT_TRUE(waitForPosters());
  const auto* const items = qobject_cast<ItemModel*>(window->browser()->model());
  const std::unique_ptr<QMimeData> data(items->mimeData({cell(4), cell(1)}));
  EXPECT_EQ(album->mediaAtIndex(1)->uuid() + "\n" + album->mediaAtIndex(4)->uuid() + "\n",
            data->data("org.quilt.QuiltFramework.QuiltMedia").toStdString());

  drop(*window->browser(), *data, window->browser()->visualRect(cell(0)).center() - QPoint(40, 0));
  const auto order = ElementsAre("picture 2", "picture 5", "picture 1", "picture 3", "picture 4");
  EXPECT_THAT(titlesOf(*album), order);
  EXPECT_THAT(titlesShown(), order);
  const auto saved = QuiltDocument::initWithPath(album->path());
  ASSERT_TRUE(saved);
  EXPECT_THAT(titlesOf(*saved), order);
  window->browser()->setCurrentIndex(cell(1));
  ASSERT_TRUE(waitForPosters());
  saveScreenshot(*window, "items");
}

TEST_F(BrowserTest, AnItemOfAnotherDocumentIsNotTaken) {
  openWindow();
  const auto one = makeAlbum(controller->collectionAtIndex(0), 2);
  const auto other = makeAlbum(controller->collectionAtIndex(0), 1);
  const auto data = dragDataOf({other->mediaAtIndex(0)});
  window->open(one);
  EXPECT_FALSE(window->browser()->model()->canDropMimeData(data.get(), Qt::MoveAction, 0, 0, {}));
}

TEST_F(BrowserTest, AnEditedTitleIsSavedByItself) {
  writeLibrary({{"Travels", 3}});
  openWindow();
  const auto document = controller->collectionAtIndex(0)->documentAtIndex(1);
  window->select(controller->collectionAtIndex(0));
  window->browser()->setCurrentIndex(cell(1));
  auto* const title = window->panel()->findChild<QLineEdit*>("title");
  ASSERT_TRUE(title);
  EXPECT_EQ(toQt(document->title()), title->text());
  title->selectAll();
  QTest::keyClicks(title, "Across the Bay");
  ASSERT_TRUE(waitFor([&] { return document->title() == "Across the Bay"; }));
  EXPECT_EQ("Across the Bay", *readRecord(document->propertiesPath()).string("Title"));
  ASSERT_TRUE(waitFor([&] { return cell(1).data() == "Across the Bay"; }));
}

TEST_F(BrowserTest, WhatIsTypedLastIsSavedWhenTheWindowCloses) {
  writeLibrary({{"Travels", 1}});
  openWindow();
  const auto document = controller->collectionAtIndex(0)->documentAtIndex(0);
  window->browser()->setCurrentIndex(cell(0));
  QTest::keyClicks(window->panel()->findChild<QLineEdit*>("author"), " and Ben");
  window.reset();
  EXPECT_EQ("Ann Example and Ben", *readRecord(document->propertiesPath()).string("Author"));
}

TEST_F(BrowserTest, AnEditMadeElsewhereShowsAtOnce) {
  writeLibrary({{"Travels", 3}});
  openWindow();
  const auto collection = controller->collectionAtIndex(0);
  const auto document = collection->documentAtIndex(0);
  window->browser()->setCurrentIndex(cell(0));
  ASSERT_TRUE(waitForPosters());
  const auto before = cell(0).data(ItemModel::PosterRole).value<QPixmap>().cacheKey();
  const std::uint64_t version = document->imageVersion();
  std::atomic<bool> done = false;
  startWorker([&] {
    document->setTitle("Renamed elsewhere");
    document->updatePosterImage(quilt::ImageWrapper::imageWithPath(makePicture("new poster", 9)));
    collection->setTitle("Journeys");
    collection->newDocumentWithType("Interactive")->setTitle("Made elsewhere");
    done = true;
  });
  ASSERT_TRUE(waitFor([&] { return done.load(); }));
  ASSERT_TRUE(waitFor([&] { return cell(0).data() == "Renamed elsewhere"; }));
  EXPECT_EQ("Renamed elsewhere", window->panel()->findChild<QLineEdit*>("title")->text().toStdString());
  EXPECT_EQ("Journeys", window->sidebar()->model()->index(0, 0).data().toString().toStdString());
  EXPECT_EQ(4, window->browser()->model()->rowCount());
  EXPECT_GT(document->imageVersion(), version);
  ASSERT_TRUE(waitFor([&] { return cell(0).data(ItemModel::PosterRole).value<QPixmap>().cacheKey() != before; }));
}

TEST_F(BrowserTest, DroppedFilesAreImported) {
  openWindow();
  const auto collection = controller->collectionAtIndex(0);
  QMimeData data;
  const Path movie = folder() / "holiday.mp4";
  fs::copy_file(quilt::support::makeMedia({}), movie);
  data.setUrls({QUrl::fromLocalFile(toQt(movie)), QUrl::fromLocalFile(toQt(makePicture("sunset", 1))),
                QUrl::fromLocalFile(toQt(writeFile(folder() / "settings.ini", "a = b\n"))),
                QUrl::fromLocalFile(toQt(folder() / "gone.mp4"))});
  drop(*window->browser(), data, window->browser()->viewport()->rect().center());
  EXPECT_EQ(0U, collection->documentsCount());  // the drop was answered first
  QMessageBox* message = nullptr;
  ASSERT_TRUE(waitFor([&] { return (message = window->findChild<QMessageBox*>()) != nullptr; }));
  EXPECT_EQ("Not everything was imported", message->text().toStdString());
  EXPECT_THAT(message->informativeText().toStdString(),
              HasSubstr("“settings.ini” is of a kind that cannot be shown.\nUse a movie, sound, picture, PDF, EPUB or "
                        "office document."));
  EXPECT_THAT(message->informativeText().toStdString(), HasSubstr("“gone.mp4” cannot be read: "));
  saveScreenshot(*message, "message");
  message->close();

  ASSERT_EQ(2U, collection->documentsCount());
  EXPECT_EQ("Movie", collection->documentAtIndex(0)->type());
  EXPECT_EQ("holiday", collection->documentAtIndex(0)->title());
  EXPECT_TRUE(collection->documentAtIndex(0)->isFlattened());
  EXPECT_EQ("sunset", collection->documentAtIndex(1)->title());
  ASSERT_TRUE(waitForPosters());
  EXPECT_TRUE(fs::exists(collection->documentAtIndex(0)->posterImagePath()));
  EXPECT_EQ(2, window->browser()->model()->rowCount());
}

/// Presses Cancel as soon as the progress dialog shows that the work is under way.
class Canceller {
 public:
  Canceller(LibraryWindow& window, std::function<void(QProgressDialog&)> look, int fromPercent) {
    QObject::connect(&_timer, &QTimer::timeout, [this, &window, look = std::move(look), fromPercent] {
      auto* const dialog = window.findChild<QProgressDialog*>();
      if (!dialog || !dialog->isVisible() || dialog->value() < fromPercent || pressed) return;
      look(*dialog);
      pressed = true;
      QTest::mouseClick(dialog->findChild<QPushButton*>(), Qt::LeftButton);
    });
    _timer.start(10);
  }
  bool pressed = false;

 private:
  QTimer _timer;
};

TEST_F(BrowserTest, CancelStopsAnExportAndLeavesNothingBehind) {
  openWindow();
  const auto collection = controller->collectionAtIndex(0);
  const Path movie = folder() / "lecture.mp4";
  fs::copy_file(
      quilt::support::makeMedia({.duration = 40, .width = 1280, .height = 720, .options = {"-preset", "ultrafast"}}),
      movie);
  window->importInto(collection, {movie});
  const auto document = collection->documentAtIndex(0);
  ASSERT_TRUE(document);
  const auto sourcesBefore = namesIn(document->path());
  const Path destination = folder() / "exported";
  fs::create_directories(destination);
  Canceller canceller(
      *window,
      [this](QProgressDialog& dialog) {
        saveScreenshot(*window, "export");
        saveScreenshot(dialog, "progress");
      },
      17);
  EXPECT_EQ(Path(), window->exportTo(document, destination, "480p"));
  ASSERT_TRUE(canceller.pressed);
  EXPECT_THAT(namesIn(destination), IsEmpty());
  EXPECT_FALSE(document->isProcessing());
  EXPECT_EQ(nullptr, window->findChild<QMessageBox*>());  // to cancel is no failure
  EXPECT_EQ(1U, document->mediaAtIndex(0)->sourceAtIndex(0)->derivativeCount());
  // And it exports when it is let.
  EXPECT_EQ(destination / "lecture.qpk", window->exportTo(document, destination, "Desktop"));
}

TEST_F(BrowserTest, CancelStopsAnImport) {
  openWindow();
  const auto collection = controller->collectionAtIndex(0);
  std::vector<Path> files;
  const Path movie = quilt::support::makeMedia({});
  for (int i = 0; i < 400; ++i) {
    files.push_back(folder() / ("clip " + std::to_string(i) + ".mp4"));
    fs::copy_file(movie, files.back());
  }
  Canceller canceller(
      *window, [](QProgressDialog&) {}, 1);
  window->importInto(collection, files);
  ASSERT_TRUE(canceller.pressed);
  EXPECT_LT(collection->documentsCount(), files.size());
  EXPECT_EQ(collection->documentsCount(), static_cast<std::size_t>(window->browser()->model()->rowCount()));
  std::size_t packages = 0;
  for (const std::string& name : namesIn(collection->path())) packages += name.ends_with(".qpk");
  EXPECT_EQ(collection->documentsCount(), packages);
}

TEST_F(BrowserTest, AnExportThatFailsSaysWhichAndWhere) {
  openWindow();
  const auto album = makeAlbum(controller->collectionAtIndex(0), 1);
  const Path file = writeFile(folder() / "not a folder", "");
  EXPECT_EQ(Path(), window->exportTo(album, file, "Desktop"));
  auto* const message = window->findChild<QMessageBox*>();
  ASSERT_TRUE(message);
  EXPECT_EQ("Nothing was exported", message->text().toStdString());
  EXPECT_THAT(message->informativeText().toStdString(),
              HasSubstr("“picture 1” was not exported to “" + file.native() + "”"));
  message->close();
}

TEST_F(BrowserTest, ClosesWhilePostersAreMade) {
  writeLibrary({{"Travels", 100}});
  openWindow();
  QCoreApplication::processEvents();
  window.reset();
  SUCCEED();
}

}  // namespace
}  // namespace browser
