// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::ChangePhase;
using platform::Services;
using support::FaultyFiles;
using support::FaultyPropertyLists;
using support::Installed;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pair;

class QuiltDocumentMediaTest : public support::DocumentFixture {
 protected:
  /// A document with the items A, B, C, D.
  std::shared_ptr<QuiltDocument> withFourItems() {
    auto document = made();
    for (const char* title : {"A", "B", "C", "D"}) addItem(*document, title);
    return document;
  }

  static std::string titlesOf(const QuiltDocument& document) {
    std::string titles;
    for (const auto& item : document.media()) titles += item->title().value_or("?");
    return titles;
  }

  /// An item of the category with one source for each file; a missing path gives a derivative without a URL.
  static std::shared_ptr<QuiltMedia> itemWith(QuiltDocument& document, const char* title,
                                              const std::vector<Path>& files, const Text& category = std::nullopt) {
    const auto item = addItem(document, title);
    document.setIsProcessing(true);
    if (category) item->setContentCategory(category);
    for (const Path& file : files) item->addSource(sourceOf(file));
    document.setIsProcessing(false);
    return item;
  }

  Path existing(const std::string& name = "movie.mp4") const { return writeFile(folder() / name, "movie"); }
  Path missing() const { return folder() / "gone.mp4"; }
};

// ---- Looking

TEST_F(QuiltDocumentMediaTest, AnIndexThatIsNotBelowTheCountGivesNothing) {
  const auto document = withFourItems();
  EXPECT_EQ(document->mediaCount(), 4u);
  EXPECT_EQ(document->mediaAtIndex(3)->title(), "D");
  takeLines();
  EXPECT_EQ(document->mediaAtIndex(4), nullptr);
  EXPECT_EQ(document->mediaAtIndex(static_cast<std::size_t>(-1)), nullptr);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentMediaTest, TheFirstItemWithAnIdentityIsFound) {
  const auto document = withFourItems();
  document->mediaAtIndex(1)->setUuid("TWIN");
  document->mediaAtIndex(2)->setUuid("TWIN");
  EXPECT_EQ(document->mediaWithUUID("TWIN")->title(), "B");
  EXPECT_EQ(document->mediaWithUUID("nobody"), nullptr);
}

TEST_F(QuiltDocumentMediaTest, AWalkOverNoItemsSucceedsWithoutACall) {
  int calls = 0;
  EXPECT_TRUE(QuiltDocument::init()->performBlockOnMedia([&calls](const auto&) { return ++calls == 0; }));
  EXPECT_EQ(calls, 0);
}

TEST_F(QuiltDocumentMediaTest, AWalkStopsAtTheFirstFalseAnswer) {
  std::string seen;
  EXPECT_FALSE(withFourItems()->performBlockOnMedia([&seen](const auto& item) {
    seen += *item->title();
    return seen.size() < 2;
  }));
  EXPECT_EQ(seen, "AB");
}

TEST_F(QuiltDocumentMediaTest, AWalkSucceedsWhenEveryAnswerIsTrue) {
  std::string seen;
  EXPECT_TRUE(withFourItems()->performBlockOnMedia([&seen](const auto& item) {
    seen += *item->title();
    return true;
  }));
  EXPECT_EQ(seen, "ABCD");
}

// ---- Adding and moving

TEST_F(QuiltDocumentMediaTest, AnAddedItemKnowsItsDocument) {
  const auto document = made();
  const auto item = QuiltMedia::init();
  document->addMedia(item);
  EXPECT_EQ(item->documentOwner(), document);
  EXPECT_EQ(document->mediaAtIndex(0), item);
}

TEST_F(QuiltDocumentMediaTest, AnItemIsInsertedAtItsIndex) {
  const auto document = withFourItems();
  const auto item = QuiltMedia::init();
  item->setTitle("x");
  document->addMedia(item, 1);
  EXPECT_EQ(titlesOf(*document), "AxBCD");
  const auto last = QuiltMedia::init();
  last->setTitle("y");
  document->addMedia(last, 5);
  EXPECT_EQ(titlesOf(*document), "AxBCDy");
}

TEST_F(QuiltDocumentMediaTest, NoItemIsAddedForNone) {
  const auto document = made();
  document->addMedia(nullptr);
  document->addMedia(nullptr, 0);
  document->removeMedia(nullptr);
  EXPECT_EQ(document->mediaCount(), 0u);
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

TEST_F(QuiltDocumentMediaTest, AnIndexBeyondTheCountAddsNothing) {
  const auto document = withFourItems();
  const auto item = QuiltMedia::init();
  document->addMedia(item, 5);
  EXPECT_EQ(titlesOf(*document), "ABCD");
  EXPECT_EQ(item->documentOwner(), nullptr);
}

TEST_F(QuiltDocumentMediaTest, TheFirstTwoMovedToThreeStandAfterTheThird) {
  const auto document = withFourItems();
  document->moveMediaAtIndexes({0, 1}, 3);
  EXPECT_EQ(titlesOf(*document), "CABD");
}

TEST_F(QuiltDocumentMediaTest, TheLastMovedToTheFrontStandsFirst) {
  const auto document = withFourItems();
  document->moveMediaAtIndexes({3}, 0);
  EXPECT_EQ(titlesOf(*document), "DABC");
}

TEST_F(QuiltDocumentMediaTest, AScatteredGroupMovesTogether) {
  const auto document = withFourItems();
  document->moveMediaAtIndexes({0, 2}, 4);
  EXPECT_EQ(titlesOf(*document), "BDAC");
}

TEST_F(QuiltDocumentMediaTest, EveryChangeIsAnnouncedBeforeAndAfter) {
  const auto document = made();
  std::vector<std::pair<ChangePhase, std::string>> notices;
  const auto observation = document->observe(
      "media", [&](const auto& notice) { notices.emplace_back(notice.phase, titlesOf(*document)); },
      platform::ObservationOptions::Prior);
  const auto item = QuiltMedia::init();
  item->setTitle("x");
  document->addMedia(item);
  document->moveMediaAtIndexes({}, 0);
  document->removeMedia(item);
  EXPECT_THAT(notices,
              ElementsAre(Pair(ChangePhase::Will, ""), Pair(ChangePhase::Did, "x"), Pair(ChangePhase::Will, "x"),
                          Pair(ChangePhase::Did, "x"), Pair(ChangePhase::Will, "x"), Pair(ChangePhase::Did, "")));
}

// ---- Removing

TEST_F(QuiltDocumentMediaTest, RemovingAnItemDeletesItsFolderAndOnlyThat) {
  const auto document = withFourItems();
  const auto a = document->mediaAtIndex(0);
  const auto b = document->mediaAtIndex(1);
  writeFile(a->path() / "sources/s/movie.mp4", "a");
  writeFile(b->path() / "sources/s/movie.mp4", "b");
  document->removeMedia(a);
  EXPECT_EQ(titlesOf(*document), "BCD");
  EXPECT_EQ(a->documentOwner(), nullptr);
  EXPECT_THAT(namesIn(document->mediaFolderPath()), ElementsAre(b->uuid()));
  EXPECT_EQ(readFile(b->path() / "sources/s/movie.mp4"), "b");
  EXPECT_THAT(takeProblems(), IsEmpty());
  EXPECT_EQ(saved(*document).array("Media")->size(), 3u);
}

TEST_F(QuiltDocumentMediaTest, AnItemWhoseFolderIsGoneIsRemovedWithoutAWarning) {
  const auto document = withFourItems();
  document->removeMedia(document->mediaAtIndex(2));
  EXPECT_EQ(titlesOf(*document), "ABD");
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentMediaTest, AFolderThatCannotBeDeletedIsReportedAndTheItemLeaves) {
  const auto document = withFourItems();
  const auto a = document->mediaAtIndex(0);
  const Path path = a->path();
  writeFile(path / "movie.mp4", "a");
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::anyPath();
  takeLines();
  document->removeMedia(a);
  EXPECT_EQ(titlesOf(*document), "BCD");
  EXPECT_EQ(takeProblems(),
            Lines{warning("Failed to delete media at path \"" + path.native() + "\": \"The disk is full.\"")});
  EXPECT_EQ(readFile(path / "movie.mp4"), "a");
}

TEST_F(QuiltDocumentMediaTest, EveryOccurrenceOfAnItemLeaves) {
  const auto document = withFourItems();
  const auto a = document->mediaAtIndex(0);
  add(*document, a);
  ASSERT_EQ(titlesOf(*document), "ABCDA");
  document->removeMedia(a);
  EXPECT_EQ(titlesOf(*document), "BCD");
}

TEST_F(QuiltDocumentMediaTest, RemovingAllDeletesEveryFolderAndSavesOnceForEach) {
  const auto document = withFourItems();
  for (const auto& item : document->media()) writeFile(item->path() / "movie.mp4", "m");
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  document->removeAllMedia();
  EXPECT_EQ(document->mediaCount(), 0u);
  EXPECT_THAT(namesIn(document->mediaFolderPath()), IsEmpty());
  EXPECT_EQ(lists->writes, 4);
  EXPECT_FALSE(saved(*document).contains("Media"));
}

TEST_F(QuiltDocumentMediaTest, RemovingFromABusyDocumentDoesNotSave) {
  const auto document = withFourItems();
  document->setIsProcessing(true);
  document->removeAllMedia();
  EXPECT_EQ(document->mediaCount(), 0u);
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

// ---- Clean-up

TEST_F(QuiltDocumentMediaTest, OnlyItemsWithoutSourcesAreEmpty) {
  const auto document = made();
  addItem(*document, "A");
  itemWith(*document, "B", {missing()});
  addItem(*document, "C");
  const auto onlyExtra = addItem(*document, "D");
  document->setIsProcessing(true);
  onlyExtra->addExtra(QuiltMediaExtra::init());
  document->setIsProcessing(false);
  addWebItem(*document, "E");
  document->removeAllEmptyMedia();
  EXPECT_EQ(titlesOf(*document), "BE");
}

TEST_F(QuiltDocumentMediaTest, AnItemIsBrokenWhenOneSourceHasLostItsFile) {
  const auto document = made();
  itemWith(*document, "A", {existing(), missing()});
  itemWith(*document, "B", {existing()});
  itemWith(*document, "C", {missing()});
  itemWith(*document, "D", {Path()});
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "B");
}

TEST_F(QuiltDocumentMediaTest, ASourceWithoutDerivativesIsBroken) {
  const auto document = made();
  const auto item = addItem(*document, "A");
  document->setIsProcessing(true);
  item->addSource(QuiltMediaSource::init());
  document->setIsProcessing(false);
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "");
}

TEST_F(QuiltDocumentMediaTest, AnItemWithoutSourcesIsNotBroken) {
  const auto document = withFourItems();
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "ABCD");
}

TEST_F(QuiltDocumentMediaTest, AWebLinkIsNeverBroken) {
  const auto document = made();
  addWebItem(*document, "A")->setContentCategory(kQuiltMediaContentCategoryMovie);
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "A");
}

TEST_F(QuiltDocumentMediaTest, AMontageIsBrokenWithoutTheFileOfItsCommentary) {
  const auto document = made();
  const char* montage = kQuiltMediaContentCategoryMontage;
  itemWith(*document, "A", {existing()}, montage);
  itemWith(*document, "B", {existing()}, montage)->setAudioCommentarySource(QuiltMediaSource::init());
  itemWith(*document, "C", {existing()}, montage)->setAudioCommentarySource(sourceOf(missing()));
  itemWith(*document, "D", {existing()}, montage)->setAudioCommentarySource(sourceOf(existing("sound.m4a")));
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "D");
}

TEST_F(QuiltDocumentMediaTest, AMontageWithACommentaryIsBrokenLikeAnyItemWhenASourceIs) {
  const auto document = made();
  itemWith(*document, "A", {missing()}, kQuiltMediaContentCategoryMontage)
      ->setAudioCommentarySource(sourceOf(existing()));
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "");
}

TEST_F(QuiltDocumentMediaTest, TheCommentaryOfAnotherItemMayBeMissing) {
  const auto document = made();
  itemWith(*document, "A", {existing()}, kQuiltMediaContentCategoryMovie)
      ->setAudioCommentarySource(sourceOf(missing()));
  document->removeAllBrokenMedia();
  EXPECT_EQ(titlesOf(*document), "A");
}

TEST_F(QuiltDocumentMediaTest, BrokenItemsLoseTheirFolders) {
  const auto document = made();
  const auto item = itemWith(*document, "A", {missing()});
  const Path path = item->path();
  writeFile(path / "poster.jpg", "poster");
  document->removeAllBrokenMedia();
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST_F(QuiltDocumentMediaTest, BrokenExtrasLeaveTheirItemsAndIntactOnesStay) {
  const auto document = made();
  const auto extraOf = [](const Path& file) {
    auto extra = QuiltMediaExtra::init();
    auto derivative = QuiltMediaDerivative::init();
    derivative->setCompatibilityTags(std::vector<std::string>{"Desktop"});
    derivative->setUrl(Url::fileUrl(file));
    extra->addDerivative(derivative);
    return extra;
  };
  const auto link = QuiltMediaExtra::init();
  link->addDerivative(QuiltMediaDerivative::initWithURL(*Url::parse("https://example.org/")));
  const auto a = addItem(*document, "A");
  const auto b = addItem(*document, "B");
  document->setIsProcessing(true);
  for (const auto& extra : {extraOf(missing()), extraOf(existing()), link, extraOf(missing())}) a->addExtra(extra);
  b->addExtra(extraOf(missing()));
  b->addExtra(QuiltMediaExtra::init());
  takeLines();
  document->removeAllBrokenMediaExtra();
  EXPECT_EQ(a->extraCount(), 2u);
  EXPECT_EQ(a->extraAtIndex(1), link);
  EXPECT_EQ(b->extraCount(), 0u);
  EXPECT_EQ(document->mediaCount(), 2u);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltDocumentMediaTest, EachItemIsAskedToRemoveEveryBrokenExtraFoundSoFar) {
  const auto document = made();
  const auto a = addItem(*document, "A");
  const auto b = addItem(*document, "B");
  document->setIsProcessing(true);
  a->addExtra(QuiltMediaExtra::init());
  document->setIsProcessing(false);
  // The second item does not hold the extra, but its list is announced to change all the same.
  int announced = 0;
  const auto observation = b->observe("extras", [&announced](const auto&) { ++announced; });
  document->removeAllBrokenMediaExtra();
  EXPECT_EQ(announced, 1);
}

// ---- Duration

TEST_F(QuiltDocumentMediaTest, AnEmptyDocumentLastsNoTime) { EXPECT_EQ(made()->duration(), 0); }

TEST_F(QuiltDocumentMediaTest, TheDurationIsTheSumOverTheItems) {
  const auto document = made();
  for (const double seconds : {1.5, 2.25}) {
    const auto item = itemWith(*document, "A", {existing()}, kQuiltMediaContentCategoryMovie);
    item->sourceAtIndex(0)->derivativeAtIndex(0)->setDuration(seconds);
  }
  addWebItem(*document);
  EXPECT_EQ(document->duration(), 3.75);
  ASSERT_TRUE(document->update());
  EXPECT_EQ(saved(*document).real("DocumentDuration"), 3.75);
}

}  // namespace
}  // namespace quilt
