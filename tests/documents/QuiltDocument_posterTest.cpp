// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::FaultyFiles;
using support::FaultyImages;
using support::Installed;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltDocumentPosterTest : public support::DocumentFixture {
 protected:
  static platform::Size sizeOfFile(const Path& file) {
    const auto image = ImageWrapper::imageWithPath(file);
    return image ? image->size() : platform::Size{0, 0};
  }
};

// ---- The poster image

TEST_F(QuiltDocumentPosterTest, WithoutAPosterFileThePlaceholderIsShownAndNothingIsWritten) {
  const auto document = made();
  takeLines();
  const auto poster = document->posterImage();
  ASSERT_NE(poster, nullptr);
  EXPECT_GT(poster->size().width, 0);
  EXPECT_EQ(document->posterImage(), poster);
  EXPECT_EQ(document->posterImageVersion(), 1u);
  EXPECT_THAT(treeOf(document->path()), IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentPosterTest, ANewPosterFollowingThePlaceholderRaisesTheVersionAndIsWritten) {
  const auto document = made();
  document->posterImage();
  document->updatePosterImage(picture(100, 50));
  EXPECT_EQ(document->posterImageVersion(), 2u);
  EXPECT_EQ(document->posterImage()->size(), (platform::Size{100, 50}));
  EXPECT_EQ(sizeOfFile(document->path() / "poster.png"), (platform::Size{100, 50}));
  EXPECT_THAT(treeOf(document->path()), ElementsAre("poster.png"));
}

TEST_F(QuiltDocumentPosterTest, ALargePosterIsKeptInStandardDefinition) {
  const auto document = made();
  document->updatePosterImage(picture(1280, 960));
  EXPECT_EQ(document->posterImage()->size(), (platform::Size{640, 480}));
  EXPECT_EQ(sizeOfFile(document->posterImagePath()), (platform::Size{640, 480}));
}

TEST_F(QuiltDocumentPosterTest, APosterFileIsLoadedOnceAsItIs) {
  const auto document = made();
  ASSERT_TRUE(picture(1280, 960)->saveAsPNGAtURL(Url::fileUrl(document->posterImagePath())));
  const auto poster = document->posterImage();
  EXPECT_EQ(poster->size(), (platform::Size{1280, 960}));
  std::filesystem::remove(document->posterImagePath());
  EXPECT_EQ(document->posterImage(), poster);
  EXPECT_EQ(document->posterImageVersion(), 1u);
}

TEST_F(QuiltDocumentPosterTest, APosterFileThatIsNoImageIsReportedEachTime) {
  const auto document = made();
  writeFile(document->posterImagePath(), "no image");
  takeLines();
  const Lines expected{
      warning("Document poster image path \"" + document->posterImagePath().native() + "\" is not a valid image")};
  EXPECT_EQ(document->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), expected);
  EXPECT_EQ(document->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), expected);
  EXPECT_EQ(readFile(document->posterImagePath()), "no image");
}

TEST_F(QuiltDocumentPosterTest, UpdatingWithNoneShowsThePlaceholderAndKeepsTheFile) {
  const auto document = made();
  document->updatePosterImage(picture(100, 50));
  document->updatePosterImage(nullptr);
  EXPECT_NE(document->posterImage()->size(), (platform::Size{100, 50}));
  EXPECT_EQ(document->posterImageVersion(), 2u);
  EXPECT_EQ(sizeOfFile(document->posterImagePath()), (platform::Size{100, 50}));
}

TEST_F(QuiltDocumentPosterTest, AMissingPackageFolderIsMadeForThePoster) {
  const auto document = made();
  std::filesystem::remove(document->path());
  document->updatePosterImage(picture(10, 10));
  EXPECT_EQ(sizeOfFile(document->posterImagePath()), (platform::Size{10, 10}));
}

TEST_F(QuiltDocumentPosterTest, WithoutAFolderForThePosterTheCacheStillShowsIt) {
  const auto document = made();
  std::filesystem::remove(document->path());
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::anyPath();
  takeLines();
  document->updatePosterImage(picture(10, 10));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to create intermediate directories for document at path \"" +
                                        document->path().native() + "\": \"The disk is full.\"")});
  EXPECT_EQ(document->posterImage()->size(), (platform::Size{10, 10}));
  EXPECT_EQ(document->posterImageVersion(), 2u);
  EXPECT_FALSE(std::filesystem::exists(document->path()));
}

TEST_F(QuiltDocumentPosterTest, APosterThatCannotBeWrittenStaysInTheCache) {
  const auto document = made();
  document->updatePosterImage(picture(10, 10));
  const std::string before = readFile(document->posterImagePath());
  const Installed<FaultyFiles> files(&Services::files);
  files->failWrite = support::anyPath();
  takeLines();
  document->updatePosterImage(picture(20, 20));
  EXPECT_EQ(takeLines(),
            support::Lines{support::warning("Document poster image cannot be saved at path \"" +
                                            document->posterImagePath().native() + "\": \"The disk is full.\"")});
  EXPECT_EQ(document->posterImage()->size(), (platform::Size{20, 20}));
  EXPECT_EQ(readFile(document->posterImagePath()), before);
}

TEST_F(QuiltDocumentPosterTest, ADocumentWithoutAPathKeepsItsPosterInMemory) {
  const auto document = QuiltDocument::init();
  document->updatePosterImage(picture(10, 10));
  EXPECT_EQ(document->posterImage()->size(), (platform::Size{10, 10}));
  EXPECT_EQ(document->posterImageVersion(), 2u);
}

// ---- The thumbnail

TEST_F(QuiltDocumentPosterTest, TheThumbnailOfADocumentWithoutAPosterIsThePlaceholder) {
  const auto document = made();
  EXPECT_TRUE(document->glanceUpdate());
  EXPECT_THAT(treeOf(document->path()), ElementsAre("Glance/", "Glance/Thumbnail.png"));
  EXPECT_EQ(sizeOfFile(document->glanceThumbnailPath()), document->posterImage()->size());
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentPosterTest, TheThumbnailHasTheSizeOfThePoster) {
  const auto document = made();
  document->updatePosterImage(picture(100, 50));
  EXPECT_TRUE(document->glanceUpdate());
  EXPECT_EQ(sizeOfFile(document->glanceThumbnailPath()), (platform::Size{100, 50}));
  document->updatePosterImage(picture(30, 40));
  EXPECT_TRUE(document->glanceUpdate());
  EXPECT_EQ(sizeOfFile(document->glanceThumbnailPath()), (platform::Size{30, 40}));
}

TEST_F(QuiltDocumentPosterTest, WithoutAPosterNoThumbnailIsWritten) {
  const auto document = made();
  writeFile(document->posterImagePath(), "no image");
  EXPECT_TRUE(document->glanceUpdate());
  EXPECT_THAT(treeOf(document->path()), ElementsAre("poster.png"));
}

TEST_F(QuiltDocumentPosterTest, AThumbnailFolderThatCannotBeMadeIsReported) {
  const auto document = made();
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named("Glance");
  takeLines();
  EXPECT_FALSE(document->glanceUpdate());
  // The first placeholder has lost its percent sign: the folder stands in the error's place.
  EXPECT_EQ(takeLines(), Lines{warning("Failed to create intermediate directory \"@\" for Glance: \"" +
                                       (document->path() / "Glance").native() + "\"")});
}

TEST_F(QuiltDocumentPosterTest, AThumbnailThatCannotBeSavedIsReported) {
  const Installed<FaultyImages> images(&Services::images);
  images->failSave = support::named("Thumbnail.png");
  const auto document = made();
  takeLines();
  EXPECT_FALSE(document->glanceUpdate());
  EXPECT_EQ(takeLines(), Lines{warning("Failed to save Glance thumbnail at path \"" +
                                       document->glanceThumbnailPath().native() + "\"")});
  EXPECT_THAT(treeOf(document->path()), ElementsAre("Glance/"));
}

}  // namespace
}  // namespace quilt
