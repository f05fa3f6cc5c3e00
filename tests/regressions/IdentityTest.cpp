// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollectionsController.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::IsNull;
using ::testing::NotNull;
using ::testing::SizeIs;

/// An object's identity names its files: it is checked where it is set, and files that another one names stay.
class IdentityTest : public support::DocumentFixture {
 protected:
  std::shared_ptr<QuiltCollection> collection() const { return QuiltCollection::initWithPath(folder() / "collection"); }
  static std::size_t filesBelow(const Path& folder) {
    std::size_t count = 0;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) count += entry.is_regular_file();
    return count;
  }
  std::shared_ptr<QuiltDocument> flattenedPicture() {
    const auto document = made();
    addPictureItem(*document);
    EXPECT_TRUE(document->flattenWithProgressionBlock({}));
    return document;
  }
};

TEST_F(IdentityTest, AnIdentityIsImportedOnce) {
  const auto owner = collection();
  const Path notes = writeFile(folder() / "notes.txt", "text");
  ASSERT_THAT(owner->importDocumentFromPath(notes, "given", {}), NotNull());
  EXPECT_THAT(owner->importDocumentFromPath(notes, "given", {}), IsNull());
  EXPECT_EQ(owner->documentsCount(), 1u);
  EXPECT_TRUE(std::filesystem::exists(owner->documentAtIndex(0)->propertiesPath()));
}

TEST_F(IdentityTest, HiddenIdentitiesAreRefused) {
  const auto owner = collection();
  EXPECT_THAT(owner->importDocumentFromPath(writeFile(folder() / "notes.txt", "text"), ".hidden", {}), IsNull());
  EXPECT_THAT(namesIn(owner->path()), ElementsAre("collection.plist"));
  const auto controller = QuiltCollectionsController::init();
  ASSERT_TRUE(controller->loadLibraryPath(folder() / "library", {}));
  EXPECT_THAT(controller->newCollectionWithUUID(".hidden"), IsNull());
  EXPECT_THAT(namesIn(folder() / "library/Collections"), IsEmpty());
}

TEST_F(IdentityTest, ACollectionThatIsOpenIsNotOpenedOnceMore) {
  const auto controller = QuiltCollectionsController::init();
  ASSERT_TRUE(controller->loadLibraryPath(folder() / "library", {}));
  ASSERT_THAT(controller->newCollectionWithUUID("given"), NotNull());
  EXPECT_THAT(controller->newCollectionWithUUID("given"), IsNull());
  EXPECT_EQ(controller->collectionsCount(), 1u);
}

TEST_F(IdentityTest, PackagesAreNamedByTheirDocuments) {
  const auto owner = collection();
  const auto made = owner->newDocumentWithType(kQuiltDocumentTypeInteractive);
  EXPECT_EQ(made->path().stem(), made->uuid());
  const auto imported = owner->importDocumentFromPath(writeFile(folder() / "notes.txt", "text"), "given", {});
  EXPECT_EQ(owner->documentWithUUID("given"), imported);
  EXPECT_EQ(saved(*imported).string("UUID"), "given");
}

TEST_F(IdentityTest, WhatIsNoFolderNameIsNoIdentity) {
  const auto document = flattenedPicture();
  const auto item = document->mediaAtIndex(0);
  const auto source = item->sourceAtIndex(0);
  const auto derivative = source->mainDerivative();
  for (const char* bad : {"", ".", "..", "../x", "a/b", ".hidden"}) {
    document->setUuid(bad);
    item->setUuid(bad);
    source->setUuid(bad);
    derivative->setUuid(bad);
    EXPECT_EQ(item->uuid(), item->path().filename());
    EXPECT_EQ(source->uuid(), source->path().filename());
    EXPECT_EQ(derivative->uuid(), derivative->url()->relativePath().stem());
    EXPECT_NE(document->uuid(), bad);
  }
}

TEST_F(IdentityTest, RemovingAnItemWhoseIdentityWasClearedLeavesTheOthersTheirFiles) {
  const auto document = flattenedPicture();
  const auto other = addPictureItem(*document, 10, 10);
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  other->setUuid("");
  document->removeMedia(other);
  EXPECT_TRUE(
      std::filesystem::exists(document->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative()->url()->relativePath()));
}

TEST_F(IdentityTest, AFolderThatTwoItemsNameGoesWithTheSecond) {
  const auto document = flattenedPicture();
  const Path file = document->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative()->url()->relativePath();
  const Path item = document->mediaAtIndex(0)->path();
  Dictionary record = saved(*document);
  record.array("Media")->push_back(record.array("Media")->front());
  const auto twice = opened(record);
  ASSERT_EQ(twice->mediaCount(), 2u);
  twice->mediaAtIndex(0)->removeAllSources();
  twice->removeMedia(twice->mediaAtIndex(0));
  EXPECT_TRUE(std::filesystem::exists(file));
  twice->removeMedia(twice->mediaAtIndex(0));
  EXPECT_FALSE(std::filesystem::exists(item));
}

TEST_F(IdentityTest, AFolderThatTwoSourcesNameGoesWithTheSecond) {
  const auto document = flattenedPicture();
  Dictionary record = saved(*document);
  Array& sources = *record.array("Media")->front().as<Dictionary>()->array("Sources");
  sources.push_back(sources.front());
  const auto twice = opened(record);
  const auto item = twice->mediaAtIndex(0);
  ASSERT_EQ(item->sourcesCount(), 2u);
  const Path folder = item->sourceAtIndex(0)->path();
  item->sourceAtIndex(0)->removeAllDerivatives();
  item->removeSource(item->sourceAtIndex(0));
  EXPECT_EQ(filesBelow(folder / "derivatives"), 1u);
  item->removeSource(item->sourceAtIndex(0));
  EXPECT_FALSE(std::filesystem::exists(folder));
}

TEST_F(IdentityTest, AFileThatServesThreeGradesGoesWithTheLast) {
  const auto document = flattenedPicture();
  const auto copy = made("copy");
  ASSERT_TRUE(document->mergeIntoDocument(copy, {"480p", "480p", "480p"}, {}));
  ASSERT_TRUE(copy->flattenWithProgressionBlock({}));
  const auto source = copy->mediaAtIndex(0)->sourceAtIndex(0);
  ASSERT_EQ(source->derivativeCount(), 3u);
  const Path file = source->mainDerivative()->url()->relativePath();
  source->removeDerivative(source->derivativeAtIndex(2));
  source->setDirty(true);
  EXPECT_EQ(source->derivativeCount(), 1u);
  EXPECT_TRUE(std::filesystem::exists(file));
  source->removeAllDerivatives();
  EXPECT_FALSE(std::filesystem::exists(file));
}

TEST_F(IdentityTest, ADerivativeThatIsReadWithTheIdentityOfAnotherFileGetsItsOwn) {
  const Dictionary one{{"UUID", "same"}, {"URL", Url::fileUrl(pictureFile(8, 8, "one.png")).absoluteString()}};
  const Dictionary other{{"UUID", "same"}, {"URL", Url::fileUrl(pictureFile(9, 9, "other.png")).absoluteString()}};
  const auto document =
      opened({{"Media", Array{Dictionary{{"Sources", Array{Dictionary{{"Derivatives", Array{one, other}}}}}}}}});
  const auto source = document->mediaAtIndex(0)->sourceAtIndex(0);
  ASSERT_TRUE(source->derivativeAtIndex(0)->flattenCopy(true, {}));
  ASSERT_TRUE(source->derivativeAtIndex(1)->flattenCopy(true, {}));
  EXPECT_THAT(namesIn(source->derivativesFolderPath()), SizeIs(2));
}

}  // namespace
}  // namespace quilt
