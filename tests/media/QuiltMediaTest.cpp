// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::PropertyList;
using platform::Services;
using support::FaultyFiles;
using support::Installed;
using support::Line;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltMediaTest : public support::DocumentFixture {
 protected:
  /// A document whose item has no sources; it does not save by itself.
  QuiltMediaTest() : document(made()), item(addItem(*document, "Item")) {
    document->setIsProcessing(true);
    takeLines();
  }

  static std::vector<std::string> keysOf(const Dictionary& record) {
    std::vector<std::string> keys;
    for (const auto& [key, value] : record) keys.push_back(key);
    return keys;
  }
  /// A source that lasts so long; the type of its content decides its category.
  static std::shared_ptr<QuiltMediaSource> lasting(double seconds, const char* contentType = platform::types::kMPEG4) {
    auto derivative = QuiltMediaDerivative::init();
    derivative->setCompatibilityTags(std::vector<std::string>{kQuiltMediaDerivativeCompatibilityTagDesktop});
    derivative->setContentType(std::string(contentType));
    derivative->setDuration(seconds);
    auto source = QuiltMediaSource::init();
    source->addDerivative(derivative);
    return source;
  }
  /// Gives the source a derivative with a file of that size.
  void addFile(QuiltMediaSource& source, double megaBytes) {
    const Path file = writeFile(folder() / (source.uuid() + ".bin"), "");
    std::filesystem::resize_file(file, static_cast<std::uintmax_t>(megaBytes * 1024 * 1024));
    auto derivative = QuiltMediaDerivative::init();
    derivative->setUrl(platform::Url::fileUrl(file));
    source.addDerivative(derivative);
  }
  std::shared_ptr<QuiltMediaSource> sized(double megaBytes) {
    auto source = QuiltMediaSource::init();
    addFile(*source, megaBytes);
    return source;
  }

  const std::shared_ptr<QuiltDocument> document;
  const std::shared_ptr<QuiltMedia> item;
};

// ---- Construction

TEST_F(QuiltMediaTest, ANewItemIsEmpty) {
  const auto made = QuiltMedia::init();
  EXPECT_FALSE(made->uuid().empty());
  EXPECT_NE(made->uuid(), QuiltMedia::init()->uuid());
  EXPECT_EQ(made->title(), std::nullopt);
  EXPECT_EQ(made->description(), std::nullopt);
  EXPECT_EQ(made->contentCategory(), std::nullopt);
  EXPECT_EQ(made->posterImageVersion(), 1u);
  EXPECT_EQ(made->sourcesCount(), 0u);
  EXPECT_EQ(made->extraCount(), 0u);
  EXPECT_EQ(made->audioCommentarySource(), nullptr);
  EXPECT_EQ(made->documentOwner(), nullptr);
}

// ---- Reading a record

TEST_F(QuiltMediaTest, EveryKeyOfARecordIsRead) {
  const Dictionary source{{"UUID", "SOURCE"}};
  const auto read = QuiltMedia::initWithDictionary({{"UUID", "ITEM"},
                                                    {"Title", "Lecture"},
                                                    {"Description", "First of two"},
                                                    {"ContentCategory", "DualSource"},
                                                    {"Sources", Array{source, Dictionary{{"UUID", "SECOND"}}}},
                                                    {"Extras", Array{Dictionary{{"UUID", "EXTRA"}}}},
                                                    {"AudioCommentarySource", Dictionary{{"UUID", "VOICE"}}}},
                                                   document);
  ASSERT_NE(read, nullptr);
  EXPECT_EQ(read->uuid(), "ITEM");
  EXPECT_EQ(read->title(), "Lecture");
  EXPECT_EQ(read->description(), "First of two");
  EXPECT_EQ(read->contentCategory(), "DualSource");
  EXPECT_EQ(read->documentOwner(), document);
  ASSERT_EQ(read->sourcesCount(), 2u);
  EXPECT_EQ(read->sourceAtIndex(0)->uuid(), "SOURCE");
  EXPECT_EQ(read->sourceAtIndex(1)->uuid(), "SECOND");
  EXPECT_EQ(read->sourceAtIndex(1)->mediaOwner(), read);
  ASSERT_EQ(read->extraCount(), 1u);
  EXPECT_EQ(read->extraAtIndex(0)->uuid(), "EXTRA");
  EXPECT_EQ(read->extraAtIndex(0)->mediaOwner(), read);
  ASSERT_NE(read->audioCommentarySource(), nullptr);
  EXPECT_EQ(read->audioCommentarySource()->uuid(), "VOICE");
  EXPECT_EQ(read->audioCommentarySource()->mediaOwner(), read);
}

TEST_F(QuiltMediaTest, ARecordWithoutAnIdentityGetsAnotherOneEachTime) {
  const Dictionary record{{"Title", "Nameless"}};
  const auto first = QuiltMedia::initWithDictionary(record, document);
  const auto second = QuiltMedia::initWithDictionary(record, document);
  EXPECT_FALSE(first->uuid().empty());
  EXPECT_NE(first->uuid(), second->uuid());
}

TEST_F(QuiltMediaTest, ValuesOfTheWrongKindCountAsMissing) {
  const auto read = QuiltMedia::initWithDictionary({{"UUID", 5},
                                                    {"Title", Array{}},
                                                    {"Description", true},
                                                    {"ContentCategory", 1.5},
                                                    {"Sources", "none"},
                                                    {"Extras", Dictionary{}},
                                                    {"AudioCommentarySource", Array{}}},
                                                   document);
  ASSERT_NE(read, nullptr);
  EXPECT_FALSE(read->uuid().empty());
  EXPECT_EQ(read->title(), std::nullopt);
  EXPECT_EQ(read->description(), std::nullopt);
  EXPECT_EQ(read->contentCategory(), std::nullopt);
  EXPECT_EQ(read->sourcesCount(), 0u);
  EXPECT_EQ(read->extraCount(), 0u);
  EXPECT_EQ(read->audioCommentarySource(), nullptr);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltMediaTest, ChildRecordsThatYieldNothingAreSkipped) {
  const auto read = QuiltMedia::initWithDictionary(
      {{"Sources", Array{"text", Dictionary{{"UUID", "KEPT"}}, 7}}, {"Extras", Array{true}}}, document);
  ASSERT_EQ(read->sourcesCount(), 1u);
  EXPECT_EQ(read->sourceAtIndex(0)->uuid(), "KEPT");
  EXPECT_EQ(read->extraCount(), 0u);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltMediaTest, AnEmptySourceListAndNoneLoadTheSameAndWriteNone) {
  for (const Dictionary& record : {Dictionary{{"Sources", Array{}}, {"Extras", Array{}}}, Dictionary{}}) {
    const auto read = QuiltMedia::initWithDictionary(record, document);
    EXPECT_EQ(read->sourcesCount(), 0u);
    EXPECT_FALSE(read->dictionary().contains("Sources"));
    EXPECT_FALSE(read->dictionary().contains("Extras"));
  }
}

TEST_F(QuiltMediaTest, WhatAnotherVersionWroteIsKept) {
  const auto read =
      QuiltMedia::initWithDictionary({{"Title", "T"}, {"Captions", Array{"en"}}, {"Rating", 4}}, document);
  const Dictionary record = read->dictionary();
  EXPECT_EQ(record.array("Captions")->front(), PropertyList("en"));
  EXPECT_EQ(*record.find("Rating"), PropertyList(4));
}

TEST_F(QuiltMediaTest, DerivedValuesOfARecordAreNotReadBack) {
  const auto read = QuiltMedia::initWithDictionary({{"IsFlattened", true},
                                                    {"TotalSizeInMegaBytes", 12.5},
                                                    {"PosterImagePath", "../../elsewhere.jpg"},
                                                    {"PosterImageWidth", 640.0},
                                                    {"PosterImageHeight", 480.0}},
                                                   document);
  const Dictionary record = read->dictionary();
  EXPECT_EQ(*record.find("IsFlattened"), PropertyList(false));
  EXPECT_EQ(*record.find("TotalSizeInMegaBytes"), PropertyList(0.0));
  EXPECT_EQ(record.string("PosterImagePath"), "media/" + read->uuid() + "/poster.jpg");
  EXPECT_EQ(*record.find("PosterImageWidth"), PropertyList(0));
}

// ---- Writing a record

TEST_F(QuiltMediaTest, TheKeysAreWrittenInOrder) {
  item->setDescription(std::string("Words"));
  item->addSource(lasting(1, platform::types::kPNG));
  item->addExtra(QuiltMediaExtra::init());
  item->setAudioCommentarySource(lasting(1, platform::types::kMP3));
  EXPECT_THAT(keysOf(item->dictionary()),
              ElementsAre("UUID", "Title", "Description", "Sources", "Extras", "AudioCommentarySource", "IsFlattened",
                          "TotalSizeInMegaBytes", "ContentCategory", "PosterImagePath", "PosterImageWidth",
                          "PosterImageHeight"));
}

TEST_F(QuiltMediaTest, WhatIsNotThereIsNotWritten) {
  item->setTitle(std::nullopt);
  EXPECT_THAT(keysOf(item->dictionary()), ElementsAre("UUID", "IsFlattened", "TotalSizeInMegaBytes", "PosterImagePath",
                                                      "PosterImageWidth", "PosterImageHeight"));
}

TEST_F(QuiltMediaTest, WithoutAPosterItsSizeIsTheIntegerZero) {
  const Dictionary record = item->dictionary();
  EXPECT_EQ(*record.find("PosterImageWidth"), PropertyList(0));
  EXPECT_EQ(*record.find("PosterImageHeight"), PropertyList(0));
  EXPECT_EQ(item->posterImageWidth(), PropertyList(0));
}

TEST_F(QuiltMediaTest, APostersSizeIsWrittenAsReals) {
  item->setPosterImage(picture(64, 48));
  const Dictionary record = item->dictionary();
  EXPECT_EQ(*record.find("PosterImageWidth"), PropertyList(64.0));
  EXPECT_EQ(*record.find("PosterImageHeight"), PropertyList(48.0));
}

TEST_F(QuiltMediaTest, ARecordReadsBackToTheSameItem) {
  item->setDescription(std::string("Words"));
  item->setContentCategory(std::string("Montage"));
  item->addSource(lasting(3, platform::types::kPNG));
  item->addExtra(QuiltMediaExtra::init());
  item->setAudioCommentarySource(lasting(5, platform::types::kMP3));
  const Dictionary record = item->dictionary();
  EXPECT_EQ(QuiltMedia::initWithDictionary(record, document)->dictionary(), record);
}

// ---- Category

TEST_F(QuiltMediaTest, TheOnlySourcesCategoryIsTakenAndKept) {
  item->addSource(lasting(1, platform::types::kPNG));
  EXPECT_EQ(item->contentCategory(), "Image");
  item->addSource(lasting(1));
  EXPECT_EQ(item->contentCategory(), "Image");
  item->removeAllSources();
  EXPECT_EQ(item->contentCategory(), "Image");
  item->setContentCategory(std::string("Montage"));
  EXPECT_EQ(item->contentCategory(), "Montage");
}

TEST_F(QuiltMediaTest, TwoSourcesGiveNoCategory) {
  item->addSource(lasting(1, platform::types::kPNG));
  item->addSource(lasting(1));
  EXPECT_EQ(item->contentCategory(), std::nullopt);
  EXPECT_FALSE(item->dictionary().contains("ContentCategory"));
}

// ---- Places

TEST_F(QuiltMediaTest, ThePlacesLieBelowTheDocumentsMediaFolder) {
  EXPECT_EQ(item->path(), document->mediaFolderPath() / item->uuid());
  EXPECT_EQ(item->sourcesFolderPath(), item->path() / "sources");
  EXPECT_EQ(item->extrasFolderPath(), item->path() / "extras");
  EXPECT_EQ(item->posterImagePath(), item->path() / "poster.jpg");
  EXPECT_FALSE(std::filesystem::exists(item->path())) << "asking makes nothing";
}

TEST_F(QuiltMediaTest, WithoutADocumentThereIsNoPlace) {
  const auto detached = QuiltMedia::init();
  EXPECT_EQ(detached->path(), Path());
  EXPECT_EQ(detached->sourcesFolderPath(), Path());
  EXPECT_EQ(detached->extrasFolderPath(), Path());
  EXPECT_EQ(detached->posterImagePath(), Path());
}

// ---- Duration and size

TEST_F(QuiltMediaTest, TheFirstSourceGivesTheDurationOfWhatPlays) {
  item->addSource(lasting(10));
  item->addSource(lasting(99));
  for (const char* category : {"Audio", "Movie", "DualSource"}) {
    item->setContentCategory(std::string(category));
    EXPECT_EQ(item->duration(), 10) << category;
  }
  for (const char* category : {"Image", "Document", "Web"}) {
    item->setContentCategory(std::string(category));
    EXPECT_EQ(item->duration(), 0) << category;
  }
}

TEST_F(QuiltMediaTest, AMontageLastsAsLongAsItsCommentary) {
  item->setContentCategory(std::string("Montage"));
  item->addSource(lasting(10));
  item->addSource(lasting(20));
  EXPECT_EQ(item->duration(), 0);
  item->setAudioCommentarySource(lasting(33, platform::types::kMP3));
  EXPECT_EQ(item->duration(), 33);
}

TEST_F(QuiltMediaTest, WithoutSourcesTheDurationIsZero) {
  item->setContentCategory(std::string("Montage"));
  item->setAudioCommentarySource(lasting(33, platform::types::kMP3));
  EXPECT_EQ(item->duration(), 0);
}

TEST_F(QuiltMediaTest, TheSizeIsThatOfEveryChild) {
  EXPECT_EQ(item->totalSizeInMegaBytes(), 0);
  item->addSource(sized(1.5));
  item->addSource(sized(2));
  const auto extra = QuiltMediaExtra::init();
  addFile(*extra, 4);
  item->addExtra(extra);
  item->setAudioCommentarySource(sized(8));
  EXPECT_EQ(item->totalSizeInMegaBytes(), 15.5);
  EXPECT_EQ(*item->dictionary().find("TotalSizeInMegaBytes"), PropertyList(15.5));
}

// ---- Caches

TEST_F(QuiltMediaTest, InvalidatingTheCachesLeavesFileAndVersion) {
  const auto pictured = addPictureItem(*document);
  ASSERT_NE(pictured->posterImage(), nullptr);
  const std::uint64_t version = pictured->posterImageVersion();
  pictured->invalidateCaches();
  EXPECT_TRUE(std::filesystem::exists(pictured->posterImagePath()));
  EXPECT_EQ(pictured->posterImageVersion(), version);
}

TEST_F(QuiltMediaTest, InvalidatingTheCachesReachesEveryChild) {
  const auto source = QuiltMediaSource::init();
  const auto extra = QuiltMediaExtra::init();
  const auto commentary = QuiltMediaSource::init();
  item->addSource(source);
  item->addExtra(extra);
  item->setAudioCommentarySource(commentary);
  const std::vector<std::shared_ptr<QuiltMediaSource>> children{source, extra, commentary};
  for (const auto& child : children) child->setPosterImage(picture(8, 8));
  item->invalidateCaches();
  for (const auto& child : children)
    EXPECT_EQ(child->posterImage(), nullptr) << "there is nothing to draw it anew from";
}

TEST_F(QuiltMediaTest, InvalidatingThePosterDeletesItAndRaisesTheVersion) {
  const auto pictured = addPictureItem(*document);
  ASSERT_NE(pictured->posterImage(), nullptr);
  const std::uint64_t version = pictured->posterImageVersion();
  takeLines();
  pictured->invalidatePosterImage();
  EXPECT_FALSE(std::filesystem::exists(pictured->posterImagePath()));
  EXPECT_EQ(pictured->posterImageVersion(), version + 1);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaTest, APosterThatCannotBeDeletedIsWarnedOf) {
  const auto pictured = addPictureItem(*document);
  const auto before = pictured->posterImage();
  ASSERT_NE(before, nullptr);
  const std::uint64_t version = pictured->posterImageVersion();
  takeLines();
  Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::named("poster.jpg");
  pictured->invalidatePosterImage();
  EXPECT_THAT(takeLines(), ElementsAre(warning("Failed to delete poster image at path \"" +
                                               pictured->posterImagePath().native() + "\": \"The disk is full.\"")));
  EXPECT_EQ(pictured->posterImageVersion(), version + 1);
  EXPECT_NE(pictured->posterImage(), before) << "the cache is dropped all the same";
}

TEST_F(QuiltMediaTest, InvalidatingThePosterOfADetachedItemDropsTheCacheAndRaisesTheVersion) {
  const auto detached = QuiltMedia::init();
  detached->setPosterImage(picture(8, 8));
  detached->invalidatePosterImage();
  EXPECT_EQ(detached->posterImageVersion(), 2u);
  EXPECT_EQ(detached->posterImage(), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

// ---- Hostile records

TEST_F(QuiltMediaTest, AnIdentityThatIsNoPlainNameIsRefused) {
  for (const char* uuid : {"..", "../x", "/x", "a/b", "", "."}) {
    EXPECT_EQ(QuiltMedia::initWithDictionary({{"UUID", uuid}}, document), nullptr) << uuid;
    EXPECT_EQ(takeProblems().size(), 1u) << uuid;
  }
  EXPECT_EQ(QuiltMedia::initWithDictionary({{"UUID", std::string(300, 'x')}}, document), nullptr);
}

}  // namespace
}  // namespace quilt
