// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using platform::PropertyList;
using ::testing::HasSubstr;
using ::testing::IsNull;
using ::testing::Not;
using ::testing::NotNull;

/// What a loader cannot use is written back as it stood.
class KeptRecordsTest : public support::DocumentFixture {
 protected:
  /// The record that the next save makes of this one.
  Dictionary savedAgain(const Dictionary& record) {
    const auto document = opened(record);
    EXPECT_TRUE(document && document->update());
    return saved(*document);
  }
  /// The same for the first item of a document, and for the first source of that.
  Dictionary itemSavedAgain(const Dictionary& item) {
    return *savedAgain({{"Media", Array{item}}}).array("Media")->front().as<Dictionary>();
  }
  Dictionary sourceSavedAgain(const Dictionary& source) {
    return *itemSavedAgain({{"Sources", Array{source}}}).array("Sources")->front().as<Dictionary>();
  }
  static void expectKept(const Dictionary& written, const Dictionary& read) {
    for (const auto& [key, value] : read) {
      const PropertyList* kept = written.find(key);
      EXPECT_TRUE(kept && *kept == value) << key;
    }
  }
};

TEST_F(KeptRecordsTest, AThemeThatIsAwayDuringASaveIsThereAgainLater) {
  const Path bundle = themeBundle();
  const Path away = folder() / "unmounted";
  std::filesystem::rename(bundle, away);
  const auto document = opened({{"ThemePath", bundle.native()}});
  document->setTitle("Edited meanwhile");
  EXPECT_EQ(saved(*document).string("ThemePath"), bundle.native());
  std::filesystem::rename(away, bundle);
  EXPECT_THAT(reopened(*document)->theme(), NotNull());
}

TEST_F(KeptRecordsTest, AThemeThatIsAwayIsForgottenWhenAnotherOrNoneIsChosen) {
  const auto document = opened({{"ThemePath", "/nowhere/Gone.qth"}});
  document->setTheme(nullptr);
  EXPECT_FALSE(saved(*document).contains("ThemePath"));
  const auto other = opened({{"ThemePath", "/nowhere/Gone.qth"}}, "other");
  other->setTheme(QuiltTheme::initWithPath(themeBundle()));
  EXPECT_EQ(saved(*other).string("ThemePath"), themeBundle().native());
}

TEST_F(KeptRecordsTest, RefusedItemsStayInTheirPlaces) {
  const PropertyList refused = Dictionary{{"UUID", "../elsewhere"}, {"Title", "Refused"}};
  const Array media{Dictionary{{"UUID", "a"}}, refused, Dictionary{{"UUID", "b"}}, 7, "text"};
  const auto document = opened({{"Media", media}});
  ASSERT_EQ(document->mediaCount(), 2u);
  document->update();
  const Dictionary record = saved(*document);
  const Array& written = *record.array("Media");
  ASSERT_EQ(written.size(), 5u);
  EXPECT_EQ(written[0].as<Dictionary>()->string("UUID"), "a");
  EXPECT_EQ(written[1], refused);
  EXPECT_EQ(written[2].as<Dictionary>()->string("UUID"), "b");
  EXPECT_EQ(written[3], PropertyList(7));
  EXPECT_EQ(written[4], PropertyList("text"));
}

TEST_F(KeptRecordsTest, ValuesOfAnotherKindStayUntilAnotherIsSet) {
  const Dictionary record{{"Title", 5}, {"Author", Array{1}}, {"jukeboxOrder", "third"}, {"CreationDate", "once"}};
  const auto document = opened(record);
  EXPECT_EQ(document->title(), std::nullopt);
  ASSERT_TRUE(document->update());
  expectKept(saved(*document), record);
  document->setTitle("A title");
  document->setAuthor(std::nullopt);
  document->setJukeboxOrder(0);
  EXPECT_EQ(saved(*document).string("Title"), "A title");
  EXPECT_FALSE(saved(*document).contains("Author"));
  EXPECT_EQ(saved(*document).integer("jukeboxOrder"), 0);
  EXPECT_EQ(saved(*document).string("CreationDate"), "once");
}

TEST_F(KeptRecordsTest, AnItemKeepsWhatItCannotUse) {
  const Dictionary record{{"Title", 1},
                          {"Sources", "gone"},
                          {"Extras", Array{"x", Dictionary{{"UUID", "a/b"}, {"k", 1}}}},
                          {"AudioCommentarySource", Dictionary{{"UUID", ".."}, {"Title", "Voice"}}}};
  expectKept(itemSavedAgain(record), record);
}

TEST_F(KeptRecordsTest, ASourceKeepsWhatItCannotUse) {
  const Dictionary record{{"Title", true},
                          {"Timecode", "later"},
                          {"Dirty", "perhaps"},
                          {"Derivatives", Array{7, Dictionary{{"UUID", "u"}, {"Filename", "../x"}}}},
                          {"Previews", Array{Dictionary{{"UUID", "/"}}}},
                          {"AudioSamples", Dictionary{{"UUID", "a/b"}, {"IsFlattened", true}}}};
  expectKept(sourceSavedAgain(record), record);
}

TEST_F(KeptRecordsTest, ADerivativeThatIsALinkOutIsKept) {
  const PropertyList refused = Dictionary{{"UUID", "d"}, {"Filename", "d.png"}, {"IsFlattened", true}};
  const Path derivatives = package() / "media/i/sources/s/derivatives";
  std::filesystem::create_directories(derivatives);
  std::filesystem::create_symlink(pictureFile(8, 8), derivatives / "d.png");
  const Dictionary source{{"UUID", "s"}, {"Derivatives", Array{refused}}};
  const Dictionary item = itemSavedAgain({{"UUID", "i"}, {"Sources", Array{source}}});
  EXPECT_EQ(item.array("Sources")->front().as<Dictionary>()->array("Derivatives")->front(), refused);
}

TEST_F(KeptRecordsTest, TheChildrenOfASourceKeepWhatTheyCannotUse) {
  const Dictionary derivative{{"URL", "no address"},
                              {"CompatibilityTags", Array{"Desktop", 5}},
                              {"MimeType", 3},
                              {"Width", "wide"},
                              {"IsFlattened", "so"}};
  const Dictionary preview{{"Title", 4}, {"Index", "first"}, {"Timecode", "late"}};
  const Dictionary samples{{"UUID", "s"}, {"SourceURL", "no address"}, {"IsFlattened", true}};
  const Dictionary written =
      sourceSavedAgain({{"Derivatives", Array{derivative}}, {"Previews", Array{preview}}, {"AudioSamples", samples}});
  expectKept(*written.array("Derivatives")->front().as<Dictionary>(), derivative);
  expectKept(*written.array("Previews")->front().as<Dictionary>(), preview);
  expectKept(*written.dictionary("AudioSamples"), samples);
}

TEST_F(KeptRecordsTest, SamplesThatCannotBeAttachedKeepTheirRecord) {
  const Dictionary record{{"AudioSamples", Dictionary{{"UUID", "s"}, {"SourceURL", "file:///nowhere.mp3"}}}};
  expectKept(sourceSavedAgain(record), record);
}

TEST_F(KeptRecordsTest, AListThatHasBecomeShorterKeepsItsRefusedElementsAtTheEnd) {
  const auto document =
      opened({{"Media", Array{Dictionary{{"UUID", "a"}}, Dictionary{{"UUID", "b"}}, Dictionary{{"UUID", "../x"}}}}});
  document->removeAllMedia();
  const Dictionary record = saved(*document);
  ASSERT_THAT(record.array("Media"), NotNull());
  EXPECT_EQ(*record.array("Media"), (Array{Dictionary{{"UUID", "../x"}}}));
}

TEST_F(KeptRecordsTest, TheDataScriptTellsNothingThatWasRefused) {
  const auto document = opened({{"Type", kQuiltDocumentTypeInteractive},
                                {"ThemePath", themeBundle().native()},
                                {"Description", Array{"hidden"}},
                                {"Media", Array{Dictionary{{"UUID", "../elsewhere"}}}}});
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(readFile(document->dataControllerPath()), Not(HasSubstr("elsewhere")));
  EXPECT_THAT(readFile(document->dataControllerPath()), Not(HasSubstr("hidden")));
  EXPECT_THAT(readFile(document->propertiesPath()), HasSubstr("../elsewhere"));
}

TEST_F(KeptRecordsTest, ACollectionKeepsValuesOfAnotherKindButNoThemeThatIsGone) {
  const Path place = folder() / "collection";
  writeRecord(place / "collection.plist", {{"Title", 5}, {"PreferredThemePath", "/nowhere/Gone.qth"}});
  const auto collection = QuiltCollection::initWithPath(place);
  ASSERT_TRUE(collection->update());
  EXPECT_EQ(*readRecord(place / "collection.plist").find("Title"), PropertyList(5));
  EXPECT_THAT(readRecord(place / "collection.plist").find("PreferredThemePath"), IsNull());
  collection->setTitle("A title");
  EXPECT_EQ(readRecord(place / "collection.plist").string("Title"), "A title");
}

}  // namespace
}  // namespace quilt
