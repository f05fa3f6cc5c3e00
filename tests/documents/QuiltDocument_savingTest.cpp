// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::dateOf;
using support::debug;
using support::FaultyFiles;
using support::FaultyImages;
using support::FaultyPropertyLists;
using support::Installed;
using support::Lines;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltDocumentSavingTest : public support::DocumentFixture {
 protected:
  struct Setter {
    std::string key;
    std::function<void(QuiltDocument&)> set;
  };

  static std::vector<Setter> savingSetters() {
    return {{"title", [](auto& document) { document.setTitle("x"); }},
            {"description", [](auto& document) { document.setDescription("x"); }},
            {"author", [](auto& document) { document.setAuthor("x"); }},
            {"keywords", [](auto& document) { document.setKeywords("x"); }},
            {"category", [](auto& document) { document.setCategory("x"); }},
            {"advisoryLabel", [](auto& document) { document.setAdvisoryLabel("x"); }},
            {"jukeboxOrder", [](auto& document) { document.setJukeboxOrder(4); }},
            {"theme", [](auto& document) { document.setTheme(nullptr); }},
            {"creationDate", [](auto& document) { document.setCreationDate(dateOf("2001-01-01T00:00:00Z")); }},
            {"lastPublishURL", [](auto& document) { document.setLastPublishURL("x"); }}};
  }

  static std::vector<Setter> silentSetters() {
    return {{"type", [](auto& document) { document.setType(kQuiltDocumentTypeClassicMovie); }},
            {"uuid", [](auto& document) { document.setUuid("x"); }},
            {"uti", [](auto& document) { document.setUti("x"); }},
            {"modifiedDate", [](auto& document) { document.setModifiedDate(dateOf("2001-01-01T00:00:00Z")); }},
            {"posterImage", [](auto& document) { document.setPosterImage(picture(2, 2)); }},
            {"posterImageVersion", [](auto& document) { document.setPosterImageVersion(9); }},
            {"media", [](auto& document) { document.setMedia({}); }},
            {"collectionOwner", [](auto& document) { document.setCollectionOwner(nullptr); }}};
  }

  static bool isSaved(const QuiltDocument& document) { return std::filesystem::exists(document.propertiesPath()); }

  static Lines cannotBeWritten(const Path& file) {
    return {critical("Failed to update document at path \"" + file.native() + "\": \"Properties cannot be written\"")};
  }
};

// ---- The automatic save

TEST_F(QuiltDocumentSavingTest, EveryListedSetterSavesAtOnce) {
  for (const auto& [key, set] : savingSetters()) {
    const auto document = made("saves-" + key);
    ASSERT_FALSE(isSaved(*document));
    takeLines();
    set(*document);
    EXPECT_TRUE(isSaved(*document)) << key;
    EXPECT_EQ(takeLines(), Lines{debug("Updating document because KVO deteched a change for the " + key)}) << key;
  }
}

TEST_F(QuiltDocumentSavingTest, EveryOtherSetterSavesNothing) {
  for (const auto& [key, set] : silentSetters()) {
    const auto document = made("silent-" + key);
    takeLines();
    set(*document);
    EXPECT_FALSE(isSaved(*document)) << key;
    EXPECT_THAT(takeLines(), IsEmpty()) << key;
  }
}

TEST_F(QuiltDocumentSavingTest, ChangingTheTypeOfAnIdleDocumentWritesNothing) {
  const auto document = made();
  takeLines();
  document->setType(kQuiltDocumentTypeInteractive);
  EXPECT_FALSE(isSaved(*document));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentSavingTest, SettingTheTitleSavesWithThePresentTimeAsModifiedDate) {
  const auto document = made();
  clock().advance(std::chrono::minutes(10));
  document->setTitle("New");
  EXPECT_EQ(saved(*document).string("Title"), "New");
  EXPECT_EQ(saved(*document).date("ModifiedDate"), clock().now());
  EXPECT_EQ(document->modifiedDate(), clock().now());
}

TEST_F(QuiltDocumentSavingTest, SettingTheSameValueSavesAgain) {
  const auto document = made();
  document->setTitle("Same");
  clock().advance(std::chrono::minutes(1));
  document->setTitle("Same");
  EXPECT_EQ(saved(*document).date("ModifiedDate"), clock().now());
}

TEST_F(QuiltDocumentSavingTest, NoSetterSavesWhileTheDocumentIsProcessing) {
  for (const auto& [key, set] : savingSetters()) {
    const auto document = made("busy-" + key);
    takeLines();
    document->setIsProcessing(true);
    set(*document);
    EXPECT_FALSE(isSaved(*document)) << key;
    EXPECT_THAT(takeLines(), IsEmpty()) << key;
  }
}

TEST_F(QuiltDocumentSavingTest, ADocumentWithoutAPathCannotBeWritten) {
  const auto document = QuiltDocument::init();
  document->setTitle("Nowhere");
  EXPECT_EQ(takeLines(),
            (Lines{debug("Updating document because KVO deteched a change for the title"),
                   critical("Failed to update document at path \"(null)\": \"Properties cannot be written\"")}));
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentSavingTest, ADocumentWithoutAPathStillGetsItsFallBackTitle) {
  const auto document = QuiltDocument::init();
  EXPECT_FALSE(document->update());
  EXPECT_EQ(document->title(), "Untitled Episode");
}

TEST_F(QuiltDocumentSavingTest, EveryListChangeSavesOnce) {
  const auto document = made();
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  const auto a = QuiltMedia::init();
  const auto b = QuiltMedia::init();
  document->addMedia(a);
  EXPECT_EQ(lists->writes, 1);
  document->addMedia(b, 0);
  EXPECT_EQ(lists->writes, 2);
  document->moveMediaAtIndexes({0}, 2);
  EXPECT_EQ(lists->writes, 3);
  document->removeMedia(a);
  EXPECT_EQ(lists->writes, 4);
}

TEST_F(QuiltDocumentSavingTest, AChangeOfAnItemsSourcesSavesTheDocument) {
  const auto document = made();
  const auto item = addItem(*document);
  EXPECT_FALSE(isSaved(*document));
  const auto source = QuiltMediaSource::init();
  item->addSource(source);
  EXPECT_EQ(saved(*document).array("Media")->front().as<Dictionary>()->array("Sources")->size(), 1u);
  source->addDerivative(QuiltMediaDerivative::init());
  const Dictionary record = saved(*document);
  const auto* sources = record.array("Media")->front().as<Dictionary>()->array("Sources");
  EXPECT_EQ(sources->front().as<Dictionary>()->array("Derivatives")->size(), 1u);
}

// ---- update

TEST_F(QuiltDocumentSavingTest, SavingWithoutATitleWritesTheFallBackAndKeepsIt) {
  const auto document = made();
  takeLines();
  EXPECT_TRUE(document->update());
  EXPECT_EQ(saved(*document).string("Title"), "Untitled Episode");
  EXPECT_EQ(document->title(), "Untitled Episode");
  EXPECT_THAT(takeLines(), IsEmpty()) << "the change of the title must not save once more";
}

TEST_F(QuiltDocumentSavingTest, ASaveIsRefusedWhileTheDocumentIsProcessing) {
  const auto document = made();
  document->setTitle("Before");
  const std::string before = readFile(document->propertiesPath());
  const auto modified = document->modifiedDate();
  takeLines();
  clock().advance(std::chrono::hours(1));
  document->setIsProcessing(true);
  document->setTitle("After");
  EXPECT_FALSE(document->update());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to update document at path \"" + document->propertiesPath().native() +
                                        "\": \"Document is already being processed\"")});
  EXPECT_EQ(readFile(document->propertiesPath()), before);
  EXPECT_EQ(document->modifiedDate(), modified);
  EXPECT_TRUE(document->isProcessing());
}

TEST_F(QuiltDocumentSavingTest, AFailedWriteLeavesTheOldFileAndStampsTheDate) {
  const auto document = made();
  document->setTitle("Before");
  const std::string before = readFile(document->propertiesPath());
  clock().advance(std::chrono::hours(1));
  {
    const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
    lists->failWrite = support::named("properties.plist");
    takeLines();
    EXPECT_FALSE(document->update());
    EXPECT_EQ(takeLines(), cannotBeWritten(document->propertiesPath()));
  }
  EXPECT_EQ(readFile(document->propertiesPath()), before);
  EXPECT_EQ(document->modifiedDate(), clock().now());
  EXPECT_FALSE(document->isProcessing());
  EXPECT_TRUE(document->update());
}

TEST_F(QuiltDocumentSavingTest, AFullDiskLeavesTheOldFileAndNoTemporary) {
  const auto document = made();
  document->setTitle("Before");
  const std::string before = readFile(document->propertiesPath());
  const Installed<FaultyFiles> files(&Services::files);
  files->failWrite = support::named("properties.plist");
  takeLines();
  EXPECT_FALSE(document->update());
  EXPECT_EQ(takeLines(), cannotBeWritten(document->propertiesPath()));
  EXPECT_EQ(readFile(document->propertiesPath()), before);
  EXPECT_THAT(treeOf(document->path()), ElementsAre("properties.plist"));
}

TEST_F(QuiltDocumentSavingTest, AFolderInTheWayOfThePropertiesFileIsKept) {
  const auto document = made();
  writeFile(document->propertiesPath() / "precious", "content");
  takeLines();
  EXPECT_FALSE(document->update());
  EXPECT_EQ(takeLines(), cannotBeWritten(document->propertiesPath()));
  EXPECT_THAT(treeOf(document->path()), ElementsAre("properties.plist/", "properties.plist/precious"));
}

TEST_F(QuiltDocumentSavingTest, APackageThatWasRemovedIsNotMadeAgainByASave) {
  const auto document = made();
  std::filesystem::remove_all(document->path());
  takeLines();
  EXPECT_FALSE(document->update());
  EXPECT_EQ(takeLines(), cannotBeWritten(document->propertiesPath()));
  EXPECT_FALSE(std::filesystem::exists(document->path()));
}

TEST_F(QuiltDocumentSavingTest, SavingManyItemsWithPostersDecodesNoImage) {
  const auto document = made();
  document->setIsProcessing(true);
  constexpr int count = 50;
  for (int i = 0; i < count; ++i) {
    const auto item = addPictureItem(*document, 40, 30);
    std::filesystem::create_directories(item->path());
    std::filesystem::copy_file(pictureFile(40, 30), item->posterImagePath());
  }
  document->setIsProcessing(false);
  const Installed<FaultyImages> images(&Services::images);
  ASSERT_TRUE(document->update());
  EXPECT_EQ(images->decodes, 0);
  const Dictionary record = saved(*document);
  ASSERT_EQ(record.array("Media")->size(), static_cast<std::size_t>(count));
  EXPECT_EQ(record.array("Media")->back().as<Dictionary>()->real("PosterImageWidth"), 40);
}

// ---- Dates

TEST_F(QuiltDocumentSavingTest, DatesLessThanASecondApartCountAsNotModified) {
  const auto document = made();
  const Date created = *document->creationDate();
  document->setModifiedDate(created + std::chrono::milliseconds(999));
  EXPECT_FALSE(document->hasBeenModified());
  document->setModifiedDate(created - std::chrono::milliseconds(999));
  EXPECT_FALSE(document->hasBeenModified());
  document->setModifiedDate(created + std::chrono::milliseconds(1000));
  EXPECT_TRUE(document->hasBeenModified());
  document->setModifiedDate(created - std::chrono::milliseconds(1000));
  EXPECT_TRUE(document->hasBeenModified());
}

TEST_F(QuiltDocumentSavingTest, ResettingTheModifiedDateOfAnIdleDocumentStampsItAnew) {
  const auto document = made();
  clock().advance(std::chrono::hours(1));
  document->resetModifiedDate();
  EXPECT_EQ(document->modifiedDate(), clock().now());
  EXPECT_TRUE(document->hasBeenModified());
  EXPECT_EQ(saved(*document).date("ModifiedDate"), clock().now());
}

TEST_F(QuiltDocumentSavingTest, ResettingTheModifiedDateOfABusyDocumentOnlyResetsIt) {
  const auto document = made();
  document->setTitle("T");
  clock().advance(std::chrono::hours(1));
  document->update();
  ASSERT_TRUE(document->hasBeenModified());
  document->setIsProcessing(true);
  takeLines();
  document->resetModifiedDate();
  EXPECT_FALSE(document->hasBeenModified());
  EXPECT_THAT(takeLines(), IsEmpty());
}

}  // namespace
}  // namespace quilt
