// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cerrno>
#include <chrono>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"
#include "tests/support/Stopwatch.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::FailsAt;
using support::FaultyFiles;
using support::Installed;
using support::Line;
using support::Lines;
using support::MediaSpec;
using support::ToldAudioPreview;
using support::ToldFiles;
using support::ToldInspector;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kNoFolderOfSource = "Failed to create intermediate directories for source at path \"";
constexpr const char* kNoSamplesFolder = "Failed to create intermediate directories for audioSamples at path \"";

FailsAt failsAt(const Path& path) {
  return [path](const Path& changed) { return changed == path; };
}

class QuiltMediaSourceFlattenTest : public support::PackageFixture {
 protected:
  Progress progress;

  /// A derivative of the source whose file lies outside of the package and holds no medium.
  std::shared_ptr<QuiltMediaDerivative> addOutside(QuiltMediaSource& source, const std::string& name,
                                                   std::vector<std::string> tags = {"Desktop"}) {
    auto derivative = derivativeTagged(std::move(tags));
    derivative->setUrl(Url::fileUrl(writeFile(folder() / "outside" / name, "8 bytes!")));
    source.addDerivative(derivative);
    return derivative;
  }
  static std::shared_ptr<QuiltMediaPreview> addPicture(QuiltMediaSource& source, std::size_t index) {
    auto preview = QuiltMediaPreview::initWithImageWrapper(picture(4, 4));
    preview->setIndex(index);
    source.addPreview(preview);
    return preview;
  }
  /// A source of a sound whose file a test may take away.
  std::shared_ptr<QuiltMediaSource> soundSource() {
    const Path file = folder() / "sound.m4a";
    std::filesystem::copy_file(support::makeMedia(support::m4aSound()), file);
    return addSource(file);
  }
  std::shared_ptr<QuiltMediaSource> movieWithChapters() {
    MediaSpec spec = support::silentMovie();
    spec.duration = 5;
    spec.width = 64;
    spec.height = 48;
    spec.frameRate = 5;
    spec.keyFrameInterval = 5;
    spec.chapters = {{"One", 0}, {"Two", 1}, {"Three", 2}, {"Four", 3}, {"Five", 4}};
    return addSource(support::makeMedia(spec));
  }

  static std::string pathOf(const QuiltMediaSource& source) {
    return source.path().empty() ? "(null)" : source.path().native();
  }
  static Line flattening(const QuiltMediaSource& source) {
    return debug("Flattening source at path \"" + pathOf(source) + "\"");
  }
  static Line flattenFailed(const QuiltMediaSource& source) {
    return critical("Failed to flatten source at path \"" + pathOf(source) + "\"");
  }
  static Line derivativeFailed(const QuiltMediaSource& source, const std::optional<Url>& url) {
    return debug("Failed to flatten source derivative \"" + url->absoluteString() + "\" during flattening at path \"" +
                 pathOf(source) + "\"");
  }
  static Line finalizing(const QuiltMediaSource& source) {
    return debug("Finalizing source at path \"" + pathOf(source) + "\"");
  }
  static Line finalizeFailed(const QuiltMediaSource& source) {
    return critical("Failed to finalize source at path \"" + pathOf(source) + "\"");
  }
  static Line noFolder(const char* beginning, const Path& path) {
    return debug(beginning + path.native() + "\": \"The disk is full.\"");
  }
};

// ---- isFlattened

TEST_F(QuiltMediaSourceFlattenTest, ASourceIsFlattenedWhenItsDerivativesAndItsSamplesAre) {
  const auto source = addEmptySource();
  const auto samples = QuiltMediaAudioSamples::init();
  samples->setIsFlattened(true);
  source->addAudioSamples(samples);
  EXPECT_FALSE(source->isFlattened()) << "without derivatives";
  addFlattenedDerivative(*source, {"Desktop"});
  EXPECT_TRUE(source->isFlattened());
  const auto second = addOutside(*source, "clip.m4v", {"480p"});
  EXPECT_FALSE(source->isFlattened()) << "one derivative lies outside";
  second->setIsFlattened(true);
  EXPECT_TRUE(source->isFlattened());
  samples->setIsFlattened(false);
  EXPECT_FALSE(source->isFlattened());
}

TEST_F(QuiltMediaSourceFlattenTest, ASourceWithoutSamplesIsNeverFlattened) {
  const auto source = addEmptySource();
  addFlattenedDerivative(*source, {"Desktop"});
  EXPECT_FALSE(source->isFlattened());
}

// ---- Flatten

TEST_F(QuiltMediaSourceFlattenTest, TwoDerivativesAndTwoPreviewsShareTheRangeInQuarters) {
  const auto source = addEmptySource();
  addOutside(*source, "a.m4v");
  addOutside(*source, "b.m4v", {"480p"});
  addPicture(*source, 0);
  addPicture(*source, 1);
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {0, 4, 8};
  takeLines();
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 12.5, 25, 25,   // the first derivative
                                           25, 37.5, 50, 50,  // the second
                                           50, 75,            // after each preview
                                           100));
  EXPECT_EQ(takeLines(), Lines{flattening(*source)});
}

TEST_F(QuiltMediaSourceFlattenTest, StartsAreIntegerQuotientsAndSharesAreNot) {
  const auto source = addEmptySource();
  for (const char* name : {"a.m4v", "b.m4v", "c.m4v"}) addOutside(*source, name);
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {4};
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(50.0 / 3, 100.0 / 3, 33 + 50.0 / 3, 33 + 100.0 / 3,  //
                                           66 + 50.0 / 3, 66 + 100.0 / 3, 100));
}

TEST_F(QuiltMediaSourceFlattenTest, FlattenedDerivativesKeepTheirStepAndFlattenedPreviewsDoNot) {
  const auto source = addEmptySource();
  addFlattenedDerivative(*source, {"Desktop"});
  addOutside(*source, "b.m4v", {"480p"});
  ASSERT_TRUE(addPicture(*source, 0)->flatten());
  addPicture(*source, 1);
  const Installed<ToldFiles> files(&Services::files);
  files->reports = std::vector<std::int64_t>{};
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(50, 50, 100));
}

TEST_F(QuiltMediaSourceFlattenTest, EverythingComesToLieInTheSourcesFolder) {
  const auto source = soundSource();
  const auto derivative = source->mainDerivative();
  addPicture(*source, 0);
  takeLines();
  EXPECT_TRUE(source->flattenCopy(true, {}));
  EXPECT_THAT(namesIn(source->path()), ElementsAre("audiosamples", "derivatives", "previews"));
  EXPECT_THAT(namesIn(source->derivativesFolderPath()), ElementsAre(derivative->uuid() + ".m4a"));
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), ElementsAre(derivative->uuid() + ".asc"));
  EXPECT_THAT(namesIn(source->previewsFolderPath()), ElementsAre("0.jpg"));
  EXPECT_EQ(source->audioSamples()->sourceURL(), derivative->url());
  EXPECT_TRUE(source->isFlattened());
  EXPECT_TRUE(std::filesystem::exists(folder() / "sound.m4a"));
  EXPECT_EQ(takeLines(), Lines{flattening(*source)});
}

TEST_F(QuiltMediaSourceFlattenTest, MovingTakesTheUsersFile) {
  keepDocumentBusy();
  const auto source = soundSource();
  EXPECT_TRUE(source->flattenCopy(false, progress.block()));
  EXPECT_FALSE(std::filesystem::exists(folder() / "sound.m4a"));
  EXPECT_TRUE(std::filesystem::exists(source->mainDerivative()->url()->relativePath()));
  EXPECT_TRUE(source->isFlattened());
  EXPECT_THAT(progress.values, ElementsAre(100, 100));
}

TEST_F(QuiltMediaSourceFlattenTest, AnEmptySourceMakesItsFoldersAndHasNoSamples) {
  const auto source = addEmptySource();
  takeLines();
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(100));
  EXPECT_THAT(namesIn(source->path()), ElementsAre("audiosamples", "derivatives"));
  EXPECT_EQ(takeLines(),
            (Lines{flattening(*source), debug("Failed to get mainDerivative for flattening audio samples at path \"" +
                                              source->path().native() + "\"")}));
}

TEST_F(QuiltMediaSourceFlattenTest, AWebLinkIsFlattenedWithoutCopying) {
  keepDocumentBusy();
  const auto source = QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
  item()->addSource(source);
  takeLines();
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(100));
  EXPECT_THAT(namesIn(source->derivativesFolderPath()), IsEmpty());
  EXPECT_EQ(takeLines(), (Lines{flattening(*source), debug("Cannot audio to generate audio samples with non-file url "
                                                           "\"https://example.org/\"")}));
}

TEST_F(QuiltMediaSourceFlattenTest, ADocumentHasNoSamplesEvenWhenItsFileHoldsSound) {
  const auto source = addEmptySource();
  const auto document = addOutside(*source, "a.pdf");
  document->setContentType(platform::types::kPDF);
  const Installed<ToldInspector> inspector(&Services::inspector);
  inspector->facts.hasAudio = true;
  const Installed<ToldAudioPreview> preview(&Services::audioPreview);
  EXPECT_TRUE(source->flattenCopy(true, {}));
  EXPECT_THAT(preview->asked, IsEmpty());
  EXPECT_EQ(source->audioSamples(), nullptr);
  document->setContentType(platform::types::kPNG);
  EXPECT_TRUE(source->flattenCopy(true, {}));
  EXPECT_EQ(preview->asked.size(), 1u) << "every other category is asked";
}

TEST_F(QuiltMediaSourceFlattenTest, SamplesThatCannotBeTakenDoNotFailTheFlatten) {
  const auto source = soundSource();
  const Installed<ToldAudioPreview> preview(&Services::audioPreview);
  preview->fails = true;
  takeLines();
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  const auto main = source->mainDerivative();
  EXPECT_EQ(takeLines(),
            (Lines{flattening(*source),
                   critical("Failed to extract audio samples file at path \"" +
                            (source->audioSamplesFolderPath() / (main->uuid() + ".asc")).native() + "\": \"(null)\""),
                   debug("Failed to flatten source audio samples \"" + main->uuid() + "\" at URL \"" +
                         main->url()->absoluteString() + "\"")}));
  EXPECT_EQ(progress.values.back(), 100);
  EXPECT_FALSE(source->isFlattened());
}

TEST_F(QuiltMediaSourceFlattenTest, FlatteningOnceMoreKeepsTheSamplesThatAreThere) {
  const auto source = soundSource();
  ASSERT_TRUE(source->flattenCopy(true, {}));
  const auto samples = source->audioSamples();
  takeLines();
  EXPECT_TRUE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(100));
  EXPECT_EQ(source->audioSamples(), samples);
  EXPECT_EQ(
      takeLines(),
      (Lines{flattening(*source),
             critical("Didn't expect audio samples file at path \"" + samples->path().native() + "\": \"(null)\""),
             debug("Failed to flatten source audio samples \"" + *samples->uuid() + "\" at URL \"" +
                   source->mainDerivative()->url()->absoluteString() + "\"")}));
}

TEST_F(QuiltMediaSourceFlattenTest, TheLastAnswerHasNoEffect) {
  const auto source = addEmptySource();
  EXPECT_TRUE(source->flattenCopy(true, [](double) { return false; }));
}

TEST_F(QuiltMediaSourceFlattenTest, ASourceOutsideOfADocumentFails) {
  const auto loose = QuiltMediaSource::init();
  const auto looseItem = QuiltMedia::init();
  const Lines expected{flattening(*loose),
                       debug("Failed to flatten source because it is not attached to a valid owner"),
                       flattenFailed(*loose)};
  takeLines();
  EXPECT_FALSE(loose->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), expected) << "no media item";
  looseItem->addSource(loose);
  EXPECT_FALSE(loose->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), expected) << "no document";
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaSourceFlattenTest, ASourceOfADocumentWithoutAPathFails) {
  const auto source = addEmptySource();
  const Path place = document()->path();
  document()->setPath({});
  takeLines();
  EXPECT_FALSE(source->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(), (Lines{flattening(*source), debug("Failed to flatten source because it does not have a path"),
                                flattenFailed(*source)}));
  EXPECT_THAT(progress.values, IsEmpty());
  document()->setPath(place);
}

TEST_F(QuiltMediaSourceFlattenTest, FoldersThatCannotBeMadeFail) {
  const struct {
    Path (QuiltMediaSource::*place)() const;
    const char* line;
  } folders[] = {{&QuiltMediaSource::path, kNoFolderOfSource},
                 {&QuiltMediaSource::derivativesFolderPath, kNoFolderOfSource},
                 {&QuiltMediaSource::audioSamplesFolderPath, kNoSamplesFolder}};
  for (const auto& [place, line] : folders) {
    const auto source = addEmptySource();
    const auto derivative = addOutside(*source, "a.m4v");
    const Path failing = (*source.*place)();
    const Installed<FaultyFiles> files(&Services::files);
    files->failCreate = failsAt(failing);
    takeLines();
    EXPECT_FALSE(source->flattenCopy(true, progress.block()));
    EXPECT_EQ(takeLines(), (Lines{flattening(*source), noFolder(line, failing), flattenFailed(*source)}));
    EXPECT_FALSE(derivative->isFlattened());
  }
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaSourceFlattenTest, ADerivativeThatFailsLeavesThoseBeforeItInThePackage) {
  const auto source = addEmptySource();
  const auto first = addOutside(*source, "a.m4v");
  const auto second = addOutside(*source, "b.m4v", {"720p"});
  const auto third = addOutside(*source, "c.m4v", {"480p"});
  addPicture(*source, 0);
  const auto url = second->url();
  takeLines();
  {
    const Installed<FaultyFiles> files(&Services::files);
    files->failCopy = support::named("b.m4v");
    EXPECT_FALSE(source->flattenCopy(true, progress.block()));
  }
  EXPECT_EQ(takeLines(),
            (Lines{flattening(*source), debug("Copy failed with error code (-1)"),
                   critical("Failed to flatten source derivative \"" + url->absoluteString() + "\" at \"" +
                            Url::fileUrl(source->derivativesFolderPath() / (second->uuid() + ".m4v")).absoluteString() +
                            "\""),
                   derivativeFailed(*source, url), flattenFailed(*source)}));
  EXPECT_THAT(progress.values, ElementsAre(25, 25));
  EXPECT_THAT(namesIn(source->derivativesFolderPath()), ElementsAre(first->uuid() + ".m4v"));
  EXPECT_TRUE(first->isFlattened());
  EXPECT_EQ(second->url(), url);
  EXPECT_FALSE(third->isFlattened());
  EXPECT_FALSE(source->previews()[0]->isFlattened());

  // Once more: the flattened one is skipped, its original no longer needed.
  std::filesystem::remove(folder() / "outside" / "a.m4v");
  EXPECT_TRUE(source->flattenCopy(true, {}));
  EXPECT_TRUE(third->isFlattened());
}

TEST_F(QuiltMediaSourceFlattenTest, ACancelDuringACopySurfacesAsAFailedCopy) {
  const auto source = addEmptySource();
  const auto derivative = addOutside(*source, "a.m4v");
  const auto url = derivative->url();
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {2, 4, 8};
  progress.cancelAt = 50;
  takeLines();
  EXPECT_FALSE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(25, 50));
  EXPECT_EQ(
      takeLines(),
      (Lines{flattening(*source), debug("Copy failed with error code (" + std::to_string(-ECANCELED) + ")"),
             critical("Failed to flatten source derivative \"" + url->absoluteString() + "\" at \"" +
                      Url::fileUrl(source->derivativesFolderPath() / (derivative->uuid() + ".m4v")).absoluteString() +
                      "\""),
             derivativeFailed(*source, url), flattenFailed(*source)}));
}

TEST_F(QuiltMediaSourceFlattenTest, APreviewThatFailsFailsTheSource) {
  const auto source = addEmptySource();
  addOutside(*source, "a.m4v");
  const auto preview = addPicture(*source, 0);
  preview->setImage(nullptr);
  takeLines();
  EXPECT_FALSE(source->flattenCopy(true, progress.block()));
  EXPECT_EQ(takeLines(),
            (Lines{flattening(*source),
                   warning("Media source preview path \"" + preview->path().native() + "\" does not exist"),
                   critical("Failed to flatten media source preview because image is unavailable"),
                   debug("Failed to flatten source preview \"" + preview->uuid() + "\" during flattening at path \"" +
                         source->path().native() + "\""),
                   flattenFailed(*source)}));
  EXPECT_THAT(progress.values, ElementsAre(50, 50)) << "only the derivative was reported";
  EXPECT_TRUE(source->mainDerivative()->isFlattened());
}

TEST_F(QuiltMediaSourceFlattenTest, ACancelBetweenPreviewsHasItsOwnLineAlone) {
  const auto source = addEmptySource();
  const auto first = addPicture(*source, 0);
  const auto second = addPicture(*source, 1);
  progress.cancelAt = 0;
  takeLines();
  EXPECT_FALSE(source->flattenCopy(true, progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_EQ(takeLines(), (Lines{flattening(*source), critical("Flattening has been cancelled")}));
  EXPECT_TRUE(first->isFlattened());
  EXPECT_FALSE(second->isFlattened());
}

TEST_F(QuiltMediaSourceFlattenTest, ASaveWaitsUntilTheFlattenIsDone) {
  const auto source = soundSource();
  std::filesystem::remove(document()->propertiesPath());
  bool savedMeanwhile = false;
  EXPECT_TRUE(source->flattenCopy(true, [&](double) {
    savedMeanwhile = savedMeanwhile || std::filesystem::exists(document()->propertiesPath());
    return true;
  }));
  EXPECT_FALSE(savedMeanwhile);
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));
}

// ---- A long sound

class LongSoundFlattenTest : public QuiltMediaSourceFlattenTest {
 protected:
  using Clock = std::chrono::steady_clock;

  LongSoundFlattenTest() {
    const auto derivative = derivativeTagged({"Desktop"});
    derivative->setUrl(Url::fileUrl(support::longSilence()));
    source->addDerivative(derivative);
    takeLines();
  }

  std::shared_ptr<QuiltMediaSource> source = addEmptySource();
};

TEST_F(LongSoundFlattenTest, ACancelStopsTheExtractionWithinASecondAndLeavesNothing) {
  support::Stopwatch asked;
  EXPECT_FALSE(source->flattenCopy(false, [&](double percentage) {
    progress.values.push_back(percentage);
    if (progress.values.size() < 3) return true;
    asked.start();
    return false;
  }));
  EXPECT_LT(asked.seconds(), 1);
  // The derivative's last report, repeated while the samples are taken.
  EXPECT_THAT(progress.values, ElementsAre(100, 100, 100));
  const auto main = source->mainDerivative();
  EXPECT_EQ(takeLines(),
            (Lines{flattening(*source),
                   critical("Failed to extract audio samples file at path \"" +
                            (source->audioSamplesFolderPath() / (main->uuid() + ".asc")).native() + "\": \"(null)\""),
                   debug("Failed to flatten source audio samples \"" + main->uuid() + "\" at URL \"" +
                         main->url()->absoluteString() + "\""),
                   critical("Flattening has been cancelled")}));
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), IsEmpty());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_TRUE(main->isFlattened()) << "what was done stays";

  // Once more: only the samples are missing.
  const Installed<ToldAudioPreview> preview(&Services::audioPreview);
  EXPECT_TRUE(source->flattenCopy(false, {}));
  EXPECT_TRUE(source->isFlattened());
}

TEST_F(LongSoundFlattenTest, TheBlockIsAskedAtLeastTwiceASecondWhileSamplesAreTaken) {
  auto last = Clock::time_point();
  Clock::duration longest{};
  support::Stopwatch sinceLast;
  double slowest = 0;
  const auto start = Clock::now();
  EXPECT_FALSE(source->flattenCopy(false, [&](double) {
    const auto now = Clock::now();
    if (last != Clock::time_point()) {
      longest = std::max(longest, now - last);
      slowest = std::max(slowest, sinceLast.seconds());
    }
    last = now;
    sinceLast.start();
    return now - start < std::chrono::milliseconds(1100);
  }));
  EXPECT_LT(slowest, 0.9);
  EXPECT_GT(longest, std::chrono::milliseconds(200)) << "and not without need";
}

TEST_F(LongSoundFlattenTest, AReloadStopsTheExtractionTooAndGoesOnWithoutSamples) {
  const auto longFile = source->mainDerivative()->url()->relativePath();
  const auto sourceToReload = addEmptySource();
  std::filesystem::create_directories(sourceToReload->audioSamplesFolderPath());
  const Installed<ToldInspector> inspector(&Services::inspector);
  inspector->facts.hasAudio = true;
  inspector->facts.audioCodecName = "PCM";
  const Installed<ToldFiles> files(&Services::files);
  std::filesystem::rename(longFile, folder() / "long.aiff");
  files->reports = std::vector<std::int64_t>{0};
  std::vector<double> values;
  const support::Stopwatch started;
  sourceToReload->reloadWithFileAtPath(folder() / "long.aiff", [&](double percentage) {
    values.push_back(percentage);
    return percentage < 20 || values.size() < 4;
  });
  EXPECT_LT(started.seconds(), 2);
  EXPECT_THAT(values, ElementsAre(0, 10, 20, 20, 20, 100));
  EXPECT_EQ(sourceToReload->audioSamples(), nullptr);
}

// ---- Finalize

TEST_F(QuiltMediaSourceFlattenTest, FinalizingMakesEveryPreviewAndPassesTheWalksReportsOn) {
  const auto source = movieWithChapters();
  takeLines();
  EXPECT_TRUE(source->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 20, 40, 60, 80, 100, 100));
  EXPECT_EQ(source->previews().size(), 5u);
  EXPECT_TRUE(source->isPreviewed());
  EXPECT_THAT(namesIn(source->path()), ElementsAre("previews"));
  EXPECT_EQ(takeLines(), Lines{finalizing(*source)});
}

TEST_F(QuiltMediaSourceFlattenTest, FinalizingASourceWithoutContentSucceeds) {
  const auto source = addEmptySource();
  EXPECT_TRUE(source->finalizeWithProgressionBlock([this](double percentage) {
    progress.values.push_back(percentage);
    return false;  // has no effect
  }));
  EXPECT_THAT(progress.values, ElementsAre(0, 100, 100));
}

TEST_F(QuiltMediaSourceFlattenTest, FinalizingASourceOutsideOfADocumentFails) {
  const auto loose = QuiltMediaSource::init();
  takeLines();
  EXPECT_FALSE(loose->finalizeWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(),
            (Lines{finalizing(*loose), debug("Failed to finalize source because it is not attached to a valid owner"),
                   finalizeFailed(*loose)}));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaSourceFlattenTest, FinalizingASourceOfADocumentWithoutAPathFails) {
  const auto source = addEmptySource();
  const Path place = document()->path();
  document()->setPath({});
  takeLines();
  EXPECT_FALSE(source->finalizeWithProgressionBlock(progress.block()));
  EXPECT_EQ(takeLines(), (Lines{finalizing(*source), debug("Failed to finalize source because it does not have a path"),
                                finalizeFailed(*source)}));
  EXPECT_THAT(progress.values, IsEmpty());
  document()->setPath(place);
}

TEST_F(QuiltMediaSourceFlattenTest, FinalizingNeedsItsFolders) {
  for (Path (QuiltMediaSource::*place)() const : {&QuiltMediaSource::path, &QuiltMediaSource::previewsFolderPath}) {
    const auto source = addEmptySource();
    const Path failing = (*source.*place)();
    const Installed<FaultyFiles> files(&Services::files);
    files->failCreate = failsAt(failing);
    takeLines();
    EXPECT_FALSE(source->finalizeWithProgressionBlock(progress.block()));
    EXPECT_EQ(takeLines(), (Lines{finalizing(*source), noFolder(kNoFolderOfSource, failing), finalizeFailed(*source)}));
  }
  EXPECT_THAT(progress.values, ElementsAre(0, 0));
}

TEST_F(QuiltMediaSourceFlattenTest, AWalkThatIsCancelledFailsTheFinalize) {
  const auto source = movieWithChapters();
  progress.cancelAt = 40;
  takeLines();
  EXPECT_FALSE(source->finalizeWithProgressionBlock(progress.block()));
  EXPECT_THAT(progress.values, ElementsAre(0, 20, 40));
  EXPECT_EQ(
      takeLines(),
      (Lines{
          finalizing(*source),
          critical("Previewing media at URL \"" + source->previewItemURL()->absoluteString() + "\" has been cancelled"),
          debug("Failed to generate previews for source during finalizing at \"" + source->path().native() + "\""),
          finalizeFailed(*source)}));
  EXPECT_EQ(source->previews().size(), 2u);
}

// ---- Export

TEST_F(QuiltMediaSourceFlattenTest, ExportTakesTheBestDerivativeForTheFormat) {
  const auto source = addEmptySource();
  addOutside(*source, "small.m4v", {"480p"});
  writeFile(addOutside(*source, "large.m4v", {"Desktop"})->url()->relativePath(), "large!!!");
  document()->setTitle("Show");
  std::filesystem::create_directory(folder() / "exports");
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {4, 8};
  EXPECT_EQ(source->exportToPath(folder() / "exports", "720p", progress.block()), folder() / "exports" / "Show.m4v");
  EXPECT_EQ(readFile(folder() / "exports" / "Show.m4v"), "8 bytes!") << "the lower grade, never the better one";
  EXPECT_THAT(progress.values, ElementsAre(50, 100, 100));
  EXPECT_EQ(source->exportToPath(folder() / "exports", "Desktop", {}), folder() / "exports" / "Show 2.m4v");
  EXPECT_EQ(readFile(folder() / "exports" / "Show 2.m4v"), "large!!!");
}

TEST_F(QuiltMediaSourceFlattenTest, ExportGivesNothingWhenNoDerivativeSuits) {
  const auto source = addEmptySource();
  addOutside(*source, "large.m4v", {"Desktop"});
  EXPECT_EQ(source->exportToPath(folder(), "480p", progress.block()), Path());
  EXPECT_EQ(source->exportToPath(folder(), "1080p", progress.block()), Path());
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltMediaSourceFlattenTest, TheAnswersOfTheBlockReachTheExport) {
  const auto source = addEmptySource();
  addOutside(*source, "large.m4v", {"Desktop"});
  std::filesystem::create_directory(folder() / "exports");
  EXPECT_EQ(source->exportToPath(folder() / "exports", "Desktop", [](double) { return false; }), Path());
  EXPECT_THAT(namesIn(folder() / "exports"), IsEmpty());
}

}  // namespace
}  // namespace quilt
