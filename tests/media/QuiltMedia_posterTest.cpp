// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/media/QuiltMedia.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::PropertyList;
using platform::Services;
using platform::Size;
using support::critical;
using support::FaultyFiles;
using support::FaultyImages;
using support::Installed;
using support::Lines;
using support::MediaSpec;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaPosterTest : public support::PackageFixture {
 protected:
  Path posterFile() const { return item()->posterImagePath(); }

  /// The item's poster file, as another run left it.
  Path writePoster(std::size_t width, std::size_t height) const {
    std::filesystem::create_directories(item()->path());
    EXPECT_TRUE(picture(width, height)->saveAsJPGAtPath(posterFile()));
    return posterFile();
  }

  static Size sizeOfFile(const Path& file) {
    const auto image = ImageWrapper::imageWithPath(file);
    return image ? image->size() : Size{0, 0};
  }

  support::Line notValid() const {
    return warning("Media poster image path \"" + posterFile().native() + "\" is not a valid image");
  }
};

// ---- Making it

TEST_F(QuiltMediaPosterTest, TheFirstSourcesPictureIsKeptInStandardDefinitionAndSaved) {
  keepDocumentBusy();
  addSource(pictureFile(1280, 960));
  addSource(pictureFile(8, 8));
  takeLines();
  const auto poster = item()->posterImage();
  ASSERT_NE(poster, nullptr);
  EXPECT_EQ(poster->size(), (Size{640, 480}));
  EXPECT_EQ(sizeOfFile(posterFile()), (Size{640, 480}));
  EXPECT_EQ(readFile(posterFile()).substr(0, 3), "\xFF\xD8\xFF") << "a JPEG file";
  EXPECT_EQ(item()->posterImageVersion(), 2u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaPosterTest, ASmallPictureIsNotEnlarged) {
  addSource(pictureFile(64, 48));
  EXPECT_EQ(item()->posterImage()->size(), (Size{64, 48}));
}

TEST_F(QuiltMediaPosterTest, AMovieShowsAFrame) {
  MediaSpec spec;
  spec.width = 320;
  spec.height = 240;
  addSource(support::makeMedia(spec));
  const auto poster = item()->posterImage();
  ASSERT_NE(poster, nullptr);
  EXPECT_EQ(poster->size(), (Size{320, 240}));
  EXPECT_EQ(sizeOfFile(posterFile()), (Size{320, 240}));
}

TEST_F(QuiltMediaPosterTest, ThePosterIsMadeOnce) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  const auto poster = item()->posterImage();
  std::filesystem::remove(posterFile());
  EXPECT_EQ(item()->posterImage(), poster);
  EXPECT_EQ(item()->posterImageVersion(), 2u);
  EXPECT_FALSE(std::filesystem::exists(posterFile()));
}

TEST_F(QuiltMediaPosterTest, APosterThatWasSetIsAnsweredAsItIs) {
  keepDocumentBusy();
  const auto set = picture(2000, 1000);
  item()->setPosterImage(set);
  EXPECT_EQ(item()->posterImage(), set);
  EXPECT_EQ(item()->posterImageVersion(), 1u);
  EXPECT_FALSE(std::filesystem::exists(item()->path()));
}

TEST_F(QuiltMediaPosterTest, TheSaveThatANewPosterAsksForKnowsItsSize) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  letDocumentSave();
  ASSERT_NE(item()->posterImage(), nullptr);
  const Dictionary record = readRecord(document()->propertiesPath());
  const Dictionary& media = *record.array("Media")->front().as<Dictionary>();
  EXPECT_EQ(*media.find("PosterImageWidth"), PropertyList(64.0));
  EXPECT_EQ(item()->posterImageVersion(), 2u);
}

// ---- None to be had

TEST_F(QuiltMediaPosterTest, WithoutAPreviewThereIsNoneAndNoMessage) {
  keepDocumentBusy();
  EXPECT_EQ(item()->posterImage(), nullptr);
  EXPECT_EQ(item()->posterImageVersion(), 2u) << "raised all the same";
  addEmptySource();
  EXPECT_EQ(item()->posterImage(), nullptr);
  EXPECT_EQ(item()->posterImageVersion(), 3u);
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(item()->path()));
}

TEST_F(QuiltMediaPosterTest, AFirstSourceWithoutAPosterOfItsOwnGivesNone) {
  keepDocumentBusy();
  const auto source = addSource(pictureFile(8, 8));
  source->addPreview(QuiltMediaPreview::initWithDictionary({{"Index", 0}, {"IsFlattened", true}}, source));
  std::filesystem::create_directories(source->previewsFolderPath());
  writeFile(source->previewsFolderPath() / "0.jpg", "no picture");
  takeLines();
  EXPECT_EQ(item()->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), (Lines{warning("Media source preview path \"" +
                                        (source->previewsFolderPath() / "0.jpg").native() + "\" is not a valid image"),
                                warning("Media poster image cannot be previewed because URL \"" +
                                        source->mainDerivative()->url()->absoluteString() + "\" is invalid"),
                                warning("Media poster image cannot be previewed")}));
  EXPECT_EQ(item()->posterImageVersion(), 2u);
  EXPECT_FALSE(std::filesystem::exists(item()->posterImagePath()));
}

TEST_F(QuiltMediaPosterTest, ACompositionThatAnotherRunSavedIsShown) {
  item()->setContentCategory(kQuiltMediaContentCategoryMontage);
  writePoster(512, 512);
  ASSERT_NE(item()->posterImage(), nullptr);
  EXPECT_EQ(item()->posterImage()->size(), (Size{480, 480}));
  EXPECT_THAT(takeLines(), IsEmpty());
}

// ---- Reading it

TEST_F(QuiltMediaPosterTest, APosterFileIsReducedAndNeitherSavedAgainNorCounted) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  const std::string before = readFile(writePoster(1280, 960));
  const Installed<FaultyImages> images(&Services::images);
  const auto poster = item()->posterImage();
  ASSERT_NE(poster, nullptr);
  EXPECT_EQ(poster->size(), (Size{640, 480}));
  EXPECT_EQ(item()->posterImage(), poster);
  EXPECT_EQ(item()->posterImageVersion(), 1u);
  EXPECT_EQ(images->decodes, 0) << "no pixel was needed";
  EXPECT_EQ(readFile(posterFile()), before);
}

TEST_F(QuiltMediaPosterTest, APosterFileThatIsNoImageIsReportedEachTimeAndStays) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  writeFile(posterFile(), "no image");
  takeLines();
  EXPECT_EQ(item()->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), Lines{notValid()});
  EXPECT_EQ(item()->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), Lines{notValid()});
  EXPECT_EQ(readFile(posterFile()), "no image");
  EXPECT_EQ(item()->posterImageVersion(), 1u);
  std::filesystem::remove(posterFile());
  EXPECT_NE(item()->posterImage(), nullptr) << "until the file is gone";
}

TEST_F(QuiltMediaPosterTest, APosterFileThatLeadsOutOfTheDocumentIsNotRead) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  const Path outside = pictureFile(32, 24, "jpg");
  std::filesystem::create_directories(item()->path());
  std::filesystem::create_symlink(outside, posterFile());
  takeLines();
  EXPECT_EQ(item()->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), (Lines{warning("Refused the file of a media poster image: \"" + posterFile().native() +
                                        "\" leads out of the document"),
                                notValid()}));
}

// ---- Faults

TEST_F(QuiltMediaPosterTest, AFolderThatCannotBeMadeIsCriticalAndTheSaveIsStillTried) {
  keepDocumentBusy();
  const Installed<FaultyImages> images(&Services::images);
  addSource(pictureFile(64, 48));
  const Installed<FaultyFiles> files(&Services::files);
  files->failCreate = support::named(item()->uuid());
  takeLines();
  const int before = images->decodes;
  const auto poster = item()->posterImage();
  ASSERT_NE(poster, nullptr);
  EXPECT_EQ(poster->size(), (Size{64, 48}));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to create intermediate directories for media at path \"" +
                                        item()->path().native() + "\": \"The disk is full.\"")});
  EXPECT_EQ(images->decodes, before + 1) << "the save";
  EXPECT_FALSE(std::filesystem::exists(posterFile()));
  EXPECT_EQ(item()->posterImage(), poster);
}

TEST_F(QuiltMediaPosterTest, AFailedSaveIsNotReported) {
  const Installed<FaultyImages> images(&Services::images);
  images->failSave = support::named("poster.jpg");
  addSource(pictureFile(64, 48));
  takeLines();
  EXPECT_NE(item()->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_THAT(namesIn(item()->path()), IsEmpty());
}

TEST_F(QuiltMediaPosterTest, APosterIsNotWrittenThroughAFolderThatLeadsOutOfTheDocument) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  const Path outside = folder() / "outside";
  std::filesystem::create_directories(outside);
  std::filesystem::create_directories(document()->mediaFolderPath());
  std::filesystem::create_directory_symlink(outside, item()->path());
  takeLines();
  EXPECT_NE(item()->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), (Lines{critical("Failed to create intermediate directories for media at path \"" +
                                         item()->path().native() + "\": \"The folder leads out of the document\""),
                                warning("Refused the file of a media poster image: \"" + posterFile().native() +
                                        "\" leads out of the document")}));
  EXPECT_THAT(namesIn(outside), IsEmpty());
}

TEST_F(QuiltMediaPosterTest, WithoutADocumentThePosterIsDrawnEachTimeAndNeverSaved) {
  const auto loose = QuiltMedia::init();
  loose->addSource(QuiltMediaSource::initWithPath(pictureFile(64, 48)));
  const auto before = namesIn(folder());
  takeLines();
  const Lines expected = {critical(
      "Failed to create intermediate directories for media at path \"(null)\": \"The item is not in a document\"")};
  const auto first = loose->posterImage();
  ASSERT_NE(first, nullptr);
  EXPECT_EQ(takeLines(), expected);
  EXPECT_EQ(loose->posterImageVersion(), 2u);
  EXPECT_EQ(loose->posterImage(), first) << "cached";
  EXPECT_THAT(takeLines(), IsEmpty());
  loose->invalidateCaches();
  EXPECT_NE(loose->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), expected);
  EXPECT_EQ(loose->posterImageVersion(), 3u);
  EXPECT_EQ(namesIn(folder()), before);
}

// ---- Its size

TEST_F(QuiltMediaPosterTest, TheSizeIsRealWithAPosterAndTheIntegerZeroWithout) {
  EXPECT_EQ(item()->posterImageWidth(), PropertyList(0));
  EXPECT_EQ(item()->posterImageHeight(), PropertyList(0));
  item()->setPosterImage(picture(30, 20));
  EXPECT_EQ(item()->posterImageWidth(), PropertyList(30.0));
  EXPECT_EQ(item()->posterImageHeight(), PropertyList(20.0));
}

// ---- Invalidating

TEST_F(QuiltMediaPosterTest, AfterTheCachesWereDroppedTheFileIsReadAndTheVersionStays) {
  addSource(pictureFile(64, 48));
  const auto drawn = item()->posterImage();
  const auto version = item()->posterImageVersion();
  item()->invalidateCaches();
  EXPECT_TRUE(std::filesystem::exists(posterFile()));
  writePoster(20, 10);  // tells the file from a new drawing
  const auto read = item()->posterImage();
  EXPECT_NE(read, drawn);
  EXPECT_EQ(read->size(), (Size{20, 10}));
  EXPECT_EQ(item()->posterImageVersion(), version);
}

TEST_F(QuiltMediaPosterTest, AfterThePosterWasInvalidatedItIsDrawnAnewAndTheVersionHasGrownByTwo) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  writePoster(20, 10);
  ASSERT_EQ(item()->posterImage()->size(), (Size{20, 10}));
  const auto version = item()->posterImageVersion();
  takeLines();
  item()->invalidatePosterImage();
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(posterFile()));
  EXPECT_EQ(item()->posterImageVersion(), version + 1);
  EXPECT_EQ(item()->posterImage()->size(), (Size{64, 48}));
  EXPECT_EQ(sizeOfFile(posterFile()), (Size{64, 48}));
  EXPECT_EQ(item()->posterImageVersion(), version + 2);
}

TEST_F(QuiltMediaPosterTest, InvalidatingWithoutAFileLogsNothing) {
  keepDocumentBusy();
  item()->invalidatePosterImage();
  EXPECT_EQ(item()->posterImageVersion(), 2u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaPosterTest, InvalidatingWithoutADocumentOnlyDropsTheCacheAndRaisesTheVersion) {
  const auto loose = QuiltMedia::init();
  loose->setPosterImage(picture(8, 8));
  loose->invalidatePosterImage();
  EXPECT_EQ(loose->posterImageVersion(), 2u);
  EXPECT_EQ(loose->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaPosterTest, APosterFileThatCannotBeDeletedIsReportedAndTheCacheIsDroppedAllTheSame) {
  keepDocumentBusy();
  const auto cached = picture(8, 8);
  item()->setPosterImage(cached);
  writePoster(20, 10);
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::named("poster.jpg");
  item()->invalidatePosterImage();
  EXPECT_EQ(takeLines(), Lines{warning("Failed to delete poster image at path \"" + posterFile().native() +
                                       "\": \"The disk is full.\"")});
  EXPECT_EQ(item()->posterImageVersion(), 2u);
  EXPECT_NE(item()->posterImage(), cached);
  EXPECT_EQ(item()->posterImage()->size(), (Size{20, 10}));
}

TEST_F(QuiltMediaPosterTest, ObserversHearOfEachNewVersion) {
  keepDocumentBusy();
  std::vector<std::uint64_t> versions;
  const auto observation =
      item()->observe("posterImageVersion", [&](const auto&) { versions.push_back(item()->posterImageVersion()); });
  addSource(pictureFile(64, 48));
  item()->posterImage();
  item()->invalidatePosterImage();
  item()->posterImage();
  EXPECT_THAT(versions, ElementsAre(2u, 3u, 4u));
}

}  // namespace
}  // namespace quilt
