// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/QuiltMediaSource.h"

#include <gmock/gmock.h>

#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using support::critical;
using support::debug;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaSourceTest : public support::PackageFixture {
 protected:
  std::shared_ptr<QuiltMediaSource> read(const Dictionary& record) {
    return QuiltMediaSource::initWithDictionary(record, item());
  }

  static Dictionary derivativeRecord(const std::string& tag) {
    return {{"URL", "https://example.org/" + tag}, {"ContentType", "public.url"}, {"CompatibilityTags", Array{tag}}};
  }
};

// ---- Record

TEST_F(QuiltMediaSourceTest, AFreshSourceHasAnIdentityAndNothingElse) {
  const auto source = QuiltMediaSource::init();
  EXPECT_EQ(source->uuid().size(), 36u);
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(source->title(), std::nullopt);
  EXPECT_EQ(source->description(), std::nullopt);
  EXPECT_EQ(source->timecode(), 3.4028234663852886e38);
  EXPECT_FALSE(source->dirty());
  EXPECT_EQ(source->mediaOwner(), nullptr);
}

TEST_F(QuiltMediaSourceTest, ARecordWithoutUuidKeepsTheFreshIdentity) {
  const auto first = read({{"Title", "T"}});
  const auto second = read({{"Title", "T"}});
  EXPECT_EQ(first->uuid().size(), 36u);
  EXPECT_NE(first->uuid(), second->uuid());
}

TEST_F(QuiltMediaSourceTest, TheTitleIsWrittenAsTheDescription) {
  const auto source = addEmptySource();
  source->setTitle("T");
  source->setDescription("D");
  const Dictionary record = source->dictionary();
  EXPECT_EQ(record.string("Description"), "T");
  const auto loaded = read(record);
  EXPECT_EQ(loaded->title(), "T");
  EXPECT_EQ(loaded->description(), "T");
}

TEST_F(QuiltMediaSourceTest, ADescriptionWithoutTitleIsLeftOutOfTheRecord) {
  const auto source = addEmptySource();
  source->setDescription("D");
  const Dictionary record = source->dictionary();
  EXPECT_FALSE(record.contains("Description"));
  EXPECT_TRUE(record.contains("Dirty"));
}

TEST_F(QuiltMediaSourceTest, KeysStandInTheWrittenOrder) {
  const auto source = addEmptySource();
  source->addDerivative(QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/")));
  source->addPreview(QuiltMediaPreview::initWithImageWrapper(picture(4, 4)));
  source->setTitle("T");
  source->setDescription("D");
  source->setTimecode(1.5);
  std::vector<std::string> keys;
  for (const auto& [key, value] : source->dictionary()) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("UUID", "ContentCategory", "Derivatives", "Previews", "Title", "Description",
                                "Timecode", "IsFlattened", "TotalSizeInMegaBytes", "Dirty"));
}

TEST_F(QuiltMediaSourceTest, ATimecodeOfTheLargestSinglePrecisionValueIsNotWritten) {
  const auto source = addEmptySource();
  source->setTimecode(3.4028234663852886e38);
  EXPECT_FALSE(source->dictionary().contains("Timecode"));
  source->setTimecode(0);
  EXPECT_EQ(source->dictionary().real("Timecode"), 0);
}

TEST_F(QuiltMediaSourceTest, ADirtyRecordIsCleanedOnLoad) {
  const auto source = read({{"Derivatives", Array{derivativeRecord("480p"), derivativeRecord("Desktop")}},
                            {"Previews", Array{Dictionary{{"Index", 0}}}},
                            {"AudioSamples", Dictionary{{"UUID", "S"}, {"IsFlattened", true}}},
                            {"Dirty", true}});
  ASSERT_EQ(source->derivativeCount(), 1u);
  EXPECT_THAT(*source->derivativeAtIndex(0)->compatibilityTags(), ElementsAre("Desktop"));
  EXPECT_EQ(source->derivativeAtIndex(0)->url()->absoluteString(), "https://example.org/Desktop");
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_TRUE(source->dirty());
}

TEST_F(QuiltMediaSourceTest, WrongKindsCountAsMissing) {
  const auto source = read({{"UUID", 7},
                            {"Derivatives", "none"},
                            {"Previews", Array{"x", 3}},
                            {"AudioSamples", Array{}},
                            {"Title", true},
                            {"Description", 1.5},
                            {"Timecode", "12"},
                            {"Dirty", "yes"}});
  ASSERT_NE(source, nullptr);
  EXPECT_EQ(source->uuid().size(), 36u);
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_THAT(source->previews(), IsEmpty());
  EXPECT_EQ(source->audioSamples(), nullptr);
  EXPECT_EQ(source->title(), std::nullopt);
  EXPECT_EQ(source->timecode(), kNoTimecode);
  EXPECT_FALSE(source->dirty());
}

TEST_F(QuiltMediaSourceTest, UnknownKeysAreWrittenBackAfterOurs) {
  const auto source = read({{"Later", Array{1, "two"}}, {"Title", "T"}});
  const Dictionary record = source->dictionary();
  EXPECT_EQ((record.end() - 1)->first, "Later");
  EXPECT_EQ((record.end() - 1)->second, platform::PropertyList(Array{1, "two"}));
}

TEST_F(QuiltMediaSourceTest, AnIdentityThatIsNoPlainNameIsRefused) {
  for (const std::string name : {"..", ".", "", "a/b", "/x", "../x"}) {
    takeLines();
    EXPECT_EQ(read({{"UUID", name}}), nullptr) << name;
    EXPECT_EQ(takeLines(),
              Lines{warning("Refused the record of a media source: \"" + name + "\" is no plain file name")});
  }
  EXPECT_EQ(read({{"UUID", std::string(300, 'x')}}), nullptr);
  EXPECT_EQ(read({{"UUID", std::string("a\0b", 3)}}), nullptr);
}

// ---- Places

TEST_F(QuiltMediaSourceTest, TheFolderLiesInTheItemUnderTheIdentity) {
  const auto source = addEmptySource();
  EXPECT_EQ(source->path(), item()->sourcesFolderPath() / source->uuid());
  EXPECT_EQ(source->derivativesFolderPath(), source->path() / "derivatives");
  EXPECT_EQ(source->previewsFolderPath(), source->path() / "previews");
  EXPECT_EQ(source->audioSamplesFolderPath(), source->path() / "audiosamples");
}

TEST_F(QuiltMediaSourceTest, ThereIsNoFolderWithoutADocument) {
  const auto loose = QuiltMedia::init();
  const auto source = QuiltMediaSource::init();
  loose->addSource(source);
  EXPECT_EQ(source->path(), Path());
  EXPECT_EQ(source->derivativesFolderPath(), Path());
  EXPECT_EQ(source->previewsFolderPath(), Path());
  EXPECT_EQ(source->audioSamplesFolderPath(), Path());
}

// ---- Derivatives

TEST_F(QuiltMediaSourceTest, TheMainDerivativeHasTheBestTagWhateverTheOrder) {
  const auto source = addEmptySource();
  const auto small = derivativeTagged({"480p"});
  const auto middle = derivativeTagged({"720p"});
  source->addDerivative(small);
  source->addDerivative(middle);
  EXPECT_EQ(source->mainDerivative(), middle);
}

TEST_F(QuiltMediaSourceTest, TheEarlierOfTwoWithTheSameTagIsTheMainDerivative) {
  const auto source = addEmptySource();
  const auto first = derivativeTagged({"Desktop"});
  source->addDerivative(first);
  source->addDerivative(derivativeTagged({"Desktop"}));
  EXPECT_EQ(source->mainDerivative(), first);
}

TEST_F(QuiltMediaSourceTest, ALowerTagStandsInForABetterOneButNotTheOtherWay) {
  const auto source = addEmptySource();
  const auto small = derivativeTagged({"480p"});
  source->addDerivative(small);
  EXPECT_EQ(source->bestDerivativeForFormat("720p"), small);
  EXPECT_EQ(source->bestDerivativeForFormat("Desktop"), small);
  EXPECT_EQ(source->bestDerivativeForFormat("1080p"), nullptr);

  const auto other = addEmptySource();
  other->addDerivative(derivativeTagged({"Desktop"}));
  EXPECT_EQ(other->bestDerivativeForFormat("480p"), nullptr);
}

TEST_F(QuiltMediaSourceTest, AvailableFormatsNameEachTagOnceInListOrder) {
  const auto source = addEmptySource();
  source->addDerivative(derivativeTagged({"720p", "480p"}));
  source->addDerivative(derivativeTagged({"Desktop", "720p"}));
  source->addDerivative(QuiltMediaDerivative::init());
  EXPECT_THAT(source->availableFormats(), ElementsAre("720p", "480p", "Desktop"));
}

TEST_F(QuiltMediaSourceTest, AddingAttachesAnnouncesAndSaves) {
  const auto source = addEmptySource();
  std::vector<platform::ChangePhase> phases;
  const auto observation = source->observe(
      "derivatives", [&](const platform::ChangeNotice& notice) { phases.push_back(notice.phase); },
      platform::ObservationOptions::Prior);
  std::filesystem::remove(document()->propertiesPath());
  const auto derivative = derivativeTagged({"Desktop"});
  source->addDerivative(derivative);
  EXPECT_EQ(derivative->sourceOwner(), source);
  EXPECT_THAT(phases, ElementsAre(platform::ChangePhase::Will, platform::ChangePhase::Did));
  EXPECT_TRUE(std::filesystem::exists(document()->propertiesPath()));

  source->addDerivative(nullptr);
  EXPECT_EQ(source->derivativeCount(), 1u);
}

TEST_F(QuiltMediaSourceTest, AddingWhileTheDocumentIsProcessingDoesNotSave) {
  keepDocumentBusy();
  std::filesystem::remove(document()->propertiesPath());
  addEmptySource()->addDerivative(derivativeTagged({"Desktop"}));
  EXPECT_FALSE(std::filesystem::exists(document()->propertiesPath()));
}

TEST_F(QuiltMediaSourceTest, RemovingDeletesAFileInThePackage) {
  const auto source = addEmptySource();
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  const Path file = derivative->url()->relativePath();
  ASSERT_TRUE(std::filesystem::exists(file));
  source->removeDerivative(derivative);
  EXPECT_FALSE(std::filesystem::exists(file));
  EXPECT_EQ(derivative->sourceOwner(), nullptr);
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_EQ(takeProblems(), Lines{});
}

TEST_F(QuiltMediaSourceTest, RemovingNeverDeletesTheUsersOwnFile) {
  const Path original = pictureFile(8, 8);
  const auto source = addSource(original);
  source->removeAllDerivatives();
  EXPECT_EQ(source->derivativeCount(), 0u);
  EXPECT_TRUE(std::filesystem::exists(original));
}

TEST_F(QuiltMediaSourceTest, ARecordCannotHaveAFileOutsideThePackageDeleted) {
  const Path outside = writeFile(folder() / "precious.txt", "keep me");
  const auto source = addEmptySource();
  const auto derivative = QuiltMediaDerivative::initWithDictionary(
      {{"URL", Url::fileUrl(outside).absoluteString()}, {"IsFlattened", true}, {"CompatibilityTags", Array{"Desktop"}}},
      source);
  source->addDerivative(derivative);
  takeLines();
  source->removeDerivative(derivative);
  EXPECT_EQ(readFile(outside), "keep me");
  const Lines lines = takeProblems();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_TRUE(lines[0].text.starts_with("Failed to delete derivative at path \"" + outside.native() + "\": \""))
      << lines[0].text;
}

TEST_F(QuiltMediaSourceTest, TheWalkStopsAtTheFirstFalse) {
  const auto source = addEmptySource();
  EXPECT_TRUE(source->performBlockOnDerivatives([](const auto&) { return false; }));
  source->addDerivative(derivativeTagged({"Desktop"}));
  source->addDerivative(derivativeTagged({"720p"}));
  int visited = 0;
  EXPECT_FALSE(source->performBlockOnDerivatives([&](const auto&) { return ++visited, false; }));
  EXPECT_EQ(visited, 1);
  EXPECT_EQ(source->derivativeAtIndex(2), nullptr);
}

// ---- Derived values

TEST_F(QuiltMediaSourceTest, CategoriesFollowConformance) {
  const auto category = [](const char* type) { return QuiltMediaSource::contentCategoryForContentType(Text(type)); };
  EXPECT_EQ(category(platform::types::kMPEG4), "Movie");
  EXPECT_EQ(category(platform::types::kMovieContainer), "Movie");
  EXPECT_EQ(category(platform::types::k3GPP), "Movie");
  EXPECT_EQ(category(platform::types::kMP3), "Audio");
  EXPECT_EQ(category(platform::types::kAIFF), "Audio");
  EXPECT_EQ(category(platform::types::kM4A), "Audio");
  for (const char* type : {platform::types::kJPEG, platform::types::kJPEG2000, platform::types::kTIFF,
                           platform::types::kGIF, platform::types::kPNG, platform::types::kICNS, platform::types::kBMP})
    EXPECT_EQ(category(type), "Image") << type;
  for (const char* type :
       {platform::types::kPDF, platform::types::kEPUBContainer, platform::types::kEPUB, platform::types::kTextDocument,
        platform::types::kFlatTextDocument, platform::types::kWordDoc, platform::types::kWordML,
        platform::types::kWordOpenXML, platform::types::kPresentation, platform::types::kFlatPresentation,
        platform::types::kPowerPointPpt, platform::types::kPowerPointOpenXML})
    EXPECT_EQ(category(type), "Document") << type;
  EXPECT_EQ(category(platform::types::kURL), "Web");
  EXPECT_EQ(category("public.plain-text"), std::nullopt);
  EXPECT_EQ(QuiltMediaSource::contentCategoryForContentType(std::nullopt), std::nullopt);
}

TEST_F(QuiltMediaSourceTest, AnImageHasNoDurationEvenWhenItsDerivativeRecordsOne) {
  const auto source = addSource(pictureFile(8, 8));
  source->mainDerivative()->setDuration(12);
  EXPECT_EQ(source->contentCategory(), "Image");
  EXPECT_EQ(source->duration(), 0);
}

TEST_F(QuiltMediaSourceTest, AMovieHasItsMainDerivativesDuration) {
  const auto source = addSource(support::makeMedia({}));
  EXPECT_EQ(source->contentCategory(), "Movie");
  EXPECT_NEAR(source->duration(), 2, 0.05);
}

TEST_F(QuiltMediaSourceTest, SizeSumsDerivativesPreviewsAndSamples) {
  const auto source = addEmptySource();
  EXPECT_EQ(source->totalSizeInMegaBytes(), 0);
  const auto derivative = addFlattenedDerivative(*source, {"Desktop"});
  writeFile(derivative->url()->relativePath(), std::string(1024 * 1024, 'x'));
  EXPECT_EQ(source->totalSizeInMegaBytes(), 1);
  std::filesystem::create_directories(source->audioSamplesFolderPath());
  writeFile(source->audioSamplesFolderPath() / "S.asc", std::string(512 * 1024, 'x'));
  source->addAudioSamples(QuiltMediaAudioSamples::initWithDictionary({{"UUID", "S"}, {"IsFlattened", true}}, source));
  EXPECT_EQ(source->totalSizeInMegaBytes(), 1.5);
}

TEST_F(QuiltMediaSourceTest, AWebLinkIsASourceOfItsOwn) {
  const auto source = QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
  ASSERT_NE(source, nullptr);
  EXPECT_EQ(source->contentCategory(), "Web");
  EXPECT_EQ(source->previewItemURL(), Url::parse("https://example.org/"));
}

TEST_F(QuiltMediaSourceTest, AFileThatNoDerivativeAcceptsGivesNoSource) {
  const Path text = writeFile(folder() / "notes.txt", "text");
  takeLines();
  EXPECT_EQ(QuiltMediaSource::initWithPath(text), nullptr);
  EXPECT_EQ(takeLines(), Lines{debug("Failed to create source derivative for url \"" +
                                     Url::fileUrl(text).absoluteString() + "\": \"Not a compatible file\"")});
}

TEST_F(QuiltMediaSourceTest, ASoundThatIsDetachedTriesItsSamplesQuietly) {
  const Path file = support::makeMedia(support::m4aSound());
  takeLines();
  const auto source = QuiltMediaSource::initWithPath(file);
  ASSERT_NE(source, nullptr);
  EXPECT_EQ(source->audioSamples(), nullptr);
  const std::string url = Url::fileUrl(file).absoluteString();
  EXPECT_EQ(takeLines(),
            (Lines{debug("Derivative at URL \"" + url + "\" as \"Audio\" is compatible with \"Desktop,720p,480p\""),
                   debug("Failed to flatten source audio samples \"" + source->mainDerivative()->uuid() +
                         "\" at URL \"" + url + "\"")}));
}

// ---- Images

TEST_F(QuiltMediaSourceTest, WithoutDerivativesThereIsNoThumbnailAndNoPoster) {
  const auto source = addEmptySource();
  EXPECT_EQ(source->thumbnailImage(), nullptr);
  EXPECT_EQ(source->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), (Lines{warning("Media thumbnail image cannot be previewed because there is no derivatives"),
                                warning("Media poster image cannot be previewed because there is no derivatives")}));
}

TEST_F(QuiltMediaSourceTest, ThumbnailAndPosterAreCachedUntilInvalidated) {
  const auto source = addSource(pictureFile(1000, 500));
  const auto thumbnail = source->thumbnailImage();
  const auto poster = source->posterImage();
  ASSERT_NE(thumbnail, nullptr);
  ASSERT_NE(poster, nullptr);
  EXPECT_EQ(poster->size(), (platform::Size{640, 320}));
  EXPECT_EQ(source->thumbnailImage(), thumbnail);
  EXPECT_EQ(source->posterImage(), poster);
  source->invalidateCaches();
  EXPECT_NE(source->thumbnailImage(), thumbnail);
  EXPECT_NE(source->posterImage(), poster);
}

TEST_F(QuiltMediaSourceTest, AThumbnailThatCannotBeMadeIsNotCached) {
  keepDocumentBusy();
  const auto source = addEmptySource();
  const auto derivative = derivativeTagged({"Desktop"});
  derivative->setUrl(Url::fileUrl(folder() / "gone.jpg"));
  source->addDerivative(derivative);
  const std::string line = "Media thumbnail image cannot be previewed because URL \"" +
                           Url::fileUrl(folder() / "gone.jpg").absoluteString() + "\" is invalid";
  EXPECT_EQ(source->thumbnailImage(), nullptr);
  EXPECT_EQ(source->thumbnailImage(), nullptr);
  EXPECT_EQ(takeLines(), (Lines{warning(line), warning(line)}));
}

TEST_F(QuiltMediaSourceTest, APosterWhosePreviewHasNoPictureSaysWhichUrl) {
  keepDocumentBusy();
  const auto source = addSource(pictureFile(8, 8));
  source->addPreview(QuiltMediaPreview::initWithDictionary({{"Index", 0}, {"IsFlattened", true}}, source));
  std::filesystem::create_directories(source->previewsFolderPath());
  writeFile(source->previewsFolderPath() / "0.jpg", "no picture");
  takeLines();
  EXPECT_EQ(source->posterImage(), nullptr);
  EXPECT_EQ(takeLines(), (Lines{warning("Media source preview path \"" +
                                        (source->previewsFolderPath() / "0.jpg").native() + "\" is not a valid image"),
                                warning("Media poster image cannot be previewed because URL \"" +
                                        source->mainDerivative()->url()->absoluteString() + "\" is invalid")}));
}

// ---- Dirty, reload

TEST_F(QuiltMediaSourceTest, SettingDirtyKeepsTheMainDerivativeAloneAsDesktop) {
  const auto source = addEmptySource();
  const auto main = addFlattenedDerivative(*source, {"720p"});
  const auto other = addFlattenedDerivative(*source, {"480p"});
  const Path lost = other->url()->relativePath();
  source->setDirty(true);
  EXPECT_THAT(source->derivatives(), ElementsAre(main));
  EXPECT_THAT(*main->compatibilityTags(), ElementsAre("Desktop"));
  EXPECT_FALSE(std::filesystem::exists(lost));
  EXPECT_TRUE(source->dirty());
  source->setDirty(false);
  EXPECT_FALSE(source->dirty());
}

TEST_F(QuiltMediaSourceTest, ReloadReplacesTheContentAndKeepsTheRest) {
  const auto source = addSource(pictureFile(8, 8));
  source->setTitle("Kept");
  source->setTimecode(3);
  const std::string identity = source->uuid();
  Progress progress;
  source->reloadWithFileAtPath(pictureFile(16, 16), progress.block());
  EXPECT_THAT(progress.values, ElementsAre(0, 10, 20, 100, 100, 100));
  EXPECT_EQ(source->uuid(), identity);
  EXPECT_EQ(source->title(), "Kept");
  EXPECT_EQ(source->timecode(), 3);
  ASSERT_EQ(source->derivativeCount(), 1u);
  EXPECT_TRUE(source->mainDerivative()->isFlattened());
  EXPECT_EQ(source->mainDerivative()->width(), 16);
}

TEST_F(QuiltMediaSourceTest, ReloadWithAFileThatCannotServeLeavesTheSourceEmpty) {
  const auto source = addSource(pictureFile(8, 8));
  Progress progress;
  source->reloadWithFileAtPath(writeFile(folder() / "notes.txt", "text"), progress.block());
  EXPECT_THAT(progress.values, ElementsAre(0, 10, 20, 100));
  EXPECT_EQ(source->derivativeCount(), 0u);
}

}  // namespace
}  // namespace quilt
