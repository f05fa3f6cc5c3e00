// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaAudioSamples.h"

#include <gmock/gmock.h>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"

namespace quilt {
namespace {

using platform::Services;
using support::critical;
using support::debug;
using support::Installed;
using support::Lines;
using support::ToldAudioPreview;
using support::ToldFiles;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaAudioSamplesTest : public support::PackageFixture {
 protected:
  const std::shared_ptr<QuiltMediaSource> source = addEmptySource();
  const Path sound = support::makeMedia(support::m4aSound());

  /// Samples of the sound with a place in the package; the folder is there unless the test removes it.
  std::shared_ptr<QuiltMediaAudioSamples> attached(const std::string& uuid = "S") {
    auto samples = QuiltMediaAudioSamples::initWithURL(Url::fileUrl(sound), uuid);
    samples->setSourceOwner(source);
    std::filesystem::create_directories(folderOfSamples());
    takeLines();
    return samples;
  }
  std::shared_ptr<QuiltMediaAudioSamples> read(const Dictionary& record) const {
    return QuiltMediaAudioSamples::initWithDictionary(record, source);
  }

  Path folderOfSamples() const { return source->audioSamplesFolderPath(); }

  static std::vector<std::string> keysOf(const Dictionary& record) {
    std::vector<std::string> keys;
    for (const auto& [key, value] : record) keys.push_back(key);
    return keys;
  }
};

// ---- Construction

TEST_F(QuiltMediaAudioSamplesTest, FreshSamplesHaveNothingNotEvenAnIdentity) {
  const auto samples = QuiltMediaAudioSamples::init();
  EXPECT_EQ(samples->uuid(), std::nullopt);
  EXPECT_EQ(samples->sampleURL(), std::nullopt);
  EXPECT_EQ(samples->sourceURL(), std::nullopt);
  EXPECT_FALSE(samples->isFlattened());
  EXPECT_EQ(samples->sourceOwner(), nullptr);
}

TEST_F(QuiltMediaAudioSamplesTest, ASoundGivesSamplesOfWhichNothingIsExtractedYet) {
  const auto samples = QuiltMediaAudioSamples::initWithURL(Url::fileUrl(sound), Text("S"));
  ASSERT_NE(samples, nullptr);
  EXPECT_EQ(samples->uuid(), "S");
  EXPECT_EQ(samples->sourceURL(), Url::fileUrl(sound));
  EXPECT_EQ(samples->sampleURL(), std::nullopt);
  EXPECT_FALSE(samples->isFlattened());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, AMovieWithSoundGivesSamplesToo) {
  EXPECT_NE(QuiltMediaAudioSamples::initWithURL(Url::fileUrl(support::makeMedia({})), Text("S")), nullptr);
}

TEST_F(QuiltMediaAudioSamplesTest, ASilentMovieHasNone) {
  const Url silent = Url::fileUrl(support::makeMedia(support::silentMovie()));
  EXPECT_EQ(QuiltMediaAudioSamples::initWithURL(silent, Text("S")), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, AFileThatIsNoMediumHasNone) {
  const Url text = Url::fileUrl(writeFile(folder() / "notes.m4a", "text"));
  EXPECT_EQ(QuiltMediaAudioSamples::initWithURL(text, Text("S")), nullptr);
  EXPECT_EQ(QuiltMediaAudioSamples::initWithURL(Url::fileUrl(folder() / "gone.m4a"), Text("S")), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, AWebLinkIsRefusedWithALine) {
  EXPECT_EQ(QuiltMediaAudioSamples::initWithURL(*Url::parse("https://example.org/a.mp3"), Text("S")), nullptr);
  EXPECT_EQ(takeLines(),
            Lines{debug("Cannot audio to generate audio samples with non-file url \"https://example.org/a.mp3\"")});
}

TEST_F(QuiltMediaAudioSamplesTest, ACopyIsASecondObjectWithTheSameValuesAndOwner) {
  const auto samples = attached();
  ASSERT_TRUE(samples->flatten());
  const auto copy = samples->copy();
  EXPECT_NE(copy, samples);
  EXPECT_EQ(copy->uuid(), "S");
  EXPECT_TRUE(copy->sampleURL() && copy->sourceURL());
  EXPECT_EQ(copy->sampleURL(), samples->sampleURL());
  EXPECT_EQ(copy->sourceURL(), samples->sourceURL());
  EXPECT_TRUE(copy->isFlattened());
  EXPECT_EQ(copy->sourceOwner(), source);
  copy->setSourceOwner(nullptr);
  EXPECT_EQ(samples->sourceOwner(), source);
}

// ---- Place

TEST_F(QuiltMediaAudioSamplesTest, TheFileIsNamedByTheIdentityInTheSourcesFolder) {
  EXPECT_EQ(attached()->path(), source->path() / "audiosamples" / "S.asc");
}

TEST_F(QuiltMediaAudioSamplesTest, ThereIsNoPlaceUnlessTheWholeChainOfOwnersIsThere) {
  const auto samples = attached();
  samples->setSourceOwner(nullptr);
  EXPECT_EQ(samples->path(), Path());
  const auto loose = QuiltMediaSource::init();
  samples->setSourceOwner(loose);
  EXPECT_EQ(samples->path(), Path()) << "no media item";
  const auto looseItem = QuiltMedia::init();
  looseItem->addSource(loose);
  EXPECT_EQ(samples->path(), Path()) << "no document";
}

TEST_F(QuiltMediaAudioSamplesTest, ThereIsNoPlaceWithoutAnIdentity) {
  const auto samples = attached();
  samples->setUuid(std::nullopt);
  EXPECT_EQ(samples->path(), Path());
}

// ---- Record

TEST_F(QuiltMediaAudioSamplesTest, FlattenedSamplesAreStoredByName) {
  const auto samples = attached();
  ASSERT_TRUE(samples->flatten());
  const Dictionary record = samples->dictionary();
  EXPECT_THAT(keysOf(record),
              ElementsAre("UUID", "SampleFilename", "SourceURL", "IsFlattened", "TotalSizeInMegaBytes"));
  EXPECT_EQ(record.string("UUID"), "S");
  EXPECT_EQ(record.string("SampleFilename"), "S.asc");
  EXPECT_EQ(record.string("SourceURL"), Url::fileUrl(sound).absoluteString());
  EXPECT_EQ(record.boolean("IsFlattened"), true);
  EXPECT_EQ(record.real("TotalSizeInMegaBytes"), samples->totalSizeInMegaBytes());
}

TEST_F(QuiltMediaAudioSamplesTest, SamplesThatAreNotFlattenedAreStoredByUrlWhenTheyHaveOne) {
  const auto samples = attached();
  EXPECT_THAT(keysOf(samples->dictionary()), ElementsAre("UUID", "SourceURL", "IsFlattened", "TotalSizeInMegaBytes"));
  samples->setSampleURL(Url::fileUrl("/elsewhere/a.asc"));
  const Dictionary record = samples->dictionary();
  EXPECT_THAT(keysOf(record), ElementsAre("UUID", "SampleURL", "SourceURL", "IsFlattened", "TotalSizeInMegaBytes"));
  EXPECT_EQ(record.string("SampleURL"), "file:///elsewhere/a.asc");
  EXPECT_EQ(record.boolean("IsFlattened"), false);
}

TEST_F(QuiltMediaAudioSamplesTest, AnAddressThatIsNoFileIsStoredWholeAlsoWhenFlattened) {
  const auto samples = attached();
  samples->setIsFlattened(true);
  samples->setSampleURL(Url::parse("https://example.org/a.asc"));
  EXPECT_EQ(samples->dictionary().string("SampleURL"), "https://example.org/a.asc");
  EXPECT_FALSE(samples->dictionary().contains("SampleFilename"));
}

TEST_F(QuiltMediaAudioSamplesTest, FreshSamplesWriteOnlyWhatIsAlwaysWritten) {
  EXPECT_THAT(keysOf(QuiltMediaAudioSamples::init()->dictionary()), ElementsAre("IsFlattened", "TotalSizeInMegaBytes"));
}

TEST_F(QuiltMediaAudioSamplesTest, AFlattenedRecordLoadsWithoutSampleUrlAndIsSizedThroughItsPlace) {
  std::filesystem::create_directories(folderOfSamples());
  writeFile(folderOfSamples() / "S.asc", std::string(1024 * 1024, 'x'));
  const auto samples = read({{"UUID", "S"}, {"SampleFilename", "other.asc"}, {"IsFlattened", true}});
  EXPECT_EQ(samples->sampleURL(), std::nullopt);
  EXPECT_TRUE(samples->isFlattened());
  EXPECT_EQ(samples->totalSizeInMegaBytes(), 1);
}

TEST_F(QuiltMediaAudioSamplesTest, ASampleUrlOnlyMarksAndIsRebuiltWithoutTheExtension) {
  const auto samples = read({{"UUID", "S"}, {"SampleURL", "https://example.org/elsewhere.asc"}});
  EXPECT_EQ(samples->sampleURL(), Url::fileUrl(folderOfSamples() / "S"));
  EXPECT_FALSE(samples->isFlattened()) << "it loads unflattened without the key";
  EXPECT_EQ(samples->sourceOwner(), source);
}

TEST_F(QuiltMediaAudioSamplesTest, TheSourceUrlIsReadBack) {
  EXPECT_EQ(read({{"SourceURL", Url::fileUrl(sound).absoluteString()}})->sourceURL(), Url::fileUrl(sound));
}

TEST_F(QuiltMediaAudioSamplesTest, MissingKeysAndWrongKindsKeepTheFreshValues) {
  for (const Dictionary& record :
       {Dictionary{}, Dictionary{{"UUID", 1}, {"SampleURL", true}, {"SourceURL", Array{}}, {"IsFlattened", "yes"}}}) {
    const auto samples = read(record);
    ASSERT_NE(samples, nullptr);
    EXPECT_EQ(samples->uuid(), std::nullopt);
    EXPECT_EQ(samples->sampleURL(), std::nullopt);
    EXPECT_EQ(samples->sourceURL(), std::nullopt);
    EXPECT_FALSE(samples->isFlattened());
  }
}

TEST_F(QuiltMediaAudioSamplesTest, UnknownKeysAreWrittenBackAlsoByACopy) {
  const auto samples = read({{"Later", "kept"}});
  EXPECT_EQ(samples->dictionary().string("Later"), "kept");
  EXPECT_EQ(samples->copy()->dictionary().string("Later"), "kept");
}

TEST_F(QuiltMediaAudioSamplesTest, AnIdentityThatIsNoPlainNameIsRefused) {
  for (const std::string name : {"..", "", "a/b", "../../x"}) {
    takeLines();
    EXPECT_EQ(read({{"UUID", name}}), nullptr);
    EXPECT_EQ(takeLines(),
              Lines{warning("Refused the record of a samples file: \"" + name + "\" is no plain file name")});
  }
}

// ---- Flatten

TEST_F(QuiltMediaAudioSamplesTest, FlatteningExtractsTheSamplesIntoThePackage) {
  const auto samples = attached();
  const std::vector<std::int16_t> wave(600, 25600);
  samples->setSourceURL(Url::fileUrl(support::makeWav(wave, 1)));
  EXPECT_TRUE(samples->flatten());
  EXPECT_EQ(samples->sampleURL(), Url::fileUrl(folderOfSamples() / "S.asc"));
  EXPECT_TRUE(samples->isFlattened());
  EXPECT_THAT(namesIn(folderOfSamples()), ElementsAre("S.asc"));
  // A header, and the least and the greatest of each 256 frames.
  const std::string bytes = readFile(samples->path());
  EXPECT_EQ(bytes.substr(0, 4), std::string("\x02\0\0\0", 4));
  EXPECT_EQ(bytes.substr(24), "dddddd");
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, FlattenedSamplesAreLeftAlone) {
  const Installed<ToldAudioPreview> preview(&Services::audioPreview);
  const auto samples = attached();
  samples->setIsFlattened(true);
  samples->setSourceOwner(nullptr);
  EXPECT_TRUE(samples->flatten());
  EXPECT_THAT(preview->asked, IsEmpty());
  EXPECT_EQ(samples->sampleURL(), std::nullopt);
}

TEST_F(QuiltMediaAudioSamplesTest, WithoutAPlaceFlatteningFailsSilently) {
  const auto detached = attached();
  detached->setSourceOwner(nullptr);
  EXPECT_FALSE(detached->flatten());
  const auto nameless = attached();
  nameless->setUuid(std::nullopt);
  EXPECT_FALSE(nameless->flatten());
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_THAT(namesIn(folderOfSamples()), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, TheFolderMustBeThere) {
  const auto samples = attached();
  std::filesystem::remove(folderOfSamples());
  const Lines expected{
      critical("Expected audio samples folder at path \"" + folderOfSamples().native() + "\": \"(null)\"")};
  EXPECT_FALSE(samples->flatten());
  EXPECT_EQ(takeLines(), expected);
  writeFile(folderOfSamples(), "a file where the folder should be");
  EXPECT_FALSE(samples->flatten());
  EXPECT_EQ(takeLines(), expected);
  EXPECT_FALSE(samples->isFlattened());
  EXPECT_EQ(samples->sampleURL(), std::nullopt);
}

TEST_F(QuiltMediaAudioSamplesTest, AFolderThatLeadsOutOfThePackageIsRefused) {
  const auto samples = attached();
  std::filesystem::remove(folderOfSamples());
  std::filesystem::create_directory(folder() / "elsewhere");
  std::filesystem::create_directory_symlink(folder() / "elsewhere", folderOfSamples());
  EXPECT_FALSE(samples->flatten());
  EXPECT_EQ(
      takeLines(),
      (Lines{warning("Refused the file of a samples file: \"" + folderOfSamples().native() +
                     "\" leads out of the document"),
             critical("Expected audio samples folder at path \"" + folderOfSamples().native() + "\": \"(null)\"")}));
  EXPECT_THAT(namesIn(folder() / "elsewhere"), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, AFileInTheWayIsLeftAsItIs) {
  const auto samples = attached();
  writeFile(samples->path(), "already here");
  EXPECT_FALSE(samples->flatten());
  EXPECT_EQ(takeLines(), Lines{critical("Didn't expect audio samples file at path \"" + samples->path().native() +
                                        "\": \"(null)\"")});
  EXPECT_EQ(readFile(samples->path()), "already here");
  EXPECT_FALSE(samples->isFlattened());
}

TEST_F(QuiltMediaAudioSamplesTest, AnExtractionThatFailsLeavesTheSamplesAsTheyWere) {
  const Installed<ToldAudioPreview> preview(&Services::audioPreview);
  preview->fails = true;
  const auto samples = attached();
  EXPECT_FALSE(samples->flatten());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to extract audio samples file at path \"" + samples->path().native() +
                                        "\": \"(null)\"")});
  ASSERT_EQ(preview->asked.size(), 1u);
  EXPECT_EQ(preview->asked[0].first, Url::fileUrl(sound));
  EXPECT_EQ(preview->asked[0].second, Url::fileUrl(samples->path()));
  EXPECT_FALSE(samples->isFlattened());
  EXPECT_EQ(samples->sampleURL(), std::nullopt);
  preview->fails = false;
  EXPECT_TRUE(samples->flatten()) << "it may be tried again";
}

TEST_F(QuiltMediaAudioSamplesTest, ASoundThatIsGoneFailsTheExtraction) {
  const auto samples = attached();
  samples->setSourceURL(Url::fileUrl(folder() / "gone.m4a"));
  EXPECT_FALSE(samples->flatten());
  samples->setSourceURL(std::nullopt);
  EXPECT_FALSE(samples->flatten());
  const auto line =
      critical("Failed to extract audio samples file at path \"" + samples->path().native() + "\": \"(null)\"");
  EXPECT_EQ(takeLines(), (Lines{line, line}));
  EXPECT_THAT(namesIn(folderOfSamples()), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, AFalseAnswerStopsTheExtractionAndLeavesNothing) {
  const auto samples = attached();
  EXPECT_FALSE(samples->flatten([] { return false; }));
  EXPECT_EQ(takeLines(), Lines{critical("Failed to extract audio samples file at path \"" + samples->path().native() +
                                        "\": \"(null)\"")});
  EXPECT_THAT(namesIn(folderOfSamples()), IsEmpty());
  EXPECT_FALSE(samples->isFlattened());
}

// ---- Size, caches

TEST_F(QuiltMediaAudioSamplesTest, SizeIsComputedInSinglePrecisionAndOnlyOfFlattenedSamples) {
  const auto samples = attached();
  writeFile(samples->path(), std::string(123457, 'x'));
  EXPECT_EQ(samples->totalSizeInMegaBytes(), 0);
  samples->setIsFlattened(true);
  EXPECT_EQ(samples->totalSizeInMegaBytes(), static_cast<double>(123457.0F * 0.0009765625F * 0.0009765625F));
  samples->setSourceOwner(nullptr);
  EXPECT_EQ(samples->totalSizeInMegaBytes(), 0);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaAudioSamplesTest, SamplesThatCannotBeSizedSaySo) {
  const auto samples = attached();
  samples->setIsFlattened(true);
  const Installed<ToldFiles> files(&Services::files);
  files->failAttributes = support::named("S.asc");
  EXPECT_EQ(samples->totalSizeInMegaBytes(), 0);
  EXPECT_EQ(takeLines(), Lines{warning("Audio samples at path \"" + samples->path().native() +
                                       "\" cannot be sized: \"The disk is full.\"")});
}

TEST_F(QuiltMediaAudioSamplesTest, InvalidatingCachesChangesNothing) {
  const auto samples = attached();
  ASSERT_TRUE(samples->flatten());
  const Dictionary before = samples->dictionary();
  samples->invalidateCaches();
  EXPECT_EQ(samples->dictionary(), before);
  EXPECT_TRUE(std::filesystem::exists(samples->path()));
}

}  // namespace
}  // namespace quilt
