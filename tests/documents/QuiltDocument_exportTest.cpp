// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/Program.h"

namespace quilt {
namespace {

using platform::Result;
using platform::Services;
using support::critical;
using support::FaultyArchive;
using support::FaultyFiles;
using support::Installed;
using support::Lines;
using support::Progress;
using support::warning;
using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;

constexpr double kBandWidth = 16.66666603088379;

class QuiltDocumentExportTest : public support::DocumentFixture {
 protected:
  QuiltDocumentExportTest() { std::filesystem::create_directories(destination()); }

  Path destination() const { return folder() / "exports"; }

  std::shared_ptr<QuiltDocument> titled(const Text& title) {
    auto document = made();
    document->setIsProcessing(true);
    document->setTitle(title);
    document->setIsProcessing(false);
    takeLines();
    return document;
  }

  Path exported(QuiltDocument& document, bool zipped = false, const std::vector<std::string>& formats = {},
                const ProgressionBlock& block = {}) const {
    return document.exportToPath(destination(), zipped, formats, block);
  }

  std::vector<std::string> exports() const { return namesIn(destination()); }

  /// Appends the values of one stage over a document with one item without sources.
  static void appendStage(std::vector<double>& values, double start) {
    for (const double percentage : {0, 0, 0, 100, 100}) values.push_back(percentage / 100 * kBandWidth + start);
  }

  static const std::string& quoted(const Path& path) {
    thread_local std::string text;
    return text = "\"" + path.native() + "\"";
  }
};

/// Notes the hidden names that an export chooses, and makes the move to its final name fail on request.
class WatchedFiles final : public platform::ForwardingFileManager {
 public:
  explicit WatchedFiles(Path destination)
      : ForwardingFileManager(platform::services().files), _destination(std::move(destination)) {}

  Path package;  ///< the temporary package
  Path archive;  ///< what was moved to its final name
  bool failMove = false;
  bool failRemove = false;
  bool failCreate = false;
  std::string takenMeanwhile;  ///< a name that somebody else takes just before the move

  Result<void> createDirectoryAtPath(const Path& path) override {
    if (path.parent_path() == _destination) {
      package = path;
      if (failCreate) return support::kFault;
    }
    return ForwardingFileManager::createDirectoryAtPath(path);
  }
  Result<void> moveItem(const Path& source, const Path& to) override {
    if (to.parent_path() == _destination) {
      archive = source;
      if (failMove) return support::kFault;
      if (to.filename() == takenMeanwhile) {
        std::filesystem::create_directories(to);
        takenMeanwhile.clear();
      }
    }
    return ForwardingFileManager::moveItem(source, to);
  }
  Result<void> removeItem(const Path& path, const Path& within) override {
    if (failRemove && path.parent_path() == _destination) return support::kFault;
    return ForwardingFileManager::removeItem(path, within);
  }

 private:
  const Path _destination;
};

// ---- Names

TEST_F(QuiltDocumentExportTest, DotsAndSlashesOfTheTitleAreReplaced) {
  const auto document = titled("Intro 1.0/final");
  EXPECT_EQ(exported(*document), destination() / "Intro 1_0-final.qpk");
  EXPECT_THAT(exports(), ElementsAre("Intro 1_0-final.qpk"));
}

TEST_F(QuiltDocumentExportTest, ASecondExportGetsANumberAndAThirdTheNext) {
  const auto document = titled("Intro 1.0/final");
  exported(*document);
  EXPECT_EQ(exported(*document), destination() / "Intro 1_0-final-2.qpk");
  EXPECT_EQ(exported(*document), destination() / "Intro 1_0-final-3.qpk");
  EXPECT_THAT(exports(), ElementsAre("Intro 1_0-final-2.qpk", "Intro 1_0-final-3.qpk", "Intro 1_0-final.qpk"));
}

TEST_F(QuiltDocumentExportTest, ZippedExportsAreNumberedByThemselves) {
  const auto document = titled("T");
  exported(*document);
  EXPECT_EQ(exported(*document, true), destination() / "T.qpk.zip");
  EXPECT_EQ(exported(*document, true), destination() / "T-2.qpk.zip");
}

TEST_F(QuiltDocumentExportTest, WhateverHasTheNameIsLeftAlone) {
  writeFile(destination() / "T.qpk", "a file");
  std::filesystem::create_directories(destination() / "T-2.qpk");
  EXPECT_EQ(exported(*titled("T")), destination() / "T-3.qpk");
  EXPECT_EQ(readFile(destination() / "T.qpk"), "a file");
  EXPECT_THAT(treeOf(destination() / "T-2.qpk"), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, ADocumentWithoutTitleIsExportedUnderTheFallBackAndStaysUntitled) {
  const auto document = titled(std::nullopt);
  EXPECT_EQ(exported(*document), destination() / "Untitled Episode.qpk");
  EXPECT_EQ(document->title(), std::nullopt);
}

TEST_F(QuiltDocumentExportTest, AnUntitledDocumentStaysUntitledWhenTheExportFails) {
  const auto document = titled(std::nullopt);
  const Installed<FaultyArchive> archive(&Services::archive);
  archive->fail = true;
  EXPECT_EQ(exported(*document, true), Path());
  EXPECT_EQ(document->title(), std::nullopt);
}

TEST_F(QuiltDocumentExportTest, NoTitleLeadsOutOfTheDestination) {
  for (const std::string& title :
       {std::string(".."), std::string("../up"), std::string("/etc/x"), std::string("a\0b", 3), std::string(300, 'x'),
        std::string("-rf"), std::string("$(x) | y")}) {
    const auto document = titled(title);
    const Path result = exported(*document);
    ASSERT_FALSE(result.empty()) << title;
    EXPECT_EQ(result.parent_path(), destination()) << title;
    EXPECT_TRUE(std::filesystem::is_directory(result)) << title;
    std::filesystem::remove_all(document->path());
  }
  EXPECT_THAT(namesIn(folder()), ElementsAre("exports"));
}

TEST_F(QuiltDocumentExportTest, ALongTitleIsCutBetweenCharacters) {
  std::string title;
  for (int i = 0; i < 120; ++i) title += "é";
  const Path result = exported(*titled(title));
  ASSERT_FALSE(result.empty());
  EXPECT_EQ(result.filename().native().size(), 200 + std::string(".qpk").size());
}

TEST_F(QuiltDocumentExportTest, ADestinationWithATrailingSlashOrNotThereYetServes) {
  const auto document = titled("T");
  EXPECT_EQ(document->exportToPath(folder() / "new" / "deep" / "", false, {}, {}), folder() / "new/deep/T.qpk");
  EXPECT_THAT(namesIn(folder() / "new/deep"), ElementsAre("T.qpk"));
}

TEST_F(QuiltDocumentExportTest, ANameTakenMeanwhileIsLeftToWhoTookIt) {
  const auto files = std::make_shared<WatchedFiles>(destination());
  const platform::ScopedService scope(&Services::files, files);
  files->takenMeanwhile = "T.qpk";
  EXPECT_EQ(exported(*titled("T")), destination() / "T-2.qpk");
  EXPECT_THAT(treeOf(destination() / "T.qpk"), IsEmpty());
  EXPECT_THAT(exports(), ElementsAre("T-2.qpk", "T.qpk"));
}

// ---- What is exported

TEST_F(QuiltDocumentExportTest, TheExportedPackageStandsAlone) {
  const auto document = titled("Pictures");
  addPictureItem(*document, 64, 48);
  addWebItem(*document);
  const Path result = exported(*document, false, {"480p"});
  ASSERT_FALSE(result.empty());
  std::filesystem::remove_all(document->path());
  std::filesystem::remove(folder() / "64x48.png");

  const auto copy = QuiltDocument::initWithPath(result);
  ASSERT_NE(copy, nullptr);
  EXPECT_EQ(copy->uuid(), document->uuid());
  EXPECT_EQ(copy->title(), "Pictures");
  ASSERT_EQ(copy->mediaCount(), 2u);
  const auto derivative = copy->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative();
  ASSERT_NE(derivative, nullptr);
  EXPECT_TRUE(derivative->isFlattened());
  EXPECT_EQ(ImageWrapper::imageWithURL(*derivative->url())->size(), (platform::Size{64, 48}));
  EXPECT_EQ(copy->mediaAtIndex(0)->sourceAtIndex(0)->previews().size(), 1u);
  copy->removeAllBrokenMedia();
  EXPECT_EQ(copy->mediaCount(), 2u);
  EXPECT_TRUE(std::filesystem::exists(copy->posterImagePath()));
  EXPECT_TRUE(std::filesystem::exists(copy->glanceThumbnailPath()));
  EXPECT_TRUE(std::filesystem::exists(copy->mediaAtIndex(0)->posterImagePath()));
}

TEST_F(QuiltDocumentExportTest, OnlyTheAskedFormatsAreExported) {
  const auto document = titled("T");
  addPictureItem(*document, 1600, 1200);
  const Path result = exported(*document, false, {"480p"});
  const auto copy = QuiltDocument::initWithPath(result);
  ASSERT_NE(copy, nullptr);
  EXPECT_EQ(copy->mediaAtIndex(0)->sourceAtIndex(0)->derivativeCount(), 1u);
  EXPECT_THAT(copy->availableFormats(), ElementsAre("480p"));
}

TEST_F(QuiltDocumentExportTest, TheDocumentItselfIsFlattenedConvertedAndFinalized) {
  const auto document = titled("T");
  const auto item = addPictureItem(*document, 1600, 1200);
  ASSERT_FALSE(exported(*document, false, {"720p", "480p"}).empty());
  EXPECT_THAT(document->availableFormats(), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_TRUE(item->sourceAtIndex(0)->mainDerivative()->isFlattened());
  EXPECT_TRUE(std::filesystem::exists(document->glanceThumbnailPath()));
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentExportTest, SoundIsExportedWithItsSamples) {
  const auto document = titled("Sound");
  const auto item = QuiltMedia::init();
  item->addSource(QuiltMediaSource::initWithPath(support::makeMedia(support::m4aSound())));
  add(*document, item);
  const Path result = exported(*document, false, {"Desktop"});
  ASSERT_FALSE(result.empty());
  const auto copy = QuiltDocument::initWithPath(result);
  ASSERT_NE(copy, nullptr);
  EXPECT_TRUE(copy->isFlattened());
  const auto source = copy->mediaAtIndex(0)->sourceAtIndex(0);
  ASSERT_NE(source->audioSamples(), nullptr);
  EXPECT_GT(std::filesystem::file_size(source->audioSamples()->path()), 0u);
  EXPECT_NEAR(copy->duration(), 2, 0.1);
}

TEST_F(QuiltDocumentExportTest, AnEmptyDocumentIsFlattenedAndExported) {
  const auto document = titled("T");
  const Path result = exported(*document);
  EXPECT_TRUE(std::filesystem::exists(document->mediaFolderPath()));
  EXPECT_THAT(namesIn(result), ElementsAre("Glance", "media", "poster.png", "properties.plist"));
}

TEST_F(QuiltDocumentExportTest, TheArchiveUnpacksToAPackageUnderItsName) {
  const auto document = titled("My.Show");
  addWebItem(*document);
  const Path result = exported(*document, true, {"Desktop"});
  EXPECT_EQ(result, destination() / "My_Show.qpk.zip");
  EXPECT_THAT(exports(), ElementsAre("My_Show.qpk.zip"));
  const Path unpacked = folder() / "unpacked";
  std::filesystem::create_directories(unpacked);
  const auto run = support::runProgram({"python3", "-m", "zipfile", "-e", result.native(), unpacked.native()});
  ASSERT_EQ(run.status, 0) << run.output;
  EXPECT_THAT(namesIn(unpacked), ElementsAre("My_Show.qpk"));
  const auto copy = QuiltDocument::initWithPath(unpacked / "My_Show.qpk");
  ASSERT_NE(copy, nullptr);
  EXPECT_EQ(copy->title(), "My.Show");
  EXPECT_EQ(copy->mediaCount(), 1u);
}

// ---- Progress

TEST_F(QuiltDocumentExportTest, EveryStageReportsIntoItsBand) {
  const auto document = titled("T");
  addItem(*document);
  Progress progress;
  ASSERT_FALSE(exported(*document, false, {}, progress.block()).empty());
  std::vector<double> expected = {0};
  appendStage(expected, 0);
  appendStage(expected, 33.333335876464844);
  appendStage(expected, 50);
  appendStage(expected, 66.66667175292969);
  expected.push_back(100);
  EXPECT_THAT(progress.values, ElementsAreArray(expected));
}

TEST_F(QuiltDocumentExportTest, EachFormatRunsThroughTheSameBand) {
  const auto document = titled("T");
  addWebItem(*document);
  Progress progress;
  ASSERT_FALSE(exported(*document, false, {"720p", "480p"}, progress.block()).empty());
  const auto convert = [](double percentage) { return percentage / 2 / 6.0 + 16.666667938232422; };
  std::vector<double> converting;
  for (const double value : progress.values)
    if (value >= 16.666667938232422 && value < 33) converting.push_back(value);
  EXPECT_THAT(converting, ElementsAre(convert(0), convert(50), convert(0), convert(50)));
  EXPECT_THAT(converting, Each(AllOf(Ge(16.67 - 0.01), Le(25.0))));
}

TEST_F(QuiltDocumentExportTest, AFlattenedDocumentSkipsTheFirstBand) {
  const auto document = titled("T");
  addFlattenedItem(*document);
  Progress progress;
  ASSERT_FALSE(exported(*document, false, {"Desktop"}, progress.block()).empty());
  ASSERT_GE(progress.values.size(), 2u);
  EXPECT_EQ(progress.values[0], 0);
  EXPECT_EQ(progress.values[1], 16.666667938232422);
}

TEST_F(QuiltDocumentExportTest, ZippingReportsIntoTheLastBand) {
  const auto document = titled("T");
  addItem(*document);
  Progress progress;
  ASSERT_FALSE(exported(*document, true, {}, progress.block()).empty());
  std::vector<double> zipping;
  for (std::size_t i = 21; i + 1 < progress.values.size(); ++i) zipping.push_back(progress.values[i]);
  ASSERT_FALSE(zipping.empty());
  EXPECT_THAT(zipping, Each(AllOf(Ge(83.33332824707031), Le(83.33332824707031 + kBandWidth))));
  EXPECT_TRUE(std::is_sorted(zipping.begin(), zipping.end()));
  EXPECT_EQ(progress.values.back(), 100);
}

TEST_F(QuiltDocumentExportTest, CancellingAtAnyReportLeavesNothingBehind) {
  std::size_t reports = 0;
  {
    const auto document = titled("T");
    addPictureItem(*document);
    Progress whole;
    const Path result = exported(*document, true, {"480p"}, whole.block());
    ASSERT_FALSE(result.empty());
    reports = whole.values.size();
    ASSERT_GT(reports, 25u);
    std::filesystem::remove(result);
    std::filesystem::remove_all(document->path());
  }
  for (std::size_t at = 0; at < reports; ++at) {
    const auto document = titled("T");
    addPictureItem(*document);
    Progress progress;
    progress.cancelFrom = at;
    const Path result = exported(*document, true, {"480p"}, progress.block());
    if (result.empty()) {
      EXPECT_THAT(exports(), IsEmpty()) << "cancelled at report " << at << " of " << reports;
    } else {
      EXPECT_THAT(exports(), ElementsAre("T.qpk.zip")) << at;
      EXPECT_EQ(progress.values.back(), 100);
      std::filesystem::remove(result);
    }
    EXPECT_FALSE(document->isProcessing()) << at;
    if (at % 8 == 0) {
      // The document is usable: what was cancelled can be done again.
      EXPECT_EQ(exported(*document, true, {"480p"}), destination() / "T.qpk.zip") << at;
      std::filesystem::remove(destination() / "T.qpk.zip");
    }
    std::filesystem::remove_all(document->path());
  }
}

// ---- Failures

TEST_F(QuiltDocumentExportTest, ABusyDocumentFailsAtItsFirstStage) {
  const auto document = titled("T");
  document->setIsProcessing(true);
  EXPECT_EQ(exported(*document), Path());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to flattening document at path " + quoted(document->path()) +
                                        ": \"Document is already being processed\"")});
  EXPECT_THAT(exports(), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, ABusyFlattenedDocumentFailsToFinalize) {
  const auto document = titled("T");
  addFlattenedItem(*document);
  document->setIsProcessing(true);
  takeLines();
  EXPECT_EQ(exported(*document), Path());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to finalize document at path " + quoted(document->path()) +
                                        ": \"Document is already being processed\"")});
  EXPECT_THAT(exports(), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, AFailedConversionAddsNoLineOfTheExport) {
  const auto document = titled("T");
  const auto item = addItem(*document);
  document->setIsProcessing(true);
  item->addSource(QuiltMediaSource::init());
  document->setIsProcessing(false);
  takeLines();
  EXPECT_EQ(exported(*document, false, {"480p"}), Path());
  EXPECT_EQ(takeProblems(), Lines{warning("Trying to convert a media with an invalid content category")});
  EXPECT_THAT(exports(), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, ATemporaryDocumentThatCannotBeMadeIsReported) {
  const auto files = std::make_shared<WatchedFiles>(destination());
  const platform::ScopedService scope(&Services::files, files);
  files->failCreate = true;
  const auto document = titled("T");
  EXPECT_EQ(exported(*document), Path());
  EXPECT_EQ(takeProblems(),
            (Lines{warning("Failed to create document at path " + quoted(files->package) + ": \"@\""),
                   warning("Failed to create document \"T\" at temporary path " + quoted(files->package))}));
  EXPECT_THAT(files->package.filename().native(), ::testing::MatchesRegex("\\.[-0-9A-F]+\\.qpk"));
  EXPECT_THAT(exports(), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, APackageThatCannotBeMovedIsRemovedAndReported) {
  const auto files = std::make_shared<WatchedFiles>(destination());
  const platform::ScopedService scope(&Services::files, files);
  files->failMove = true;
  const auto document = titled("T.1");
  EXPECT_EQ(exported(*document), Path());
  EXPECT_EQ(takeProblems(),
            Lines{warning("Failed to move temporary document copy \"T.1\" from path \"" + files->package.native() +
                          "\" to path \"" + (destination() / "T_1.qpk").native() + "\": \"The disk is full.\"")});
  EXPECT_THAT(exports(), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, AnArchiveThatCannotBeMadeIsReported) {
  const auto files = std::make_shared<WatchedFiles>(destination());
  const platform::ScopedService scope(&Services::files, files);
  const Installed<FaultyArchive> archive(&Services::archive);
  archive->fail = true;
  EXPECT_EQ(exported(*titled("T"), true), Path());
  const Lines lines = takeProblems();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0].level, platform::LogLevel::Warning);
  EXPECT_THAT(lines[0].text, ::testing::MatchesRegex("Failed to archive temporary document copy of \"T\" at path \"" +
                                                     files->package.native() + "\" to path \"" +
                                                     destination().native() + "/\\.[-0-9A-F]+\\.qpk\\.zip\""));
  EXPECT_THAT(exports(), IsEmpty());
}

TEST_F(QuiltDocumentExportTest, ATemporaryPackageThatCannotBeRemovedDoesNotStopTheExport) {
  const auto files = std::make_shared<WatchedFiles>(destination());
  const platform::ScopedService scope(&Services::files, files);
  files->failRemove = true;
  EXPECT_EQ(exported(*titled("T"), true), destination() / "T.qpk.zip");
  // The line prints an absent path.
  EXPECT_EQ(takeProblems(), Lines{warning("Failed to remove temporary document copy \"T\" at path \"(null)\": "
                                          "\"The disk is full.\"")});
  EXPECT_THAT(exports(), ElementsAre(files->package.filename().native(), "T.qpk.zip"));
}

TEST_F(QuiltDocumentExportTest, AnArchiveThatCannotBeMovedStaysWhereItIs) {
  const auto files = std::make_shared<WatchedFiles>(destination());
  const platform::ScopedService scope(&Services::files, files);
  files->failMove = true;
  EXPECT_EQ(exported(*titled("T"), true), Path());
  EXPECT_EQ(takeProblems(),
            Lines{warning("Failed to move temporary zipped document \"T\" from path \"" + files->archive.native() +
                          "\" to path \"" + (destination() / "T.qpk.zip").native() + "\": \"The disk is full.\"")});
  EXPECT_THAT(exports(), ElementsAre(files->archive.filename().native()));
}

TEST_F(QuiltDocumentExportTest, WhatTheExportChangedInTheDocumentStaysAfterAFailure) {
  const auto document = titled("T");
  const auto item = addPictureItem(*document, 1600, 1200);
  const Installed<FaultyArchive> archive(&Services::archive);
  archive->fail = true;
  EXPECT_EQ(exported(*document, true, {"480p"}), Path());
  EXPECT_TRUE(item->sourceAtIndex(0)->mainDerivative()->isFlattened());
  EXPECT_NE(item->sourceAtIndex(0)->derivativeWithFormat("480p"), nullptr);
  EXPECT_FALSE(document->isProcessing());
}

}  // namespace
}  // namespace quilt
