// SPDX-License-Identifier: Apache-2.0
// Files come before the record that names them and go after the record that no longer does.
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollectionsController.h"
#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/testing/FailNthFileManager.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using platform::ErrorKind;
using platform::FailNthFileManager;
using platform::ScopedService;
using platform::Services;
using platform::services;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class OrderOfWritingTest : public support::DocumentFixture {
 protected:
  /// A saved document with one item, which holds a picture.
  std::shared_ptr<QuiltDocument> withPicture() {
    auto document = made();
    document->setTitle("Talk");
    addPictureItem(*document);
    EXPECT_TRUE(document->flattenWithProgressionBlock({}));
    return document;
  }

  static std::vector<std::string> hiddenIn(const Path& folder) {
    std::vector<std::string> hidden;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder))
      if (platform::isHiddenTemporaryName(entry.path().filename().native())) hidden.push_back(entry.path());
    return hidden;
  }

  /// The file manager fails from the next change of the disk on.
  void failWrites() { files->failNth(1, ErrorKind::NoSpace, FailNthFileManager::Repeat::ForEver); }
  void stopFailing() { files->failNth(0, ErrorKind::NoSpace); }

  const std::shared_ptr<FailNthFileManager> files = std::make_shared<FailNthFileManager>(services().files);
  ScopedService<platform::FileManager> installed{&Services::files, files};
};

TEST_F(OrderOfWritingTest, AnItemWhoseRemovalCannotBeSavedKeepsItsFiles) {
  const auto document = withPicture();
  const auto before = treeOf(document->path());
  failWrites();
  document->removeMedia(document->mediaAtIndex(0));
  stopFailing();
  EXPECT_EQ(0U, document->mediaCount());
  const auto again = reopened(*document);
  ASSERT_EQ(1U, again->mediaCount()) << "the record could not be written";
  EXPECT_TRUE(again->update());
  EXPECT_EQ(before, treeOf(document->path()));
}

TEST_F(OrderOfWritingTest, ALaterSaveDeletesWhatAFailedOneBroughtBack) {
  const auto document = withPicture();
  failWrites();
  document->removeMedia(document->mediaAtIndex(0));
  stopFailing();
  EXPECT_TRUE(document->update());
  EXPECT_THAT(namesIn(document->mediaFolderPath()), IsEmpty());
}

TEST_F(OrderOfWritingTest, FilesRemovedDuringALongOperationGoWithItsSave) {
  const auto document = withPicture();
  document->setIsProcessing(true);
  document->removeMedia(document->mediaAtIndex(0));
  document->setIsProcessing(false);
  EXPECT_THAT(namesIn(document->mediaFolderPath()), SizeIs(1)) << "set aside";
  const auto undone = reopened(*document);  // as after a kill
  EXPECT_TRUE(undone->update());
  EXPECT_THAT(hiddenIn(document->path()), IsEmpty());
  ASSERT_EQ(1U, undone->mediaCount());
  EXPECT_TRUE(undone->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative()->isFlattened());
  const auto url = undone->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative()->url();
  EXPECT_TRUE(services().files->fileExistsAtPath(url->relativePath())) << "the record still named it";
}

TEST_F(OrderOfWritingTest, WhatALivingProcessMakesIsNotSwept) {
  const auto document = withPicture();
  document->setIsProcessing(true);
  const auto item = addPictureItem(*document, 80, 60);
  EXPECT_TRUE(item->flattenWithProgressionBlock({}));
  EXPECT_THAT(namesIn(document->mediaFolderPath()), SizeIs(3)) << "two items, and a mark";
  const Path itemFolder = item->path();
  const auto next = reopened(*document);  // as after a kill: no record names the item
  document->setIsProcessing(false);
  // The one that is at work holds the package until it has saved; a killed one holds nothing.
  EXPECT_TRUE(next->update());
  EXPECT_TRUE(services().files->fileExistsAtPath(itemFolder)) << "a living process is making it";
}

TEST_F(OrderOfWritingTest, ADocumentWhoseFirstSaveFailsIsNotThere) {
  const auto collection = QuiltCollection::initWithPath(folder() / "collection");
  for (std::size_t n = 1; n < 30; ++n) {
    files->failNth(n, ErrorKind::InputOutput, FailNthFileManager::Repeat::Once);
    const auto document = collection->newDocumentWithType(kQuiltDocumentTypeInteractive);
    stopFailing();
    if (document) break;
    EXPECT_THAT(namesIn(folder() / "collection"), ElementsAre("collection.plist")) << n;
  }
  EXPECT_EQ(1U, collection->documentsCount());
}

TEST_F(OrderOfWritingTest, ACollectionWhoseFirstSaveFailsIsNotThere) {
  for (std::size_t n = 1; n < 30; ++n) {
    files->failNth(n, ErrorKind::InputOutput, FailNthFileManager::Repeat::Once);
    const auto collection = QuiltCollection::initWithPath(folder() / "collection");
    stopFailing();
    if (collection) return;
    EXPECT_THAT(namesIn(folder()), IsEmpty()) << n;
  }
  FAIL() << "it is never made";
}

TEST_F(OrderOfWritingTest, ATemplateThatIsGoneLeavesTheWorkingPlayer) {
  const auto document = made();
  document->setTitle("Talk");
  document->setType(kQuiltDocumentTypeInteractive);
  const Path bundle = themeBundle();
  document->setTheme(QuiltTheme::initWithPath(bundle));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  const auto before = treeOf(document->path());
  std::filesystem::remove_all(bundle / "Template");
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(before, treeOf(document->path()));
}

}  // namespace
}  // namespace quilt
