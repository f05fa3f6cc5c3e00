// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

class LibraryCommandsTest : public QuiltProgramTest {
 protected:
  std::string newCollection(const std::string& title) const {
    return quiltJson({"new", "collection", "--", title})["result"]["uuid"];
  }
  std::string newDocument(const std::string& title, const std::string& collection = "") const {
    std::vector<std::string> arguments{"new", "document", title, "--type", "Static"};
    if (!collection.empty()) arguments.insert(arguments.end(), {"--collection", collection});
    return quiltJson(arguments)["result"]["uuid"];
  }
  /// A document with one item; its UUID.
  std::string importMovie(const std::string& name) const {
    MediaSpec spec;
    spec.duration = 1;
    const std::filesystem::path file = folder() / name;
    std::filesystem::copy_file(makeMedia(spec), file);
    return quiltJson({"import", file})["result"][0]["uuid"];
  }
  json shown(const std::string& object) const { return quiltJson({"show", object})["result"]; }
  std::string itemOf(const std::string& document) const { return shown(document)["Media"][0]["UUID"]; }
};

// new

using NewCommandTest = LibraryCommandsTest;

TEST_F(NewCommandTest, PrintsTheUuidOfACollection) {
  const Ended run = quilt({"new", "collection", "Talks"});
  EXPECT_EQ(0, run.exit) << run.err;
  ASSERT_THAT(run.out, SizeIs(37));
  const json collection = shown(run.out.substr(0, 36));
  EXPECT_EQ("Talks", collection["Title"]);
  EXPECT_EQ(collection["UUID"], std::filesystem::path(collection["path"].get<std::string>()).filename().string());
}

TEST_F(NewCommandTest, PutsADocumentIntoItsCollection) {
  const std::string talks = newCollection("Talks");
  const json made = quiltJson({"new", "document", "A talk", "--collection", "Talks", "--type", "PDF"})["result"];
  const json document = shown("A talk");
  EXPECT_EQ(made["uuid"], document["UUID"]);
  EXPECT_EQ("PDF", document["Type"]);
  EXPECT_EQ(talks, document["collection"]["uuid"]);
}

TEST_F(NewCommandTest, PutsADocumentWithoutACollectionIntoImports) {
  newDocument("One");
  newDocument("Two");
  const json collections = quiltJson({"list"})["result"];
  ASSERT_THAT(collections, SizeIs(1));
  EXPECT_EQ("Imports", collections[0]["title"]);
  EXPECT_THAT(collections[0]["documents"], SizeIs(2));
}

TEST_F(NewCommandTest, IsInteractiveWhenNoTypeIsNamed) {
  EXPECT_EQ("Interactive", quiltJson({"new", "document", "A talk"})["result"]["type"]);
  EXPECT_EQ(2, quilt({"new", "document", "A talk", "--type", "Movie"}).exit);
}

TEST_F(NewCommandTest, ADryRunMakesNothing) {
  EXPECT_THAT(quilt({"new", "collection", "Talks", "--dry-run"}).out, HasSubstr("Would make the collection \"Talks\""));
  EXPECT_THAT(quilt({"new", "document", "A talk", "--dry-run"}).out, HasSubstr("in the new collection \"Imports\""));
  EXPECT_FALSE(std::filesystem::exists(library()));
}

TEST_F(NewCommandTest, ALibraryThatIsAFileIsRefused) {
  write(library(), "a file");
  EXPECT_EQ(4, quilt({"list"}).exit);
  const Ended run = quilt({"new", "collection", "Talks"});
  EXPECT_NE(0, run.exit);
  EXPECT_THAT(run.err, HasSubstr(library().string()));
  EXPECT_EQ("a file", read(library()));
}

// list

using ListCommandTest = LibraryCommandsTest;

TEST_F(ListCommandTest, ALibraryThatIsNotThereIsEmptyAndIsNotMade) {
  const Ended run = quilt({"list"});
  EXPECT_EQ(0, run.exit);
  EXPECT_EQ("", run.out);
  EXPECT_THAT(quiltJson({"list"})["result"], IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(library()));
}

TEST_F(ListCommandTest, PrintsATree) {
  const std::string collection = newCollection("Talks");
  const std::string one = newDocument("One", "Talks");
  const std::string two = newDocument("Two", "Talks");
  const std::string out = quilt({"list"}).out;
  EXPECT_THAT(out, HasSubstr("Talks  " + collection + "\n"));
  EXPECT_THAT(out, HasSubstr("├─ "));
  EXPECT_THAT(out, HasSubstr("└─ "));
  EXPECT_THAT(out, HasSubstr(one + "  Static       One\n"));
  EXPECT_THAT(out, HasSubstr(two + "  Static       Two\n"));
}

TEST_F(ListCommandTest, CanBeLimitedToOneCollection) {
  newCollection("Walks");
  newDocument("One", "Walks");
  newCollection("Talks");
  const json collections = quiltJson({"list", "Talks"})["result"];
  ASSERT_THAT(collections, SizeIs(1));
  EXPECT_EQ("Talks", collections[0]["title"]);
  EXPECT_EQ(3, quilt({"list", "Nowhere"}).exit);
}

TEST_F(ListCommandTest, NamesWhatIsDamaged) {
  newDocument("One");
  const json document = quiltJson({"list"})["result"][0]["documents"][0];
  write(std::filesystem::path(document["path"].get<std::string>()) / "properties.plist", "<plist><dict>");
  const json damaged = quiltJson({"list"})["result"][0]["documents"][0];
  EXPECT_THAT(damaged["damage"].get<std::string>(), Not(IsEmpty()));
  EXPECT_THAT(quilt({"list"}).out, HasSubstr("damaged: "));
  EXPECT_EQ(4, quilt({"show", damaged["path"]}).exit);
}

// Commands that read

TEST_F(LibraryCommandsTest, ReadingChangesNothing) {
  importMovie("a.mp4");
  newDocument("Empty");
  // Opening this one would delete it: a classic document without media.
  const std::filesystem::path collection = quiltJson({"list"})["result"][0]["path"].get<std::string>();
  write(collection / "B.qpk/properties.plist",
        "<?xml version=\"1.0\" encoding=\"UTF-8\"?><plist version=\"1.0\"><dict><key>Version</key><string>1.0</string>"
        "<key>Type</key><string>Movie</string><key>Title</key><string>Bare</string></dict></plist>");
  const auto before = snapshot(library());
  const std::vector<std::vector<std::string>> commands{
      {"list"},   {"list", "Imports"},          {"show", "a"}, {"show", "Imports"}, {"show", "Bare"},
      {"doctor"}, {"info", folder() / "a.mp4"}, {"help"},      {"--version"},       {"show", "nothing"}};
  for (const auto& command : commands) {
    quilt(command);
    EXPECT_EQ(before, snapshot(library())) << command.front();
  }
}

// Names of objects

using LookupTest = LibraryCommandsTest;

TEST_F(LookupTest, AnObjectIsNamedByUuidPrefixTitleOrPath) {
  const std::string uuid = newDocument("A talk");
  const std::string path = shown("A talk")["path"];
  const std::string filename = std::filesystem::path(path).filename();
  std::string lower = uuid;
  for (char& letter : lower) letter = static_cast<char>(std::tolower(static_cast<unsigned char>(letter)));
  for (const std::string& name : {uuid, lower, uuid.substr(0, 30), path, path + "/", path + "/../" + filename})
    EXPECT_EQ(uuid, shown(name)["uuid"]) << name;
}

TEST_F(LookupTest, WhatIsNotThereIsNotFound) {
  newDocument("A talk");
  const json document = quiltJson({"show", "Another talk"}, 3);
  EXPECT_EQ("not-found", document["error"]["code"]);
  EXPECT_THAT(document["error"]["message"].get<std::string>(), HasSubstr("\"Another talk\""));
  EXPECT_EQ(2, quilt({"show", ""}).exit);
}

TEST_F(LookupTest, WhatMayBeSeveralIsAUsageErrorThatNamesThem) {
  const std::string one = newDocument("Twice");
  const std::string two = newDocument("Twice");
  const json document = quiltJson({"show", "Twice"}, 2);
  ASSERT_THAT(document["error"]["candidates"], SizeIs(2));
  EXPECT_THAT(document["error"]["candidates"].dump(), ::testing::AllOf(HasSubstr(one), HasSubstr(two)));
  const Ended run = quilt({"remove", "Twice", "--force"});
  EXPECT_EQ(2, run.exit);
  EXPECT_THAT(run.err, HasSubstr(two));
  EXPECT_THAT(quiltJson({"list"})["result"][0]["documents"], SizeIs(2));
}

// show

using ShowCommandTest = LibraryCommandsTest;

TEST_F(ShowCommandTest, CarriesTheWholeRecordOfADocument) {
  const std::string uuid = importMovie("opening.mp4");
  const json document = shown(uuid);
  EXPECT_EQ(uuid, document["uuid"]);
  EXPECT_EQ("opening", document["title"]);
  EXPECT_EQ("Movie", document["type"]);
  EXPECT_EQ("1.0", document["Version"]);
  EXPECT_EQ(uuid, document["UUID"]);
  EXPECT_THAT(document["CreationDate"].get<std::string>(), ::testing::MatchesRegex("....-..-..T..:..:..Z"));
  ASSERT_THAT(document["Media"], SizeIs(1));
  EXPECT_EQ("Movie", document["Media"][0]["ContentCategory"]);
  EXPECT_EQ("public.mpeg-4", document["Media"][0]["Sources"][0]["Derivatives"][0]["ContentType"]);
  EXPECT_EQ(true, document["IsFlattened"]);
}

TEST_F(ShowCommandTest, SummarisesForPeople) {
  importMovie("opening.mp4");
  quilt({"set", "opening", "author=Ada", "description=Two\nlines"});
  const Ended run = quilt({"show", "opening"});
  EXPECT_EQ(0, run.exit);
  EXPECT_THAT(run.out, HasSubstr("Author       Ada\n"));
  EXPECT_THAT(run.out, HasSubstr("Two\\nlines"));
  EXPECT_THAT(run.out, HasSubstr("320 × 240"));
}

TEST_F(ShowCommandTest, ShowsACollectionWithItsDocuments) {
  newCollection("Talks");
  const std::string one = newDocument("One", "Talks");
  const json collection = shown("Talks");
  EXPECT_EQ("Collection", collection["type"]);
  EXPECT_EQ("Talks", collection["Title"]);
  EXPECT_EQ(one, collection["documents"][0]["uuid"]);
}

TEST_F(ShowCommandTest, ShowsAPackageOutsideTheLibrary) {
  newDocument("One");
  std::filesystem::copy(shown("One")["path"].get<std::string>(), folder() / "other.qpk",
                        std::filesystem::copy_options::recursive);
  quilt({"remove", "One", "--force"});
  EXPECT_EQ("One", shown(folder() / "other.qpk")["Title"]);
}

// set

using SetCommandTest = LibraryCommandsTest;

TEST_F(SetCommandTest, ChangesADocumentAndPrintsNothing) {
  newDocument("One");
  const Ended run = quilt({"set", "One", "title=Two", "description=D", "author=A=B", "keywords=k, l", "category=c",
                           "advisoryLabel=x", "jukeboxOrder=-7"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_EQ("", run.out);
  const json document = shown("Two");
  EXPECT_EQ("D", document["Description"]);
  EXPECT_EQ("A=B", document["Author"]);
  EXPECT_EQ("k, l", document["Keywords"]);
  EXPECT_EQ("c", document["Category"]);
  EXPECT_EQ("x", document["AdvisoryLabel"]);
  EXPECT_EQ(-7, document["jukeboxOrder"]);
}

TEST_F(SetCommandTest, AnEmptyValueClears) {
  newDocument("One");
  quilt({"set", "One", "author=A", "jukeboxOrder=3"});
  EXPECT_EQ(0, quilt({"set", "One", "author=", "jukeboxOrder="}).exit);
  EXPECT_FALSE(shown("One").contains("Author"));
  EXPECT_EQ(0, shown("One")["jukeboxOrder"]);
}

TEST_F(SetCommandTest, ChangesACollection) {
  newCollection("Talks");
  EXPECT_EQ(0, quilt({"set", "Talks", "copyright=© Ada", "author=Ada"}).exit);
  EXPECT_EQ("© Ada", shown("Talks")["Copyright"]);
  newDocument("One", "Talks");
  EXPECT_EQ("Ada", shown("One")["Author"]);
}

TEST_F(SetCommandTest, ChangesAnItem) {
  const std::string item = itemOf(importMovie("a.mp4"));
  const json result = quiltJson({"set", item.substr(0, 20), "title=Opening", "description=First"})["result"];
  EXPECT_EQ(item, result["uuid"]);
  EXPECT_EQ("Movie", result["category"]);
  EXPECT_EQ("Opening", shown("a")["Media"][0]["Title"]);
  EXPECT_EQ("First", shown("a")["Media"][0]["Description"]);
}

TEST_F(SetCommandTest, SetsAndClearsAPoster) {
  newDocument("One");
  newCollection("Talks");
  writeFile(folder() / "cover.png", encode(quadrants(64, 48), {.suffix = ".png"}));
  write(folder() / "no.png", "no picture");
  for (const char* object : {"One", "Talks"}) {
    const std::filesystem::path poster = std::filesystem::path(shown(object)["path"].get<std::string>()) / "poster.png";
    EXPECT_EQ(0, quilt({"set", object, "poster=" + (folder() / "cover.png").string()}).exit);
    EXPECT_THAT(read(poster), ::testing::StartsWith("\x89PNG"));
    EXPECT_EQ(4, quilt({"set", object, "poster=" + (folder() / "no.png").string()}).exit);
    EXPECT_EQ(3, quilt({"set", object, "poster=/missing.png"}).exit);
    EXPECT_TRUE(std::filesystem::exists(poster));
    EXPECT_EQ(0, quilt({"set", object, "poster="}).exit);
    EXPECT_FALSE(std::filesystem::exists(poster));
  }
}

TEST_F(SetCommandTest, ChangesNothingUnlessEverythingCanBe) {
  newDocument("One");
  newCollection("Talks");
  const std::string item = itemOf(importMovie("a.mp4"));
  const auto before = snapshot(library());
  EXPECT_EQ(2, quilt({"set", "One", "title=Two", "copyright=x"}).exit);  // of a collection only
  EXPECT_EQ(2, quilt({"set", "Talks", "title=Two", "jukeboxOrder=1"}).exit);
  EXPECT_EQ(2, quilt({"set", item, "title=Two", "author=x"}).exit);
  EXPECT_EQ(2, quilt({"set", "One", "title=Two", "jukeboxOrder=1.5"}).exit);
  EXPECT_EQ(2, quilt({"set", "One", "title=Two", "nonsense=1"}).exit);
  EXPECT_EQ(3, quilt({"set", "One", "title=Two", "theme=org.example.nowhere"}).exit);
  EXPECT_EQ(3, quilt({"set", "Nobody", "title=Two"}).exit);
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(SetCommandTest, ADryRunPrintsThePlanAndChangesNothing) {
  newDocument("One");
  const auto before = snapshot(library());
  const Ended run = quilt({"set", "One", "title=Two", "author=", "--dry-run"});
  EXPECT_EQ(0, run.exit);
  EXPECT_THAT(run.out, HasSubstr("Would set title of the document \"One\" to \"Two\""));
  EXPECT_THAT(run.out, HasSubstr("Would clear author"));
  EXPECT_EQ(before, snapshot(library()));
}

// remove

using RemoveCommandTest = LibraryCommandsTest;

TEST_F(RemoveCommandTest, NeedsForceWithoutATerminal) {
  newDocument("One");
  const auto before = snapshot(library());
  const Ended run = quilt({"remove", "One"}, "y\n");
  EXPECT_EQ(2, run.exit);
  EXPECT_THAT(run.err, HasSubstr("needs --force"));
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(RemoveCommandTest, RemovesADocumentWithItsFiles) {
  const std::string uuid = importMovie("a.mp4");
  const std::filesystem::path package = shown(uuid)["path"].get<std::string>();
  newDocument("Other");
  EXPECT_EQ(0, quilt({"remove", uuid, "--force"}).exit);
  EXPECT_FALSE(std::filesystem::exists(package));
  EXPECT_THAT(quiltJson({"list"})["result"][0]["documents"], SizeIs(1));
}

TEST_F(RemoveCommandTest, RemovesACollectionWithItsDocuments) {
  newCollection("Talks");
  newDocument("One", "Talks");
  const std::filesystem::path path = shown("Talks")["path"].get<std::string>();
  EXPECT_EQ(0, quilt({"remove", "Talks", "--force"}).exit);
  EXPECT_FALSE(std::filesystem::exists(path));
  EXPECT_THAT(quiltJson({"list"})["result"], IsEmpty());
}

TEST_F(RemoveCommandTest, RemovesAnItemOfADocument) {
  const std::string document = importMovie("a.mp4");
  const std::string item = itemOf(document);
  const std::filesystem::path package = shown(document)["path"].get<std::string>();
  ASSERT_TRUE(std::filesystem::exists(package / "media" / item));
  const auto before = snapshot(library());
  EXPECT_EQ(3, quilt({"remove", item, "nothing", "--from", document, "--force"}).exit);
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_EQ(0, quilt({"remove", item, item, "--from", document, "--force"}).exit);
  EXPECT_FALSE(std::filesystem::exists(package / "media" / item));
  EXPECT_TRUE(std::filesystem::exists(package / "properties.plist"));
  EXPECT_EQ(std::string::npos, read(package / "properties.plist").find(item));
}

TEST_F(RemoveCommandTest, RemovesWhatIsDamaged) {
  newDocument("One");
  const std::filesystem::path package = shown("One")["path"].get<std::string>();
  write(package / "properties.plist", "nonsense");
  EXPECT_EQ(0, quilt({"remove", package, "--force"}).exit);
  EXPECT_FALSE(std::filesystem::exists(package));
}

TEST_F(RemoveCommandTest, ADryRunNeedsNoForceAndRemovesNothing) {
  newDocument("One");
  const auto before = snapshot(library());
  EXPECT_THAT(quilt({"remove", "Imports", "--dry-run"}).out,
              HasSubstr("Would remove the collection \"Imports\" with 1 document"));
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(RemoveCommandTest, NothingOutsideTheLibraryIsRemoved) {
  newDocument("One");
  std::filesystem::copy(shown("One")["path"].get<std::string>(), folder() / "other.qpk",
                        std::filesystem::copy_options::recursive);
  EXPECT_EQ(3, quilt({"remove", folder() / "other.qpk", "--force"}).exit);
  EXPECT_TRUE(std::filesystem::exists(folder() / "other.qpk/properties.plist"));
}

}  // namespace
}  // namespace quilt::support
