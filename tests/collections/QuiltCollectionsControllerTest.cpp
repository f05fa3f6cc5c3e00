// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <atomic>
#include <thread>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/testing/ForwardingFileManager.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/ModelFixture.h"

namespace quilt {
namespace {

using platform::Error;
using platform::ErrorKind;
using platform::Result;
using platform::ScopedService;
using platform::Services;
using platform::services;
using support::critical;
using support::dateOf;
using support::debug;
using support::Lines;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

/// Lists folders sorted, so that a test knows the order, and fails the operations that it names.
class SortedFiles final : public platform::ForwardingFileManager {
 public:
  using ForwardingFileManager::ForwardingFileManager;
  bool failCreate = false;
  bool failList = false;
  bool failRemove = false;

  Result<void> createDirectoryAtPath(const Path& path) override {
    if (failCreate) return support::kFault;
    return ForwardingFileManager::createDirectoryAtPath(path);
  }
  Result<std::vector<std::string>> contentsOfDirectoryAtPath(const Path& path) const override {
    if (failList) return support::kFault;
    auto names = ForwardingFileManager::contentsOfDirectoryAtPath(path);
    if (names) std::sort(names->begin(), names->end());
    return names;
  }
  Result<void> removeItem(const Path& path, const Path& within) override {
    if (failRemove) return Error{ErrorKind::PermissionDenied, "Permission denied.", path};
    return ForwardingFileManager::removeItem(path, within);
  }
};

class QuiltCollectionsControllerTest : public support::ModelFixture {
 protected:
  using Call = std::pair<std::string, double>;  ///< the title of the collection, or "none", and the percentage

  QuiltCollectionsControllerTest()
      : files(std::make_shared<SortedFiles>(services().files)), _scoped(&Services::files, files) {}

  Path library() const { return folder() / "library"; }
  Path directory() const { return library() / "Collections"; }

  void makeCollection(const std::string& name) {
    writeRecord(directory() / name / "collection.plist", {{"UUID", name}, {"Title", name}});
  }
  /// Loads; the block answers false from the call `until` on (0: never).
  bool load(std::size_t until = 0) {
    return controller->loadLibraryPath(
        library(), [&](const std::shared_ptr<QuiltCollection>& collection, double percentage) {
          calls.emplace_back(collection ? collection->title().value_or("untitled") : "none", percentage);
          return until == 0 || calls.size() < until;
        });
  }
  std::vector<std::string> titles() const {
    std::vector<std::string> all;
    for (const auto& collection : controller->collections()) all.push_back(collection->title().value_or("untitled"));
    return all;
  }
  support::Line loading() const { return debug("Loading collections at path \"" + library().native() + "\"..."); }

  const std::shared_ptr<SortedFiles> files;
  const std::shared_ptr<QuiltCollectionsController> controller = QuiltCollectionsController::init();
  std::vector<Call> calls;

 private:
  ScopedService<platform::FileManager> _scoped;
};
/// What starts threads; run with the thread sanitizer too.
using QuiltCollectionsControllerThreadTest = QuiltCollectionsControllerTest;

using Call = std::pair<std::string, double>;

TEST_F(QuiltCollectionsControllerTest, ANewControllerIsEmptyAndIdle) {
  EXPECT_EQ(controller->libraryPath(), Path());
  EXPECT_EQ(controller->_collectionsDirectory(), Path());
  EXPECT_FALSE(controller->loadingCollections());
  EXPECT_FALSE(controller->isUpdating());
  EXPECT_EQ(controller->collectionsCount(), 0u);
}

TEST_F(QuiltCollectionsControllerThreadTest, TheDefaultControllerIsTheSameOnEveryThread) {
  std::shared_ptr<QuiltCollectionsController> other;
  std::thread([&] { other = QuiltCollectionsController::defaultController(); }).join();
  EXPECT_TRUE(other);
  EXPECT_EQ(QuiltCollectionsController::defaultController(), other);
}

// Loading

TEST_F(QuiltCollectionsControllerTest, ALibraryWithoutCollectionsGetsTheFolderAndOneClosingCall) {
  EXPECT_TRUE(load());
  EXPECT_TRUE(std::filesystem::is_directory(directory()));
  EXPECT_THAT(calls, ElementsAre(Call{"none", 100.0}));
  EXPECT_FALSE(controller->loadingCollections());
  EXPECT_EQ(controller->libraryPath(), library());
  EXPECT_EQ(takeLines(), Lines{loading()});
}

TEST_F(QuiltCollectionsControllerTest, ThreeCollectionsAndAHiddenNameAreReportedByThirds) {
  for (const char* name : {"a", "b", "c", ".hidden"}) makeCollection(name);
  EXPECT_TRUE(load());
  EXPECT_THAT(calls, ElementsAre(Call{"a", 33.0}, Call{"b", 66.0}, Call{"c", 100.0}, Call{"none", 100.0}));
  EXPECT_THAT(titles(), ElementsAre("a", "b", "c"));
  EXPECT_EQ(controller->collectionAtIndex(0)->collectionControllerOwner(), controller);
  EXPECT_EQ(takeLines(), (Lines{loading(), debug("Loading collection \"a\"..."), debug("Loading collection \"b\"..."),
                                debug("Loading collection \"c\"...")}));
}

TEST_F(QuiltCollectionsControllerTest, AFolderThatIsNoCollectionIsReportedAsNone) {
  makeCollection("a");
  std::filesystem::create_directories(directory() / "b");
  makeCollection("c");
  EXPECT_TRUE(load());
  EXPECT_THAT(calls, ElementsAre(Call{"a", 33.0}, Call{"none", 66.0}, Call{"c", 100.0}, Call{"none", 100.0}));
  EXPECT_THAT(titles(), ElementsAre("a", "c"));
  EXPECT_EQ(takeProblems(), Lines{warning("Failed to load collection at path \"" + (directory() / "b").native() +
                                          "\": \"Collection dictionary is invalid\"")});
}

TEST_F(QuiltCollectionsControllerTest, ABlockThatAnswersFalseCancelsAndKeepsWhatWasLoaded) {
  for (const char* name : {"a", "b"}) makeCollection(name);
  EXPECT_FALSE(load(1));
  EXPECT_THAT(calls, ElementsAre(Call{"a", 50.0}));
  EXPECT_THAT(titles(), ElementsAre("a"));
  EXPECT_FALSE(controller->loadingCollections());
  EXPECT_EQ(takeProblems(),
            Lines{critical("Loading collections at path \"" + library().native() + "\" has been cancelled")});
}

TEST_F(QuiltCollectionsControllerTest, TheAnswerToTheClosingCallCountsForNothing) {
  makeCollection("a");
  EXPECT_TRUE(load(2));
  EXPECT_THAT(calls, ElementsAre(Call{"a", 100.0}, Call{"none", 100.0}));
}

TEST_F(QuiltCollectionsControllerTest, AFileInPlaceOfTheFolderFailsTheLoadAndEveryLaterOne) {
  writeFile(directory(), "text");
  EXPECT_FALSE(load());
  const Lines lines = takeProblems();
  ASSERT_THAT(lines, SizeIs(1));
  EXPECT_EQ(lines[0].level, platform::LogLevel::Critical);
  EXPECT_TRUE(
      lines[0].text.starts_with("Failed to load collections in directory \"" + directory().native() + "\": \""));
  EXPECT_TRUE(controller->loadingCollections());

  std::filesystem::remove(directory());
  EXPECT_FALSE(load());
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_THAT(calls, IsEmpty());
}

TEST_F(QuiltCollectionsControllerTest, AFolderThatCannotBeListedIsReportedWithTheReason) {
  files->failList = true;
  EXPECT_FALSE(load());
  EXPECT_EQ(takeProblems(), Lines{critical("Failed to load collections in directory \"" + directory().native() +
                                           "\": \"The disk is full.\"")});
  EXPECT_TRUE(controller->loadingCollections());
}

TEST_F(QuiltCollectionsControllerTest, AFolderThatCannotBeMadeIsReportedAndTheLoadGoesOn) {
  files->failCreate = true;
  EXPECT_FALSE(load());
  const Lines lines = takeProblems();
  ASSERT_THAT(lines, SizeIs(2));  // the listing fails too
  EXPECT_EQ(lines[0], critical("Failed to create collections directory at path \"" + directory().native() +
                               "\": \"The disk is full.\""));
  EXPECT_TRUE(lines[1].text.starts_with("Failed to load collections in directory"));
}

TEST_F(QuiltCollectionsControllerTest, ALoadDuringALoadIsRefusedSilently) {
  makeCollection("a");
  std::vector<bool> inner;
  EXPECT_TRUE(controller->loadLibraryPath(library(), [&](const auto&, double) {
    takeLines();
    inner.push_back(controller->loadLibraryPath(folder() / "other", nullptr));
    EXPECT_THAT(takeLines(), IsEmpty());
    EXPECT_FALSE(controller->update());
    EXPECT_THAT(takeLines(), IsEmpty());
    return true;
  }));
  EXPECT_THAT(inner, ElementsAre(false, false));
  EXPECT_EQ(controller->libraryPath(), library());
}

TEST_F(QuiltCollectionsControllerTest, LoadingAgainReplacesTheList) {
  makeCollection("a");
  EXPECT_TRUE(load());
  const auto before = controller->collectionAtIndex(0);
  std::vector<std::size_t> counts;
  const auto observation = controller->observe(
      "collections", [&](const platform::ChangeNotice&) { counts.push_back(controller->collectionsCount()); });
  EXPECT_TRUE(load());
  EXPECT_THAT(counts, ElementsAre(0u, 1u));
  EXPECT_NE(controller->collectionAtIndex(0), before);
  EXPECT_EQ(before->collectionControllerOwner(), controller);  // dropped, not removed
}

TEST_F(QuiltCollectionsControllerThreadTest, TheBlockIsCalledOnTheLoadingThreadAndListChangesOnTheMainOne) {
  makeCollection("a");
  std::vector<bool> changedOnMain;
  const auto observation = controller->observe("collections", [&](const platform::ChangeNotice&) {
    changedOnMain.push_back(platform::MainThread::isCurrent());
  });
  std::atomic<bool> done = false;
  bool calledOnMain = true;
  std::thread worker([&] {
    controller->loadLibraryPath(library(), [&](const auto&, double) {
      calledOnMain = platform::MainThread::isCurrent();
      return true;
    });
    done = true;
    platform::MainThread::signal();
  });
  while (!done) platform::MainThread::waitAndRunQueuedBlocks();
  worker.join();
  EXPECT_FALSE(calledOnMain);
  EXPECT_THAT(changedOnMain, ElementsAre(true, true));
}

// Saving

TEST_F(QuiltCollectionsControllerTest, AnUpdateWithoutALibraryIsReported) {
  EXPECT_FALSE(controller->update());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to update collections because there is no library path available")});
  EXPECT_FALSE(controller->isUpdating());
}

TEST_F(QuiltCollectionsControllerTest, AnUpdateSavesEveryCollectionWhateverTheResults) {
  for (const char* name : {"a", "b"}) makeCollection(name);
  EXPECT_TRUE(load());
  std::filesystem::remove_all(directory() / "a");
  takeLines();

  EXPECT_TRUE(controller->update());

  EXPECT_EQ(takeLines(), Lines{critical("Failed to update collection at path \"" +
                                        (directory() / "a/collection.plist").native() + "\"")});
  EXPECT_TRUE(readRecord(directory() / "b/collection.plist").contains("ModifiedDate"));
  EXPECT_FALSE(controller->isUpdating());
}

TEST_F(QuiltCollectionsControllerTest, AnUpdateDuringAnUpdateIsRefusedSilently) {
  controller->setLibraryPath(library());
  controller->setIsUpdating(true);
  EXPECT_FALSE(controller->update());
  EXPECT_TRUE(controller->isUpdating());
  EXPECT_THAT(takeLines(), IsEmpty());
}

// The list

TEST_F(QuiltCollectionsControllerTest, AnIndexEqualToTheCountAnswersNone) {
  controller->addCollection(QuiltCollection::init());
  EXPECT_EQ(controller->collectionsCount(), 1u);
  EXPECT_EQ(controller->collectionAtIndex(1), nullptr);
}

TEST_F(QuiltCollectionsControllerTest, AnIdentityFindsTheFirstOfItAndAnUnknownOneNone) {
  const auto one = QuiltCollection::init();
  const auto two = QuiltCollection::init();
  for (const auto& collection : {one, two}) {
    collection->setUuid("same");
    controller->addCollection(collection);
  }
  EXPECT_EQ(controller->collectionWithUUID("same"), one);
  EXPECT_EQ(controller->collectionWithUUID("other"), nullptr);
}

TEST_F(QuiltCollectionsControllerTest, AVisitStopsAtTheFirstFalse) {
  for (int i = 0; i < 3; ++i) controller->addCollection(QuiltCollection::init());
  std::size_t visited = 0;
  controller->performBlockOnCollections([&](const auto&) { return ++visited < 2; });
  EXPECT_EQ(visited, 2u);
}

TEST_F(QuiltCollectionsControllerTest, NoneIsNeitherAddedNorRemoved) {
  controller->addCollection(nullptr);
  controller->removeCollection(nullptr, true);
  EXPECT_EQ(controller->collectionsCount(), 0u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltCollectionsControllerTest, RemovingWithoutDeletionEmptiesTheCollectionAndKeepsTheFiles) {
  makeCollection("a");
  writeRecord(directory() / "a/one.qpk/properties.plist", {{"Version", "1.0"}, {"UUID", "one"}});
  EXPECT_TRUE(load());
  const auto collection = controller->collectionAtIndex(0);
  ASSERT_EQ(collection->documentsCount(), 1u);

  controller->removeCollection(collection, false);

  EXPECT_EQ(controller->collectionsCount(), 0u);
  EXPECT_EQ(collection->documentsCount(), 0u);
  EXPECT_EQ(collection->collectionControllerOwner(), nullptr);
  EXPECT_TRUE(std::filesystem::exists(directory() / "a/one.qpk/properties.plist"));
}

TEST_F(QuiltCollectionsControllerTest, RemovingWithDeletionDeletesTheFolderWhole) {
  makeCollection("a");
  writeRecord(directory() / "a/one.qpk/properties.plist", {{"Version", "1.0"}, {"UUID", "one"}});
  makeCollection("b");
  EXPECT_TRUE(load());
  controller->removeCollection(controller->collectionAtIndex(0), true);
  EXPECT_THAT(namesIn(directory()), ElementsAre("b"));
  EXPECT_THAT(titles(), ElementsAre("b"));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltCollectionsControllerTest, AFolderThatCannotBeDeletedIsReportedAndLeavesTheList) {
  makeCollection("a");
  EXPECT_TRUE(load());
  files->failRemove = true;
  const auto collection = controller->collectionAtIndex(0);
  controller->removeCollection(collection, true);
  EXPECT_EQ(takeProblems(), Lines{warning("Failed to remove collection at path \"" + (directory() / "a").native() +
                                          "\": \"Permission denied.\"")});
  EXPECT_EQ(controller->collectionsCount(), 0u);
  EXPECT_EQ(collection->collectionControllerOwner(), nullptr);
}

TEST_F(QuiltCollectionsControllerTest, ACollectionOutsideTheLibraryIsNeverDeleted) {
  EXPECT_TRUE(load());
  const Path outside = folder() / "elsewhere";
  const auto collection = QuiltCollection::initWithPath(outside);
  controller->addCollection(collection);
  controller->removeCollection(collection, true);
  EXPECT_THAT(takeProblems(), SizeIs(1));
  EXPECT_TRUE(std::filesystem::exists(outside / "collection.plist"));
  EXPECT_EQ(controller->collectionsCount(), 0u);
}

TEST_F(QuiltCollectionsControllerTest, TheOwnerChangesBeforeTheList) {
  const auto collection = QuiltCollection::init();
  std::vector<std::pair<bool, std::size_t>> seen;  // owned, count
  const auto observation = controller->observe(
      "collections",
      [&](const platform::ChangeNotice&) {
        seen.emplace_back(collection->collectionControllerOwner() == controller, controller->collectionsCount());
      },
      platform::ObservationOptions::Prior);
  controller->addCollection(collection);
  controller->removeCollection(collection, false);
  using Seen = std::pair<bool, std::size_t>;
  EXPECT_THAT(seen, ElementsAre(Seen{true, 0}, Seen{true, 1}, Seen{false, 1}, Seen{false, 0}));
}

// New collections

TEST_F(QuiltCollectionsControllerTest, ANewCollectionIsMadeInTheFolderOfItsIdentity) {
  EXPECT_TRUE(load());
  const std::string uuid = "11111111-2222-4333-8444-555555555555";

  const auto collection = controller->newCollectionWithUUID(uuid);

  ASSERT_TRUE(collection);
  EXPECT_EQ(collection->uuid(), uuid);
  EXPECT_EQ(collection->path(), directory() / uuid);
  EXPECT_EQ(collection->collectionControllerOwner(), controller);
  EXPECT_FALSE(collection->hasBeenModified());
  ASSERT_TRUE(collection->creationDate());
  EXPECT_EQ(collection->creationDate(), collection->modifiedDate());
  EXPECT_EQ(controller->collectionWithUUID(uuid), collection);
  EXPECT_TRUE(std::filesystem::exists(directory() / uuid / "collection.plist"));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(QuiltCollectionsControllerTest, TheIdentityReachesTheFileWithTheNextSave) {
  EXPECT_TRUE(load());
  const auto collection = controller->newCollectionWithUUID("given");
  ASSERT_TRUE(collection);
  EXPECT_NE(readRecord(collection->_collectionFilepath()).string("UUID"), "given");
  EXPECT_TRUE(collection->update());
  EXPECT_EQ(readRecord(collection->_collectionFilepath()).string("UUID"), "given");
}

TEST_F(QuiltCollectionsControllerTest, ANewCollectionWithoutAnIdentityGetsAFreshOne) {
  EXPECT_TRUE(load());
  const auto collection = controller->newCollection();
  ASSERT_TRUE(collection);
  EXPECT_THAT(collection->uuid(), SizeIs(36));
  EXPECT_EQ(collection->path(), directory() / collection->uuid());
}

TEST_F(QuiltCollectionsControllerTest, ACollectionThatCannotBeMadeIsReportedWithItsPath) {
  EXPECT_TRUE(load());
  takeLines();
  files->failCreate = true;
  EXPECT_FALSE(controller->newCollectionWithUUID("given"));
  const std::string path = (directory() / "given").native();
  EXPECT_EQ(takeLines(), (Lines{critical("Failed to create collection at path \"" + path + "\": \"The disk is full.\""),
                                critical("Failed to create a new empty collection at path \"" + path + "\"")}));
  EXPECT_EQ(controller->collectionsCount(), 0u);
}

TEST_F(QuiltCollectionsControllerTest, AnIdentityThatIsNoPlainNameIsRefused) {
  EXPECT_TRUE(load());
  for (const std::string& uuid : {std::string("../escape"), std::string("a/b"), std::string("/tmp"), std::string(".."),
                                  std::string("."), std::string(), std::string(300, 'x')}) {
    takeLines();
    EXPECT_FALSE(controller->newCollectionWithUUID(uuid)) << uuid;
    EXPECT_THAT(takeLines(), SizeIs(1)) << uuid;
  }
  EXPECT_THAT(namesIn(library()), ElementsAre("Collections"));
  EXPECT_THAT(namesIn(directory()), IsEmpty());
}

TEST_F(QuiltCollectionsControllerTest, WithoutALibraryNoCollectionIsMade) {
  EXPECT_FALSE(controller->newCollection());
  EXPECT_EQ(takeLines(), Lines{critical("Failed to create a new empty collection at path \"(null)\"")});
}

}  // namespace
}  // namespace quilt
