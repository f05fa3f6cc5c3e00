// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using support::dateOf;
using support::debug;
using support::Lines;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class QuiltDocumentReloadTest : public support::DocumentFixture {
 protected:
  static Dictionary recordModifiedAt(const char* date, const char* title = "Outside") {
    return {{"Version", "1.0"},
            {"UUID", "X"},
            {"Title", title},
            {"ModifiedDate", dateOf(date)},
            {"Media", Array{Dictionary{{"UUID", "A"}}, Dictionary{{"UUID", "B"}}}}};
  }

  static std::vector<std::string> identitiesOf(const QuiltDocument& document) {
    std::vector<std::string> identities;
    for (const auto& item : document.media()) identities.push_back(item->uuid());
    return identities;
  }

  /// A document in memory whose file another program then replaces.
  std::shared_ptr<QuiltDocument> replacedOnDisk(const Dictionary& record) {
    const auto document = opened(recordModifiedAt("2020-01-01T00:00:00Z", "Mine"));
    writeRecord(document->propertiesPath(), record);
    takeLines();
    return document;
  }
};

TEST_F(QuiltDocumentReloadTest, AFileOfTheSameDateIsNotReadAgain) {
  const auto document = replacedOnDisk(recordModifiedAt("2020-01-01T00:00:00Z"));
  document->reload();
  EXPECT_EQ(document->title(), "Mine");
  EXPECT_EQ(document->mediaCount(), 2u);
  EXPECT_EQ(document->posterImageVersion(), 1u);
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentReloadTest, AnOlderFileIsNotReadAgain) {
  const auto document = replacedOnDisk(recordModifiedAt("2019-12-31T23:59:59Z"));
  document->reload();
  EXPECT_EQ(document->title(), "Mine");
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentReloadTest, TheOwnSaveIsNotTakenForAnOutsideChange) {
  const auto document = made();
  clock().advance(std::chrono::milliseconds(700));  // the file holds whole seconds
  document->setTitle("Mine");
  takeLines();
  document->reload();
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentReloadTest, ANewerFileIsReadAndItsItemsAreAppended) {
  const auto document = replacedOnDisk(recordModifiedAt("2020-01-01T00:00:01Z"));
  document->setPosterImage(picture(3, 3));
  document->reload();
  EXPECT_EQ(document->title(), "Outside");
  EXPECT_EQ(document->modifiedDate(), dateOf("2020-01-01T00:00:01Z"));
  EXPECT_THAT(identitiesOf(*document), ElementsAre("A", "B", "A", "B"));
  EXPECT_EQ(document->posterImageVersion(), 2u);
  EXPECT_NE(document->posterImage()->size().width, 3) << "the poster must have been made anew";
  EXPECT_EQ(takeLines(), (Lines{debug("Reload detected that something has changed in document with UUID \"X\""),
                                debug("Loaded document at \"" + package().native() + "\"")}));
  EXPECT_EQ(saved(*document), recordModifiedAt("2020-01-01T00:00:01Z")) << "reloading must not save";
}

TEST_F(QuiltDocumentReloadTest, AFileWithoutADateOrThatCannotBeReadChangesNothing) {
  Dictionary record = recordModifiedAt("2030-01-01T00:00:00Z");
  record.remove("ModifiedDate");
  const auto document = replacedOnDisk(record);
  document->reload();
  writeFile(document->propertiesPath(), "damaged");
  document->reload();
  std::filesystem::remove(document->propertiesPath());
  document->reload();
  EXPECT_EQ(document->title(), "Mine");
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentReloadTest, TheCollectionAnnouncesItsDocuments) {
  const auto document = replacedOnDisk(recordModifiedAt("2021-01-01T00:00:00Z"));
  const auto collection = QuiltCollection::initWithPath(folder() / "collection");
  document->setCollectionOwner(collection);
  std::vector<platform::ChangePhase> phases;
  const auto observation = collection->observe(
      "documents", [&phases](const auto& notice) { phases.push_back(notice.phase); },
      platform::ObservationOptions::Prior);
  document->reload();
  EXPECT_THAT(phases, ElementsAre(platform::ChangePhase::Will, platform::ChangePhase::Did));
  phases.clear();
  document->reload();
  EXPECT_THAT(phases, IsEmpty());
}

TEST_F(QuiltDocumentReloadTest, InvalidatingDropsTheCachedPostersOfDocumentAndItems) {
  const auto document = made();
  const auto item = addItem(*document);
  std::filesystem::create_directories(item->path());
  ASSERT_TRUE(picture(10, 10)->saveAsJPGAtPath(item->posterImagePath()));
  ASSERT_TRUE(picture(10, 10)->saveAsPNGAtURL(Url::fileUrl(document->posterImagePath())));
  EXPECT_EQ(document->posterImage()->size().width, 10);
  EXPECT_EQ(item->posterImage()->size().width, 10);
  ASSERT_TRUE(picture(20, 20)->saveAsJPGAtPath(item->posterImagePath()));
  ASSERT_TRUE(picture(20, 20)->saveAsPNGAtURL(Url::fileUrl(document->posterImagePath())));
  EXPECT_EQ(document->posterImage()->size().width, 10);
  document->invalidateCaches();
  EXPECT_EQ(document->posterImage()->size().width, 20);
  EXPECT_EQ(item->posterImage()->size().width, 20);
  EXPECT_EQ(document->posterImageVersion(), 1u);
}

}  // namespace
}  // namespace quilt
