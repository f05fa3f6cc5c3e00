// SPDX-License-Identifier: Apache-2.0
// Two who have one record open, and save: each edit of both stays, or its save is refused in so many words.
#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include "quilt/collections/QuiltCollection.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using platform::Result;
using support::Lines;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

class LostEditTest : public support::DocumentFixture {
 protected:
  LostEditTest() {
    mine->setTitle("Talk");
    for (const char* title : {"One", "Two", "Three"}) addWebItem(*mine, title)->setUuid(title);
    EXPECT_TRUE(mine->update());
    theirs = reopened(*mine);
    (void)takeLines();
  }

  static std::vector<std::string> titlesIn(const QuiltDocument& document) {
    std::vector<std::string> titles;
    for (const auto& item : document.media()) titles.push_back(item->title().value_or(""));
    return titles;
  }
  /// What is in the file, and that both would show the same if they opened it.
  std::vector<std::string> savedTitles() { return titlesIn(*reopened(*mine)); }
  std::string problems() {
    std::string all;
    for (const auto& line : takeProblems()) all += line.text + "\n";
    return all;
  }

  const std::shared_ptr<QuiltDocument> mine = made();
  std::shared_ptr<QuiltDocument> theirs;
};

TEST_F(LostEditTest, WhatEachChangedIsKeptAndSeenByTheLaterOne) {
  theirs->setDescription("of theirs");
  mine->setAuthor("me");
  EXPECT_EQ("of theirs", saved(*mine).string("Description"));
  EXPECT_EQ("me", saved(*mine).string("Author"));
  EXPECT_EQ("of theirs", mine->description());
  EXPECT_THAT(problems(), HasSubstr("Another program has changed the document at path \"" + mine->path().native()));
}

TEST_F(LostEditTest, WhatWasTakenOutStaysOut) {
  mine->setKeywords("a, b");
  theirs->setAuthor("them");  // takes the keywords over
  theirs->setKeywords(std::nullopt);
  mine->setCategory("Lecture");
  EXPECT_FALSE(saved(*mine).contains("Keywords"));
  EXPECT_EQ(std::nullopt, mine->keywords());
}

TEST_F(LostEditTest, TheSameFieldIsRefusedInSoManyWordsAndNothingIsWritten) {
  theirs->setTitle("Theirs");
  (void)takeLines();
  mine->setTitle("Mine");
  EXPECT_EQ("Theirs", saved(*mine).string("Title"));
  EXPECT_THAT(problems(), HasSubstr("Another program has changed \"Title\" since it was read; nothing is overwritten"));
  EXPECT_FALSE(mine->update());
}

TEST_F(LostEditTest, TheHostDecidesWhoseItIs) {
  theirs->setTitle("Theirs");
  mine->setTitle("Mine");
  EXPECT_TRUE(mine->update(ConflictChoice::KeepMine));
  EXPECT_EQ("Mine", saved(*mine).string("Title"));
  theirs->setTitle("Theirs again");
  EXPECT_TRUE(theirs->update(ConflictChoice::KeepTheirs));
  EXPECT_EQ("Mine", saved(*mine).string("Title"));
  EXPECT_EQ("Mine", theirs->title());
}

TEST_F(LostEditTest, TheSameEditOfBothIsNoConflict) {
  theirs->setTitle("Alike");
  mine->setTitle("Alike");
  EXPECT_TRUE(mine->update());
  EXPECT_EQ("Alike", saved(*mine).string("Title"));
}

TEST_F(LostEditTest, ItemsThatBothAddedAreThere) {
  theirs->addMedia([] {
    const auto item = QuiltMedia::init();
    item->setTitle("Theirs");
    return item;
  }());
  const auto item = QuiltMedia::init();
  item->setTitle("Mine");
  mine->addMedia(item);
  EXPECT_THAT(savedTitles(), ::testing::UnorderedElementsAre("One", "Two", "Three", "Mine", "Theirs"));
  EXPECT_EQ(savedTitles(), titlesIn(*mine));
  for (const auto& one : mine->media()) EXPECT_EQ(mine, one->documentOwner());
}

TEST_F(LostEditTest, AnItemThatTheyRemovedDoesNotComeBack) {
  theirs->removeMedia(theirs->mediaWithUUID("Two"));
  mine->setAuthor("me");
  EXPECT_THAT(savedTitles(), ElementsAre("One", "Three"));
  EXPECT_THAT(titlesIn(*mine), ElementsAre("One", "Three"));
}

TEST_F(LostEditTest, AnItemThatTheyChangedIsTakenOver) {
  theirs->mediaWithUUID("Two")->setTitle("Second");
  EXPECT_TRUE(theirs->update());
  mine->mediaWithUUID("One")->setTitle("First");
  EXPECT_TRUE(mine->update());
  EXPECT_THAT(savedTitles(), ElementsAre("First", "Second", "Three"));
  EXPECT_THAT(titlesIn(*mine), ElementsAre("First", "Second", "Three"));
}

TEST_F(LostEditTest, AnItemThatBothChangedIsRefused) {
  theirs->mediaWithUUID("Two")->setTitle("Second");
  EXPECT_TRUE(theirs->update());
  mine->mediaWithUUID("Two")->setTitle("Zwei");
  EXPECT_FALSE(mine->update());
  EXPECT_THAT(problems(), HasSubstr("has changed the media item Two since"));
  EXPECT_THAT(savedTitles(), ElementsAre("One", "Second", "Three"));
}

TEST_F(LostEditTest, AnItemThatTheyChangedAndIRemovedIsRefused) {
  theirs->mediaWithUUID("Two")->setTitle("Second");
  EXPECT_TRUE(theirs->update());
  mine->removeMedia(mine->mediaWithUUID("Two"));
  EXPECT_THAT(problems(), HasSubstr("has changed the media item Two since"));
  EXPECT_THAT(savedTitles(), ElementsAre("One", "Second", "Three"));
}

TEST_F(LostEditTest, TheOrderOfWhoMovedItemsHolds) {
  theirs->moveMediaAtIndexes({0}, 3);  // One to the end
  mine->mediaWithUUID("Two")->setTitle("Second");
  EXPECT_TRUE(mine->update());
  EXPECT_THAT(savedTitles(), ElementsAre("Second", "Three", "One"));
  EXPECT_THAT(titlesIn(*mine), ElementsAre("Second", "Three", "One"));
}

TEST_F(LostEditTest, TwoDifferentMovesAreRefused) {
  theirs->moveMediaAtIndexes({0}, 3);
  mine->moveMediaAtIndexes({2}, 0);
  EXPECT_THAT(problems(), HasSubstr("the order of the media items"));
  EXPECT_THAT(savedTitles(), ElementsAre("Two", "Three", "One"));
}

TEST_F(LostEditTest, KeysOfANewerVersionAreTakenOverToo) {
  Dictionary record = saved(*mine);
  record.set("Newer", "kept");
  writeRecord(mine->propertiesPath(), record);
  mine->setAuthor("me");
  EXPECT_EQ("kept", saved(*mine).string("Newer"));
  mine->setAuthor("me again");
  EXPECT_EQ("kept", saved(*mine).string("Newer"));
}

TEST_F(LostEditTest, ALongOperationsOwnWriteKeepsThemToo) {
  theirs->setDescription("of theirs");
  EXPECT_TRUE(mine->flattenWithProgressionBlock({}));
  EXPECT_EQ("of theirs", saved(*mine).string("Description"));
}

TEST_F(LostEditTest, ADamagedRecordAndOneOfAnotherDocumentAreNotOverwritten) {
  const std::string good = readFile(mine->propertiesPath());
  for (const std::string& other : {std::string("no record"), [&] {
                                     Dictionary record = saved(*mine);
                                     record.set("UUID", "another");
                                     return platform::services().propertyLists->serialize(record);
                                   }()}) {
    writeFile(mine->propertiesPath(), other);
    mine->setAuthor("me");
    EXPECT_THAT(problems(), HasSubstr("has changed the whole record"));
    EXPECT_EQ(other, readFile(mine->propertiesPath()));
    EXPECT_TRUE(mine->update(ConflictChoice::KeepMine));
    EXPECT_EQ(good.size() > 0, !readFile(mine->propertiesPath()).empty());
    EXPECT_EQ(mine->uuid(), saved(*mine).string("UUID"));
  }
}

TEST_F(LostEditTest, ARecordMadeMeanwhileInANewPackageIsNotOverwritten) {
  const auto late = made("new");
  const auto early = opened({{"UUID", "somebody's"}, {"Title", "Early"}}, "new");
  ASSERT_TRUE(early);
  late->setTitle("Late");
  EXPECT_EQ("Early", saved(*late).string("Title"));
}

/// Counts the reads.
class CountingLists final : public platform::PropertyLists {
 public:
  mutable int reads = 0;

  Result<platform::PropertyList> parse(std::string_view bytes) const override { return _real->parse(bytes); }
  std::string serialize(const platform::PropertyList& value) const override { return _real->serialize(value); }
  Result<Dictionary> readDictionary(const Path& path) const override {
    ++reads;
    return _real->readDictionary(path);
  }
  Result<void> writeDictionary(const Dictionary& dictionary, const Path& path) override {
    return _real->writeDictionary(dictionary, path);
  }

 private:
  const std::shared_ptr<platform::PropertyLists> _real = platform::services().propertyLists;
};

TEST_F(LostEditTest, WithoutAnotherHandNothingIsReadAndNothingSaid) {
  const auto lists = std::make_shared<CountingLists>();
  const platform::ScopedService service(&platform::Services::propertyLists, lists);
  for (int i = 0; i < 3; ++i) mine->setAuthor("me " + std::to_string(i));
  EXPECT_EQ(0, lists->reads);
  EXPECT_EQ("", problems());
}

TEST_F(LostEditTest, AFileThatWasOnlyTouchedIsNoMatter) {
  std::filesystem::permissions(mine->propertiesPath(), std::filesystem::perms::owner_all);
  mine->setAuthor("me");
  EXPECT_EQ("", problems());
  EXPECT_EQ("me", saved(*mine).string("Author"));
}

TEST_F(LostEditTest, AfterAReloadTheFileIsKnown) {
  clock().advance(std::chrono::seconds(5));
  theirs->setTitle("Theirs");
  mine->reload();
  (void)takeLines();
  mine->setTitle("Mine");
  EXPECT_EQ("Mine", saved(*mine).string("Title"));
  EXPECT_EQ("", problems());
}

TEST_F(LostEditTest, OfTwoProcessesThatSaveAllTheTimeEachKeepsItsOwn) {
  constexpr int kTimes = 60;
  std::vector<pid_t> children;
  for (int process = 0; process < 2; ++process) {
    const pid_t child = fork();
    if (child != 0) {
      children.push_back(child);
      continue;
    }
    const auto document = QuiltDocument::initWithPath(mine->path());
    for (int i = 1; i <= kTimes; ++i) {
      if (process == 0) document->setDescription(std::to_string(i));
      if (process == 1) document->setKeywords(std::to_string(i));
      const Dictionary record = saved(*document);
      if (record.string(process == 0 ? "Description" : "Keywords") != std::to_string(i)) _exit(1);
    }
    _exit(0);
  }
  for (const pid_t child : children) {
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(0, WEXITSTATUS(status));
  }
  EXPECT_EQ(std::to_string(kTimes), saved(*mine).string("Description"));
  EXPECT_EQ(std::to_string(kTimes), saved(*mine).string("Keywords"));
}

// Collections

class LostCollectionEditTest : public support::DocumentFixture {
 protected:
  Dictionary saved() { return readRecord(mine->path() / "collection.plist"); }

  const std::shared_ptr<QuiltCollection> mine = QuiltCollection::initWithPath(folder() / "collection");
  const std::shared_ptr<QuiltCollection> theirs = QuiltCollection::initWithPath(folder() / "collection");
};

TEST_F(LostCollectionEditTest, WhatEachChangedIsKeptAndSeenByTheLaterOne) {
  theirs->setTitle("Theirs");
  mine->setAuthor("me");
  EXPECT_EQ("Theirs", saved().string("Title"));
  EXPECT_EQ("me", saved().string("Author"));
  EXPECT_EQ("Theirs", mine->title());
}

TEST_F(LostCollectionEditTest, TheSameFieldIsRefusedInSoManyWords) {
  theirs->setTitle("Theirs");
  (void)takeLines();
  mine->setTitle("Mine");
  EXPECT_EQ("Theirs", saved().string("Title"));
  const Lines lines = takeProblems();
  ASSERT_FALSE(lines.empty());
  EXPECT_THAT(lines.front().text, HasSubstr("Another program has changed \"Title\" since it was read"));
  EXPECT_TRUE(mine->update(ConflictChoice::KeepMine));
  EXPECT_EQ("Mine", saved().string("Title"));
}

TEST_F(LostCollectionEditTest, WhatTheyTookOutStaysOut) {
  theirs->setTitle("Theirs");
  mine->setAuthor("me");
  theirs->setTitle(std::nullopt);
  mine->setCategory("Lecture");
  EXPECT_FALSE(saved().contains("Title"));
}

}  // namespace
}  // namespace quilt
