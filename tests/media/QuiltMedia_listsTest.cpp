// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/MediaFixtures.h"

namespace quilt {
namespace {

using platform::ChangePhase;
using platform::Services;
using support::FaultyFiles;
using support::FaultyPropertyLists;
using support::Installed;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// The verbs of one list, so that sources and extras pass the same tests.
struct SourceList {
  using Child = QuiltMediaSource;
  static constexpr const char* kKey = "sources";
  static constexpr const char* kWarning = "Failed to delete source at path \"";
  static std::size_t count(const QuiltMedia& item) { return item.sourcesCount(); }
  static auto at(const QuiltMedia& item, std::size_t index) { return item.sourceAtIndex(index); }
  static bool perform(const QuiltMedia& item, const std::function<bool(const std::shared_ptr<Child>&)>& block) {
    return item.performBlockOnSources(block);
  }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.addSource(child); }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child, std::size_t index) {
    item.addSource(child, index);
  }
  static void move(QuiltMedia& item, const IndexSet& indexes, std::size_t to) {
    item.moveSourcesAtIndexes(indexes, to);
  }
  static void remove(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.removeSource(child); }
  static void removeAll(QuiltMedia& item) { item.removeAllSources(); }
};

struct ExtraList {
  using Child = QuiltMediaExtra;
  static constexpr const char* kKey = "extras";
  static constexpr const char* kWarning = "Failed to delete extra at path \"";
  static std::size_t count(const QuiltMedia& item) { return item.extraCount(); }
  static auto at(const QuiltMedia& item, std::size_t index) { return item.extraAtIndex(index); }
  static bool perform(const QuiltMedia& item, const std::function<bool(const std::shared_ptr<Child>&)>& block) {
    return item.performBlockOnExtra(block);
  }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.addExtra(child); }
  static void add(QuiltMedia& item, const std::shared_ptr<Child>& child, std::size_t index) {
    item.addExtra(child, index);
  }
  static void move(QuiltMedia& item, const IndexSet& indexes, std::size_t to) { item.moveExtraAtIndexes(indexes, to); }
  static void remove(QuiltMedia& item, const std::shared_ptr<Child>& child) { item.removeExtra(child); }
  static void removeAll(QuiltMedia& item) { item.removeAllExtras(); }
};

template <class List>
class QuiltMediaListTest : public support::DocumentFixture {
 protected:
  using Child = typename List::Child;

  /// A document that does not save by itself, and its item.
  QuiltMediaListTest() : document(made()), item(addItem(*document)) {
    document->setIsProcessing(true);
    takeLines();
  }

  static std::shared_ptr<Child> titled(const std::string& title) {
    auto child = Child::init();
    child->setTitle(title);
    return child;
  }
  void fill(const std::string& titles) {
    for (const char title : titles) List::add(*item, titled(std::string(1, title)));
    takeLines();
  }
  std::string titles() const {
    std::string all;
    List::perform(*item, [&all](const auto& child) {
      all += child->title().value_or("?");
      return true;
    });
    return all;
  }
  /// The places where the list is announced to change, with the titles at that time.
  std::vector<std::string> announcedWhile(const std::function<void()>& change) {
    std::vector<std::string> seen;
    const auto observation = item->observe(
        List::kKey,
        [&](const platform::ChangeNotice& notice) {
          seen.push_back((notice.phase == ChangePhase::Will ? "will " : "did ") + titles());
        },
        platform::ObservationOptions::Prior);
    change();
    return seen;
  }
  /// How often the document is saved meanwhile.
  int savesWhile(const std::function<void()>& change) {
    document->setIsProcessing(false);
    Installed<FaultyPropertyLists> lists(&Services::propertyLists);
    change();
    document->setIsProcessing(true);
    return lists->writes;
  }

  const std::shared_ptr<QuiltDocument> document;
  const std::shared_ptr<QuiltMedia> item;
};

using Lists = ::testing::Types<SourceList, ExtraList>;
TYPED_TEST_SUITE(QuiltMediaListTest, Lists);

// ---- Looking

TYPED_TEST(QuiltMediaListTest, AnIndexThatIsNotBelowTheCountGivesNothing) {
  this->fill("AB");
  EXPECT_EQ(TypeParam::count(*this->item), 2u);
  EXPECT_EQ(TypeParam::at(*this->item, 1)->title(), "B");
  EXPECT_EQ(TypeParam::at(*this->item, 2), nullptr);
  EXPECT_EQ(TypeParam::at(*this->item, static_cast<std::size_t>(-1)), nullptr);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListTest, AWalkOverAnEmptyListSucceedsWithoutACall) {
  EXPECT_TRUE(TypeParam::perform(*this->item, [](const auto&) -> bool { throw "called"; }));
}

TYPED_TEST(QuiltMediaListTest, AWalkStopsAtTheFirstFalseAnswer) {
  this->fill("ABC");
  std::string seen;
  EXPECT_FALSE(TypeParam::perform(*this->item, [&seen](const auto& child) {
    seen += *child->title();
    return seen.size() < 2;
  }));
  EXPECT_EQ(seen, "AB");
}

// ---- Adding

TYPED_TEST(QuiltMediaListTest, AnAddedChildKnowsItsItemAndIsAnnounced) {
  this->fill("A");
  const auto child = this->titled("B");
  EXPECT_THAT(this->announcedWhile([&] { TypeParam::add(*this->item, child); }), ElementsAre("will A", "did AB"));
  EXPECT_EQ(child->mediaOwner(), this->item);
}

TYPED_TEST(QuiltMediaListTest, AChildIsInsertedAtItsIndex) {
  this->fill("AB");
  TypeParam::add(*this->item, this->titled("x"), 1);
  TypeParam::add(*this->item, this->titled("y"), 3);
  TypeParam::add(*this->item, this->titled("z"), 0);
  EXPECT_EQ(this->titles(), "zAxBy");
}

TYPED_TEST(QuiltMediaListTest, TheOwnerIsSetBeforeTheChildIsSeen) {
  const auto child = this->titled("A");
  bool owned = false;
  const auto observation = this->item->observe(TypeParam::kKey, [&](const platform::ChangeNotice&) {
    owned = TypeParam::at(*this->item, 0)->mediaOwner() == this->item;
  });
  TypeParam::add(*this->item, child);
  EXPECT_TRUE(owned);
}

TYPED_TEST(QuiltMediaListTest, NoneIsIgnored) {
  this->fill("A");
  EXPECT_EQ(this->savesWhile([this] {
    TypeParam::add(*this->item, nullptr);
    TypeParam::add(*this->item, nullptr, 0);
    TypeParam::remove(*this->item, nullptr);
  }),
            0);
  EXPECT_EQ(this->titles(), "A");
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

// ---- Moving

TYPED_TEST(QuiltMediaListTest, AGroupKeepsItsOrderAndStartsAtTheTarget) {
  const auto moved = [this](const IndexSet& indexes, std::size_t target) {
    TypeParam::removeAll(*this->item);
    this->fill("ABCD");
    TypeParam::move(*this->item, indexes, target);
    return this->titles();
  };
  EXPECT_EQ(moved({0, 2}, 4), "BDAC");
  EXPECT_EQ(moved({3}, 0), "DABC");
  EXPECT_EQ(moved({1, 2}, 2), "ABCD");
  EXPECT_EQ(moved({0, 1, 2, 3}, 4), "ABCD");
  EXPECT_EQ(moved({0}, 2), "BACD");
}

TYPED_TEST(QuiltMediaListTest, AMoveIsAnnouncedOnceAlsoWhenNothingMoves) {
  this->fill("ABC");
  EXPECT_THAT(this->announcedWhile([this] {
    TypeParam::move(*this->item, {0, 1}, 3);
  }),
              ElementsAre("will ABC", "did CAB"));
  EXPECT_THAT(this->announcedWhile([this] { TypeParam::move(*this->item, {}, 0); }),
              ElementsAre("will CAB", "did CAB"));
}

// ---- Removing

TYPED_TEST(QuiltMediaListTest, ARemovedChildsFolderIsDeletedAndItsOwnerCleared) {
  this->fill("AB");
  const auto child = TypeParam::at(*this->item, 0);
  const Path folder = child->path();
  this->writeFile(folder / "derivatives" / "file.mp4", "movie");
  EXPECT_THAT(this->announcedWhile([&] { TypeParam::remove(*this->item, child); }), ElementsAre("will AB", "did B"));
  EXPECT_FALSE(std::filesystem::exists(folder));
  EXPECT_EQ(child->mediaOwner(), nullptr);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListTest, AFolderThatCannotBeDeletedIsWarnedOfAndTheChildGoesAllTheSame) {
  this->fill("A");
  const auto child = TypeParam::at(*this->item, 0);
  const Path folder = child->path();
  this->writeFile(folder / "derivatives" / "file.mp4", "movie");
  Installed<FaultyFiles> files(&Services::files);
  files->failRemove = support::anyPath();
  TypeParam::remove(*this->item, child);
  EXPECT_THAT(this->takeLines(),
              ElementsAre(warning(TypeParam::kWarning + folder.native() + "\": \"The disk is full.\"")));
  EXPECT_EQ(this->titles(), "");
  EXPECT_EQ(child->mediaOwner(), nullptr);
}

TYPED_TEST(QuiltMediaListTest, RemovingWhatIsNotInTheListStillDeletesItsFolderAndClearsItsOwner) {
  this->fill("A");
  const auto stranger = this->titled("x");
  stranger->setMediaOwner(this->item);
  this->writeFile(stranger->path() / "file.mp4", "movie");
  const Path folder = stranger->path();
  TypeParam::remove(*this->item, stranger);
  EXPECT_FALSE(std::filesystem::exists(folder));
  EXPECT_EQ(stranger->mediaOwner(), nullptr);
  EXPECT_EQ(this->titles(), "A");
}

TYPED_TEST(QuiltMediaListTest, RemovingAllWithoutFilesRemovesEveryOneAndLogsNothing) {
  this->fill("ABC");
  EXPECT_THAT(this->announcedWhile([this] { TypeParam::removeAll(*this->item); }),
              ElementsAre("will ABC", "did BC", "will BC", "did C", "will C", "did "));
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

TYPED_TEST(QuiltMediaListTest, RemovingAllDeletesEveryFolder) {
  this->fill("AB");
  std::vector<Path> folders;
  TypeParam::perform(*this->item, [&](const auto& child) {
    folders.push_back(child->path());
    this->writeFile(child->path() / "file", "x");
    return true;
  });
  TypeParam::removeAll(*this->item);
  for (const Path& folder : folders) EXPECT_FALSE(std::filesystem::exists(folder));
}

// ---- Saving

TYPED_TEST(QuiltMediaListTest, EveryChangeSavesTheDocument) {
  EXPECT_EQ(this->savesWhile([this] { TypeParam::add(*this->item, this->titled("A")); }), 1);
  EXPECT_EQ(this->savesWhile([this] { TypeParam::add(*this->item, this->titled("B"), 0); }), 1);
  EXPECT_EQ(this->savesWhile([this] { TypeParam::move(*this->item, {}, 0); }), 1);
  EXPECT_EQ(this->savesWhile([this] { TypeParam::remove(*this->item, TypeParam::at(*this->item, 0)); }), 1);
  TypeParam::add(*this->item, this->titled("C"));
  EXPECT_EQ(this->savesWhile([this] { TypeParam::removeAll(*this->item); }), 2) << "once for each";
}

TYPED_TEST(QuiltMediaListTest, WhileTheDocumentIsProcessingNothingIsSaved) {
  Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  TypeParam::add(*this->item, this->titled("A"));
  TypeParam::move(*this->item, {0}, 1);
  TypeParam::removeAll(*this->item);
  EXPECT_EQ(lists->writes, 0);
  EXPECT_THAT(this->takeProblems(), IsEmpty());
}

TYPED_TEST(QuiltMediaListTest, WithoutADocumentNothingIsSaved) {
  const auto detached = QuiltMedia::init();
  Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  TypeParam::add(*detached, this->titled("A"));
  TypeParam::removeAll(*detached);
  EXPECT_EQ(TypeParam::count(*detached), 0u);
  EXPECT_EQ(lists->writes, 0);
  EXPECT_THAT(this->takeLines(), IsEmpty());
}

// ---- What sources alone have

class QuiltMediaSourcesTest : public support::DocumentFixture {
 protected:
  QuiltMediaSourcesTest() : document(made()), item(addItem(*document)) { document->setIsProcessing(true); }

  /// A source of a movie with so many chapters.
  std::shared_ptr<QuiltMediaSource> addMovie(int chapters) {
    support::MediaSpec spec;
    spec.duration = chapters;
    for (int i = 0; i < chapters; ++i) spec.chapters.push_back({"Chapter", static_cast<double>(i)});
    const auto source = QuiltMediaSource::initWithPath(support::makeMedia(spec));
    item->addSource(source);
    return source;
  }

  const std::shared_ptr<QuiltDocument> document;
  const std::shared_ptr<QuiltMedia> item;
};

TEST_F(QuiltMediaSourcesTest, TheFirstSourceWithAnIdentityIsFound) {
  for (const char* title : {"A", "B", "C"}) {
    const auto source = QuiltMediaSource::init();
    source->setTitle(std::string(title));
    source->setUuid(*title == 'A' ? "ONE" : "TWIN");
    item->addSource(source);
  }
  EXPECT_EQ(item->sourceWithUUID("TWIN")->title(), "B");
  EXPECT_EQ(item->sourceWithUUID("nobody"), nullptr);
}

TEST_F(QuiltMediaSourcesTest, PreviewsAreNumberedThroughAllSources) {
  const auto first = addMovie(2);
  item->addSource(QuiltMediaSource::init());
  const auto third = addMovie(3);
  EXPECT_EQ(item->totalSourcesPreviewsCount(), 5u);
  EXPECT_EQ(item->sourcePreviewAtIndex(0), first->previewAtIndex(0));
  EXPECT_EQ(item->sourcePreviewAtIndex(1), first->previewAtIndex(1));
  ASSERT_NE(item->sourcePreviewAtIndex(2), nullptr);
  EXPECT_EQ(item->sourcePreviewAtIndex(2), third->previewAtIndex(0));
  EXPECT_EQ(item->sourcePreviewAtIndex(4), third->previewAtIndex(2));
  EXPECT_EQ(item->sourcePreviewAtIndex(5), nullptr);
}

// ---- Audio commentary

TEST_F(QuiltMediaSourcesTest, ACommentaryKnowsItsItemUntilItIsReplaced) {
  const auto first = QuiltMediaSource::init();
  const auto second = QuiltMediaSource::init();
  item->setAudioCommentarySource(first);
  EXPECT_EQ(item->audioCommentarySource(), first);
  EXPECT_EQ(first->mediaOwner(), item);
  item->setAudioCommentarySource(second);
  EXPECT_EQ(first->mediaOwner(), nullptr);
  EXPECT_EQ(second->mediaOwner(), item);
  item->setAudioCommentarySource(nullptr);
  EXPECT_EQ(second->mediaOwner(), nullptr);
  EXPECT_EQ(item->audioCommentarySource(), nullptr);
}

TEST_F(QuiltMediaSourcesTest, SettingTheSameCommentaryAgainKeepsItsOwner) {
  const auto commentary = QuiltMediaSource::init();
  item->setAudioCommentarySource(commentary);
  item->setAudioCommentarySource(commentary);
  EXPECT_EQ(commentary->mediaOwner(), item);
}

TEST_F(QuiltMediaSourcesTest, ReplacingACommentaryDeletesNoFilesSavesNothingAndIsAnnounced) {
  const auto commentary = QuiltMediaSource::init();
  item->setAudioCommentarySource(commentary);
  const Path file = writeFile(commentary->path() / "derivatives" / "voice.m4a", "sound");
  document->setIsProcessing(false);
  Installed<FaultyPropertyLists> lists(&Services::propertyLists);
  int announced = 0;
  const auto observation =
      item->observe("audioCommentarySource", [&announced](const platform::ChangeNotice&) { ++announced; });
  item->setAudioCommentarySource(nullptr);
  EXPECT_EQ(announced, 1);
  EXPECT_EQ(lists->writes, 0);
  EXPECT_TRUE(std::filesystem::exists(file));
}

}  // namespace
}  // namespace quilt
