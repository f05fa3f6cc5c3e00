// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <algorithm>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::FaultyFiles;
using support::FaultyImages;
using support::Installed;
using support::Line;
using support::Lines;
using support::MediaSpec;
using support::ToldTranscoder;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

class QuiltMediaSourceConvertTest : public support::PackageFixture {
 protected:
  Progress progress;

  /// A silent movie that suits "480p" alone.
  static Path smallMovie() {
    MediaSpec spec = support::silentMovie();
    spec.duration = 0.2;
    return support::makeMedia(spec);
  }
  static Path largeMovie() {
    MediaSpec spec = support::silentMovie();
    spec.duration = 0.2;
    spec.width = 1920;
    spec.height = 1080;
    return support::makeMedia(spec);
  }
  static Path mediumMovie() {
    MediaSpec spec = support::silentMovie();
    spec.duration = 0.2;
    spec.width = 1280;
    spec.height = 720;
    return support::makeMedia(spec);
  }
  std::shared_ptr<QuiltMediaSource> source(const Path& file) {
    auto made = addSource(file);
    takeLines();
    return made;
  }

  Line nothingBetter(const char* size) const {
    return debug("Framework was asked to convert media with UUID \"" + item()->uuid() + "\" to " + size +
                 " format but no higher quality source is available");
  }
  static std::string mainUrl(const QuiltMediaSource& source) {
    return source.mainDerivative()->url()->absoluteString();
  }
  /// The files in the derivatives folder, hidden ones included.
  static std::vector<std::string> filesOf(const QuiltMediaSource& source) {
    return std::filesystem::exists(source.derivativesFolderPath()) ? namesIn(source.derivativesFolderPath())
                                                                   : std::vector<std::string>();
  }
  static bool isHiddenUuid(const Path& file, const std::string& extension) {
    const std::string name = file.filename();
    return name.size() == 1 + 36 + extension.size() && name.starts_with(".") && name.ends_with(extension);
  }
  /// One line has been logged: which grades the output, under its first, hidden name, suits.
  void expectOnlyTagging(const QuiltMediaSource& source, const std::string& category, const std::string& tags) {
    const Lines lines = takeLines();
    ASSERT_THAT(lines, SizeIs(1));
    const std::string start = "Derivative at URL \"" + Url::fileUrl(source.derivativesFolderPath()).absoluteString();
    const std::string end = "\" as \"" + category + "\" is compatible with \"" + tags + "\"";
    EXPECT_EQ(lines[0], debug(lines[0].text));
    EXPECT_TRUE(lines[0].text.starts_with(start)) << lines[0].text;
    EXPECT_TRUE(lines[0].text.ends_with(end)) << lines[0].text;
  }
  /// What a failed conversion leaves: one derivative, the flag as it was, nothing but the end report of 0.
  void expectFailed(const QuiltMediaSource& source, bool wasDirty = false) const {
    EXPECT_EQ(source.derivativeCount(), 1u);
    EXPECT_EQ(source.dirty(), wasDirty);
    EXPECT_EQ(progress.values.back(), 0);
  }
};

// ---- What needs no conversion

TEST_F(QuiltMediaSourceConvertTest, ACleanSourceThatHasTheFormatAnswersWithTheBlocksAnswer) {
  const auto source = addEmptySource();
  source->addDerivative(derivativeTagged({"720p"}));
  takeLines();
  EXPECT_TRUE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_FALSE(source->convertToFormat("720p", [](double percentage) { return percentage < 100; }));
  EXPECT_TRUE(source->convertToFormat("720p", [](double percentage) { return percentage > 0; }))
      << "the first answer has no effect";
  EXPECT_TRUE(source->convertToFormat("720p", {}));
  EXPECT_EQ(source->derivativeCount(), 1u);
  EXPECT_FALSE(std::filesystem::exists(source->path())) << "no file was touched";
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceConvertTest, DocumentsAndLinksAreNeverConverted) {
  const auto link = QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
  item()->addSource(link);
  const auto document = source(writeFile(folder() / "a.pdf", support::makePages(1)));
  for (const auto& each : {link, document}) {
    each->mainDerivative()->setCompatibilityTags(std::vector<std::string>{"Desktop"});
    takeLines();
    progress.values.clear();
    EXPECT_TRUE(each->convertToFormat("480p", progress.block()));
    EXPECT_THAT(progress.values, ElementsAre(0, 100));
    EXPECT_EQ(each->derivativeCount(), 1u);
    EXPECT_THAT(takeLines(), IsEmpty());
  }
}

TEST_F(QuiltMediaSourceConvertTest, ASourceWithoutMainDerivativeHasNoCategoryToConvert) {
  const auto source = addEmptySource();
  takeLines();
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{warning("Trying to convert a media with an invalid content category")});
  EXPECT_THAT(progress.values, ElementsAre(0)) << "no further report";
}

// ---- Images

TEST_F(QuiltMediaSourceConvertTest, AnImageIsScaledIntoANewDerivative) {
  const auto source = this->source(pictureFile(1600, 1200));
  EXPECT_TRUE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100)) << "the move's own reports are ignored";
  ASSERT_EQ(source->derivativeCount(), 2u);
  const auto made = source->derivativeAtIndex(1);
  EXPECT_THAT(*made->compatibilityTags(), ElementsAre("720p", "720p")) << "its own tag, and the one asked for";
  EXPECT_TRUE(made->isFlattened());
  EXPECT_EQ(made->url(), Url::fileUrl(source->derivativesFolderPath() / (made->uuid() + ".png")));
  EXPECT_THAT(filesOf(*source), ElementsAre(made->uuid() + ".png")) << "the hidden file has become the derivative's";
  EXPECT_EQ(ImageWrapper::imageWithURL(*made->url())->size(), (platform::Size{960, 720}));
}

TEST_F(QuiltMediaSourceConvertTest, AnImageIsScaledToStandardDefinitionFromEitherBetterGrade) {
  for (const auto& [width, height] : {std::pair(1600, 1200), std::pair(1000, 700)}) {
    const auto source = this->source(pictureFile(static_cast<std::size_t>(width), static_cast<std::size_t>(height)));
    EXPECT_TRUE(source->convertToFormat("480p", {}));
    ASSERT_EQ(source->derivativeCount(), 2u);
    EXPECT_THAT(*source->derivativeAtIndex(1)->compatibilityTags(), ElementsAre("480p", "480p"));
    EXPECT_LE(source->derivativeAtIndex(1)->width(), 640);
  }
}

TEST_F(QuiltMediaSourceConvertTest, AnImageIsNeverMadeForTheDesktop) {
  const auto source = this->source(pictureFile(320, 240));
  EXPECT_TRUE(source->convertToFormat("Desktop", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_EQ(source->derivativeCount(), 1u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceConvertTest, ASmallJpegHasNothingBetterForHighDefinition) {
  const auto source = this->source(pictureFile(640, 480, "jpg"));
  EXPECT_TRUE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_EQ(takeLines(), Lines{nothingBetter("HD")});
  EXPECT_EQ(source->derivativeCount(), 1u);
  EXPECT_THAT(filesOf(*source), IsEmpty());
}

TEST_F(QuiltMediaSourceConvertTest, AnyConversionThatSucceedsClearsTheDirtyFlag) {
  const auto source = this->source(pictureFile(640, 480, "jpg"));
  source->setDirty(true);
  source->mainDerivative()->setCompatibilityTags(std::vector<std::string>{"480p"});
  takeLines();
  EXPECT_TRUE(source->convertToFormat("720p", {}));
  EXPECT_FALSE(source->dirty());
  EXPECT_EQ(takeLines(), Lines{nothingBetter("HD")}) << "for an image, dirty or not does not matter";
}

TEST_F(QuiltMediaSourceConvertTest, ASmallImageHasNothingBetterForStandardDefinition) {
  // Clean, it would have the format already.
  const auto source = this->source(pictureFile(640, 480));
  source->setDirty(true);
  source->mainDerivative()->setCompatibilityTags(std::vector<std::string>{"480p"});
  takeLines();
  EXPECT_TRUE(source->convertToFormat("480p", {}));
  EXPECT_EQ(takeLines(), Lines{nothingBetter("SD")});
  EXPECT_EQ(source->derivativeCount(), 1u);
}

TEST_F(QuiltMediaSourceConvertTest, AnUnknownFormatFailsWithoutALine) {
  for (const Path& file : {pictureFile(1600, 1200), largeMovie()}) {
    const auto source = this->source(file);
    progress.values.clear();
    EXPECT_FALSE(source->convertToFormat("1080p", progress.block()));
    EXPECT_THAT(progress.values, ElementsAre(0, 0));
    EXPECT_THAT(takeLines(), IsEmpty());
    expectFailed(*source);
  }
}

TEST_F(QuiltMediaSourceConvertTest, AnImageThatCannotBeLoadedFails) {
  for (const char* format : {"720p", "480p"}) {
    const auto source = this->source(pictureFile(1600, 1200));
    std::filesystem::remove(folder() / "1600x1200.png");
    progress.values.clear();
    EXPECT_FALSE(source->convertToFormat(format, progress.block()));
    EXPECT_THAT(progress.values, ElementsAre(0, 0));
    EXPECT_EQ(takeLines(), Lines{critical("Failed to load image at path \"" + mainUrl(*source) + "\"")});
    expectFailed(*source);
  }
}

/// Images that load and cannot be scaled.
class UnscalableImages final : public platform::Images {
 public:
  class Image final : public ImageWrapper {
   public:
    [[nodiscard]] platform::Size size() const override { return {1600, 1200}; }
    [[nodiscard]] std::shared_ptr<ImageWrapper> convertToSD() const override { return nullptr; }
    [[nodiscard]] std::shared_ptr<ImageWrapper> convertToHD() const override { return nullptr; }
    [[nodiscard]] platform::Result<void> saveAsJPGAtPath(const Path&) const override { return support::kFault; }
    [[nodiscard]] platform::Result<void> saveAsPNGAtURL(const Url&) const override { return support::kFault; }
    [[nodiscard]] platform::Result<platform::Bitmap> bitmap() const override { return support::kFault; }
  };
  using Made = platform::Result<std::shared_ptr<ImageWrapper>>;
  [[nodiscard]] Made imageWithPath(const Path&) const override { return {std::make_shared<Image>()}; }
  [[nodiscard]] Made imageWithData(std::span<const unsigned char>) const override { return support::kFault; }
  [[nodiscard]] Made imageWithBitmap(platform::Bitmap) const override { return support::kFault; }
};

TEST_F(QuiltMediaSourceConvertTest, AnImageThatCannotBeScaledFailsInTheWordsOfItsSize) {
  const auto source = this->source(pictureFile(1600, 1200));
  const Installed<UnscalableImages> images(&Services::images);
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to convert image at path \"" + mainUrl(*source) + "\" to HD.")});
  EXPECT_FALSE(source->convertToFormat("480p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to convert image at URL \"" + mainUrl(*source) + "\" to SD.")});
  EXPECT_THAT(progress.values, ElementsAre(0, 0, 0, 0));
  expectFailed(*source);
}

TEST_F(QuiltMediaSourceConvertTest, AnImageThatCannotBeWrittenFails) {
  const auto source = this->source(pictureFile(1600, 1200));
  const Installed<FaultyImages> images(&Services::images);
  images->failSave = support::withExtension("png");
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to write converted image of \"" +
                                        source->previewItemURL()->absoluteString() + "\": \"The disk is full.\"")});
  expectFailed(*source);
}

TEST_F(QuiltMediaSourceConvertTest, AFolderThatCannotBeMadeFails) {
  for (const Path& file : {pictureFile(1600, 1200), largeMovie(), support::makeMedia(support::mp3Sound())}) {
    const auto source = this->source(file);
    const Installed<FaultyFiles> files(&Services::files);
    files->failCreate = support::named("derivatives");
    const Installed<ToldTranscoder> transcoder(&Services::transcoder);
    EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
    EXPECT_THAT(transcoder->calls, IsEmpty());
    expectFailed(*source);
  }
}

TEST_F(QuiltMediaSourceConvertTest, AResultThatCannotBeMovedIntoPlaceFails) {
  const auto source = this->source(pictureFile(1600, 1200));
  const Installed<FaultyFiles> files(&Services::files);
  files->failMove = support::anyPath();
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0));
  const Lines problems = takeProblems();
  ASSERT_THAT(problems, SizeIs(1));
  EXPECT_TRUE(problems[0].text.starts_with("Failed to flatten source derivative \"file:///")) << problems[0].text;
  ASSERT_THAT(filesOf(*source), SizeIs(1)) << "the output stays";
  EXPECT_TRUE(isHiddenUuid(filesOf(*source)[0], ".png")) << filesOf(*source)[0];
}

// ---- Sound

TEST_F(QuiltMediaSourceConvertTest, ASoundIsTranscodedForEveryTagThatNoDerivativeCarries) {
  for (const char* format : {"720p", "480p", "anything"}) {
    const auto source = this->source(support::makeMedia(support::mp3Sound()));
    const Installed<ToldTranscoder> transcoder(&Services::transcoder);
    transcoder->made = support::makeMedia(support::m4aSound());
    EXPECT_TRUE(source->convertToFormat(format, {}));
    ASSERT_THAT(transcoder->calls, SizeIs(1));
    EXPECT_EQ(transcoder->calls[0].operation, "audio");
    EXPECT_EQ(transcoder->calls[0].source.absoluteString(), mainUrl(*source));
    const Path destination = transcoder->calls[0].destination.relativePath();
    EXPECT_EQ(destination.parent_path(), source->derivativesFolderPath());
    EXPECT_TRUE(isHiddenUuid(destination, ".m4a")) << destination;
    ASSERT_EQ(source->derivativeCount(), 2u);
    const auto made = source->derivativeAtIndex(1);
    EXPECT_THAT(*made->compatibilityTags(), ElementsAre("Desktop", "720p", "480p", format));
    EXPECT_THAT(filesOf(*source), ElementsAre(made->uuid() + ".m4a"));
  }
}

TEST_F(QuiltMediaSourceConvertTest, EvenForTheDesktop) {
  const auto source = this->source(support::makeMedia(support::mp3Sound()));
  source->mainDerivative()->setCompatibilityTags(std::vector<std::string>{"480p"});
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  transcoder->made = support::makeMedia(support::m4aSound());
  EXPECT_TRUE(source->convertToFormat("Desktop", {}));
  EXPECT_THAT(transcoder->calls, SizeIs(1));
  EXPECT_EQ(source->derivativeCount(), 2u);
}

TEST_F(QuiltMediaSourceConvertTest, ASoundThatCannotBeTranscodedFails) {
  const auto source = this->source(support::makeMedia(support::mp3Sound()));
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  transcoder->reports = {10};
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_EQ(takeLines(),
            Lines{critical("Failed to convert file at URL \"" + mainUrl(*source) + "\" to audio: \"The film tore.\"")});
  EXPECT_THAT(progress.values, ElementsAre(0, 10, 0));
  expectFailed(*source);
}

// ---- Movies

TEST_F(QuiltMediaSourceConvertTest, AMovieIsTranscodedToTheSizeAskedFor) {
  const struct {
    const char* format;
    const char* operation;
    Path made;
    std::vector<std::string> tags;
  } cases[] = {{"720p", "HD", mediumMovie(), {"720p", "720p"}},
               {"480p", "SD", smallMovie(), {"480p", "480p"}},
               // The grade asked for is there even when the file's own is another.
               {"480p", "SD", mediumMovie(), {"720p", "480p"}}};
  for (const auto& [format, operation, file, tags] : cases) {
    const auto source = this->source(largeMovie());
    const Installed<ToldTranscoder> transcoder(&Services::transcoder);
    transcoder->made = file;
    EXPECT_TRUE(source->convertToFormat(format, {}));
    ASSERT_THAT(transcoder->calls, SizeIs(1));
    EXPECT_EQ(transcoder->calls[0].operation, operation);
    EXPECT_EQ(transcoder->calls[0].source.absoluteString(), mainUrl(*source));
    EXPECT_TRUE(isHiddenUuid(transcoder->calls[0].destination.relativePath(), ".m4v"));
    ASSERT_EQ(source->derivativeCount(), 2u);
    EXPECT_EQ(source->derivativeAtIndex(1)->compatibilityTags(), tags);
    EXPECT_TRUE(source->derivativeAtIndex(1)->isFlattened());
    EXPECT_THAT(filesOf(*source), ElementsAre(source->derivativeAtIndex(1)->uuid() + ".m4v"));
  }
}

TEST_F(QuiltMediaSourceConvertTest, AGradeThatIsAskedForNextIsMadeInTheSamePass) {
  for (const auto& [first, next] : {std::pair("720p", "480p"), std::pair("480p", "720p")}) {
    const auto source = this->source(largeMovie());
    const Installed<ToldTranscoder> transcoder(&Services::transcoder);
    transcoder->made = mediumMovie();
    EXPECT_TRUE(source->convertToFormat(first, {}, {next}));
    ASSERT_THAT(transcoder->calls, SizeIs(2));
    EXPECT_EQ(transcoder->calls[0].operation, "HD and SD");
    ASSERT_EQ(source->derivativeCount(), 3u);
    EXPECT_EQ(source->derivativeAtIndex(1)->compatibilityTags()->back(), first);
    EXPECT_EQ(source->derivativeAtIndex(2)->compatibilityTags()->back(), next);
    EXPECT_THAT(filesOf(*source), UnorderedElementsAre(source->derivativeAtIndex(1)->uuid() + ".m4v",
                                                       source->derivativeAtIndex(2)->uuid() + ".m4v"));
    EXPECT_TRUE(source->convertToFormat(next, {}));
    EXPECT_THAT(transcoder->calls, SizeIs(2)) << "it is there";
  }
}

TEST_F(QuiltMediaSourceConvertTest, AGradeThatIsThereOrUselessIsNotMadeAgain) {
  const auto source = this->source(largeMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  transcoder->made = smallMovie();
  EXPECT_TRUE(source->convertToFormat("480p", {}, {"Desktop", "480p"}));
  EXPECT_TRUE(source->convertToFormat("720p", {}, {"480p"}));
  const auto medium = this->source(mediumMovie());
  EXPECT_TRUE(medium->convertToFormat("480p", {}, {"720p"}));
  std::vector<std::string> operations;
  for (const auto& call : transcoder->calls) operations.push_back(call.operation);
  EXPECT_THAT(operations, ElementsAre("SD", "HD", "SD"));
}

TEST_F(QuiltMediaSourceConvertTest, APassForBothGradesFailsWithOneLine) {
  const auto source = this->source(largeMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  EXPECT_FALSE(source->convertToFormat("720p", progress.block(), {"480p"}));
  EXPECT_EQ(takeLines(),
            Lines{critical("Failed to convert video at URL \"" + mainUrl(*source) + "\" to HD: \"The film tore.\"")});
  EXPECT_EQ(source->derivativeCount(), 1u);
}

TEST_F(QuiltMediaSourceConvertTest, AMediumMovieIsTranscodedToStandardDefinition) {
  const auto source = this->source(mediumMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  transcoder->made = smallMovie();
  EXPECT_TRUE(source->convertToFormat("480p", {}));
  EXPECT_THAT(transcoder->calls, SizeIs(1));
}

TEST_F(QuiltMediaSourceConvertTest, TheTranscodersProgressIsPassedOnAndItsStopFlagSet) {
  const auto source = this->source(largeMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  transcoder->reports = {0.1F, 33.3F, 66.6F};
  transcoder->made = mediumMovie();
  progress.cancelAt = 60;
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, static_cast<double>(0.1F), static_cast<double>(33.3F),  //
                                           static_cast<double>(66.6F), 0));
  EXPECT_THAT(transcoder->stops, ElementsAre(false, false, true));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to convert video at URL \"" + mainUrl(*source) +
                                        "\" to HD: \"The projectionist left.\"")});
  expectFailed(*source);
}

TEST_F(QuiltMediaSourceConvertTest, AFailureNamesHighDefinitionForBothSizes) {
  for (const char* format : {"720p", "480p"}) {
    const auto source = this->source(largeMovie());
    source->setDirty(true);
    takeLines();
    progress.values.clear();
    const Installed<ToldTranscoder> transcoder(&Services::transcoder);
    EXPECT_FALSE(source->convertToFormat(format, progress.block()));
    EXPECT_EQ(takeLines(),
              Lines{critical("Failed to convert video at URL \"" + mainUrl(*source) + "\" to HD: \"The film tore.\"")});
    EXPECT_THAT(progress.values, ElementsAre(0, 0));
    expectFailed(*source, /*wasDirty=*/true);
  }
}

TEST_F(QuiltMediaSourceConvertTest, AMovieIsNeverMadeForTheDesktop) {
  const auto source = this->source(smallMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  EXPECT_TRUE(source->convertToFormat("Desktop", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(transcoder->calls, IsEmpty());
}

TEST_F(QuiltMediaSourceConvertTest, ASmallMovieHasNothingBetter) {
  const auto source = this->source(smallMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  EXPECT_TRUE(source->convertToFormat("720p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{nothingBetter("HD")});
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(transcoder->calls, IsEmpty());
}

TEST_F(QuiltMediaSourceConvertTest, AMovieThatCarriesNoGradeAtAllHasNoCategory) {
  const auto source = this->source(smallMovie());
  source->mainDerivative()->setCompatibilityTags(std::vector<std::string>{"other"});
  EXPECT_FALSE(source->convertToFormat("480p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{warning("Trying to convert a media with an invalid content category")});
}

TEST_F(QuiltMediaSourceConvertTest, ADirtySmallMovieIsTranscodedEvenSo) {
  for (const auto& [format, operation] : {std::pair("480p", "SD"), std::pair("720p", "HD")}) {
    const auto source = this->source(smallMovie());
    source->setDirty(true);
    source->mainDerivative()->setCompatibilityTags(std::vector<std::string>{"480p"});
    takeLines();
    const Installed<ToldTranscoder> transcoder(&Services::transcoder);
    transcoder->made = smallMovie();
    EXPECT_TRUE(source->convertToFormat(format, {}));
    ASSERT_THAT(transcoder->calls, SizeIs(1));
    EXPECT_EQ(transcoder->calls[0].operation, operation);
    EXPECT_FALSE(source->dirty());
    EXPECT_EQ(takeProblems(), Lines{});
  }
}

TEST_F(QuiltMediaSourceConvertTest, AnOutputThatNoDerivativeAcceptsFailsAndStays) {
  const auto source = this->source(largeMovie());
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  transcoder->made = writeFile(folder() / "no-movie", "no movie at all");
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 0));
  ASSERT_THAT(transcoder->calls, SizeIs(1));
  const Url output = transcoder->calls[0].destination;
  const Lines lines = takeLines();
  ASSERT_GE(lines.size(), 2u);
  EXPECT_EQ(lines[lines.size() - 2], debug("Failed to create source derivative for url \"" + output.absoluteString() +
                                           "\": \"Not a compatible file\""));
  EXPECT_EQ(lines.back(), critical("Failed to use the converted file at path \"" + output.relativePath().native() +
                                   "\": \"It cannot be read\""));
  EXPECT_TRUE(std::filesystem::exists(output.relativePath()));
  expectFailed(*source);
}

TEST_F(QuiltMediaSourceConvertTest, ANameThatIsTakenIsNotUsedAgain) {
  /// The same identity twice, then others.
  class Repeating final : public platform::UuidGenerator {
   public:
    mutable int made = 0;
    [[nodiscard]] std::string generateUUID() override {
      ++made;
      return "00000000-0000-4000-8000-00000000000" + std::to_string(made < 3 ? 1 : made);
    }
  };
  const auto source = this->source(largeMovie());
  writeFile(source->derivativesFolderPath() / ".00000000-0000-4000-8000-000000000001.m4v", "taken");
  const Installed<ToldTranscoder> transcoder(&Services::transcoder);
  const Installed<Repeating> uuids(&Services::uuids);
  EXPECT_FALSE(source->convertToFormat("720p", {}));
  ASSERT_THAT(transcoder->calls, SizeIs(1));
  EXPECT_EQ(transcoder->calls[0].destination,
            Url::fileUrl(source->derivativesFolderPath() / ".00000000-0000-4000-8000-000000000003.m4v"));
}

// ---- With the media library's own transcoder

TEST_F(QuiltMediaSourceConvertTest, ARealMovieBecomesBothGrades) {
  QUILT_CORPUS_FILE(movie, "h264-aac-1080p-phone.mp4");
  const auto source = this->source(movie);
  EXPECT_THAT(source->availableFormats(), ElementsAre("Desktop"));
  for (const char* format : {"720p", "480p"}) {
    progress.values.clear();
    EXPECT_TRUE(source->convertToFormat(format, progress.block()));
    EXPECT_EQ(progress.values.front(), 0);
    EXPECT_EQ(progress.values.back(), 100);
    EXPECT_TRUE(std::ranges::is_sorted(progress.values));
    EXPECT_GE(progress.values.size(), 6U) << "the transcoder reports, too";
    expectOnlyTagging(*source, "Movie", format);
  }
  ASSERT_EQ(source->derivativeCount(), 3u);
  const auto high = source->derivativeAtIndex(1);
  const auto standard = source->derivativeAtIndex(2);
  EXPECT_THAT(*high->compatibilityTags(), ElementsAre("720p", "720p"));
  EXPECT_THAT(*standard->compatibilityTags(), ElementsAre("480p", "480p"));
  EXPECT_THAT(source->availableFormats(), ElementsAre("Desktop", "720p", "480p"));
  EXPECT_THAT(filesOf(*source), UnorderedElementsAre(high->uuid() + ".m4v", standard->uuid() + ".m4v"));
  const auto size = [](const QuiltMediaDerivative& derivative) {
    const auto facts = platform::services().inspector->inspect(derivative.url()->relativePath());
    return facts ? std::pair(facts->width, facts->height) : std::pair(0.0, 0.0);
  };
  EXPECT_EQ(size(*high), std::pair(1280.0, 720.0));
  EXPECT_EQ(size(*standard), std::pair(640.0, 360.0));
}

TEST_F(QuiltMediaSourceConvertTest, ARealConversionStopsWhenTheBlockSaysSo) {
  QUILT_CORPUS_FILE(movie, "h264-aac-1080p-phone.mp4");
  const auto source = this->source(movie);
  progress.cancelAt = 10;
  EXPECT_FALSE(source->convertToFormat("480p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to convert video at URL \"" + mainUrl(*source) +
                                        "\" to HD: \"The conversion was stopped.\"")});
  EXPECT_THAT(filesOf(*source), IsEmpty());
  expectFailed(*source);
}

TEST_F(QuiltMediaSourceConvertTest, ARealMovieThatIsGoneFails) {
  const Path movie = support::copyOf(largeMovie());
  const auto source = this->source(movie);
  std::filesystem::remove(movie);
  EXPECT_FALSE(source->convertToFormat("720p", progress.block()));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to convert video at URL \"" + mainUrl(*source) +
                                        "\" to HD: \"There is no such file.\"")});
  expectFailed(*source);
}

TEST_F(QuiltMediaSourceConvertTest, ARealSoundIsConverted) {
  const auto source = this->source(support::makeMedia(support::mp3Sound()));
  EXPECT_TRUE(source->convertToFormat("extra", progress.block()));
  expectOnlyTagging(*source, "Audio", "Desktop,720p,480p");
  ASSERT_EQ(source->derivativeCount(), 2u);
  EXPECT_THAT(filesOf(*source), ElementsAre(source->derivativeAtIndex(1)->uuid() + ".m4a"));
  EXPECT_EQ(source->derivativeAtIndex(1)->compatibilityTags()->back(), "extra");
}

TEST_F(QuiltMediaSourceConvertTest, WhatWasMadeIsRecordedByName) {
  const auto source = this->source(pictureFile(1600, 1200));
  EXPECT_TRUE(source->convertToFormat("720p", {}));
  document()->update();
  const Dictionary record = readRecord(document()->propertiesPath());
  const auto* derivatives =
      record.array("Media")->front().as<Dictionary>()->array("Sources")->front().as<Dictionary>()->array("Derivatives");
  ASSERT_THAT(*derivatives, SizeIs(2));
  EXPECT_EQ((*derivatives)[1].as<Dictionary>()->string("Filename"), source->derivativeAtIndex(1)->uuid() + ".png");
}

}  // namespace
}  // namespace quilt
