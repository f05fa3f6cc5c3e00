// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMedia.h"

#include <gmock/gmock.h>

#include <algorithm>

#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::PropertyList;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaTest : public support::PackageFixture {
 protected:
  std::shared_ptr<QuiltMedia> read(const Dictionary& record) {
    return QuiltMedia::initWithDictionary(record, document());
  }

  static std::vector<std::string> keysOf(const Dictionary& record) {
    std::vector<std::string> keys;
    for (const auto& [key, value] : record) keys.push_back(key);
    return keys;
  }

  /// A child that says of itself that it plays that long.
  template <class Child = QuiltMediaSource>
  static std::shared_ptr<Child> playing(double seconds, const char* type = platform::types::kMPEG4) {
    auto child = Child::init();
    const auto derivative = derivativeTagged({"Desktop"});
    derivative->setContentType(type);
    derivative->setDuration(seconds);
    child->addDerivative(derivative);
    return child;
  }

  static std::shared_ptr<QuiltMediaSource> link() {
    return QuiltMediaSource::initWithURL(*Url::parse("https://example.org/"));
  }

  static Dictionary linkRecord(const std::string& uuid) {
    return {{"UUID", uuid},
            {"Derivatives", Array{Dictionary{{"URL", "https://example.org/"},
                                             {"ContentType", "public.url"},
                                             {"CompatibilityTags", Array{"Desktop"}}}}}};
  }
};

// ---- Construction

TEST_F(QuiltMediaTest, AFreshItemHasAnIdentityAndNothingElse) {
  const auto media = QuiltMedia::init();
  EXPECT_EQ(media->uuid().size(), 36u);
  EXPECT_NE(media->uuid(), QuiltMedia::init()->uuid());
  EXPECT_EQ(media->title(), std::nullopt);
  EXPECT_EQ(media->description(), std::nullopt);
  EXPECT_EQ(media->contentCategory(), std::nullopt);
  EXPECT_EQ(media->posterImageVersion(), 1u);
  EXPECT_THAT(media->sources(), IsEmpty());
  EXPECT_THAT(media->extras(), IsEmpty());
  EXPECT_EQ(media->audioCommentarySource(), nullptr);
  EXPECT_EQ(media->documentOwner(), nullptr);
  EXPECT_EQ(media->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

// ---- Reading a record

TEST_F(QuiltMediaTest, EveryStoredValueIsReadBack) {
  const auto media = read({{"UUID", "ITEM"},
                           {"Title", "T"},
                           {"Description", "D"},
                           {"ContentCategory", "Montage"},
                           {"Sources", Array{linkRecord("S1"), linkRecord("S2")}},
                           {"Extras", Array{linkRecord("E1")}},
                           {"AudioCommentarySource", linkRecord("C")}});
  ASSERT_NE(media, nullptr);
  EXPECT_EQ(media->documentOwner(), document());
  EXPECT_EQ(media->uuid(), "ITEM");
  EXPECT_EQ(media->title(), "T");
  EXPECT_EQ(media->description(), "D");
  EXPECT_EQ(media->contentCategory(), "Montage");
  ASSERT_EQ(media->sourcesCount(), 2u);
  EXPECT_EQ(media->sourceAtIndex(0)->uuid(), "S1");
  EXPECT_EQ(media->sourceAtIndex(1)->uuid(), "S2");
  EXPECT_EQ(media->sourceAtIndex(1)->mediaOwner(), media);
  ASSERT_EQ(media->extraCount(), 1u);
  EXPECT_EQ(media->extraAtIndex(0)->uuid(), "E1");
  EXPECT_EQ(media->extraAtIndex(0)->path(), media->extrasFolderPath() / "E1");
  EXPECT_EQ(media->extraAtIndex(0)->mediaOwner(), media);
  ASSERT_NE(media->audioCommentarySource(), nullptr);
  EXPECT_EQ(media->audioCommentarySource()->uuid(), "C");
  EXPECT_EQ(media->audioCommentarySource()->mediaOwner(), media);
}

TEST_F(QuiltMediaTest, AnEmptyRecordGivesAFreshItem) {
  const auto media = read({});
  ASSERT_NE(media, nullptr);
  EXPECT_EQ(media->uuid().size(), 36u);
  EXPECT_EQ(media->title(), std::nullopt);
  EXPECT_EQ(media->description(), std::nullopt);
  EXPECT_EQ(media->contentCategory(), std::nullopt);
  EXPECT_EQ(media->sourcesCount(), 0u);
  EXPECT_EQ(media->extraCount(), 0u);
  EXPECT_EQ(media->audioCommentarySource(), nullptr);
  EXPECT_EQ(media->posterImageVersion(), 1u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaTest, ARecordWithoutUuidHasAnotherIdentityEachTime) {
  const auto first = read({{"Title", "T"}});
  const auto second = read({{"Title", "T"}});
  EXPECT_EQ(first->uuid().size(), 36u);
  EXPECT_NE(first->uuid(), second->uuid());
}

TEST_F(QuiltMediaTest, AnEmptySourcesArrayLoadsAsNoSourcesAndIsNotWrittenBack) {
  for (const Dictionary& record : {Dictionary{{"Sources", Array{}}, {"Extras", Array{}}}, Dictionary{}}) {
    const auto media = read(record);
    EXPECT_EQ(media->sourcesCount(), 0u);
    EXPECT_EQ(media->extraCount(), 0u);
    EXPECT_FALSE(media->dictionary().contains("Sources"));
    EXPECT_FALSE(media->dictionary().contains("Extras"));
  }
}

TEST_F(QuiltMediaTest, AValueOfTheWrongKindCountsAsMissing) {
  for (const char* key :
       {"UUID", "Title", "Description", "ContentCategory", "Sources", "Extras", "AudioCommentarySource"}) {
    for (const PropertyList& wrong :
         {PropertyList(7), PropertyList(true), PropertyList(1.5), PropertyList(platform::Data{1})}) {
      const auto media = read({{key, wrong}});
      ASSERT_NE(media, nullptr) << key;
      EXPECT_EQ(media->uuid().size(), 36u) << key;
      EXPECT_EQ(keysOf(media->dictionary()), keysOf(read({})->dictionary())) << key;
    }
  }
  EXPECT_EQ(read({{"Sources", "S"}, {"Extras", Dictionary{}}})->sourcesCount(), 0u);
  EXPECT_EQ(read({{"AudioCommentarySource", Array{linkRecord("C")}}})->audioCommentarySource(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaTest, AChildRecordThatYieldsNothingIsSkipped) {
  const Array records = {"no record", Dictionary{{"UUID", ".."}}, linkRecord("A"), 7};
  const auto media =
      read({{"Sources", records}, {"Extras", records}, {"AudioCommentarySource", Dictionary{{"UUID", "a/b"}}}});
  ASSERT_EQ(media->sourcesCount(), 1u);
  EXPECT_EQ(media->sourceAtIndex(0)->uuid(), "A");
  ASSERT_EQ(media->extraCount(), 1u);
  EXPECT_EQ(media->extraAtIndex(0)->uuid(), "A");
  EXPECT_EQ(media->audioCommentarySource(), nullptr);
  // The children speak for themselves; the item adds nothing.
  const auto refused = [](const std::string& name) {
    return warning("Refused the record of a media source: \"" + name + "\" is no plain file name");
  };
  EXPECT_EQ(takeProblems(), (Lines{refused(".."), refused(".."), refused("a/b")}));
}

TEST_F(QuiltMediaTest, AnIdentityThatIsNoPlainNameIsRefused) {
  for (const std::string name : {"..", ".", "", "a/b", "/x", "../x"}) {
    takeLines();
    EXPECT_EQ(read({{"UUID", name}}), nullptr) << name;
    EXPECT_EQ(takeLines(),
              Lines{warning("Refused the record of a media item: \"" + name + "\" is no plain file name")});
  }
}

TEST_F(QuiltMediaTest, AnIdentityThatNoFolderCanHaveIsRefused) {
  EXPECT_EQ(read({{"UUID", std::string(300, 'x')}}), nullptr);
  EXPECT_EQ(read({{"UUID", std::string("a\0b", 3)}}), nullptr);
  EXPECT_EQ(takeProblems().size(), 2u);
}

TEST_F(QuiltMediaTest, ChildrenFindTheirPlacesWhileTheyLoad) {
  const auto media =
      read({{"UUID", "ITEM"},
            {"Sources",
             Array{Dictionary{{"UUID", "S"},
                              {"Derivatives", Array{Dictionary{{"Filename", "d.png"}, {"IsFlattened", true}}}}}}}});
  EXPECT_EQ(media->sourceAtIndex(0)->derivativeAtIndex(0)->url()->relativePath(),
            document()->mediaFolderPath() / "ITEM/sources/S/derivatives/d.png");
}

TEST_F(QuiltMediaTest, ARecordCanBeReadWithoutADocument) {
  const auto media = QuiltMedia::initWithDictionary({{"UUID", "ITEM"}, {"Sources", Array{linkRecord("S")}}}, nullptr);
  ASSERT_NE(media, nullptr);
  EXPECT_EQ(media->sourcesCount(), 1u);
  EXPECT_EQ(media->path(), Path());
}

// ---- Writing the record

TEST_F(QuiltMediaTest, KeysStandInTheWrittenOrder) {
  item()->setTitle("T");
  item()->setDescription("D");
  item()->addSource(link());
  item()->addExtra(QuiltMediaExtra::init());
  item()->setAudioCommentarySource(QuiltMediaSource::init());
  EXPECT_THAT(keysOf(item()->dictionary()),
              ElementsAre("UUID", "Title", "Description", "Sources", "Extras", "AudioCommentarySource", "IsFlattened",
                          "TotalSizeInMegaBytes", "ContentCategory", "PosterImagePath", "PosterImageWidth",
                          "PosterImageHeight"));
}

TEST_F(QuiltMediaTest, AnItemWithoutAPosterWritesItsSizeAsTheIntegerZero) {
  const Dictionary expected = {
      {"UUID", item()->uuid()},      {"IsFlattened", false},
      {"TotalSizeInMegaBytes", 0.0}, {"PosterImagePath", "media/" + item()->uuid() + "/poster.jpg"},
      {"PosterImageWidth", 0},       {"PosterImageHeight", 0}};
  EXPECT_EQ(item()->dictionary(), expected);
}

TEST_F(QuiltMediaTest, WritingTheRecordMakesThePosterAndItsSizeIsReal) {
  addSource(pictureFile(64, 48));
  const Dictionary record = item()->dictionary();
  EXPECT_EQ(*record.find("PosterImageWidth"), PropertyList(64.0));
  EXPECT_EQ(*record.find("PosterImageHeight"), PropertyList(48.0));
  EXPECT_EQ(record.string("PosterImagePath"), "media/" + item()->uuid() + "/poster.jpg");
  EXPECT_TRUE(std::filesystem::exists(document()->path() / *record.string("PosterImagePath")));
}

TEST_F(QuiltMediaTest, ChildrenAreWrittenInListOrder) {
  const auto media = read({{"Sources", Array{linkRecord("B"), linkRecord("A")}},
                           {"Extras", Array{linkRecord("Y"), linkRecord("X")}},
                           {"AudioCommentarySource", linkRecord("C")}});
  const auto identities = [](const Array& records) {
    std::vector<std::string> names;
    for (const auto& record : records) names.push_back(*record.as<Dictionary>()->string("UUID"));
    return names;
  };
  media->posterImage();  // adds a preview to the first source
  const Dictionary record = media->dictionary();
  EXPECT_THAT(identities(*record.array("Sources")), ElementsAre("B", "A"));
  EXPECT_THAT(identities(*record.array("Extras")), ElementsAre("Y", "X"));
  EXPECT_EQ(*record.dictionary("AudioCommentarySource"), media->audioCommentarySource()->dictionary());
  EXPECT_EQ(record.array("Sources")->front(), PropertyList(media->sourceAtIndex(0)->dictionary()));
}

TEST_F(QuiltMediaTest, WhatIsWrittenForOthersIsComputedAnewNotReadBack) {
  const auto media = read({{"IsFlattened", true},
                           {"TotalSizeInMegaBytes", 12.5},
                           {"PosterImagePath", "elsewhere.jpg"},
                           {"PosterImageWidth", 3},
                           {"PosterImageHeight", 4}});
  media->setUuid("ITEM");
  const Dictionary expected = {{"UUID", "ITEM"},
                               {"IsFlattened", false},
                               {"TotalSizeInMegaBytes", 0.0},
                               {"PosterImagePath", "media/ITEM/poster.jpg"},
                               {"PosterImageWidth", 0},
                               {"PosterImageHeight", 0}};
  EXPECT_EQ(media->dictionary(), expected);
}

TEST_F(QuiltMediaTest, TheRecordSaysWhetherTheItemIsFlattenedAndHowLargeItIs) {
  const auto source = addEmptySource();
  writeFile(addFlattenedDerivative(*source, {"Desktop"})->url()->relativePath(), std::string(1024 * 1024, 'x'));
  const auto samples = QuiltMediaAudioSamples::init();
  samples->setIsFlattened(true);
  source->addAudioSamples(samples);
  const Dictionary record = item()->dictionary();
  EXPECT_EQ(record.boolean("IsFlattened"), true);
  EXPECT_EQ(*record.find("TotalSizeInMegaBytes"), PropertyList(1.0));
}

TEST_F(QuiltMediaTest, UnknownKeysAreWrittenBackAfterOurs) {
  const Dictionary record = read({{"Later", Array{1, "two"}}, {"Title", "T"}, {"Sooner", true}})->dictionary();
  EXPECT_EQ(*(record.end() - 2), Dictionary::Entry("Later", Array{1, "two"}));
  EXPECT_EQ(*(record.end() - 1), Dictionary::Entry("Sooner", true));
}

TEST_F(QuiltMediaTest, TheRecordLooksAtEachFileOnceAndSaysSoEachTimeWhenItIsGone) {
  keepDocumentBusy();
  class CountingFiles final : public platform::ForwardingFileManager {
   public:
    CountingFiles() : ForwardingFileManager(platform::services().files) {}
    [[nodiscard]] platform::Result<platform::FileAttributes> attributesOfItemAtPath(const Path& path) const override {
      looks.push_back(path.filename().native());
      return ForwardingFileManager::attributesOfItemAtPath(path);
    }
    mutable std::vector<std::string> looks;
  };
  const auto files = std::make_shared<CountingFiles>();
  const platform::ScopedService scope(&platform::Services::files, files);
  const auto source = addEmptySource();
  for (const char* name : {"here.mp4", "gone.mp4"}) {
    const auto derivative = derivativeTagged({"Desktop"});
    derivative->setUrl(Url::fileUrl(folder() / name));
    source->addDerivative(derivative);
  }
  writeFile(folder() / "here.mp4", std::string(1 << 20, 'x'));
  takeLines();

  const Dictionary record = item()->dictionary();
  EXPECT_THAT(files->looks, ElementsAre("here.mp4", "gone.mp4"));
  EXPECT_EQ(record.real("TotalSizeInMegaBytes"), 1.0);
  const Lines lines = takeProblems();
  const auto ofGone = [](const support::Line& line) {
    return line.text.find("gone.mp4\" cannot be sized") != std::string::npos;
  };
  EXPECT_EQ(std::count_if(lines.begin(), lines.end(), ofGone), 3);  // derivative, source, item

  writeFile(folder() / "here.mp4", std::string(2 << 20, 'x'));
  EXPECT_EQ(item()->dictionary().real("TotalSizeInMegaBytes"), 2.0);
  EXPECT_EQ(files->looks.size(), 4U);
}

TEST_F(QuiltMediaTest, ARecordSurvivesTheRoundTrip) {
  keepDocumentBusy();
  addSource(pictureFile(64, 48));
  item()->setTitle("T");
  item()->setDescription("D");
  item()->addExtra(QuiltMediaExtra::initWithPath(pictureFile(32, 24)));
  item()->setAudioCommentarySource(link());
  const Dictionary record = item()->dictionary();
  EXPECT_EQ(read(record)->dictionary(), record);
}

TEST_F(QuiltMediaTest, WithoutADocumentTheRecordHasNoPosterPath) {
  EXPECT_THAT(keysOf(QuiltMedia::init()->dictionary()),
              ElementsAre("UUID", "IsFlattened", "TotalSizeInMegaBytes", "PosterImageWidth", "PosterImageHeight"));
}

// ---- Content category

TEST_F(QuiltMediaTest, TheOnlySourceGivesTheCategoryForGood) {
  addSource(pictureFile(8, 8));
  EXPECT_EQ(item()->contentCategory(), "Image");
  item()->addSource(link(), 0);
  EXPECT_EQ(item()->contentCategory(), "Image");
  item()->removeAllSources();
  EXPECT_EQ(item()->contentCategory(), "Image");
  item()->setContentCategory(kQuiltMediaContentCategoryMontage);
  EXPECT_EQ(item()->contentCategory(), "Montage");
}

TEST_F(QuiltMediaTest, TwoSourcesGiveNoCategory) {
  keepDocumentBusy();
  addSource(pictureFile(8, 8));
  item()->addSource(link());
  EXPECT_EQ(item()->contentCategory(), std::nullopt);
  EXPECT_FALSE(item()->dictionary().contains("ContentCategory"));
}

TEST_F(QuiltMediaTest, ASourceWithoutACategoryLeavesTheItemFreeToHaveOneLater) {
  const auto source = addEmptySource();
  EXPECT_EQ(item()->contentCategory(), std::nullopt);
  source->addDerivative(QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/")));
  EXPECT_EQ(item()->contentCategory(), "Web");
}

TEST_F(QuiltMediaTest, TheCategoriesHaveTheirStoredValues) {
  EXPECT_STREQ(kQuiltMediaContentCategoryAudio, "Audio");
  EXPECT_STREQ(kQuiltMediaContentCategoryMovie, "Movie");
  EXPECT_STREQ(kQuiltMediaContentCategoryMontage, "Montage");
  EXPECT_STREQ(kQuiltMediaContentCategoryDocument, "Document");
  EXPECT_STREQ(kQuiltMediaContentCategoryDualSource, "DualSource");
  EXPECT_STREQ(kQuiltMediaContentCategoryImage, "Image");
  EXPECT_STREQ(kQuiltMediaContentCategoryWeb, "Web");
}

// ---- Places

TEST_F(QuiltMediaTest, TheFoldersLieInTheDocumentUnderTheIdentity) {
  EXPECT_EQ(item()->path(), document()->mediaFolderPath() / item()->uuid());
  EXPECT_EQ(item()->sourcesFolderPath(), item()->path() / "sources");
  EXPECT_EQ(item()->extrasFolderPath(), item()->path() / "extras");
  EXPECT_EQ(item()->posterImagePath(), item()->path() / "poster.jpg");
  EXPECT_FALSE(std::filesystem::exists(item()->path())) << "asking for a place makes no folder";
}

TEST_F(QuiltMediaTest, ThereIsNoPlaceWithoutADocumentOrAPackage) {
  const auto loose = QuiltMedia::init();
  const auto unsaved = QuiltDocument::init();
  for (const auto& owner : {std::shared_ptr<QuiltDocument>(), unsaved}) {
    loose->setDocumentOwner(owner);
    EXPECT_EQ(loose->path(), Path());
    EXPECT_EQ(loose->sourcesFolderPath(), Path());
    EXPECT_EQ(loose->extrasFolderPath(), Path());
    EXPECT_EQ(loose->posterImagePath(), Path());
  }
}

// ---- Duration

TEST_F(QuiltMediaTest, AnItemWithoutSourcesHasNoDuration) {
  item()->setContentCategory(kQuiltMediaContentCategoryMontage);
  item()->setAudioCommentarySource(playing(9));
  EXPECT_EQ(item()->duration(), 0);
}

TEST_F(QuiltMediaTest, MoviesAudioAndDualSourcesLastAsLongAsTheFirstSource) {
  item()->addSource(playing(3));
  item()->addSource(playing(8));
  item()->setAudioCommentarySource(playing(20));
  for (const char* category :
       {kQuiltMediaContentCategoryAudio, kQuiltMediaContentCategoryMovie, kQuiltMediaContentCategoryDualSource}) {
    item()->setContentCategory(category);
    EXPECT_EQ(item()->duration(), 3) << category;
  }
}

TEST_F(QuiltMediaTest, AMontageLastsAsLongAsItsCommentary) {
  item()->setContentCategory(kQuiltMediaContentCategoryMontage);
  for (int i = 0; i < 3; ++i) item()->addSource(playing(5));
  EXPECT_EQ(item()->duration(), 0) << "without a commentary, however many sources it has";
  item()->setAudioCommentarySource(playing(7, platform::types::kM4A));
  EXPECT_EQ(item()->duration(), 7);
}

TEST_F(QuiltMediaTest, OtherItemsHaveNoDuration) {
  keepDocumentBusy();
  item()->addSource(playing(3));
  item()->addSource(playing(3));
  item()->setAudioCommentarySource(playing(3));
  EXPECT_EQ(item()->duration(), 0) << "no category";
  for (const char* category :
       {kQuiltMediaContentCategoryImage, kQuiltMediaContentCategoryDocument, kQuiltMediaContentCategoryWeb}) {
    item()->setContentCategory(category);
    EXPECT_EQ(item()->duration(), 0) << category;
  }
}

// ---- Size

TEST_F(QuiltMediaTest, TheSizeSumsSourcesExtrasAndCommentary) {
  const auto fill = [](QuiltMediaSource& child, std::size_t kilobytes) {
    writeFile(addFlattenedDerivative(child, {"Desktop"})->url()->relativePath(), std::string(kilobytes * 1024, 'x'));
  };
  EXPECT_EQ(item()->totalSizeInMegaBytes(), 0);
  fill(*addEmptySource(), 1024);
  fill(*addEmptySource(), 512);
  EXPECT_EQ(item()->totalSizeInMegaBytes(), 1.5);
  const auto extra = QuiltMediaExtra::init();
  item()->addExtra(extra);
  fill(*extra, 256);
  EXPECT_EQ(item()->totalSizeInMegaBytes(), 1.75);
  const auto commentary = QuiltMediaSource::init();
  item()->setAudioCommentarySource(commentary);
  fill(*commentary, 128);
  EXPECT_EQ(item()->totalSizeInMegaBytes(), 1.875);
}

// ---- Properties and ownership

TEST_F(QuiltMediaTest, EverySetterAnnouncesItsKey) {
  std::vector<std::string> announced;
  std::vector<platform::Observation> observations;
  for (const char* key : {"uuid", "title", "description", "contentCategory", "posterImage", "posterImageVersion",
                          "documentOwner", "sources", "extras", "audioCommentarySource"}) {
    observations.push_back(item()->observe(
        key, [&announced](const platform::ChangeNotice& notice) { announced.emplace_back(notice.key); }));
  }
  item()->setUuid(item()->uuid());  // also when the value stays the same
  item()->setTitle(std::nullopt);
  item()->setDescription("D");
  item()->setContentCategory("Image");
  item()->setPosterImage(picture(4, 4));
  item()->setPosterImageVersion(9);
  item()->setDocumentOwner(document());
  item()->setSources({QuiltMediaSource::init()});
  item()->setExtras({QuiltMediaExtra::init()});
  item()->setAudioCommentarySource(nullptr);
  EXPECT_THAT(announced,
              ElementsAre("uuid", "title", "description", "contentCategory", "posterImage", "posterImageVersion",
                          "documentOwner", "sources", "extras", "audioCommentarySource"));
  EXPECT_EQ(item()->posterImageVersion(), 9u);
  EXPECT_EQ(item()->sourcesCount(), 1u);
  EXPECT_EQ(item()->extraCount(), 1u);
}

TEST_F(QuiltMediaTest, AnItemKeepsItsChildrenAndNeitherItsDocumentNorItself) {
  auto owner = QuiltDocument::initWithPath(folder() / "other.qpk");
  auto media = QuiltMedia::init();
  media->setDocumentOwner(owner);
  std::weak_ptr<QuiltDocument> document = owner;
  owner = nullptr;
  EXPECT_TRUE(document.expired());
  EXPECT_EQ(media->documentOwner(), nullptr);

  const auto source = QuiltMediaSource::init();
  const auto extra = QuiltMediaExtra::init();
  const auto commentary = QuiltMediaSource::init();
  media->addSource(source);
  media->addExtra(extra);
  media->setAudioCommentarySource(commentary);
  media = nullptr;
  EXPECT_EQ(source->mediaOwner(), nullptr);
  EXPECT_EQ(extra->mediaOwner(), nullptr);
  EXPECT_EQ(commentary->mediaOwner(), nullptr);
  EXPECT_EQ(source.use_count(), 1);
  EXPECT_EQ(extra.use_count(), 1);
  EXPECT_EQ(commentary.use_count(), 1);
}

TEST_F(QuiltMediaTest, TheEndOfAnItemTouchesNothingOnDisk) {
  auto media = read({{"UUID", "ITEM"}, {"Sources", Array{Dictionary{{"UUID", "S"}}}}});
  const Path file = writeFile(media->sourceAtIndex(0)->path() / "derivatives/d.png", "content");
  const Path poster = writeFile(media->posterImagePath(), "poster");
  media = nullptr;
  EXPECT_EQ(readFile(file), "content");
  EXPECT_EQ(readFile(poster), "poster");
}

// ---- Invalidation

TEST_F(QuiltMediaTest, InvalidatingDropsThePosterAndTheCachesOfEveryChild) {
  const auto source = addSource(pictureFile(8, 8));
  const auto extra = QuiltMediaExtra::initWithPath(pictureFile(9, 9));
  const auto commentary = QuiltMediaSource::initWithPath(pictureFile(10, 10));
  item()->addExtra(extra);
  item()->setAudioCommentarySource(commentary);
  std::vector<std::shared_ptr<ImageWrapper>> before;
  const auto pictures = [&] {
    return std::vector{source->thumbnailImage(), extra->thumbnailImage(), commentary->thumbnailImage(),
                       item()->posterImage()};
  };
  before = pictures();
  EXPECT_EQ(pictures(), before);
  item()->invalidateCaches();
  const auto after = pictures();
  for (std::size_t i = 0; i < before.size(); ++i) {
    EXPECT_NE(after[i], before[i]) << i;
    EXPECT_NE(after[i], nullptr) << i;
  }
}

}  // namespace
}  // namespace quilt
