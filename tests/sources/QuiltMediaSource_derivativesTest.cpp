// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cerrno>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/DocumentFixtures.h"
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
using support::Lines;
using support::ToldFiles;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaSourceDerivativesTest : public support::PackageFixture {
 protected:
  /// A PDF of a length that eight divides.
  Path documentFile() const {
    std::string pdf = support::makePages(1);
    pdf.resize((pdf.size() + 7) / 8 * 8, '\n');
    return writeFile(folder() / "file.pdf", pdf);
  }
  static Dictionary linkRecord(const std::string& tag) {
    return {{"URL", "https://example.org/" + tag}, {"ContentType", "public.url"}, {"CompatibilityTags", Array{tag}}};
  }
  static std::vector<std::string> keysOf(const Dictionary& record) {
    std::vector<std::string> keys;
    for (const auto& [key, value] : record) keys.push_back(key);
    return keys;
  }
  /// Whether the action made the document save itself.
  bool saves(const std::function<void()>& action) {
    std::filesystem::remove(document()->propertiesPath());
    action();
    return std::filesystem::exists(document()->propertiesPath());
  }

  Progress progress;
};

// ---- The list

TEST_F(QuiltMediaSourceDerivativesTest, TheTagsStandBestFirst) {
  EXPECT_THAT(QuiltMediaSource::compatibilityTagsInOrderOfQuality(), ElementsAre("Desktop", "720p", "480p"));
}

TEST_F(QuiltMediaSourceDerivativesTest, TheListKeepsTheOrderOfAddingAndEndsAtItsCount) {
  const auto source = addEmptySource();
  const auto first = derivativeTagged({"480p"});
  const auto second = derivativeTagged({"Desktop"});
  source->addDerivative(first);
  source->addDerivative(second);
  EXPECT_EQ(source->derivativeCount(), 2u);
  EXPECT_EQ(source->derivativeAtIndex(0), first);
  EXPECT_EQ(source->derivativeAtIndex(1), second);
  EXPECT_EQ(source->derivativeAtIndex(2), nullptr);
}

TEST_F(QuiltMediaSourceDerivativesTest, RemovingAnnouncesSavesAndIgnoresNothing) {
  const auto source = addEmptySource();
  const auto derivative = derivativeTagged({"Desktop"});
  source->addDerivative(derivative);
  std::vector<std::pair<ChangePhase, std::size_t>> seen;
  const auto observation = source->observe(
      "derivatives",
      [&](const platform::ChangeNotice& notice) { seen.emplace_back(notice.phase, source->derivativeCount()); },
      platform::ObservationOptions::Prior);
  EXPECT_FALSE(saves([&] { source->removeDerivative(nullptr); }));
  EXPECT_TRUE(saves([&] { source->removeDerivative(derivative); }));
  EXPECT_THAT(seen, ElementsAre(std::pair(ChangePhase::Will, 1u), std::pair(ChangePhase::Did, 0u)));
}

TEST_F(QuiltMediaSourceDerivativesTest, ADeletionThatFailsIsLoggedAndTheDerivativeRemovedAllTheSame) {
  const auto source = addEmptySource();
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  const Path file = derivative->url()->relativePath();
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::withExtension("bin");
  takeLines();
  source->removeDerivative(derivative);
  EXPECT_EQ(takeLines(),
            Lines{warning("Failed to delete derivative at path \"" + file.native() + "\": \"The disk is full.\"")});
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_EQ(derivative->sourceOwner(), nullptr);
  EXPECT_TRUE(std::filesystem::exists(file));
}

TEST_F(QuiltMediaSourceDerivativesTest, AFileThatIsGoneAlreadyIsNoFailure) {
  const auto source = addEmptySource();
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  std::filesystem::remove(derivative->url()->relativePath());
  source->removeDerivative(derivative);
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaSourceDerivativesTest, RemovingAllGoesOnPastADeletionThatFails) {
  const auto source = addEmptySource();
  const auto first = addFlattenedDerivative(*source, {"Desktop"});
  const auto second = addFlattenedDerivative(*source, {"720p"});
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::named(first->uuid() + ".bin");
  source->removeAllDerivatives();
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_THAT(namesIn(source->derivativesFolderPath()), ElementsAre(first->uuid() + ".bin"));
}

// ---- The record

TEST_F(QuiltMediaSourceDerivativesTest, AFullRecordHasItsElevenKeysInTheirOrder) {
  const auto source = addSource(pictureFile(8, 8));
  source->addPreview(QuiltMediaPreview::initWithImageWrapper(picture(4, 4)));
  const auto samples = QuiltMediaAudioSamples::init();
  samples->setIsFlattened(true);
  source->addAudioSamples(samples);
  source->setTitle("T");
  source->setDescription("D");
  source->setTimecode(1.5);
  EXPECT_THAT(keysOf(source->dictionary()),
              ElementsAre("UUID", "ContentCategory", "Derivatives", "Previews", "AudioSamples", "Title", "Description",
                          "Timecode", "IsFlattened", "TotalSizeInMegaBytes", "Dirty"));
  EXPECT_EQ(source->dictionary().string("ContentCategory"), "Image");
}

TEST_F(QuiltMediaSourceDerivativesTest, AnEmptySourceWritesOnlyWhatIsAlwaysWritten) {
  EXPECT_THAT(keysOf(addEmptySource()->dictionary()),
              ElementsAre("UUID", "IsFlattened", "TotalSizeInMegaBytes", "Dirty"));
}

TEST_F(QuiltMediaSourceDerivativesTest, RecordsOfChildrenThatCannotBeReadAreLeftOut) {
  Dictionary bad = linkRecord("720p");
  bad.set("UUID", "../elsewhere");
  const auto source =
      QuiltMediaSource::initWithDictionary({{"Derivatives", Array{bad, "no record", linkRecord("480p")}},
                                            {"Previews", Array{Dictionary{{"UUID", ".."}}, Dictionary{{"Index", 2}}}},
                                            {"AudioSamples", Dictionary{{"UUID", "a/b"}, {"IsFlattened", true}}}},
                                           item());
  ASSERT_NE(source, nullptr);
  ASSERT_EQ(source->derivativeCount(), 1u);
  EXPECT_THAT(*source->derivativeAtIndex(0)->compatibilityTags(), ElementsAre("480p"));
  ASSERT_EQ(source->previews().size(), 1u);
  EXPECT_EQ(source->previews()[0]->index(), 2u);
  EXPECT_EQ(source->audioSamples(), nullptr);
}

TEST_F(QuiltMediaSourceDerivativesTest, ChildrenAreReadWithTheirOwnerSoThatNamesFindTheirFolder) {
  const auto source = QuiltMediaSource::initWithDictionary(
      {{"UUID", "S"}, {"Derivatives", Array{Dictionary{{"Filename", "a.mp4"}, {"IsFlattened", true}}}}}, item());
  EXPECT_EQ(source->derivativeAtIndex(0)->url(),
            Url::fileUrl(item()->sourcesFolderPath() / "S" / "derivatives" / "a.mp4"));
  EXPECT_EQ(source->derivativeAtIndex(0)->sourceOwner(), source);
}

// ---- Construction

TEST_F(QuiltMediaSourceDerivativesTest, ADocumentFileIsNotAskedForItsSound) {
  const Path file = writeFile(folder() / "a.pdf", support::makePages(1));
  takeLines();
  const auto source = QuiltMediaSource::initWithPath(file);
  ASSERT_NE(source, nullptr);
  EXPECT_EQ(source->contentCategory(), "Document");
  EXPECT_EQ(takeLines(), Lines{debug("Derivative at URL \"" + Url::fileUrl(file).absoluteString() +
                                     "\" as \"Document\" is compatible with \"Desktop,720p,480p\"")});
}

TEST_F(QuiltMediaSourceDerivativesTest, TheFileStaysWhereItIs) {
  const Path file = pictureFile(8, 8);
  const auto source = QuiltMediaSource::initWithPath(file);
  EXPECT_EQ(source->mainDerivative()->url(), Url::fileUrl(file));
  EXPECT_FALSE(source->mainDerivative()->isFlattened());
  EXPECT_EQ(source->path(), Path());
}

// ---- Duration

TEST_F(QuiltMediaSourceDerivativesTest, OnlySoundAndMoviesLast) {
  const auto source = addEmptySource();
  EXPECT_EQ(source->duration(), 0);
  const auto derivative = derivativeTagged({"480p"});
  derivative->setDuration(7.5);
  source->addDerivative(derivative);
  for (const auto& [type, duration] : {std::pair(platform::types::kMP3, 7.5), std::pair(platform::types::kMPEG4, 7.5),
                                       std::pair(platform::types::kPNG, 0.0), std::pair(platform::types::kPDF, 0.0),
                                       std::pair(platform::types::kURL, 0.0)}) {
    derivative->setContentType(type);
    EXPECT_EQ(source->duration(), duration) << type;
  }
}

// ---- Dirty

TEST_F(QuiltMediaSourceDerivativesTest, SettingDirtyAgainCleansAgain) {
  const auto source = addEmptySource();
  const auto main = addFlattenedDerivative(*source, {"720p"});
  source->setDirty(true);
  const auto later = addFlattenedDerivative(*source, {"480p"});
  main->setCompatibilityTags(std::vector<std::string>{"720p"});
  source->addPreview(QuiltMediaPreview::initWithImageWrapper(picture(4, 4)));
  source->setDirty(true);
  EXPECT_THAT(source->derivatives(), ElementsAre(main));
  EXPECT_THAT(*main->compatibilityTags(), ElementsAre("Desktop"));
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_EQ(later->sourceOwner(), nullptr);
}

TEST_F(QuiltMediaSourceDerivativesTest, ClearingDirtyCleansNothing) {
  const auto source = addEmptySource();
  const auto main = addFlattenedDerivative(*source, {"720p"});
  addFlattenedDerivative(*source, {"480p"});
  source->setDirty(false);
  EXPECT_EQ(source->derivativeCount(), 2u);
  EXPECT_THAT(*main->compatibilityTags(), ElementsAre("720p"));
}

TEST_F(QuiltMediaSourceDerivativesTest, ASourceWithNothingInItCanBeDirty) {
  const auto source = addEmptySource();
  source->setDirty(true);
  EXPECT_TRUE(source->dirty());
}

TEST_F(QuiltMediaSourceDerivativesTest, InvalidatingAllDropsTheImagesToo) {
  const auto source = addSource(pictureFile(100, 50));
  const auto thumbnail = source->thumbnailImage();
  const auto poster = source->posterImage();
  ASSERT_NE(thumbnail, nullptr);
  ASSERT_NE(poster, nullptr);
  source->invalidateAll();
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_NE(source->thumbnailImage(), thumbnail);
  EXPECT_NE(source->posterImage(), poster);
}

TEST_F(QuiltMediaSourceDerivativesTest, EachImageIsInvalidatedByItself) {
  const auto source = addSource(pictureFile(100, 50));
  const auto thumbnail = source->thumbnailImage();
  const auto poster = source->posterImage();
  source->invalidateThumbnailImage();
  EXPECT_EQ(source->posterImage(), poster);
  EXPECT_NE(source->thumbnailImage(), thumbnail);
  source->invalidatePosterImage();
  EXPECT_NE(source->posterImage(), poster);
}

// ---- Reload

TEST_F(QuiltMediaSourceDerivativesTest, ReloadMapsTheCopyIntoTheRangeFromTwentyToAHundred) {
  const auto source = addEmptySource();
  const Path file = documentFile();
  const auto size = static_cast<std::int64_t>(std::filesystem::file_size(file));
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {0, size * 3 / 8, size};
  source->reloadWithFileAtPath(file, progress.block());
  EXPECT_THAT(progress.values, ElementsAre(0, 10, 20, 20, 37 * 8.0 / 10.0 + 20.0, 100, 100, 100));
  EXPECT_TRUE(source->mainDerivative()->isFlattened());
}

TEST_F(QuiltMediaSourceDerivativesTest, ACancelStopsTheCopyOfAReloadWhichEndsAllTheSame) {
  keepDocumentBusy();
  const auto source = addEmptySource();
  const Path file = documentFile();
  const auto size = static_cast<std::int64_t>(std::filesystem::file_size(file));
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {size / 2, size * 3 / 4, size};
  progress.cancelAt = 60;
  takeLines();
  source->reloadWithFileAtPath(file, progress.block());
  EXPECT_THAT(progress.values, ElementsAre(0, 10, 20, 60, 100));
  ASSERT_EQ(source->derivativeCount(), 1u) << "the derivative points at the file where it is";
  EXPECT_EQ(source->mainDerivative()->url(), Url::fileUrl(file));
  EXPECT_FALSE(source->mainDerivative()->isFlattened());
  const std::string url = Url::fileUrl(file).absoluteString();
  EXPECT_EQ(takeLines(),
            (Lines{debug("Derivative at URL \"" + url + "\" as \"Document\" is compatible with \"Desktop,720p,480p\""),
                   debug("Copy failed with error code (" + std::to_string(-ECANCELED) + ")"),
                   critical("Failed to flatten source derivative \"" + url + "\" at \"" +
                            Url::fileUrl(source->derivativesFolderPath() / (source->mainDerivative()->uuid() + ".pdf"))
                                .absoluteString() +
                            "\""),
                   critical("Failed to update document at path \"" + document()->propertiesPath().native() +
                            "\": \"Document is already being processed\"")}));
}

TEST_F(QuiltMediaSourceDerivativesTest, OnlyTheCopysAnswersMatterToAReload) {
  const auto source = addEmptySource();
  const Path file = documentFile();
  const Installed<ToldFiles> files(&Services::files);
  files->reports = {static_cast<std::int64_t>(std::filesystem::file_size(file)) / 2};
  source->reloadWithFileAtPath(file, [](double percentage) { return percentage == 60; });
  EXPECT_TRUE(source->mainDerivative()->isFlattened());
}

TEST_F(QuiltMediaSourceDerivativesTest, ReloadDropsWhatWasMadeFromTheOldFile) {
  const auto source = addSource(pictureFile(8, 8));
  ASSERT_TRUE(source->flattenCopy(true, {}));
  ASSERT_NE(source->posterImage(), nullptr);
  const auto preview = source->previews()[0];
  ASSERT_TRUE(preview->flatten());
  const Path oldFile = source->mainDerivative()->url()->relativePath();
  source->setDirty(false);
  source->setDescription("D");
  source->reloadWithFileAtPath(support::makeMedia(support::m4aSound()), {});
  EXPECT_FALSE(std::filesystem::exists(oldFile));
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_THAT(namesIn(source->previewsFolderPath()), IsEmpty());
  EXPECT_EQ(source->contentCategory(), "Audio");
  EXPECT_EQ(source->description(), "D");
}

TEST_F(QuiltMediaSourceDerivativesTest, ReloadSavesAtTheEnd) {
  const auto source = addEmptySource();
  EXPECT_TRUE(saves([&] { source->reloadWithFileAtPath(folder() / "gone.pdf", {}); }));
}

TEST_F(QuiltMediaSourceDerivativesTest, ReloadTakesTheSamplesOfTheNewSound) {
  const auto source = addSource(support::makeMedia(support::mp3Sound()));
  ASSERT_TRUE(source->flattenCopy(true, {}));
  const Path oldSamples = source->audioSamples()->path();
  source->reloadWithFileAtPath(support::makeMedia(support::m4aSound()), {});
  EXPECT_FALSE(std::filesystem::exists(oldSamples));
  ASSERT_NE(source->audioSamples(), nullptr);
  EXPECT_EQ(source->audioSamples()->uuid(), source->mainDerivative()->uuid());
  EXPECT_TRUE(source->isFlattened());
}

}  // namespace
}  // namespace quilt
