// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
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
using support::Progress;
using ::testing::AllOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

class QuiltDocumentFinalizeTest : public support::DocumentFixture {
 protected:
  std::shared_ptr<QuiltDocument> interactive() {
    auto document = made();
    document->setIsProcessing(true);
    document->setTitle("Tales");
    document->setType(kQuiltDocumentTypeInteractive);
    document->setTheme(QuiltTheme::initWithPath(themeBundle()));
    document->setIsProcessing(false);
    takeLines();
    return document;
  }

  static std::string line(const char* text, const QuiltDocument& document) {
    return std::string(text) + " document at path \"" + document.path().native() + "\"";
  }
  /// The last line of every failed run.
  static support::Line failed(const QuiltDocument& document) { return critical(line("Failed to finalize", document)); }

  /// What the template would read: the script without its frame.
  static std::string dataOf(const QuiltDocument& document) {
    const std::string script = readFile(document.dataControllerPath());
    EXPECT_THAT(script, StartsWith("var appData = "));
    EXPECT_EQ(script.back(), ';');
    EXPECT_EQ(script.find('\n'), std::string::npos);
    return script.substr(14, script.size() - 15);
  }
};

// ---- Progress

TEST_F(QuiltDocumentFinalizeTest, AnEmptyDocumentReportsItsStartAndItsEnd) {
  Progress progress;
  EXPECT_TRUE(made()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
}

TEST_F(QuiltDocumentFinalizeTest, TwoItemsReportZeroAndFiftyBeforeThem) {
  const auto document = made();
  addItem(*document);
  addItem(*document);
  Progress progress;
  EXPECT_TRUE(document->finalizeWithProgressionBlock(progress.block()));
  // start | before, begin and end of the first item | the same of the second | end
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 50, 50, 50, 100, 100));
}

TEST_F(QuiltDocumentFinalizeTest, ThreeItemsStartAtIntegerQuotients) {
  const auto document = made();
  for (int i = 0; i < 3; ++i) addItem(*document);
  Progress progress;
  EXPECT_TRUE(document->finalizeWithProgressionBlock(progress.block()));
  const double third = 100.0 / 3;
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, third, 33, 33, 33 + third, 66, 66, 66 + third, 100));
}

TEST_F(QuiltDocumentFinalizeTest, ProgressInsideAnItemIsItsShareOfTheWhole) {
  const auto document = made();
  addWebItem(*document);
  addItem(*document);
  Progress progress;
  EXPECT_TRUE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0,         // before the first item
                                           0, 0,         // it and its source begin
                                           50, 50, 50,   // the preview, the source, the item
                                           50, 50, 100,  // the second item
                                           100));
}

TEST_F(QuiltDocumentFinalizeTest, TheAnswersToTheFirstAndTheLastCallHaveNoEffect) {
  Progress progress;
  progress.cancelFrom = 0;
  EXPECT_TRUE(made()->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentFinalizeTest, AnEmptyBlockIsNotCalled) { EXPECT_TRUE(made()->finalizeWithProgressionBlock({})); }

// ---- What every document gets

TEST_F(QuiltDocumentFinalizeTest, AMovieGetsAThumbnailAndItsPropertiesAndNothingOfATheme) {
  const auto document = made();
  document->setIsProcessing(true);
  document->setTitle("Tales");
  document->setType(kQuiltDocumentTypeClassicMovie);
  document->setTheme(QuiltTheme::initWithPath(themeBundle()));
  document->setIsProcessing(false);
  addWebItem(*document);
  addWebItem(*document);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(namesIn(document->path()), ElementsAre("Glance", "media", "properties.plist"));
  EXPECT_EQ(saved(*document).string("Title"), "Tales");
  const Dictionary record = saved(*document);
  const auto* item = record.array("Media")->front().as<Dictionary>();
  EXPECT_EQ(item->array("Sources")->front().as<Dictionary>()->array("Previews")->size(), 1u);
  EXPECT_TRUE(std::filesystem::exists(document->path() / *item->string("PosterImagePath")));
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentFinalizeTest, TheModifiedDateIsNotStamped) {
  const auto document = made();
  document->setTitle("T");
  const auto modified = document->modifiedDate();
  clock().advance(std::chrono::hours(1));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(document->modifiedDate(), modified);
  EXPECT_EQ(saved(*document).date("ModifiedDate"), modified);
}

TEST_F(QuiltDocumentFinalizeTest, TheDocumentSavesOnlyOnceAtTheEnd) {
  const auto document = made();
  addWebItem(*document);
  addPictureItem(*document);
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(lists->writes, 1);
}

TEST_F(QuiltDocumentFinalizeTest, AThumbnailThatCannotBeWrittenDoesNotFailTheRun) {
  const auto document = made();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("Glance");
  EXPECT_TRUE(document->finalizeWithProgressionBlock({}));
}

// ---- Interactive documents

TEST_F(QuiltDocumentFinalizeTest, AnInteractiveDocumentGetsThemeScriptArtworkAndMetadata) {
  const auto document = interactive();
  addWebItem(*document);
  Progress progress;
  ASSERT_TRUE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(namesIn(document->path()), ElementsAre("Glance", "JukeboxArtwork", "JukeboxMetadata.plist", "controllers",
                                                     "index.html", "media", "properties.plist"));
  EXPECT_THAT(namesIn(document->path() / "controllers"), ElementsAre("data.js", "player.js"));
  EXPECT_EQ(readFile(document->path() / "index.html"), "<p>Plain");
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 0, 100, 100, 100, 100)) << "the theme reports nothing";
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentFinalizeTest, TheScriptHoldsTheRecordWithoutTheThemesPath) {
  const auto document = interactive();
  addWebItem(*document, "Link </script>");
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  const std::string data = dataOf(*document);
  // The record as it was when the script was written is the record that the properties file got.
  Dictionary expected = document->dictionary();
  expected.remove("ThemePath");
  expected.set("PosterImagePath", "poster.png");
  expected.set("CollectionOwner", Dictionary());
  EXPECT_EQ(data, platform::services().json->toJSON(expected));
  EXPECT_THAT(data, Not(HasSubstr("ThemePath")));
  EXPECT_THAT(data, Not(HasSubstr("</script>")));
}

TEST_F(QuiltDocumentFinalizeTest, TheScriptIsThisToTheByte) {
  const auto document = interactive();
  document->setIsProcessing(true);
  document->setUuid("DOCUMENT");
  document->setTitle("</script><!-- \"x\" \\ \xE2\x80\xA8\xE2\x80\xA9 \xC3\xBC\n");
  document->setAuthor("javascript:alert(1)");
  document->setJukeboxOrder(7);
  document->setCreationDate(dateOf("2010-05-01T12:00:00Z"));
  document->setModifiedDate(dateOf("2026-03-05T14:07:09Z"));
  document->setIsProcessing(false);
  const auto item = QuiltMedia::init();
  item->setUuid("ITEM");
  item->setTitle("Read on");
  add(*document, item);
  const auto collection = QuiltCollection::init();
  collection->setUuid("COLLECTION");
  collection->setTitle("All");
  document->setCollectionOwner(collection);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(readFile(document->dataControllerPath()),
            R"(var appData = {"Version":"1.0","UUID":"DOCUMENT",)"
            R"~("Title":"\u003c/script>\u003c!-- \"x\" \\ \u2028\u2029 ü\n","Author":"javascript:alert(1)",)~"
            R"("jukeboxOrder":7,"CreationDate":"2010-05-01T12:00:00Z","ModifiedDate":"2026-03-05T14:07:09Z",)"
            R"("Type":"Interactive","Media":[{"UUID":"ITEM","Title":"Read on","IsFlattened":false,)"
            R"("TotalSizeInMegaBytes":0,"PosterImagePath":"media/ITEM/poster.jpg","PosterImageWidth":0,)"
            R"("PosterImageHeight":0}],"DocumentDuration":0,"IsFlattened":false,)"
            R"("PosterImagePath":"poster.png","CollectionOwner":{"UUID":"COLLECTION","Title":"All"}};)");
}

TEST_F(QuiltDocumentFinalizeTest, APlaceholderPosterBecomesTheArtwork) {
  const auto document = interactive();
  ASSERT_FALSE(std::filesystem::exists(document->posterImagePath()));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(dataOf(*document), HasSubstr("\"PosterImagePath\":\"poster.png\""));
  const auto artwork = ImageWrapper::imageWithPath(document->jukeboxArtworkPath());
  ASSERT_NE(artwork, nullptr);
  EXPECT_EQ(artwork->size(), document->posterImage()->size());
  EXPECT_FALSE(std::filesystem::exists(document->posterImagePath()));
}

TEST_F(QuiltDocumentFinalizeTest, WithoutAnyPosterThereIsNoArtwork) {
  const auto document = interactive();
  writeFile(document->posterImagePath(), "no image");
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(dataOf(*document), Not(HasSubstr("PosterImagePath")));
  EXPECT_FALSE(std::filesystem::exists(document->jukeboxArtworkPath()));
}

TEST_F(QuiltDocumentFinalizeTest, TheCollectionIsDescribedUpToItsFirstMissingField) {
  const auto document = interactive();
  const auto collection = QuiltCollection::initWithPath(folder() / "collection");
  collection->setUuid("COLLECTION");
  collection->setTitle("All tales");
  collection->setDescription(std::nullopt);
  document->setCollectionOwner(collection);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(dataOf(*document), HasSubstr(R"("CollectionOwner":{"UUID":"COLLECTION","Title":"All tales"})"));

  collection->setTitle(std::nullopt);
  collection->setDescription("Never seen");
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(dataOf(*document), HasSubstr(R"("CollectionOwner":{"UUID":"COLLECTION"})"));
}

TEST_F(QuiltDocumentFinalizeTest, ACollectionThatSaysAllIsDescribedWhole) {
  const auto document = interactive();
  const auto collection = QuiltCollection::initWithPath(folder() / "collection");
  collection->setUuid("COLLECTION");
  collection->setTitle("All tales");
  collection->setDescription("Told");
  collection->setCreationDate(dateOf("2020-01-02T03:04:05Z"));
  document->setCollectionOwner(collection);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(dataOf(*document), HasSubstr(R"("CollectionOwner":{"UUID":"COLLECTION","Title":"All tales",)"
                                           R"("Description":"Told","CreationDate":"2020-01-02T03:04:05Z"})"));
}

TEST_F(QuiltDocumentFinalizeTest, ADocumentWithoutCollectionGetsAnEmptyOne) {
  const auto document = interactive();
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(dataOf(*document), HasSubstr("\"CollectionOwner\":{}"));
}

TEST_F(QuiltDocumentFinalizeTest, TheMetadataFileHoldsTheStoreMetadata) {
  const auto document = interactive();
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(readRecord(document->jukeboxMetadataPath()), document->jukeboxMetadata());
}

TEST_F(QuiltDocumentFinalizeTest, FinalizingTwiceGivesTheSameFiles) {
  const auto document = interactive();
  addWebItem(*document);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  const auto tree = treeOf(document->path());
  const std::string data = readFile(document->dataControllerPath());
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(treeOf(document->path()), tree);
  EXPECT_EQ(readFile(document->dataControllerPath()), data);
}

// ---- Failures

TEST_F(QuiltDocumentFinalizeTest, ABusyDocumentIsRefusedWithoutACall) {
  const auto document = made();
  takeLines();
  document->setIsProcessing(true);
  Progress progress;
  EXPECT_FALSE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_EQ(takeLines(),
            Lines{critical(line("Failed to finalize", *document) + ": \"Document is already being processed\"")});
  EXPECT_TRUE(document->isProcessing());
  EXPECT_THAT(treeOf(document->path()), IsEmpty());
}

TEST_F(QuiltDocumentFinalizeTest, AFalseAnswerBeforeAnItemCancels) {
  const auto document = made();
  addItem(*document);
  addItem(*document);
  takeLines();
  Progress progress;
  progress.cancelFrom = 4;  // 0, 0, 0, 50, then 50 before the second item
  EXPECT_FALSE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 50, 50));
  const Lines lines = takeLines();
  ASSERT_FALSE(lines.empty());
  EXPECT_EQ(lines.back(),
            critical("Finalizing document at path \"" + document->path().native() + "\" has been cancelled"));
  EXPECT_EQ(std::count_if(lines.begin(), lines.end(),
                          [](const auto& entry) { return entry.level != platform::LogLevel::Debug; }),
            1);
  EXPECT_FALSE(document->isProcessing());
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
  EXPECT_TRUE(std::filesystem::exists(document->mediaAtIndex(0)->path())) << "what was done stays";
}

TEST_F(QuiltDocumentFinalizeTest, AFalseAnswerInsideAnItemCountsAsItsFailure) {
  const auto document = made();
  const auto item = addWebItem(*document);
  takeLines();
  Progress progress;
  progress.cancelFrom = 4;  // the preview's report
  EXPECT_FALSE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 0, 100));
  const auto source = item->sourceAtIndex(0);
  EXPECT_EQ(
      takeLines(),
      (Lines{debug("Finalizing media at path \"" + item->path().native() + "\""),
             debug("Finalizing source at path \"" + source->path().native() + "\""),
             critical("Previewing media at URL \"https://example.org/\" has been cancelled"),
             debug("Failed to generate previews for source during finalizing at \"" + source->path().native() + "\""),
             critical("Failed to finalize source at path \"" + source->path().native() + "\""),
             debug("Failed to finalize source \"" + source->uuid() + "\" during finalizing media at path \"" +
                   item->path().native() + "\""),
             critical("Failed to finalize source at path \"" + item->path().native() + "\""),
             debug("Failed to finalize media \"" + item->uuid() + "\" during finalizing document at path \"" +
                   document->path().native() + "\""),
             failed(*document)}));
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentFinalizeTest, AnItemThatFailsIsNamedAndTheNextIsNotTouched) {
  const auto document = made();
  const auto first = addItem(*document);
  const auto second = addItem(*document);
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named(first->uuid());
  takeLines();
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  const Lines lines = takeLines();
  ASSERT_GE(lines.size(), 2u);
  EXPECT_EQ(lines[lines.size() - 2],
            debug("Failed to finalize media \"" + first->uuid() + "\" during finalizing document at path \"" +
                  document->path().native() + "\""));
  EXPECT_EQ(lines.back(), failed(*document));
  EXPECT_FALSE(std::filesystem::exists(second->path()));
}

TEST_F(QuiltDocumentFinalizeTest, AnInteractiveDocumentWithoutAThemeFailsAfterItsItems) {
  const auto document = interactive();
  document->setIsProcessing(true);
  document->setTheme(nullptr);
  document->setIsProcessing(false);
  const auto item = addItem(*document);
  takeLines();
  Progress progress;
  EXPECT_FALSE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(),
            (Lines{debug("Finalizing media at path \"" + item->path().native() + "\""),
                   critical(line("Failed to finalize", *document) + ": \"No valid theme found\""), failed(*document)}));
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 100));
  EXPECT_TRUE(std::filesystem::exists(item->path()));
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentFinalizeTest, AThemeThatCannotBeAppliedFailsTheRun) {
  const auto document = interactive();
  std::filesystem::remove_all(document->theme()->templatePath());
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  const Lines lines = takeProblems();
  ASSERT_GE(lines.size(), 2u) << "the theme names its own cause";
  EXPECT_EQ(lines.back(), failed(*document));
  EXPECT_FALSE(std::filesystem::exists(document->dataControllerPath()));
}

TEST_F(QuiltDocumentFinalizeTest, ArtworkThatCannotBeWrittenFailsTheRun) {
  const Installed<FaultyImages> images(&Services::images);
  const auto document = interactive();
  images->failSave = support::named("JukeboxArtwork");
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(takeLines(),
            (Lines{debug(line("Failed to finalize", *document) + ": Failed to copy Jukebox Artwork into place."),
                   failed(*document)}));
  EXPECT_TRUE(std::filesystem::exists(document->path() / "index.html")) << "the theme's files stay";
  EXPECT_FALSE(std::filesystem::exists(document->dataControllerPath()));
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

TEST_F(QuiltDocumentFinalizeTest, AScriptThatCannotBeWrittenFailsTheRun) {
  const auto document = interactive();
  const Installed<FaultyFiles> files(&Services::files);
  files->failWrite = support::named("data.js");
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(takeLines(),
            (Lines{debug(line("Failed to finalize", *document) + " with data controller: \"The disk is full.\""),
                   failed(*document)}));
  EXPECT_TRUE(std::filesystem::exists(document->jukeboxArtworkPath()));
  EXPECT_FALSE(std::filesystem::exists(document->jukeboxMetadataPath()));
}

TEST_F(QuiltDocumentFinalizeTest, MetadataThatCannotBeWrittenFailsTheRun) {
  const auto document = interactive();
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  lists->failWrite = support::named("JukeboxMetadata.plist");
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(takeLines(),
            (Lines{debug(line("Failed to finalize", *document) + " with Jukebox metadata"), failed(*document)}));
  EXPECT_TRUE(std::filesystem::exists(document->dataControllerPath()));
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

TEST_F(QuiltDocumentFinalizeTest, PropertiesThatCannotBeWrittenFailTheRun) {
  const auto document = made();
  document->setTitle("Before");
  const std::string before = readFile(document->propertiesPath());
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  lists->failWrite = support::named("properties.plist");
  takeLines();
  Progress progress;
  EXPECT_FALSE(document->finalizeWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Failed to update document at path \"" + document->propertiesPath().native() +
                                      "\": \"Properties cannot be written\""),
                                failed(*document)}));
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_EQ(readFile(document->propertiesPath()), before);
  EXPECT_FALSE(document->isProcessing());
}

}  // namespace
}  // namespace quilt
