// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/collections/QuiltCollection.h"
#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/text/IcuDateFormatter.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/PlistByPython.h"

namespace quilt {
namespace {

using platform::ScopedService;
using platform::Services;
using support::dateOf;
using ::testing::ElementsAre;

class QuiltDocumentJukeboxTest : public support::DocumentFixture {
 protected:
  /// The keys and values below "Metadata", in order.
  static Dictionary metadataOf(const QuiltDocument& document) {
    const Dictionary all = document.jukeboxMetadata();
    EXPECT_EQ(all.size(), 1u);
    const Dictionary* metadata = all.find("Metadata") ? all.find("Metadata")->as<Dictionary>() : nullptr;
    EXPECT_NE(metadata, nullptr);
    return metadata ? *metadata : Dictionary();
  }

  std::shared_ptr<QuiltCollection> collection(Text title, Text author) {
    auto owner = QuiltCollection::initWithPath(folder() / "collection");
    owner->setTitle(std::move(title));
    owner->setAuthor(std::move(author));
    _document->setCollectionOwner(owner);
    return owner;
  }

  const std::shared_ptr<QuiltDocument>& document() const { return _document; }

 private:
  const std::shared_ptr<QuiltDocument> _document = [] {
    auto document = QuiltDocument::init();
    document->setIsProcessing(true);  // nothing here is to be saved
    return document;
  }();
};

TEST_F(QuiltDocumentJukeboxTest, ADocumentThatSaysNothingGetsTheFallBacks) {
  EXPECT_EQ(metadataOf(*document()), (Dictionary{{"itemName", "Untitled Episode"},
                                                 {"sort-name", "Untitled Episode"},
                                                 {"sort-name-status", 1},
                                                 {"playlistName", "Untitled Podcast"},
                                                 {"sort-album", "Untitled Podcast"},
                                                 {"sort-album-status", 1},
                                                 {"genre", "Podcast"},
                                                 {"kind", "podcast"},
                                                 {"is-podcast", true}}));
  EXPECT_EQ(document()->title(), std::nullopt) << "reading it changes nothing";
}

TEST_F(QuiltDocumentJukeboxTest, ADocumentThatSaysAllGetsEveryKeyInOrder) {
  document()->setAuthor("Ann");
  document()->setTitle("Tales");
  document()->setDescription("Told");
  document()->setModifiedDate(dateOf("2010-05-01T12:00:00Z"));
  const auto owner = collection("All tales", "Anthology");
  EXPECT_EQ(metadataOf(*document()), (Dictionary{{"artistName", "Ann"},
                                                 {"sort-artist", "Ann"},
                                                 {"sort-artist-status", 1},
                                                 {"playlistArtistName", "Anthology"},
                                                 {"sort-album-artist", "Anthology"},
                                                 {"sort-album-artist-status", 1},
                                                 {"description", "Told"},
                                                 {"longDescription", "Told"},
                                                 {"itemName", "Tales"},
                                                 {"sort-name", "Tales"},
                                                 {"sort-name-status", 1},
                                                 {"playlistName", "All tales"},
                                                 {"sort-album", "All tales"},
                                                 {"sort-album-status", 1},
                                                 {"releaseDate", "2010-05-01 12:00:00 +0000"},
                                                 {"year", 2010},
                                                 {"genre", "Podcast"},
                                                 {"kind", "podcast"},
                                                 {"is-podcast", true}}));
}

TEST_F(QuiltDocumentJukeboxTest, AnEmptyAuthorOfTheDocumentCountsAndOneOfTheCollectionDoesNot) {
  document()->setAuthor("");
  const auto owner = collection("All tales", "");
  const Dictionary metadata = metadataOf(*document());
  EXPECT_EQ(metadata.string("artistName"), "");
  EXPECT_EQ(metadata.string("sort-artist"), "");
  EXPECT_EQ(*metadata.find("sort-artist-status"), platform::PropertyList(1));
  for (const char* key : {"playlistArtistName", "sort-album-artist", "sort-album-artist-status"})
    EXPECT_FALSE(metadata.contains(key)) << key;
}

TEST_F(QuiltDocumentJukeboxTest, EmptyTextsOfTheDocumentAreKept) {
  document()->setTitle("");
  document()->setDescription("");
  const auto owner = collection("", std::nullopt);
  const Dictionary metadata = metadataOf(*document());
  for (const char* key : {"itemName", "sort-name", "description", "longDescription", "playlistName", "sort-album"})
    EXPECT_EQ(metadata.string(key), "") << key;
}

TEST_F(QuiltDocumentJukeboxTest, ACollectionWithoutATitleGetsTheFallBack) {
  const auto owner = collection(std::nullopt, "Anthology");
  EXPECT_EQ(metadataOf(*document()).string("playlistName"), "Untitled Podcast");
}

TEST_F(QuiltDocumentJukeboxTest, TheStatusValuesAreIntegersAndThePodcastFlagIsABoolean) {
  document()->setAuthor("Ann");
  const auto owner = collection("All tales", "Anthology");
  const Dictionary metadata = metadataOf(*document());
  for (const char* key : {"sort-artist-status", "sort-album-artist-status", "sort-name-status", "sort-album-status"}) {
    ASSERT_NE(metadata.find(key)->as<std::int64_t>(), nullptr) << key;
    EXPECT_EQ(*metadata.find(key)->as<std::int64_t>(), 1) << key;
  }
  ASSERT_NE(metadata.find("is-podcast")->as<bool>(), nullptr);
  EXPECT_TRUE(*metadata.find("is-podcast")->as<bool>());
}

TEST_F(QuiltDocumentJukeboxTest, TheYearIsTheStoresWhateverTheUsersCalendarAndDigits) {
  document()->setModifiedDate(dateOf("2010-05-01T12:00:00Z"));
  for (const char* language : {"ar_EG", "th_TH", "fa_IR"}) {
    const ScopedService dates(&Services::dates, std::make_shared<platform::IcuDateFormatter>(language));
    EXPECT_EQ(*metadataOf(*document()).find("year"), platform::PropertyList(2010)) << language;
  }
}

TEST_F(QuiltDocumentJukeboxTest, TheFileIsThisToTheByte) {
  const auto interactive = made();
  interactive->setIsProcessing(true);
  interactive->setType(kQuiltDocumentTypeInteractive);
  interactive->setTitle("Tales <of> \"Ann\" & Bob");
  interactive->setAuthor("Ann");
  interactive->setTheme(QuiltTheme::initWithPath(themeBundle()));
  interactive->setModifiedDate(dateOf("2010-05-01T12:00:00Z"));
  interactive->setIsProcessing(false);
  ASSERT_TRUE(interactive->finalizeWithProgressionBlock({}));
  EXPECT_EQ(readFile(interactive->jukeboxMetadataPath()),
            R"(<?xml version="1.0" encoding="UTF-8"?>
<plist version="1.0">
<dict>
	<key>Metadata</key>
	<dict>
		<key>artistName</key>
		<string>Ann</string>
		<key>sort-artist</key>
		<string>Ann</string>
		<key>sort-artist-status</key>
		<integer>1</integer>
		<key>itemName</key>
		<string>Tales &lt;of&gt; "Ann" &amp; Bob</string>
		<key>sort-name</key>
		<string>Tales &lt;of&gt; "Ann" &amp; Bob</string>
		<key>sort-name-status</key>
		<integer>1</integer>
		<key>playlistName</key>
		<string>Untitled Podcast</string>
		<key>sort-album</key>
		<string>Untitled Podcast</string>
		<key>sort-album-status</key>
		<integer>1</integer>
		<key>releaseDate</key>
		<string>2010-05-01 12:00:00 +0000</string>
		<key>year</key>
		<integer>2010</integer>
		<key>genre</key>
		<string>Podcast</string>
		<key>kind</key>
		<string>podcast</string>
		<key>is-podcast</key>
		<true/>
	</dict>
</dict>
</plist>
)");
  EXPECT_THAT(support::entriesByPython(interactive->jukeboxMetadataPath()),
              ElementsAre(::testing::StartsWith("Metadata dict")));
}

}  // namespace
}  // namespace quilt
