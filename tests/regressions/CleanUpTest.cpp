// SPDX-License-Identifier: Apache-2.0
// What the clean-up of a loaded collection deletes, and what it must not.
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class CleanUpTest : public support::DocumentFixture {
 protected:
  CleanUpTest() {
    writeRecord(collection / "collection.plist", {{"UUID", "C"}, {"Title", "Talks"}});
    writeRecord(emptied / "properties.plist",
                {{"Version", "1.0"}, {"UUID", "emptied"}, {"Title", "Film"}, {"Type", "Movie"}});
  }
  /// The documents that a host sees after loading.
  std::size_t loaded() { return QuiltCollection::initWithPath(collection)->documentsCount(); }

  const Path collection = folder() / "collection";
  const Path emptied = collection / "emptied.qpk";
};

TEST_F(CleanUpTest, AnEmptyMovieDocumentIsDeletedWithAWarningThatNamesIt) {
  EXPECT_EQ(0U, loaded());
  EXPECT_FALSE(std::filesystem::exists(emptied));
  EXPECT_THAT(takeProblems(),
              ElementsAre(support::warning("Removed the empty document at path \"" + emptied.native() + "\"")));
}

TEST_F(CleanUpTest, OneThatSomebodyPutWorkIntoIsKeptWithAWarning) {
  const auto expectKept = [this] {
    EXPECT_EQ(1U, loaded());
    EXPECT_TRUE(std::filesystem::exists(emptied / "properties.plist"));
    EXPECT_THAT(takeProblems(),
                ElementsAre(support::warning("Kept the document at path \"" + emptied.native() +
                                             "\" without media: it has a description, a poster or files")));
  };
  writeFile(emptied / "media/item/sources/source/derivatives/film.mp4", "a film");
  expectKept();
  std::filesystem::remove_all(emptied / "media");
  writeFile(emptied / "poster.png", "a picture");
  expectKept();
  std::filesystem::remove(emptied / "poster.png");
  Dictionary record = readRecord(emptied / "properties.plist");
  record.set("Description", "Filmed in May");
  writeRecord(emptied / "properties.plist", record);
  expectKept();
}

TEST_F(CleanUpTest, EmptyFoldersAndLinksThatLeadOutAreNoWork) {
  std::filesystem::create_directories(emptied / "media/item/sources");
  writeFile(folder() / "elsewhere/film.mp4", "somebody else's");
  std::filesystem::create_directory_symlink(folder() / "elsewhere", emptied / "media/link");
  EXPECT_EQ(0U, loaded());
  EXPECT_FALSE(std::filesystem::exists(emptied));
  EXPECT_TRUE(std::filesystem::exists(folder() / "elsewhere/film.mp4"));
}

TEST_F(CleanUpTest, OpeningOneDocumentCleansNothingUp) {
  writeRecord(collection / "other.qpk/properties.plist", {{"Version", "1.0"}, {"UUID", "other"}});
  const auto alone = QuiltCollection::initWithPathAlone(collection);
  ASSERT_TRUE(alone);
  EXPECT_EQ("Talks", alone->title());
  EXPECT_THAT(alone->documents(), IsEmpty());
  const auto document = alone->openDocument(collection / "other.qpk");
  ASSERT_TRUE(document);
  EXPECT_EQ(alone, document->collectionOwner());
  EXPECT_EQ(document, alone->openDocument(collection / "../collection/other.qpk/"));
  EXPECT_THAT(alone->documents(), SizeIs(1));
  EXPECT_TRUE(std::filesystem::exists(emptied));
}

TEST_F(CleanUpTest, WhatIsNotThereIsNotOpenedAndNotMade) {
  const auto alone = QuiltCollection::initWithPathAlone(collection);
  EXPECT_FALSE(alone->openDocument(collection / "gone.qpk"));
  EXPECT_FALSE(alone->openDocument(folder() / "elsewhere.qpk"));
  EXPECT_FALSE(std::filesystem::exists(collection / "gone.qpk"));
  EXPECT_FALSE(QuiltCollection::initWithPathAlone(folder() / "nowhere"));
  EXPECT_FALSE(std::filesystem::exists(folder() / "nowhere"));
}

}  // namespace
}  // namespace quilt
