// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <future>
#include <thread>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"

namespace quilt {
namespace {

using platform::ChangePhase;
using platform::Services;
using support::critical;
using support::debug;
using support::FaultyFiles;
using support::Installed;
using support::Line;
using support::Lines;
using support::ToldAudioPreview;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaSourceAudioSamplesTest : public support::PackageFixture {
 protected:
  const Path sound = support::makeMedia(support::m4aSound());

  /// A source of the sound in the package, with the folder that samples need and no samples yet.
  std::shared_ptr<QuiltMediaSource> soundSource() {
    auto source = addSource(sound);
    std::filesystem::create_directories(source->audioSamplesFolderPath());
    takeLines();
    return source;
  }
  /// The same with its samples.
  std::shared_ptr<QuiltMediaSource> sampledSource() {
    auto source = soundSource();
    EXPECT_TRUE(source->addAudioSamplesForMainDerivative());
    EXPECT_NE(source->audioSamples(), nullptr);
    takeLines();
    return source;
  }

  /// Samples that say of themselves that they are flattened, with a file.
  std::shared_ptr<QuiltMediaAudioSamples> flattenedSamples(QuiltMediaSource& source, const std::string& uuid) {
    writeFile(source.audioSamplesFolderPath() / (uuid + ".asc"), "samples");
    auto samples = QuiltMediaAudioSamples::init();
    samples->setUuid(uuid);
    samples->setIsFlattened(true);
    return samples;
  }

  static Line notFlattened(const QuiltMediaAudioSamples& samples) {
    return debug("Failed to flatten source audio samples \"" + samples.uuid().value_or("(null)") + "\" at URL \"" +
                 (samples.sourceURL() ? samples.sourceURL()->absoluteString() : "(null)") + "\"");
  }

  struct Change {
    ChangePhase phase;
    bool hasSamples;
    bool operator==(const Change&) const = default;
  };
  /// What an observer of the samples sees while the action runs.
  static std::vector<Change> changesDuring(QuiltMediaSource& source, const std::function<void()>& action) {
    std::vector<Change> changes;
    const auto observation = source.observe(
        "audioSamples",
        [&](const platform::ChangeNotice& notice) {
          changes.push_back({notice.phase, source.audioSamples() != nullptr});
        },
        platform::ObservationOptions::Prior);
    action();
    return changes;
  }
};

// ---- Samples of the main derivative

TEST_F(QuiltMediaSourceAudioSamplesTest, TheMainDerivativeGivesTheSamplesTheirIdentityAndSound) {
  const auto source = soundSource();
  EXPECT_TRUE(source->addAudioSamplesForMainDerivative());
  const auto samples = source->audioSamples();
  ASSERT_NE(samples, nullptr);
  EXPECT_EQ(samples->uuid(), source->mainDerivative()->uuid());
  EXPECT_EQ(samples->sourceURL(), Url::fileUrl(sound));
  EXPECT_EQ(samples->sourceOwner(), source);
  EXPECT_TRUE(samples->isFlattened());
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), ElementsAre(*samples->uuid() + ".asc"));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceAudioSamplesTest, WithoutAMainDerivativeThereAreNone) {
  const auto source = addEmptySource();
  EXPECT_FALSE(source->addAudioSamplesForMainDerivative());
  EXPECT_FALSE(QuiltMediaSource::init()->addAudioSamplesForMainDerivative());
  EXPECT_EQ(takeLines(),
            (Lines{debug("Failed to get mainDerivative for flattening audio samples at path \"" +
                         source->path().native() + "\""),
                   debug("Failed to get mainDerivative for flattening audio samples at path \"(null)\"")}));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, ASilentMovieHasNone) {
  const auto source = addSource(support::makeMedia(support::silentMovie()));
  std::filesystem::create_directories(source->audioSamplesFolderPath());
  takeLines();
  EXPECT_FALSE(source->addAudioSamplesForMainDerivative());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AWebLinkHasNone) {
  const auto source = QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
  takeLines();
  EXPECT_FALSE(source->addAudioSamplesForMainDerivative());
  EXPECT_EQ(takeLines(),
            Lines{debug("Cannot audio to generate audio samples with non-file url \"https://example.org/\"")});
}

TEST_F(QuiltMediaSourceAudioSamplesTest, ASourceThatIsDetachedTriesQuietlyAndFlatteningTriesAgain) {
  const auto source = QuiltMediaSource::initWithPath(sound);
  takeLines();
  EXPECT_TRUE(source->addAudioSamplesForMainDerivative()) << "an attempt was made";
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(takeLines(), Lines{debug("Failed to flatten source audio samples \"" + source->mainDerivative()->uuid() +
                                     "\" at URL \"" + Url::fileUrl(sound).absoluteString() + "\"")});
  item()->addSource(source);
  EXPECT_TRUE(source->flattenCopy(true, {}));
  ASSERT_NE(source->audioSamples(), nullptr);
  EXPECT_EQ(source->audioSamples()->sourceURL(), source->mainDerivative()->url()) << "the copy in the package";
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AnAttemptThatFailsAnswersTrueAndLeavesThemOut) {
  const Installed<ToldAudioPreview> preview(&Services::audioPreview);
  preview->fails = true;
  const auto source = soundSource();
  const std::string uuid = source->mainDerivative()->uuid();
  EXPECT_TRUE(source->addAudioSamplesForMainDerivative());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(takeLines(),
            (Lines{critical("Failed to extract audio samples file at path \"" +
                            (source->audioSamplesFolderPath() / (uuid + ".asc")).native() + "\": \"(null)\""),
                   debug("Failed to flatten source audio samples \"" + uuid + "\" at URL \"" +
                         Url::fileUrl(sound).absoluteString() + "\"")}));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AFalseAnswerStopsTheAttempt) {
  const auto source = soundSource();
  EXPECT_TRUE(source->addAudioSamplesForMainDerivative([] { return false; }));
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), IsEmpty());
}

// ---- Add

TEST_F(QuiltMediaSourceAudioSamplesTest, AddingNothingIsIgnored) {
  const auto source = sampledSource();
  const auto before = source->audioSamples();
  EXPECT_THAT(changesDuring(*source, [&] { source->addAudioSamples(nullptr); }), IsEmpty());
  EXPECT_EQ(source->audioSamples(), before);
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AddingReplacesEarlierOnesAndAnnouncesIt) {
  const auto source = sampledSource();
  const auto earlier = source->audioSamples();
  const auto samples = flattenedSamples(*source, "S");
  EXPECT_THAT(changesDuring(*source, [&] { source->addAudioSamples(samples); }),
              ElementsAre(Change{ChangePhase::Will, true}, Change{ChangePhase::Did, true}));
  EXPECT_EQ(source->audioSamples(), samples);
  EXPECT_EQ(samples->sourceOwner(), source);
  EXPECT_TRUE(std::filesystem::exists(earlier->path())) << "the earlier ones' file stays";
}

TEST_F(QuiltMediaSourceAudioSamplesTest, SamplesThatCannotBeFlattenedLeaveTheEarlierOnesInPlace) {
  const auto source = sampledSource();
  const auto earlier = source->audioSamples();
  const auto again = QuiltMediaAudioSamples::initWithURL(Url::fileUrl(sound), earlier->uuid());
  EXPECT_THAT(changesDuring(*source, [&] { source->addAudioSamples(again); }), IsEmpty());
  EXPECT_EQ(source->audioSamples(), earlier);
  EXPECT_EQ(
      takeLines(),
      (Lines{critical("Didn't expect audio samples file at path \"" + earlier->path().native() + "\": \"(null)\""),
             notFlattened(*again)}));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, SamplesWithoutValuesAreNamedAsNothing) {
  const auto source = soundSource();
  source->addAudioSamples(QuiltMediaAudioSamples::init());
  EXPECT_EQ(takeLines(), Lines{debug("Failed to flatten source audio samples \"(null)\" at URL \"(null)\"")});
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AddingSavesTheDocumentAlsoWhenItFails) {
  const auto source = soundSource();
  std::filesystem::remove(document()->propertiesPath());
  source->addAudioSamples(flattenedSamples(*source, "S"));
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));
  std::filesystem::remove(document()->propertiesPath());
  source->addAudioSamples(QuiltMediaAudioSamples::init());
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, NothingIsSavedWhileTheDocumentIsProcessing) {
  keepDocumentBusy();
  std::filesystem::remove(document()->propertiesPath());
  const auto source = soundSource();
  const auto samples = flattenedSamples(*source, "S");
  source->addAudioSamples(samples);
  source->removeAudioSamples(samples);
  EXPECT_FALSE(std::filesystem::exists(document()->propertiesPath()));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, ARecordThatIsNotFlattenedHasItsSamplesExtractedAgain) {
  const auto loaded = QuiltMediaSource::initWithDictionary({{"UUID", "source"}}, item());
  std::filesystem::create_directories(loaded->audioSamplesFolderPath());
  const Dictionary record{
      {"UUID", "source"},
      {"AudioSamples", Dictionary{{"UUID", "S"}, {"SourceURL", Url::fileUrl(sound).absoluteString()}}}};
  const auto source = QuiltMediaSource::initWithDictionary(record, item());
  ASSERT_NE(source->audioSamples(), nullptr);
  EXPECT_TRUE(source->audioSamples()->isFlattened());
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), ElementsAre("S.asc"));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AndGoesWithoutThemWhenTheFileIsAlreadyThere) {
  const Path file = item()->sourcesFolderPath() / "source" / "audiosamples" / "S.asc";
  writeFile(file, "already here");
  const std::string url = Url::fileUrl(sound).absoluteString();
  takeLines();
  const auto source = QuiltMediaSource::initWithDictionary(
      {{"UUID", "source"}, {"AudioSamples", Dictionary{{"UUID", "S"}, {"SourceURL", url}}}}, item());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(takeLines(),
            (Lines{critical("Didn't expect audio samples file at path \"" + file.native() + "\": \"(null)\""),
                   debug("Failed to flatten source audio samples \"S\" at URL \"" + url + "\"")}));
  EXPECT_EQ(readFile(file), "already here");
}

TEST_F(QuiltMediaSourceAudioSamplesTest, ASourcesRecordCarriesItsSamples) {
  const auto source = sampledSource();
  const Dictionary record = source->dictionary();
  ASSERT_NE(record.dictionary("AudioSamples"), nullptr);
  EXPECT_EQ(*record.dictionary("AudioSamples"), source->audioSamples()->dictionary());
  const auto loaded = QuiltMediaSource::initWithDictionary(record, item());
  ASSERT_NE(loaded->audioSamples(), nullptr);
  EXPECT_TRUE(loaded->audioSamples()->isFlattened());
  EXPECT_GT(source->audioSamples()->totalSizeInMegaBytes(), 0);
  EXPECT_EQ(loaded->audioSamples()->totalSizeInMegaBytes(), source->audioSamples()->totalSizeInMegaBytes());
}

// ---- Remove

TEST_F(QuiltMediaSourceAudioSamplesTest, RemovingFlattenedSamplesDeletesTheirFile) {
  const auto source = sampledSource();
  const auto samples = source->audioSamples();
  EXPECT_THAT(changesDuring(*source, [&] { source->removeAudioSamples(samples); }),
              ElementsAre(Change{ChangePhase::Will, true}, Change{ChangePhase::Did, false}));
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(samples->sourceOwner(), nullptr);
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), IsEmpty());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceAudioSamplesTest, RemovingSamplesOfALoadedRecordDeletesTheirFileToo) {
  const auto source = QuiltMediaSource::initWithDictionary(sampledSource()->dictionary(), item());
  const Path file = source->audioSamples()->path();
  ASSERT_TRUE(std::filesystem::exists(file));
  source->removeAllAudioSamples();
  EXPECT_FALSE(std::filesystem::exists(file));
  EXPECT_EQ(source->audioSamples(), nullptr);
}

TEST_F(QuiltMediaSourceAudioSamplesTest, RemovingNothingIsIgnored) {
  const auto source = sampledSource();
  EXPECT_THAT(changesDuring(*source, [&] { source->removeAudioSamples(nullptr); }), IsEmpty());
  EXPECT_NE(source->audioSamples(), nullptr);
}

TEST_F(QuiltMediaSourceAudioSamplesTest, SamplesThatAreNotFlattenedKeepTheirFile) {
  const auto source = sampledSource();
  const auto samples = source->audioSamples();
  samples->setIsFlattened(false);
  source->removeAudioSamples(samples);
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_THAT(namesIn(source->audioSamplesFolderPath()), ElementsAre(*samples->uuid() + ".asc"));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, AFileThatIsGoneAlreadyIsNoFailure) {
  const auto source = sampledSource();
  std::filesystem::remove(source->audioSamples()->path());
  source->removeAudioSamples(source->audioSamples());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceAudioSamplesTest, ADeletionThatFailsIsLoggedAndTheSlotEmptiedAllTheSame) {
  const auto source = sampledSource();
  const auto samples = source->audioSamples();
  const Path file = samples->path();
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::withExtension("asc");
  source->removeAudioSamples(samples);
  EXPECT_EQ(takeLines(),
            Lines{warning("Failed to delete audio samples at path \"" + file.native() + "\": \"The disk is full.\"")});
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(samples->sourceOwner(), nullptr);
  EXPECT_TRUE(std::filesystem::exists(file));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, RemovingSavesTheDocument) {
  const auto source = sampledSource();
  std::filesystem::remove(document()->propertiesPath());
  source->removeAudioSamples(source->audioSamples());
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));
}

TEST_F(QuiltMediaSourceAudioSamplesTest, RemovingAllRemovesACopyAndLeavesTheObjectItsOwner) {
  const auto source = sampledSource();
  const auto samples = source->audioSamples();
  source->removeAllAudioSamples();
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(samples->sourceOwner(), source);
  EXPECT_FALSE(std::filesystem::exists(samples->path()));
  EXPECT_THAT(changesDuring(*source, [&] { source->removeAllAudioSamples(); }), IsEmpty()) << "there are none left";
}

// ---- Lock

TEST_F(QuiltMediaSourceAudioSamplesTest, ChangesWaitForTheLockOfTheCurrentSamples) {
  const auto source = sampledSource();
  const auto samples = source->audioSamples();
  std::promise<void> locked;
  std::promise<void> release;
  std::thread holder([&] {
    const auto lock = samples->lock();
    locked.set_value();
    release.get_future().wait();
  });
  locked.get_future().wait();
  std::atomic<bool> removed = false;
  std::thread remover([&] {
    source->removeAudioSamples(samples);
    removed = true;
    platform::services().runLoop->wake();
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_FALSE(removed);
  EXPECT_EQ(source->audioSamples(), samples);
  release.set_value();
  holder.join();
  // The change itself is made on this thread, the main one.
  platform::services().runLoop->runUntil([&] { return removed.load(); });
  remover.join();
  EXPECT_EQ(source->audioSamples(), nullptr);
}

}  // namespace
}  // namespace quilt
