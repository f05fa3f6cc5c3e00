// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cerrno>

#include "quilt/platform/testing/FailNthFileManager.h"
#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::FaultyFiles;
using support::Installed;
using support::Line;
using support::Lines;
using support::ToldFiles;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaDerivativeFlattenTest : public support::PackageFixture {
 protected:
  const std::shared_ptr<QuiltMediaSource> source = addEmptySource();
  Progress progress;

  /// A derivative of the source whose file, with 8 bytes, lies outside of the package.
  std::shared_ptr<QuiltMediaDerivative> outside(const std::string& name = "clip.m4v") {
    auto derivative = derivativeTagged({"Desktop"});
    derivative->setUrl(Url::fileUrl(writeFile(folder() / "outside" / name, "8 bytes!")));
    source->addDerivative(derivative);
    takeLines();
    return derivative;
  }

  Path placeOf(const QuiltMediaDerivative& derivative, const std::string& ending = ".m4v") const {
    return source->derivativesFolderPath() / (derivative.uuid() + ending);
  }
  Line notFlattened(const QuiltMediaDerivative& derivative) const {
    return critical("Failed to flatten source derivative \"" + derivative.url()->absoluteString() + "\" at \"" +
                    Url::fileUrl(placeOf(derivative)).absoluteString() + "\"");
  }
  /// What a failed flatten leaves: the derivative as it was, its file, and nothing in the package.
  void expectUntouched(const QuiltMediaDerivative& derivative) const {
    EXPECT_FALSE(derivative.isFlattened());
    EXPECT_EQ(derivative.url(), Url::fileUrl(folder() / "outside" / "clip.m4v"));
    EXPECT_EQ(readFile(folder() / "outside" / "clip.m4v"), "8 bytes!");
    if (std::filesystem::is_directory(source->derivativesFolderPath())) {
      EXPECT_THAT(namesIn(source->derivativesFolderPath()), IsEmpty());
    }
  }

  Path exports() const {
    std::filesystem::create_directories(folder() / "exports");
    return folder() / "exports";
  }
};

// ---- Flatten

TEST_F(QuiltMediaDerivativeFlattenTest, CopyingKeepsTheOriginalAndPointsIntoThePackage) {
  const auto derivative = outside();
  EXPECT_TRUE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(derivative->url(), Url::fileUrl(placeOf(*derivative)));
  EXPECT_TRUE(derivative->isFlattened());
  EXPECT_EQ(readFile(placeOf(*derivative)), "8 bytes!");
  EXPECT_EQ(readFile(folder() / "outside" / "clip.m4v"), "8 bytes!");
  EXPECT_THAT(progress.values, ElementsAre(100, 100));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, MovingTakesTheOriginalAndReportsOnce) {
  const auto derivative = outside();
  EXPECT_TRUE(derivative->flattenCopy(false, progress.block()));
  EXPECT_EQ(readFile(placeOf(*derivative)), "8 bytes!");
  EXPECT_FALSE(std::filesystem::exists(folder() / "outside" / "clip.m4v"));
  EXPECT_EQ(derivative->url(), Url::fileUrl(placeOf(*derivative)));
  EXPECT_TRUE(derivative->isFlattened());
  EXPECT_THAT(progress.values, ElementsAre(100));
}

TEST_F(QuiltMediaDerivativeFlattenTest, TheCopysBytesAreReportedAsIntegerPercentages) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {1, 3, 8};
  EXPECT_TRUE(derivative->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(12, 37, 100, 100));
  EXPECT_THAT(files->copies, ElementsAre(std::pair(folder() / "outside" / "clip.m4v", placeOf(*derivative))));
}

TEST_F(QuiltMediaDerivativeFlattenTest, AnEmptyFileIsCopiedToo) {
  const auto derivative = outside();
  writeFile(folder() / "outside" / "clip.m4v", "");
  EXPECT_TRUE(derivative->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(100));
  EXPECT_TRUE(std::filesystem::exists(placeOf(*derivative)));
}

TEST_F(QuiltMediaDerivativeFlattenTest, AFileWithoutExtensionGetsNone) {
  const auto derivative = outside("clip");
  EXPECT_TRUE(derivative->flattenCopy(true, {}));
  EXPECT_EQ(derivative->url(), Url::fileUrl(placeOf(*derivative, "")));
}

TEST_F(QuiltMediaDerivativeFlattenTest, AFlattenedDerivativeAnswersTrueAndReportsNothing) {
  const auto derivative = outside();
  ASSERT_TRUE(derivative->flattenCopy(true, {}));
  EXPECT_TRUE(derivative->flattenCopy(true, progress.block()));
  EXPECT_TRUE(derivative->flattenCopy(false, progress.block()));
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_TRUE(std::filesystem::exists(placeOf(*derivative)));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, TheAnswerToTheLastReportHasNoEffect) {
  const auto derivative = outside();
  EXPECT_TRUE(derivative->flattenCopy(false, [](double) { return false; }));
  EXPECT_TRUE(derivative->isFlattened());
}

TEST_F(QuiltMediaDerivativeFlattenTest, ADerivativeOutsideOfADocumentFails) {
  const auto derivative = derivativeTagged({"Desktop"});
  derivative->setUrl(Url::fileUrl(writeFile(folder() / "clip.m4v", "content")));
  const auto loose = QuiltMediaSource::init();
  const auto looseItem = QuiltMedia::init();
  const Lines expected{critical("Failed to flatten source derivative because it is not attached to a valid owner")};
  takeLines();
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), expected) << "no source";
  loose->addDerivative(derivative);
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), expected) << "no media item";
  looseItem->addSource(loose);
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), expected) << "no document";
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, AWebLinkNeedsNoCopy) {
  const auto made = QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/"));
  EXPECT_TRUE(made->isFlattened()) << "the derivative made from a link is flattened already";
  const auto link = derivativeTagged({"Desktop"});
  link->setUrl(Url::parse("https://example.org/a.m4v"));
  source->addDerivative(link);
  takeLines();
  EXPECT_TRUE(link->flattenCopy(true, progress.block()));
  EXPECT_FALSE(link->isFlattened());
  EXPECT_EQ(link->url(), Url::parse("https://example.org/a.m4v"));
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(source->derivativesFolderPath()));
}

TEST_F(QuiltMediaDerivativeFlattenTest, AFolderThatCannotBeMadeFails) {
  const auto derivative = outside();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("derivatives");
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Failed to create intermediate directories for media derivative destination \"" +
                                      source->derivativesFolderPath().native() + "\": \"The disk is full.\""),
                                notFlattened(*derivative)}));
  EXPECT_THAT(progress.values, IsEmpty());
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, AFolderThatLeadsOutOfThePackageFails) {
  const auto derivative = outside();
  std::filesystem::create_directories(source->path());
  std::filesystem::create_directory(folder() / "elsewhere");
  std::filesystem::create_directory_symlink(folder() / "elsewhere", source->derivativesFolderPath());
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(),
            (Lines{debug("Failed to create intermediate directories for media derivative destination \"" +
                         source->derivativesFolderPath().native() + "\": \"The folder leads out of the document\""),
                   notFlattened(*derivative)}));
  EXPECT_THAT(namesIn(folder() / "elsewhere"), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, AFileThatCannotBeSizedIsNotCopied) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->failAttributes = support::named("clip.m4v");
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), (Lines{warning("Source derivative at path \"" + derivative->url()->relativePath().native() +
                                        "\" cannot be sized: \"The disk is full.\""),
                                notFlattened(*derivative)}));
  EXPECT_THAT(files->copies, IsEmpty());
  EXPECT_THAT(progress.values, IsEmpty());
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, ACopyThatFailsNamesItsNumber) {
  const auto derivative = outside();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCopy = support::named("clip.m4v");
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), (Lines{debug("Copy failed with error code (-1)"), notFlattened(*derivative)}));
  EXPECT_THAT(progress.values, IsEmpty());
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, ACopyThatDoesNotReachTheDiskFails) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->failSync = support::anyPath();
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(),
            (Lines{debug("Copy failed with error code (" + std::to_string(-EIO) + ")"), notFlattened(*derivative)}));
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, ACancelSurfacesAsAFailedCopy) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {2, 4, 8};
  progress.cancelAt = 50;
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(25, 50));
  EXPECT_EQ(takeLines(), (Lines{debug("Copy failed with error code (" + std::to_string(-ECANCELED) + ")"),
                                notFlattened(*derivative)}));
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, ACancelOfARealCopyLeavesNothing) {
  const auto derivative = outside();
  progress.cancelAt = 0;
  EXPECT_FALSE(derivative->flattenCopy(true, progress.block()));
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, AMoveThatFailsSaysFromWhereToWhere) {
  const auto derivative = outside();
  const Installed<FaultyFiles> files(&Services::files);
  files->failMove = support::anyPath();
  EXPECT_FALSE(derivative->flattenCopy(false, progress.block()));
  EXPECT_EQ(
      takeLines(),
      (Lines{debug("Failed to flatten source derivative moving \"" + derivative->url()->absoluteString() + "\" to \"" +
                   Url::fileUrl(placeOf(*derivative)).absoluteString() + "\": \"The disk is full.\""),
             notFlattened(*derivative)}));
  EXPECT_THAT(progress.values, IsEmpty());
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, WhateverChangeOfTheDiskFailsNothingIsLeftOrLost) {
  for (const bool copy : {true, false}) {
    const auto derivative = outside();
    bool succeeded = false;
    for (std::size_t n = 1; !succeeded; ++n) {
      SCOPED_TRACE(n);
      ASSERT_LT(n, 10U);
      const auto files = std::make_shared<platform::FailNthFileManager>(platform::services().files);
      const platform::ScopedService installed(&Services::files, std::shared_ptr<platform::FileManager>(files));
      files->failNth(n, platform::ErrorKind::NoSpace);
      succeeded = derivative->flattenCopy(copy, {});
      if (!succeeded) expectUntouched(*derivative);
      EXPECT_TRUE(succeeded || n < 4);
    }
    EXPECT_EQ(readFile(placeOf(*derivative)), "8 bytes!");
    source->removeAllDerivatives();
  }
}

// ---- Export

TEST_F(QuiltMediaDerivativeFlattenTest, ExportingTwiceCountsWithTheTitleAsItIs) {
  keepDocumentBusy();
  const auto derivative = outside();
  document()->setTitle("My.Show/1");
  EXPECT_EQ(derivative->exportToPath(exports(), progress.block()), exports() / "My_Show-1.m4v");
  EXPECT_THAT(progress.values, ElementsAre(100, 100));
  // The slash of the counted name makes a sub-path.
  EXPECT_EQ(derivative->exportToPath(exports(), {}), exports() / "My.Show" / "1 2.m4v");
  EXPECT_EQ(derivative->exportToPath(exports(), {}), exports() / "My.Show" / "1 3.m4v");
  EXPECT_EQ(readFile(exports() / "My_Show-1.m4v"), "8 bytes!");
  EXPECT_EQ(readFile(exports() / "My.Show" / "1 2.m4v"), "8 bytes!");
  EXPECT_THAT(namesIn(exports()), ElementsAre("My.Show", "My_Show-1.m4v"));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, ExportingLeavesTheDerivativeWhereItIs) {
  const auto derivative = outside();
  document()->setTitle("Show");
  EXPECT_FALSE(derivative->exportToPath(exports(), {}).empty());
  expectUntouched(*derivative);
}

TEST_F(QuiltMediaDerivativeFlattenTest, ADotInACountedNameIsKept) {
  const auto derivative = outside();
  document()->setTitle("A.B");
  EXPECT_EQ(derivative->exportToPath(exports(), {}), exports() / "A_B.m4v");
  EXPECT_EQ(derivative->exportToPath(exports(), {}), exports() / "A.B 2.m4v");
}

TEST_F(QuiltMediaDerivativeFlattenTest, ADocumentWithoutTitleExportsAsAnUntitledEpisode) {
  const auto derivative = outside();
  document()->setTitle(std::nullopt);
  EXPECT_EQ(derivative->exportToPath(exports(), {}), exports() / "Untitled Episode.m4v");
}

TEST_F(QuiltMediaDerivativeFlattenTest, ATitleCannotLeadAnExportOutOfItsFolder) {
  const auto derivative = outside();
  document()->setTitle("../escaped");
  EXPECT_EQ(derivative->exportToPath(exports(), {}), exports() / "__-escaped.m4v");
  EXPECT_EQ(derivative->exportToPath(exports(), {}), Path()) << "the counted name would";
  EXPECT_THAT(namesIn(exports()), ElementsAre("__-escaped.m4v"));
  EXPECT_FALSE(std::filesystem::exists(folder() / "escaped 2.m4v"));
}

TEST_F(QuiltMediaDerivativeFlattenTest, ExportReportsTheCopysPercentages) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {1, 3, 8};
  EXPECT_FALSE(derivative->exportToPath(exports(), progress.block()).empty());
  EXPECT_THAT(progress.values, ElementsAre(12, 37, 100, 100));
}

TEST_F(QuiltMediaDerivativeFlattenTest, AnExportOfAFileThatCannotBeSizedFails) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->failAttributes = support::named("clip.m4v");
  EXPECT_EQ(derivative->exportToPath(exports(), progress.block()), Path());
  EXPECT_EQ(takeLines(), Lines{warning("Source derivative at path \"" + derivative->url()->relativePath().native() +
                                       "\" cannot be sized: \"The disk is full.\"")});
  EXPECT_THAT(files->copies, IsEmpty());
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_THAT(namesIn(exports()), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, AnExportThatFailsRemovesWhatItWrote) {
  const auto derivative = outside();
  const Installed<ToldFiles> files(&Services::files);
  files->copyAnswer = -28;
  EXPECT_EQ(derivative->exportToPath(exports(), progress.block()), Path());
  ASSERT_EQ(files->copies.size(), 1u) << "half of the file was written";
  EXPECT_EQ(takeLines(), Lines{debug("Copy failed with error code (-28)")});
  EXPECT_THAT(progress.values, IsEmpty());
  EXPECT_THAT(namesIn(exports()), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, ACancelledExportLeavesNothing) {
  const auto derivative = outside();
  progress.cancelAt = 0;
  EXPECT_EQ(derivative->exportToPath(exports(), progress.block()), Path());
  EXPECT_EQ(takeLines(), Lines{debug("Copy failed with error code (" + std::to_string(-ECANCELED) + ")")});
  EXPECT_THAT(namesIn(exports()), IsEmpty());
}

TEST_F(QuiltMediaDerivativeFlattenTest, AnExportIntoAFolderThatCannotBeMadeIsAFailedCopy) {
  const auto derivative = outside();
  const Path file = writeFile(folder() / "file", "no folder");
  EXPECT_EQ(derivative->exportToPath(file / "exports", progress.block()), Path());
  EXPECT_EQ(takeLines(), Lines{debug("Copy failed with error code (" + std::to_string(-ENOTDIR) + ")")});
}

TEST_F(QuiltMediaDerivativeFlattenTest, WhatHasNoFileOrNoDocumentIsNotExported) {
  const auto link = QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/"));
  source->addDerivative(link);
  EXPECT_EQ(link->exportToPath(exports(), progress.block()), Path());
  const auto loose = derivativeTagged({"Desktop"});
  loose->setUrl(Url::fileUrl(writeFile(folder() / "clip.m4v", "content")));
  EXPECT_EQ(loose->exportToPath(exports(), progress.block()), Path());
  EXPECT_THAT(namesIn(exports()), IsEmpty());
  EXPECT_THAT(progress.values, IsEmpty());
}

}  // namespace
}  // namespace quilt
