// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaPreview.h"

#include <gmock/gmock.h>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using support::critical;
using support::debug;
using support::Lines;
using support::MediaSpec;
using support::warning;
using ::testing::ElementsAre;
using ::testing::Pair;

class QuiltMediaPreviewTest : public support::PackageFixture {
 protected:
  static MediaSpec movieOf(double seconds) {
    MediaSpec spec;
    spec.duration = seconds;
    spec.sound = "";
    spec.width = 64;
    spec.height = 48;
    spec.frameRate = 5;
    spec.keyFrameInterval = 5;
    return spec;
  }

  static MediaSpec movieWithChapters() {
    MediaSpec spec = movieOf(5);
    spec.chapters = {{"One", 0}, {"Two", 1}, {"Three", 2}, {"Four", 3}, {"Fünf", 4}};
    return spec;
  }

  /// A movie of which a test decides everything but the frames.
  class ToldMovie final : public platform::Movie {
   public:
    std::optional<double> theDuration, thePosterTime, theKeyFrame;
    std::vector<platform::Chapter> theChapters;
    std::shared_ptr<ImageWrapper> theArtwork;
    std::vector<double> asked;
    std::shared_ptr<ImageWrapper> frame;

    std::optional<double> duration() const override { return theDuration; }
    std::optional<double> posterTime() const override { return thePosterTime; }
    const std::vector<platform::Chapter>& chapters() const override { return theChapters; }
    std::optional<double> keyFrameTimeAtOrBefore(double) override { return theKeyFrame; }
    platform::Result<std::shared_ptr<ImageWrapper>> frameAtTime(double time) override {
      asked.push_back(time);
      return frame;
    }
    std::shared_ptr<ImageWrapper> albumArtworkMovie() override { return theArtwork; }
  };

  class ToldToolkit final : public platform::MovieToolkit {
   public:
    mutable ToldMovie movie;
    mutable std::vector<double> asked;
    bool opens = true;

    platform::Result<std::unique_ptr<platform::Movie>> openMovie(const Path& path) const override {
      if (!opens) return platform::Error{platform::ErrorKind::Damaged, "It is broken", path};
      auto copy = std::make_unique<Recorder>(movie, asked);
      return std::unique_ptr<platform::Movie>(std::move(copy));
    }

   private:
    class Recorder final : public platform::Movie {
     public:
      Recorder(ToldMovie& movie, std::vector<double>& asked) : _movie(movie), _asked(asked) {}
      std::optional<double> duration() const override { return _movie.duration(); }
      std::optional<double> posterTime() const override { return _movie.posterTime(); }
      const std::vector<platform::Chapter>& chapters() const override { return _movie.chapters(); }
      std::optional<double> keyFrameTimeAtOrBefore(double time) override { return _movie.keyFrameTimeAtOrBefore(time); }
      platform::Result<std::shared_ptr<ImageWrapper>> frameAtTime(double time) override {
        _asked.push_back(time);
        return _movie.frameAtTime(time);
      }
      std::shared_ptr<ImageWrapper> albumArtworkMovie() override { return _movie.albumArtworkMovie(); }

     private:
      ToldMovie& _movie;
      std::vector<double>& _asked;
    };
  };

  /// The time of the frame that a movie's first preview shows.
  double posterTimeOf(const std::function<void(ToldMovie&)>& tell) {
    const auto toolkit = std::make_shared<ToldToolkit>();
    toolkit->movie.frame = picture(4, 4);
    tell(toolkit->movie);
    const auto source = addSource(support::makeMedia(movieOf(1)));
    const platform::ScopedService movies(&platform::Services::movies, toolkit);
    EXPECT_NE(source->previewAtIndex(0), nullptr);
    return toolkit->asked.empty() ? -1 : toolkit->asked.back();
  }
};

TEST_F(QuiltMediaPreviewTest, ALongMovieIsShownAtTenSecondsAndAShortOneInTheMiddle) {
  keepDocumentBusy();
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 90; }), 10);
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 12; }), 6);
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 20; }), 10);
}

TEST_F(QuiltMediaPreviewTest, TheTimeMovesBackToItsKeyFrameUnlessThatIsTheStart) {
  keepDocumentBusy();
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 90, movie.theKeyFrame = 8.5; }), 8.5);
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 90, movie.theKeyFrame = 0; }), 10);
}

TEST_F(QuiltMediaPreviewTest, TheAuthorsPosterTimeComesFirstUnlessItIsZero) {
  keepDocumentBusy();
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 90, movie.thePosterTime = 42; }), 42);
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theDuration = 90, movie.thePosterTime = 0; }), 10);
}

TEST_F(QuiltMediaPreviewTest, AlbumArtworkStandsForTheMovie) {
  EXPECT_EQ(posterTimeOf([](ToldMovie& movie) { movie.theArtwork = picture(8, 8); }), -1) << "no frame was taken";
}

TEST_F(QuiltMediaPreviewTest, AMovieWithoutChaptersHasOnePreview) {
  const auto source = addSource(support::makeMedia(movieOf(12)));
  EXPECT_EQ(source->previewCount(), 1u);
  const auto preview = source->previewAtIndex(0);
  ASSERT_NE(preview, nullptr);
  EXPECT_EQ(preview->index(), 0u);
  EXPECT_EQ(preview->title(), std::nullopt);
  EXPECT_EQ(preview->timecode(), kNoTimecode);
  EXPECT_EQ(preview->image()->size(), (platform::Size{64, 48}));
  EXPECT_EQ(source->previewAtIndex(1), nullptr);
}

TEST_F(QuiltMediaPreviewTest, AMovieHasAPreviewForEachChapter) {
  const auto source = addSource(support::makeMedia(movieWithChapters()));
  EXPECT_EQ(source->previewCount(), 5u);
  EXPECT_EQ(source->previewAtIndex(5), nullptr);
  const auto last = source->previewAtIndex(4);
  ASSERT_NE(last, nullptr);
  EXPECT_EQ(last->title(), "Fünf");
  EXPECT_NEAR(last->timecode(), 4, 0.01);
}

TEST_F(QuiltMediaPreviewTest, AskingTwiceGivesTheSamePreview) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = source->previewAtIndex(0);
  EXPECT_NE(preview, nullptr);
  EXPECT_EQ(source->previewAtIndex(0), preview);
  EXPECT_THAT(source->previews(), ElementsAre(preview));
}

TEST_F(QuiltMediaPreviewTest, APreviewThatWasRecordedButNeverWrittenIsMadeAgain) {
  keepDocumentBusy();
  const auto source = addSource(pictureFile(8, 8));
  const auto recorded = QuiltMediaPreview::initWithDictionary({{"Index", 0}}, source);
  source->addPreview(recorded);
  const auto preview = source->previewAtIndex(0);
  ASSERT_NE(preview, nullptr);
  EXPECT_NE(preview, recorded);
  EXPECT_NE(preview->image(), nullptr);
  EXPECT_THAT(source->previews(), ElementsAre(preview));
}

TEST_F(QuiltMediaPreviewTest, SoundImageAndLinkHaveOnePreviewEach) {
  const auto sound = addSource(support::makeMedia(support::m4aSound()));
  const auto image = addSource(pictureFile(2000, 1000));
  const auto link = QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
  item()->addSource(link);
  EXPECT_EQ(sound->previewCount(), 1u);
  EXPECT_NE(sound->previewAtIndex(0), nullptr);
  EXPECT_EQ(image->previewCount(), 1u);
  EXPECT_EQ(image->previewAtIndex(0)->image()->size(), (platform::Size{1280, 640}));
  EXPECT_EQ(link->previewCount(), 1u);
  EXPECT_NE(link->previewAtIndex(0), nullptr);
}

TEST_F(QuiltMediaPreviewTest, NothingHasNoPreviews) {
  EXPECT_EQ(addEmptySource()->previewCount(), 0u);
  EXPECT_EQ(addEmptySource()->previewAtIndex(0), nullptr);
}

TEST_F(QuiltMediaPreviewTest, AMovieThatCannotBeOpenedSaysSo) {
  keepDocumentBusy();
  const auto source = addSource(support::makeMedia(movieOf(1)));
  const auto toolkit = std::make_shared<ToldToolkit>();
  toolkit->opens = false;
  const platform::ScopedService movies(&platform::Services::movies, toolkit);
  takeLines();
  const std::string line = "Failed to preview movie derivative at URL \"" +
                           source->mainDerivative()->url()->absoluteString() + "\": \"It is broken\"";
  EXPECT_EQ(source->previewCount(), 0u);
  EXPECT_EQ(source->previewAtIndex(0), nullptr);
  EXPECT_EQ(takeLines(), (Lines{warning(line), warning(line)}));
}

// ---- The walk

TEST_F(QuiltMediaPreviewTest, TheWalkReportsEachPreviewWithItsShare) {
  const auto source = addSource(support::makeMedia(movieWithChapters()));
  std::vector<std::pair<std::size_t, double>> seen;
  EXPECT_TRUE(source->previewWithProgressionBlock([&](const auto& preview, double percentage) {
    seen.emplace_back(preview->index(), percentage);
    return true;
  }));
  EXPECT_THAT(seen, ElementsAre(Pair(0, 20), Pair(1, 40), Pair(2, 60), Pair(3, 80), Pair(4, 100)));
  EXPECT_TRUE(source->isPreviewed());
  EXPECT_TRUE(std::filesystem::is_directory(source->previewsFolderPath()));
}

TEST_F(QuiltMediaPreviewTest, TheWalkOverNothingReportsNoPreviewAtHundred) {
  const auto source = addEmptySource();
  std::vector<std::pair<bool, double>> seen;
  EXPECT_TRUE(source->previewWithProgressionBlock([&](const auto& preview, double percentage) {
    seen.emplace_back(preview != nullptr, percentage);
    return false;
  }));
  EXPECT_THAT(seen, ElementsAre(Pair(false, 100)));
}

TEST_F(QuiltMediaPreviewTest, TheWalkStopsWhenTheBlockSaysSo) {
  const auto source = addSource(support::makeMedia(movieWithChapters()));
  takeLines();
  EXPECT_FALSE(source->previewWithProgressionBlock([](const auto&, double percentage) { return percentage < 40; }));
  EXPECT_EQ(source->previews().size(), 2u);
  EXPECT_EQ(takeProblems(), Lines{critical("Previewing media at URL \"" + source->previewItemURL()->absoluteString() +
                                           "\" has been cancelled")});
}

TEST_F(QuiltMediaPreviewTest, TheWalkNeedsAFolder) {
  const auto source = addSource(pictureFile(8, 8));
  std::filesystem::create_directories(source->path());
  std::filesystem::permissions(source->path(), std::filesystem::perms::owner_read);
  writeFile(folder() / "in-the-way", "");
  std::filesystem::permissions(source->path(), std::filesystem::perms::owner_all);
  std::filesystem::remove_all(source->path());
  writeFile(source->path(), "a file where the folder should be");
  takeLines();
  EXPECT_FALSE(source->previewWithProgressionBlock({}));
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 2u);
  EXPECT_TRUE(lines[0].text.starts_with("Failed to create intermediate directories for source at path \"" +
                                        source->previewsFolderPath().native() + "\": \""));
  EXPECT_EQ(lines[0].level, platform::LogLevel::Debug);
  EXPECT_EQ(lines[1], critical("Failed to preview media at URL \"" + source->previewItemURL()->absoluteString() +
                               "\" has been cancelled"));
}

// ---- Record and file

TEST_F(QuiltMediaPreviewTest, FilesAreNamedByIndexOrIdentity) {
  const auto source = addSource(pictureFile(8, 8));
  EXPECT_EQ(source->previewAtIndex(0)->path(), source->previewsFolderPath() / "0.jpg");
  const auto loose = QuiltMediaPreview::initWithImageWrapper(picture(4, 4));
  EXPECT_EQ(loose->path(), Path());
  source->addPreview(loose);
  EXPECT_EQ(loose->path(), source->previewsFolderPath() / (loose->uuid() + ".jpg"));
}

TEST_F(QuiltMediaPreviewTest, AnAbsentImageGivesNoPreviewAndAnAbsentPreviewIsIgnored) {
  EXPECT_EQ(QuiltMediaPreview::initWithImageWrapper(nullptr), nullptr);
  const auto source = addEmptySource();
  source->addPreview(nullptr);
  EXPECT_TRUE(source->previews().empty());
}

TEST_F(QuiltMediaPreviewTest, FlattenWritesThePictureOnce) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = source->previewAtIndex(0);
  EXPECT_EQ(preview->totalSizeInMegaBytes(), 0);
  ASSERT_TRUE(preview->flatten());
  EXPECT_TRUE(std::filesystem::exists(preview->path()));
  EXPECT_GT(preview->totalSizeInMegaBytes(), 0);
  std::filesystem::remove(preview->path());
  EXPECT_TRUE(preview->flatten()) << "it is marked as flattened";
  EXPECT_FALSE(std::filesystem::exists(preview->path()));
}

TEST_F(QuiltMediaPreviewTest, FlattenWithoutAPictureFails) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = QuiltMediaPreview::initWithDictionary({{"Index", 3}}, source);
  source->addPreview(preview);
  takeLines();
  EXPECT_FALSE(preview->flatten());
  EXPECT_EQ(takeLines(),
            (Lines{warning("Media source preview path \"" + preview->path().native() + "\" does not exist"),
                   critical("Failed to flatten media source preview because image is unavailable")}));
  EXPECT_FALSE(QuiltMediaPreview::initWithImageWrapper(picture(4, 4))->flatten()) << "it has no place in a document";
}

TEST_F(QuiltMediaPreviewTest, AFlattenedPreviewComesBackFromItsFile) {
  const auto source = addSource(pictureFile(20, 10));
  const auto preview = source->previewAtIndex(0);
  preview->setTitle("T");
  preview->setContent("C");
  preview->setTimecode(2.5);
  ASSERT_TRUE(preview->flatten());
  const Dictionary record = preview->dictionary();
  std::vector<std::string> keys;
  for (const auto& [key, value] : record) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("UUID", "Title", "Content", "Index", "Timecode", "Width", "Height", "IsFlattened",
                                "Filename", "RelativePath"));
  EXPECT_EQ(record.string("Filename"), "0.jpg");
  EXPECT_EQ(record.string("RelativePath"),
            "media/" + item()->uuid() + "/sources/" + source->uuid() + "/previews/0.jpg");

  const auto loaded = QuiltMediaPreview::initWithDictionary(record, source);
  EXPECT_EQ(loaded->uuid(), preview->uuid());
  EXPECT_EQ(loaded->title(), "T");
  EXPECT_EQ(loaded->content(), "C");
  EXPECT_EQ(loaded->index(), 0u);
  EXPECT_EQ(loaded->timecode(), 2.5);
  EXPECT_TRUE(loaded->isFlattened());
  EXPECT_EQ(loaded->width(), std::nullopt);
  ASSERT_NE(loaded->image(), nullptr);
  EXPECT_EQ(loaded->width(), 20);
  EXPECT_EQ(loaded->height(), 10);
}

TEST_F(QuiltMediaPreviewTest, AFileThatIsNoPictureSaysSo) {
  const auto source = addSource(pictureFile(8, 8));
  std::filesystem::create_directories(source->previewsFolderPath());
  writeFile(source->previewsFolderPath() / "7.jpg", "no picture");
  const auto preview = QuiltMediaPreview::initWithDictionary({{"Index", 7}}, source);
  takeLines();
  EXPECT_EQ(preview->image(), nullptr);
  EXPECT_EQ(takeLines(),
            Lines{warning("Media source preview path \"" + preview->path().native() + "\" is not a valid image")});
}

TEST_F(QuiltMediaPreviewTest, AFileThatIsGoneCannotBeSized) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = source->previewAtIndex(0);
  ASSERT_TRUE(preview->flatten());
  std::filesystem::remove(preview->path());
  takeLines();
  EXPECT_EQ(preview->totalSizeInMegaBytes(), 0);
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_TRUE(
      lines[0].text.starts_with("Source preview at path \"" + preview->path().native() + "\" cannot be sized: \""));
}

TEST_F(QuiltMediaPreviewTest, ATimecodeOfNoneIsWrittenAsItStands) {
  const auto preview = QuiltMediaPreview::initWithImageWrapper(picture(4, 4));
  EXPECT_EQ(preview->dictionary().real("Timecode"), 3.4028234663852886e38);
  EXPECT_EQ(QuiltMediaPreview::initWithDictionary(preview->dictionary(), nullptr)->index(), kNoIndex);
}

TEST_F(QuiltMediaPreviewTest, RemovingDeletesTheFile) {
  const auto source = addSource(pictureFile(8, 8));
  const auto preview = source->previewAtIndex(0);
  ASSERT_TRUE(preview->flatten());
  const Path file = preview->path();
  source->removeAllPreviews();
  EXPECT_FALSE(std::filesystem::exists(file));
  EXPECT_TRUE(source->previews().empty());
  EXPECT_EQ(preview->sourceOwner(), nullptr);
}

}  // namespace
}  // namespace quilt
