// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::FaultyFiles;
using support::FaultyPropertyLists;
using support::Installed;
using support::Lines;
using support::Progress;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltDocumentFlattenTest : public support::DocumentFixture {
 protected:
  static support::Line failed(const QuiltDocument& document) {
    return critical("Failed to flatten document at path \"" + document.path().native() + "\"");
  }

  static std::shared_ptr<QuiltMedia> addItemOffering(QuiltDocument& document, std::vector<std::string> formats) {
    const auto item = addWebItem(document);
    item->sourceAtIndex(0)->derivativeAtIndex(0)->setCompatibilityTags(std::move(formats));
    return item;
  }
};

// ---- isFlattened, availableFormats

TEST_F(QuiltDocumentFlattenTest, AnEmptyDocumentIsNotFlattenedAndOffersNoFormat) {
  const auto document = made();
  EXPECT_FALSE(document->isFlattened());
  EXPECT_THAT(document->availableFormats(), IsEmpty());
}

TEST_F(QuiltDocumentFlattenTest, ADocumentIsFlattenedWhenEveryItemIs) {
  const auto document = made();
  addFlattenedItem(*document);
  EXPECT_TRUE(document->isFlattened());
  addFlattenedItem(*document);
  EXPECT_TRUE(document->isFlattened());
  addItem(*document);
  EXPECT_FALSE(document->isFlattened());
}

TEST_F(QuiltDocumentFlattenTest, TheFormatsAreThoseOfEveryItemInTheFirstItemsOrder) {
  const auto document = made();
  addItemOffering(*document, {"480p", "Desktop", "720p"});
  EXPECT_THAT(document->availableFormats(), ElementsAre("480p", "Desktop", "720p"));
  addItemOffering(*document, {"Desktop", "720p", "480p"});
  addItemOffering(*document, {"Desktop", "480p"});
  EXPECT_THAT(document->availableFormats(), ElementsAre("480p", "Desktop"));
  addItem(*document);
  EXPECT_THAT(document->availableFormats(), IsEmpty());
}

// ---- Flatten

TEST_F(QuiltDocumentFlattenTest, FlatteningCopiesOutsideFilesIntoThePackage) {
  const auto document = made();
  const auto item = addPictureItem(*document, 64, 48);
  const auto derivative = item->sourceAtIndex(0)->mainDerivative();
  const Path outside = derivative->url()->relativePath();
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  const Path inside = item->sourceAtIndex(0)->derivativesFolderPath() / (derivative->uuid() + ".png");
  EXPECT_EQ(derivative->url()->relativePath(), inside);
  EXPECT_TRUE(derivative->isFlattened());
  EXPECT_EQ(readFile(inside), readFile(outside));
  const Dictionary record = saved(*document);
  const Dictionary& source =
      *record.array("Media")->front().as<Dictionary>()->array("Sources")->front().as<Dictionary>();
  EXPECT_EQ(source.array("Derivatives")->front().as<Dictionary>()->string("Filename"), derivative->uuid() + ".png");
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentFlattenTest, AFlattenedDocumentReopensWithItsOwnCopies) {
  const auto document = made();
  addPictureItem(*document, 64, 48);
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  std::filesystem::remove(folder() / "64x48.png");
  const auto again = reopened(*document);
  const auto derivative = again->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative();
  ASSERT_NE(derivative, nullptr);
  EXPECT_TRUE(std::filesystem::exists(derivative->url()->relativePath()));
  again->removeAllBrokenMedia();
  EXPECT_EQ(again->mediaCount(), 1u);
}

TEST_F(QuiltDocumentFlattenTest, TheMediaFolderIsMadeAlsoForAnEmptyDocument) {
  const auto document = made();
  Progress progress;
  EXPECT_TRUE(document->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(namesIn(document->path()), ElementsAre("media", "properties.plist"));
}

TEST_F(QuiltDocumentFlattenTest, ItemsThatAreFlattenedOnlyReportTheirStart) {
  const auto document = made();
  for (int i = 0; i < 3; ++i) addFlattenedItem(*document);
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  takeLines();
  Progress progress;
  EXPECT_TRUE(document->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 33, 66, 100));
  EXPECT_EQ(lists->writes, 1) << "the properties file is written all the same";
  EXPECT_THAT(takeLines(), IsEmpty()) << "no item was flattened once more";
}

TEST_F(QuiltDocumentFlattenTest, ItemsReportIntoTheirShare) {
  const auto document = made();
  addItem(*document);
  addFlattenedItem(*document);
  addItem(*document);
  Progress progress;
  EXPECT_TRUE(document->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 100.0 / 3, 33, 66, 66, 66 + 100.0 / 3, 100));
}

TEST_F(QuiltDocumentFlattenTest, FlatteningDoesNotStampTheModifiedDate) {
  const auto document = made();
  const auto modified = document->modifiedDate();
  clock().advance(std::chrono::hours(1));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  EXPECT_EQ(document->modifiedDate(), modified);
}

TEST_F(QuiltDocumentFlattenTest, TheFirstAndTheLastAnswerHaveNoEffect) {
  Progress progress;
  progress.cancelFrom = 0;
  EXPECT_TRUE(made()->flattenWithProgressionBlock(progress.block()));
}

TEST_F(QuiltDocumentFlattenTest, ABusyDocumentIsRefusedWithoutACall) {
  const auto document = made();
  takeLines();
  document->setIsProcessing(true);
  Progress progress;
  EXPECT_FALSE(document->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to flattening document at path \"" + document->path().native() +
                                        "\": \"Document is already being processed\"")});
  EXPECT_TRUE(document->isProcessing());
}

TEST_F(QuiltDocumentFlattenTest, AMediaFolderThatCannotBeMadeFails) {
  const auto document = made();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("media");
  takeLines();
  EXPECT_FALSE(document->flattenWithProgressionBlock({}));
  EXPECT_EQ(takeLines(), (Lines{debug("Failed to create intermediate directories for document at path \"" +
                                      document->mediaFolderPath().native() + "\": \"The disk is full.\""),
                                failed(*document)}));
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentFlattenTest, AFalseAnswerBeforeAnItemCancels) {
  const auto document = made();
  for (int i = 0; i < 2; ++i) addFlattenedItem(*document);
  takeLines();
  Progress progress;
  progress.cancelFrom = 2;
  EXPECT_FALSE(document->flattenWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 50));
  EXPECT_EQ(takeLines(),
            Lines{critical("Flattening document at path \"" + document->path().native() + "\" has been cancelled")});
  EXPECT_FALSE(document->isProcessing());
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

TEST_F(QuiltDocumentFlattenTest, AnItemThatFailsStopsTheRun) {
  const auto document = made();
  const auto first = addPictureItem(*document, 64, 48);
  const auto second = addPictureItem(*document, 32, 24);
  const auto third = addPictureItem(*document, 16, 12);
  std::filesystem::remove(folder() / "32x24.png");
  takeLines();
  EXPECT_FALSE(document->flattenWithProgressionBlock({}));
  EXPECT_EQ(takeLines().back(), failed(*document));
  EXPECT_TRUE(first->sourceAtIndex(0)->mainDerivative()->isFlattened()) << "what was done stays";
  EXPECT_FALSE(second->sourceAtIndex(0)->mainDerivative()->isFlattened());
  EXPECT_FALSE(third->sourceAtIndex(0)->mainDerivative()->isFlattened());
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
  EXPECT_THAT(namesIn(second->sourceAtIndex(0)->derivativesFolderPath()), IsEmpty());
}

TEST_F(QuiltDocumentFlattenTest, AFlattenThatFailedGoesOnWhereItStopped) {
  const auto document = made();
  const auto first = addPictureItem(*document, 64, 48);
  const auto second = addPictureItem(*document, 32, 24);
  {
    const Installed<FaultyFiles> files(&Services::files);
    files->failCopy = support::named("32x24.png");
    EXPECT_FALSE(document->flattenWithProgressionBlock({}));
  }
  std::filesystem::remove(folder() / "64x48.png");  // the first needs it no more
  EXPECT_TRUE(document->flattenWithProgressionBlock({}));
  EXPECT_TRUE(second->sourceAtIndex(0)->mainDerivative()->isFlattened());
}

TEST_F(QuiltDocumentFlattenTest, PropertiesThatCannotBeWrittenFail) {
  const auto document = made();
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  lists->failWrite = support::anyPath();
  takeLines();
  Progress progress;
  EXPECT_FALSE(document->flattenWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Failed to update document at path \"" + document->propertiesPath().native() +
                                      "\": \"Properties cannot be written\""),
                                failed(*document)}));
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_FALSE(document->isProcessing());
}

// ---- Convert

TEST_F(QuiltDocumentFlattenTest, ConvertingReportsStartsInSinglePrecision) {
  const auto document = made();
  for (int i = 0; i < 3; ++i) addWebItem(*document);
  Progress progress;
  EXPECT_TRUE(document->convertToFormat("720p", progress.block()));
  // Each item reports 0 and, having no commentary, 50.
  EXPECT_THAT(progress.values, ElementsAre(0, 50.0 / 3,                                      //
                                           33.33333206176758, 33.33333206176758 + 50.0 / 3,  //
                                           66.66666412353516, 66.66666412353516 + 50.0 / 3));
}

TEST_F(QuiltDocumentFlattenTest, ConvertingNeitherSavesNorBecomesBusy) {
  const auto document = made();
  addWebItem(*document);
  bool wasBusy = false;
  EXPECT_TRUE(document->convertToFormat("Desktop", [&](double) {
    wasBusy = wasBusy || document->isProcessing();
    return true;
  }));
  EXPECT_FALSE(wasBusy);
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

TEST_F(QuiltDocumentFlattenTest, ConvertingStopsAtTheFirstItemThatFails) {
  const auto document = made();
  addWebItem(*document);
  const auto broken = addItem(*document);
  document->setIsProcessing(true);
  broken->addSource(QuiltMediaSource::init());  // nothing to convert
  document->setIsProcessing(false);
  addWebItem(*document);
  Progress progress;
  EXPECT_FALSE(document->convertToFormat("Desktop", progress.block()));
  EXPECT_EQ(progress.values.back(), 33.33333206176758);
}

TEST_F(QuiltDocumentFlattenTest, AFalseAnswerAtTheEndOfASourceStopsTheConversion) {
  const auto document = made();
  addWebItem(*document);
  addWebItem(*document);
  Progress progress;
  progress.cancelFrom = 1;
  EXPECT_FALSE(document->convertToFormat("Desktop", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 25));
}

TEST_F(QuiltDocumentFlattenTest, ConvertingAnEmptyDocumentSucceedsSilently) {
  Progress progress;
  EXPECT_TRUE(made()->convertToFormat("Desktop", progress.block()));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltDocumentFlattenTest, APictureIsConvertedIntoTheSmallerFormats) {
  const auto document = made();
  const auto item = addPictureItem(*document, 1600, 1200);
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  EXPECT_THAT(document->availableFormats(), ElementsAre("Desktop"));
  EXPECT_TRUE(document->convertToFormat("720p", {}));
  EXPECT_TRUE(document->convertToFormat("480p", {}));
  EXPECT_THAT(document->availableFormats(), ElementsAre("Desktop", "720p", "480p"));
  const auto small = item->sourceAtIndex(0)->derivativeWithFormat("480p");
  const auto image = ImageWrapper::imageWithURL(*small->url());
  ASSERT_NE(image, nullptr);
  EXPECT_EQ(image->size(), (platform::Size{640, 480}));
  EXPECT_TRUE(small->isFlattened());
}

}  // namespace
}  // namespace quilt
