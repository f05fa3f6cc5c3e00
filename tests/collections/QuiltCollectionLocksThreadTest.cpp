// SPDX-License-Identifier: Apache-2.0
// What changes a list of a library does so with the list's lock held from its first step to its last.
#include <gtest/gtest.h>

#include <future>
#include <optional>

#include "quilt/collections/QuiltCollectionsController.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

class QuiltCollectionLocksThreadTest : public support::DocumentFixture {
 protected:
  QuiltCollectionLocksThreadTest() {
    EXPECT_TRUE(controller->loadLibraryPath(folder() / "library", {}));
    collection = controller->newCollection();
    for (int i = 0; i < 3; ++i) documents.push_back(collection->newDocumentWithType(kQuiltDocumentTypeClassicMovie));
  }

  /// What another thread reads that looks for the first time in the middle of the operation, when `object` tells of
  /// `key`: with the lock held it can only read what is there at the end.
  static std::size_t seenFromTheMiddle(platform::Object& object, const char* key,
                                       const std::function<std::size_t()>& read,
                                       const std::function<void()>& operation) {
    std::optional<std::future<std::size_t>> reader;
    {
      const auto observation = object.observe(key, [&](const auto&) {
        if (reader) return;
        reader = std::async(std::launch::async, read);
        reader->wait_for(std::chrono::milliseconds(100));  // time enough for one that need not wait
      });
      operation();
    }
    return reader ? reader->get() : static_cast<std::size_t>(-1);
  }

  std::function<std::size_t()> countOfDocuments() {
    return [this] { return collection->documentsCount(); };
  }
  std::function<std::size_t()> countOfCollections() {
    return [this] { return controller->collectionsCount(); };
  }

  const std::shared_ptr<QuiltCollectionsController> controller = QuiltCollectionsController::init();
  std::shared_ptr<QuiltCollection> collection;
  std::vector<std::shared_ptr<QuiltDocument>> documents;
};

TEST_F(QuiltCollectionLocksThreadTest, ADocumentIsAttachedAndAddedInOne) {
  const auto added = QuiltDocument::init();
  EXPECT_EQ(4u,
            seenFromTheMiddle(*added, "collectionOwner", countOfDocuments(), [&] { collection->addDocument(added); }));
}

TEST_F(QuiltCollectionLocksThreadTest, ADocumentIsDetachedAndRemovedInOne) {
  EXPECT_EQ(2u, seenFromTheMiddle(*documents[0], "collectionOwner", countOfDocuments(),
                                  [&] { collection->removeDocument(documents[0], true); }));
}

TEST_F(QuiltCollectionLocksThreadTest, AllDocumentsAreRemovedInOne) {
  EXPECT_EQ(0u, seenFromTheMiddle(*collection, "documents", countOfDocuments(),
                                  [&] { collection->removeAllDocumentsAndDelete(false); }));
}

TEST_F(QuiltCollectionLocksThreadTest, AllBrokenDocumentsAreRemovedInOne) {
  const auto kept = collection->newDocumentWithType(kQuiltDocumentTypeInteractive);
  EXPECT_EQ(1u, seenFromTheMiddle(*collection, "documents", countOfDocuments(),
                                  [&] { collection->removeAllBrokenDocuments(); }));
  EXPECT_EQ(kept, collection->documentAtIndex(0));
}

TEST_F(QuiltCollectionLocksThreadTest, ACollectionIsAttachedAndAddedInOne) {
  const auto added = QuiltCollection::init();
  EXPECT_EQ(2u, seenFromTheMiddle(*added, "collectionControllerOwner", countOfCollections(),
                                  [&] { controller->addCollection(added); }));
}

TEST_F(QuiltCollectionLocksThreadTest, ACollectionIsRemovedWithItsDocumentsInOne) {
  EXPECT_EQ(0u, seenFromTheMiddle(*collection, "documents", countOfCollections(),
                                  [&] { controller->removeCollection(collection, true); }));
}

TEST_F(QuiltCollectionLocksThreadTest, AllCollectionsAreSavedInOne) {
  // What another thread adds meanwhile comes after the last save.
  const auto other = controller->newCollection();
  const auto whetherTheOtherIsSaved = [&] {
    (void)controller->collectionsCount();
    return static_cast<std::size_t>(other->hasBeenModified());
  };
  clock().advance(std::chrono::hours(1));
  EXPECT_EQ(1u, seenFromTheMiddle(*collection, "modifiedDate", whetherTheOtherIsSaved, [&] { controller->update(); }));
}

}  // namespace
}  // namespace quilt
