// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/QuiltProgram.h"

namespace quilt {
namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::IsNull;
using ::testing::Not;

class RecordReadingTest : public support::DocumentFixture {
 protected:
  Dictionary sourceSavedAgain(const Dictionary& source) {
    const auto document = opened({{"Media", Array{Dictionary{{"Sources", Array{source}}}}}});
    EXPECT_TRUE(document && document->update());
    return *saved(*document).array("Media")->front().as<Dictionary>()->array("Sources")->front().as<Dictionary>();
  }
};

TEST_F(RecordReadingTest, AWholeNumberIsABoolean) {
  const auto document = opened({{"Media", Array{Dictionary{{"Sources", Array{Dictionary{{"Dirty", 1}}}}}}}});
  EXPECT_TRUE(document->mediaAtIndex(0)->sourceAtIndex(0)->dirty());
  const Dictionary record{{"one", 1}, {"zero", 0}, {"real", 0.5}, {"text", "1"}};
  EXPECT_EQ(record.boolean("one"), true);
  EXPECT_EQ(record.boolean("zero"), false);
  EXPECT_EQ(record.boolean("real"), true);
  EXPECT_EQ(record.boolean("text"), std::nullopt);
}

TEST_F(RecordReadingTest, AnAddressWithASpaceSurvives) {
  const auto url = Url::parse("https://example.org/a b?c d");
  ASSERT_TRUE(url);
  EXPECT_EQ(url->absoluteString(), "https://example.org/a%20b?c%20d");
  EXPECT_EQ(Url::parse("file:///a b/c")->relativePath(), "/a b/c");
  EXPECT_FALSE(Url::parse("https://exa mple.org/"));
  const Dictionary link{{"URL", "https://example.org/a b"}, {"IsFlattened", true}};
  const Dictionary source = sourceSavedAgain({{"Derivatives", Array{link}}});
  EXPECT_EQ(source.array("Derivatives")->front().as<Dictionary>()->string("URL"), "https://example.org/a%20b");
}

TEST_F(RecordReadingTest, APreviewWithoutATimecodeWritesNone) {
  EXPECT_FALSE(QuiltMediaPreview::init()->dictionary().contains("Timecode"));
  const auto preview = QuiltMediaPreview::init();
  preview->setTimecode(2);
  EXPECT_EQ(preview->dictionary().real("Timecode"), 2);
}

TEST_F(RecordReadingTest, AnotherVersionIsSilentWhateverElseIsWrong) {
  EXPECT_THAT(opened({{"Version", "2.0"}, {"Media", "no list"}}), IsNull());
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(RecordReadingTest, ACollectionFileAndAPosterThatLeadOutAreNotRead) {
  const Path place = folder() / "collection";
  std::filesystem::create_directories(place);
  writeRecord(folder() / "outside.plist", {{"Title", "Secret"}});
  std::filesystem::create_symlink(folder() / "outside.plist", place / "collection.plist");
  EXPECT_THAT(QuiltCollection::initWithPath(place), IsNull());
  std::filesystem::remove(place / "collection.plist");
  writeRecord(place / "collection.plist", {});
  std::filesystem::create_symlink(pictureFile(8, 8), place / "poster.png");
  EXPECT_THAT(QuiltCollection::initWithPath(place)->posterImage(), IsNull());
}

TEST_F(RecordReadingTest, ALongTitleIsExportedAsOftenAsOneLikes) {
  const auto document = made();
  std::string title;
  for (int i = 0; i < 100; ++i) title += "dö/";
  document->setTitle(title + std::string(300, 'x'));
  const auto derivative = addPictureItem(*document)->sourceAtIndex(0)->mainDerivative();
  std::set<Path> paths;
  for (int i = 0; i < 3; ++i) paths.insert(derivative->exportToPath(folder() / "out", {}));
  EXPECT_EQ(paths.size(), 3u);
  EXPECT_FALSE(paths.contains(Path()));
}

TEST_F(RecordReadingTest, WhatTheReaderWouldRefuseIsNotWritten) {
  const auto document = made();
  document->setTitle("Short");
  const std::string before = readFile(document->propertiesPath());
  document->setDescription(std::string(17'000'000, '='));
  EXPECT_FALSE(document->update());
  EXPECT_EQ(readFile(document->propertiesPath()), before);
  document->setDescription(std::string((std::size_t{256} << 20U) + 1, 'x'));
  EXPECT_FALSE(document->update());
  EXPECT_EQ(readFile(document->propertiesPath()), before);
}

using RecordReadingProgramTest = support::QuiltProgramTest;

TEST_F(RecordReadingProgramTest, ALinkedCollectionFileIsNotShown) {
  write(folder() / "outside.plist",
        "<plist version=\"1.0\"><dict><key>Title</key><string>Secret</string></dict></plist>");
  const std::filesystem::path place = library() / "Collections/c";
  std::filesystem::create_directories(place);
  std::filesystem::create_symlink(folder() / "outside.plist", place / "collection.plist");
  EXPECT_THAT(quilt({"list"}).out, Not(HasSubstr("Secret")));
}

}  // namespace
}  // namespace quilt
