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
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaPosterTest : public support::DocumentFixture {
 protected:
  /// A document that does not save by itself; its item has one picture.
  QuiltMediaPosterTest() : document(made()), item(addPictureItem(*document, 1600, 1200)) {
    document->setIsProcessing(true);
    takeLines();
  }

  std::string poster() const { return item->posterImagePath().native(); }

  const std::shared_ptr<QuiltDocument> document;
  const std::shared_ptr<QuiltMedia> item;
};

TEST_F(QuiltMediaPosterTest, TheFirstSourcesPosterIsReducedKeptAndSaved) {
  const auto image = item->posterImage();
  ASSERT_NE(image, nullptr);
  EXPECT_EQ(image->size(), (platform::Size{640, 480}));
  EXPECT_EQ(item->posterImage(), image) << "cached";
  EXPECT_EQ(item->posterImageVersion(), 2u);
  EXPECT_THAT(takeProblems(), IsEmpty());
  const auto stored = ImageWrapper::imageWithPath(poster());
  ASSERT_NE(stored, nullptr);
  EXPECT_EQ(stored->size(), (platform::Size{640, 480}));
  EXPECT_EQ(readFile(poster()).substr(0, 3), "\xFF\xD8\xFF") << "JPEG";
}

TEST_F(QuiltMediaPosterTest, AfterInvalidatingTheCachesItIsReadWithTheSameVersion) {
  ASSERT_NE(item->posterImage(), nullptr);
  const std::string bytes = readFile(poster());
  const std::uint64_t version = item->posterImageVersion();
  item->invalidateCaches();
  Installed<FaultyImages> images(&Services::images);
  ASSERT_NE(item->posterImage(), nullptr);
  EXPECT_EQ(item->posterImageVersion(), version);
  EXPECT_EQ(readFile(poster()), bytes);
  EXPECT_EQ(images->decodes, 0) << "read from the file, and not saved again";
}

TEST_F(QuiltMediaPosterTest, AfterInvalidatingThePosterItIsDrawnAnewAndTheVersionGrewByTwo) {
  ASSERT_NE(item->posterImage(), nullptr);
  const std::uint64_t version = item->posterImageVersion();
  item->invalidatePosterImage();
  ASSERT_NE(item->posterImage(), nullptr);
  EXPECT_EQ(item->posterImageVersion(), version + 2);
  EXPECT_TRUE(std::filesystem::exists(poster()));
}

TEST_F(QuiltMediaPosterTest, AnUnreadableFileGivesNoneEachTimeAndStays) {
  writeFile(poster(), "no image");
  const std::uint64_t version = item->posterImageVersion();
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(item->posterImage(), nullptr);
    EXPECT_THAT(takeProblems(),
                ElementsAre(warning("Media poster image path \"" + poster() + "\" is not a valid image")));
  }
  EXPECT_EQ(readFile(poster()), "no image");
  EXPECT_EQ(item->posterImageVersion(), version);
  std::filesystem::remove(poster());
  EXPECT_NE(item->posterImage(), nullptr);
}

TEST_F(QuiltMediaPosterTest, WithoutAPreviewThereIsNoneWithoutAMessage) {
  const auto empty = addItem(*document);
  takeLines();
  EXPECT_EQ(empty->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_EQ(empty->posterImageVersion(), 2u) << "an attempt counts";
  EXPECT_FALSE(std::filesystem::exists(empty->posterImagePath()));
}

TEST_F(QuiltMediaPosterTest, AFolderThatCannotBeMadeIsReportedAndTheImageIsAnsweredAllTheSame) {
  Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named(item->uuid());
  EXPECT_NE(item->posterImage(), nullptr);
  EXPECT_THAT(takeProblems(), ElementsAre(critical("Failed to create intermediate directories for media at path \"" +
                                                   item->path().native() + "\": \"The disk is full.\"")));
}

TEST_F(QuiltMediaPosterTest, ADetachedItemDrawsItsPosterEachTimeAndSavesNothing) {
  const auto detached = QuiltMedia::init();
  detached->addSource(QuiltMediaSource::initWithPath(pictureFile(64, 48)));
  takeLines();
  EXPECT_NE(detached->posterImage(), nullptr);
  EXPECT_THAT(takeProblems(),
              ElementsAre(critical("Failed to create intermediate directories for media at path \"(null)\": \"The item "
                                   "is not in a document\"")));
  EXPECT_EQ(detached->posterImageVersion(), 2u);
  detached->invalidateCaches();
  EXPECT_NE(detached->posterImage(), nullptr);
  EXPECT_EQ(detached->posterImageVersion(), 3u) << "drawn again";
  EXPECT_EQ(takeProblems().size(), 1u);
}

TEST_F(QuiltMediaPosterTest, AFailedSaveIsNotReported) {
  Installed<FaultyImages> images(&Services::images);
  images->failSave = support::named("poster.jpg");
  const auto other = addPictureItem(*document, 320, 240);
  takeLines();
  EXPECT_NE(other->posterImage(), nullptr);
  EXPECT_THAT(takeProblems(), IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(other->posterImagePath()));
}

TEST_F(QuiltMediaPosterTest, APosterBehindALinkOutOfThePackageIsNotRead) {
  const Path outside = pictureFile(64, 48, "outside.png");
  std::filesystem::create_directories(item->path());
  std::filesystem::create_symlink(outside, poster());
  EXPECT_EQ(item->posterImage(), nullptr);
  EXPECT_FALSE(takeProblems().empty());
}

}  // namespace
}  // namespace quilt
