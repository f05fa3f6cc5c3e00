// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/media/QuiltMedia.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::ChangePhase;
using platform::Services;
using support::critical;
using support::FaultyFiles;
using support::FaultyPropertyLists;
using support::Installed;
using support::Line;
using support::Lines;
using support::MediaSpec;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

// ---- What sources and extras have in common, under the names of each

struct Sources {
  using Child = QuiltMediaSource;
  static constexpr const char* key = "sources";
  static constexpr const char* recordKey = "Sources";
  static constexpr const char* notDeleted = "Failed to delete source at path \"";
  static std::size_t count(const QuiltMedia& item) { return item.sourcesCount(); }
  static auto at(const QuiltMedia& item, std::size_t index) { return item.sourceAtIndex(index); }
  static auto all(const QuiltMedia& item) { return item.sources(); }
  template <class Block>
  static bool walk(const QuiltMedia& item, const Block& block) {
    return item.performBlockOnSources(block);
  }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.addSource(child); }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child, std::size_t index) {
    item.addSource(child, index);
  }
  static void move(QuiltMedia& item, const IndexSet& indexes, std::size_t target) {
    item.moveSourcesAtIndexes(indexes, target);
  }
  static void remove(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.removeSource(child); }
  static void removeAll(QuiltMedia& item) { item.removeAllSources(); }
};

struct Extras {
  using Child = QuiltMediaExtra;
  static constexpr const char* key = "extras";
  static constexpr const char* recordKey = "Extras";
  static constexpr const char* notDeleted = "Failed to delete extra at path \"";
  static std::size_t count(const QuiltMedia& item) { return item.extraCount(); }
  static auto at(const QuiltMedia& item, std::size_t index) { return item.extraAtIndex(index); }
  static auto all(const QuiltMedia& item) { return item.extras(); }
  template <class Block>
  static bool walk(const QuiltMedia& item, const Block& block) {
    return item.performBlockOnExtra(block);
  }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.addExtra(child); }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child, std::size_t index) {
    item.addExtra(child, index);
  }
  static void move(QuiltMedia& item, const IndexSet& indexes, std::size_t target) {
    item.moveExtraAtIndexes(indexes, target);
  }
  static void remove(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.removeExtra(child); }
  static void removeAll(QuiltMedia& item) { item.removeAllExtras(); }
};

template <class List>
class QuiltMediaListsTest : public support::PackageFixture {
 protected:
  using Child = typename List::Child;
  using Pointer = std::shared_ptr<Child>;

  static Pointer child(const std::string& name) {
    auto made = Child::init();
    made->setUuid(name);
    return made;
  }
  void fill(const std::string& names) {
    for (const char name : names) List::add(*this->item(), child(std::string(1, name)));
  }
  std::string names() const {
    std::string names;
    for (const Pointer& held : List::all(*this->item())) names += held->uuid();
    return names;
  }
  std::string moved(const IndexSet& indexes, std::size_t target) {
    List::removeAll(*this->item());
    fill("ABCD");
    List::move(*this->item(), indexes, target);
    return names();
  }
  /// The folder of a child with a file deep in it.
  static Path withFiles(const Pointer& held) {
    writeFile(held->path() / "derivatives/d.png", "content");
    return held->path();
  }
  static Line notDeleted(const Path& path, const std::string& reason) {
    return warning(List::notDeleted + path.native() + "\": \"" + reason + "\"");
  }
  /// Calls back before (true) and after (false) each change of the list.
  platform::Observation observe(const std::function<void(bool before)>& block) {
    return this->item()->observe(
        List::key, [block](const platform::ChangeNotice& notice) { block(notice.phase == ChangePhase::Will); },
        platform::ObservationOptions::Prior);
  }
};

class ListNames {
 public:
  template <class List>
  static std::string GetName(int) {
    return List::key;
  }
};

using Lists = ::testing::Types<Sources, Extras>;
TYPED_TEST_SUITE(QuiltMediaListsTest, Lists, ListNames);

// ---- Reading

TYPED_TEST(QuiltMediaListsTest, AnEmptyListCallsNoBlock) {
  EXPECT_EQ(TypeParam::count(*this->item()), 0u);
  EXPECT_EQ(TypeParam::at(*this->item(), 0), nullptr);
  int calls = 0;
  EXPECT_TRUE(TypeParam::walk(*this->item(), [&](const auto&) { return ++calls, false; }));
  EXPECT_EQ(calls, 0);
}

TYPED_TEST(QuiltMediaListsTest, AnIndexPastTheEndAnswersNoneWithoutAMessage) {
  this->fill("AB");
  EXPECT_EQ(TypeParam::count(*this->item()), 2u);
  EXPECT_EQ(TypeParam::at(*this->item(), 1)->uuid(), "B");
  EXPECT_EQ(TypeParam::at(*this->item(), 2), nullptr);
  EXPECT_EQ(TypeParam::at(*this->item(), static_cast<std::size_t>(-1)), nullptr);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, AWalkVisitsInOrderAndStopsAtTheFirstFalse) {
  this->fill("ABC");
  std::string visited;
  EXPECT_TRUE(TypeParam::walk(*this->item(), [&](const auto& child) { return visited += child->uuid(), true; }));
  EXPECT_EQ(visited, "ABC");
  visited.clear();
  EXPECT_FALSE(TypeParam::walk(*this->item(), [&](const auto& child) {
    visited += child->uuid();
    return child->uuid() != "B";
  }));
  EXPECT_EQ(visited, "AB");
}

// ---- Adding

TYPED_TEST(QuiltMediaListsTest, AddingAppendsOrInsertsAndAttaches) {
  this->fill("AC");
  TypeParam::add(*this->item(), this->child("B"), 1);
  TypeParam::add(*this->item(), this->child("0"), 0);
  TypeParam::add(*this->item(), this->child("D"), 4);
  EXPECT_EQ(this->names(), "0ABCD");
  EXPECT_TRUE(
      TypeParam::walk(*this->item(), [this](const auto& child) { return child->mediaOwner() == this->item(); }));
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, AChildIsAttachedBeforeItIsSeen) {
  const auto child = this->child("A");
  std::vector<std::pair<bool, std::size_t>> seen;
  const auto observation = this->observe([&](bool before) {
    EXPECT_EQ(child->mediaOwner(), this->item());
    seen.emplace_back(before, TypeParam::count(*this->item()));
  });
  TypeParam::add(*this->item(), child);
  EXPECT_THAT(seen, ElementsAre(std::pair(true, 0u), std::pair(false, 1u)));
}

TYPED_TEST(QuiltMediaListsTest, NoneIsIgnored) {
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  int announced = 0;
  const auto observation = this->observe([&](bool) { ++announced; });
  TypeParam::add(*this->item(), nullptr);
  TypeParam::add(*this->item(), nullptr, 0);
  TypeParam::add(*this->item(), nullptr, 7);
  TypeParam::remove(*this->item(), nullptr);
  EXPECT_EQ(announced, 0);
  EXPECT_EQ(lists->writes, 0);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, AnInsertionBeyondTheEndIsRefused) {
  this->fill("A");
  const auto child = this->child("B");
  TypeParam::add(*this->item(), child, 2);
  EXPECT_EQ(this->names(), "A");
  EXPECT_EQ(child->mediaOwner(), nullptr);
  EXPECT_EQ(this->takeLines(),
            Lines{critical("Index 2 is beyond the 1 items of \"" + std::string(TypeParam::key) + "\"")});
}

// ---- Moving

TYPED_TEST(QuiltMediaListsTest, AGroupMovesToAPositionCountedBeforeTheMove) {
  EXPECT_EQ(this->moved({0, 2}, 4), "BDAC");
  EXPECT_EQ(this->moved({3}, 0), "DABC");
  EXPECT_EQ(this->moved({0}, 2), "BACD");
  EXPECT_EQ(this->moved({0, 1, 2, 3}, 4), "ABCD");
  EXPECT_EQ(this->moved({1, 2}, 2), "ABCD") << "the target is lowered once, for the second child";
}

TYPED_TEST(QuiltMediaListsTest, MovingNothingIsAnnouncedAndSavedAllTheSame) {
  this->fill("AB");
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  std::vector<bool> phases;
  const auto observation = this->observe([&](bool before) { phases.push_back(before); });
  TypeParam::move(*this->item(), {}, 1);
  EXPECT_THAT(phases, ElementsAre(true, false));
  EXPECT_EQ(lists->writes, 1);
  EXPECT_EQ(this->names(), "AB");
}

TYPED_TEST(QuiltMediaListsTest, AMoveFromOrToOutsideIsRefused) {
  const std::string list = "\"" + std::string(TypeParam::key) + "\"";
  EXPECT_EQ(this->moved({1, 4}, 0), "ABCD");
  EXPECT_EQ(this->moved({0}, 5), "ABCD");
  EXPECT_EQ(this->takeLines(), (Lines{critical("Index 5 is beyond the 4 items of " + list),
                                      critical("Index 5 is beyond the 4 items of " + list)}));
}

TYPED_TEST(QuiltMediaListsTest, AMoveKeepsTheOwners) {
  this->moved({0, 2}, 4);
  EXPECT_TRUE(
      TypeParam::walk(*this->item(), [this](const auto& child) { return child->mediaOwner() == this->item(); }));
}

// ---- Removing

TYPED_TEST(QuiltMediaListsTest, RemovingDeletesTheFolderDetachesAndAnnounces) {
  this->fill("AB");
  const auto child = TypeParam::at(*this->item(), 0);
  const Path gone = this->withFiles(child);
  const Path kept = this->withFiles(TypeParam::at(*this->item(), 1));
  std::vector<std::pair<bool, std::string>> seen;
  const auto observation = this->observe([&](bool before) {
    EXPECT_FALSE(std::filesystem::exists(gone)) << "the files go first, for the path leads through the owner";
    EXPECT_EQ(child->mediaOwner(), nullptr);
    seen.emplace_back(before, this->names());
  });
  TypeParam::remove(*this->item(), child);
  EXPECT_THAT(seen, ElementsAre(std::pair(true, std::string("AB")), std::pair(false, std::string("B"))));
  EXPECT_TRUE(std::filesystem::exists(kept));
  EXPECT_EQ(child->uuid(), "A") << "who still holds it may use it";
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, RemovingTakesEveryEntryOfTheChild) {
  const auto twice = this->child("A");
  TypeParam::add(*this->item(), twice);
  TypeParam::add(*this->item(), this->child("B"));
  TypeParam::add(*this->item(), twice);
  TypeParam::remove(*this->item(), twice);
  EXPECT_EQ(this->names(), "B");
}

TYPED_TEST(QuiltMediaListsTest, AFolderThatCannotBeDeletedIsReportedAndTheChildGoesAllTheSame) {
  this->fill("A");
  const auto child = TypeParam::at(*this->item(), 0);
  const Path path = this->withFiles(child);
  const Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::named("A");
  TypeParam::remove(*this->item(), child);
  EXPECT_EQ(this->takeLines(), Lines{this->notDeleted(path, "The disk is full.")});
  EXPECT_EQ(this->names(), "");
  EXPECT_EQ(child->mediaOwner(), nullptr);
  EXPECT_TRUE(std::filesystem::exists(path));
}

TYPED_TEST(QuiltMediaListsTest, AChildThatIsNotInTheListStillLosesItsFilesAndItsOwner) {
  this->fill("A");
  const auto stranger = this->child("X");
  stranger->setMediaOwner(this->item());
  const Path path = this->withFiles(stranger);
  std::vector<bool> phases;
  const auto observation = this->observe([&](bool before) { phases.push_back(before); });
  TypeParam::remove(*this->item(), stranger);
  EXPECT_FALSE(std::filesystem::exists(path));
  EXPECT_EQ(stranger->mediaOwner(), nullptr);
  EXPECT_EQ(this->names(), "A");
  EXPECT_THAT(phases, ElementsAre(true, false));
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, AFolderBehindALinkIsNotDeleted) {
  this->fill("A");
  const auto child = TypeParam::at(*this->item(), 0);
  const Path precious = this->writeFile(this->folder() / "outside/precious.txt", "keep me");
  std::filesystem::create_directories(child->path().parent_path());
  std::filesystem::create_directory_symlink(precious.parent_path(), child->path());
  TypeParam::remove(*this->item(), child);
  EXPECT_EQ(this->readFile(precious), "keep me");
  EXPECT_EQ(this->names(), "");
}

TYPED_TEST(QuiltMediaListsTest, RemovingAllWithoutFilesLogsNothing) {
  this->fill("ABC");
  TypeParam::removeAll(*this->item());
  EXPECT_EQ(TypeParam::count(*this->item()), 0u);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, RemovingAllDeletesAnnouncesAndSavesForEachInOrder) {
  this->fill("ABC");
  for (const auto& child : TypeParam::all(*this->item())) this->withFiles(child);
  const Path parent = TypeParam::at(*this->item(), 0)->path().parent_path();
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  std::vector<std::string> after;
  const auto observation = this->observe([&](bool before) {
    if (!before) after.push_back(this->names());
  });
  TypeParam::removeAll(*this->item());
  EXPECT_THAT(after, ElementsAre("BC", "C", ""));
  EXPECT_EQ(lists->writes, 3);
  EXPECT_THAT(this->namesIn(parent), IsEmpty());
}

// ---- Saving

TYPED_TEST(QuiltMediaListsTest, EachChangeSavesTheDocumentAfterItWasMade) {
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  const auto savedNames = [this] {
    const Dictionary record = this->readRecord(this->document()->propertiesPath());
    const Dictionary& media = *record.array("Media")->front().template as<Dictionary>();
    std::string names;
    for (const auto& child : *media.array(TypeParam::recordKey))
      names += *child.template as<Dictionary>()->string("UUID");
    return names;
  };
  this->fill("A");
  EXPECT_EQ(lists->writes, 1);
  EXPECT_EQ(savedNames(), "A");
  TypeParam::add(*this->item(), this->child("B"), 0);
  EXPECT_EQ(lists->writes, 2);
  EXPECT_EQ(savedNames(), "BA");
  TypeParam::move(*this->item(), {0}, 2);
  EXPECT_EQ(lists->writes, 3);
  EXPECT_EQ(savedNames(), "AB");
  TypeParam::remove(*this->item(), TypeParam::at(*this->item(), 0));
  EXPECT_EQ(lists->writes, 4);
  EXPECT_EQ(savedNames(), "B");
}

TYPED_TEST(QuiltMediaListsTest, NothingIsSavedWhileTheDocumentIsProcessing) {
  this->keepDocumentBusy();
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  this->moved({0}, 2);
  TypeParam::removeAll(*this->item());
  EXPECT_EQ(lists->writes, 0);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListsTest, AnItemWithoutADocumentChangesItsListsAllTheSame) {
  const auto loose = QuiltMedia::init();
  TypeParam::add(*loose, this->child("A"));
  TypeParam::add(*loose, this->child("B"), 0);
  TypeParam::move(*loose, {0}, 2);
  EXPECT_EQ(TypeParam::at(*loose, 0)->uuid(), "A");
  TypeParam::removeAll(*loose);
  EXPECT_EQ(TypeParam::count(*loose), 0u);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

// ---- Sources alone

class QuiltMediaSourcesTest : public support::PackageFixture {
 protected:
  static std::shared_ptr<QuiltMediaSource> named(const std::string& uuid) {
    auto source = QuiltMediaSource::init();
    source->setUuid(uuid);
    return source;
  }

  /// A movie of one preview per chapter.
  std::shared_ptr<QuiltMediaSource> addMovieWithChapters(const std::vector<platform::Chapter>& chapters) {
    MediaSpec spec;
    spec.duration = static_cast<double>(chapters.size());
    spec.sound = "";
    spec.width = 64;
    spec.height = 48;
    spec.frameRate = 5;
    spec.keyFrameInterval = 5;
    spec.chapters = chapters;
    return addSource(support::makeMedia(spec));
  }
};

TEST_F(QuiltMediaSourcesTest, TheFirstSourceWithTheUuidIsFound) {
  const auto first = named("S");
  item()->addSource(named("R"));
  item()->addSource(first);
  item()->addSource(named("S"));
  EXPECT_EQ(item()->sourceWithUUID("S"), first);
  EXPECT_EQ(item()->sourceWithUUID("s"), nullptr);
  EXPECT_EQ(item()->sourceWithUUID(""), nullptr);
}

TEST_F(QuiltMediaSourcesTest, AnExtraIsNotFoundAmongTheSources) {
  const auto extra = QuiltMediaExtra::init();
  item()->addExtra(extra);
  EXPECT_EQ(item()->sourceWithUUID(extra->uuid()), nullptr);
}

TEST_F(QuiltMediaSourcesTest, PreviewsAreNumberedAcrossSources) {
  EXPECT_EQ(item()->totalSourcesPreviewsCount(), 0u);
  EXPECT_EQ(item()->sourcePreviewAtIndex(0), nullptr);
  const auto first = addMovieWithChapters({{"One", 0}, {"Two", 1}});
  const auto none = addEmptySource();
  const auto third = addMovieWithChapters({{"Uno", 0}, {"Due", 1}, {"Tre", 2}});
  ASSERT_EQ(first->previewCount(), 2u);
  ASSERT_EQ(none->previewCount(), 0u);
  ASSERT_EQ(third->previewCount(), 3u);
  EXPECT_EQ(item()->totalSourcesPreviewsCount(), 5u);
  EXPECT_EQ(item()->sourcePreviewAtIndex(0), first->previewAtIndex(0));
  EXPECT_EQ(item()->sourcePreviewAtIndex(1)->title(), "Two");
  EXPECT_EQ(item()->sourcePreviewAtIndex(2), third->previewAtIndex(0));
  EXPECT_EQ(item()->sourcePreviewAtIndex(2)->title(), "Uno");
  EXPECT_EQ(item()->sourcePreviewAtIndex(4)->title(), "Tre");
  EXPECT_EQ(item()->sourcePreviewAtIndex(5), nullptr);
}

TEST_F(QuiltMediaSourcesTest, ExtrasAndCommentaryHaveNoPartInThePreviews) {
  item()->addExtra(QuiltMediaExtra::initWithPath(pictureFile(8, 8)));
  item()->setAudioCommentarySource(QuiltMediaSource::initWithPath(pictureFile(9, 9)));
  EXPECT_EQ(item()->totalSourcesPreviewsCount(), 0u);
  EXPECT_EQ(item()->sourcePreviewAtIndex(0), nullptr);
}

// ---- Audio commentary

class QuiltMediaCommentaryTest : public support::PackageFixture {};

TEST_F(QuiltMediaCommentaryTest, TheCommentaryBelongsToTheItemUntilItIsReplaced) {
  const auto first = QuiltMediaSource::init();
  const auto second = QuiltMediaSource::init();
  item()->setAudioCommentarySource(first);
  EXPECT_EQ(item()->audioCommentarySource(), first);
  EXPECT_EQ(first->mediaOwner(), item());
  EXPECT_EQ(first->path(), item()->sourcesFolderPath() / first->uuid());
  item()->setAudioCommentarySource(second);
  EXPECT_EQ(first->mediaOwner(), nullptr);
  EXPECT_EQ(second->mediaOwner(), item());
  item()->setAudioCommentarySource(second);
  EXPECT_EQ(second->mediaOwner(), item()) << "set once more it stays attached";
  item()->setAudioCommentarySource(nullptr);
  EXPECT_EQ(item()->audioCommentarySource(), nullptr);
  EXPECT_EQ(second->mediaOwner(), nullptr);
  EXPECT_EQ(item()->sourcesCount(), 0u);
}

TEST_F(QuiltMediaCommentaryTest, ReplacingDeletesNoFileAndSavesNothing) {
  const auto commentary = QuiltMediaSource::init();
  item()->setAudioCommentarySource(commentary);
  const Path file = writeFile(commentary->path() / "derivatives/d.m4a", "content");
  const Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  item()->setAudioCommentarySource(QuiltMediaSource::init());
  item()->setAudioCommentarySource(nullptr);
  EXPECT_EQ(readFile(file), "content");
  EXPECT_EQ(lists->writes, 0);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltMediaCommentaryTest, ObserversHearOfEachReplacement) {
  std::vector<ChangePhase> phases;
  const auto observation = item()->observe(
      "audioCommentarySource", [&](const platform::ChangeNotice& notice) { phases.push_back(notice.phase); },
      platform::ObservationOptions::Prior);
  item()->setAudioCommentarySource(QuiltMediaSource::init());
  EXPECT_THAT(phases, ElementsAre(ChangePhase::Will, ChangePhase::Did));
  item()->setAudioCommentarySource(nullptr);
  EXPECT_THAT(phases, ElementsAre(ChangePhase::Will, ChangePhase::Did, ChangePhase::Will, ChangePhase::Did));
}

}  // namespace
}  // namespace quilt
