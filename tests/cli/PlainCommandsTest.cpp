// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "cli/Options.h"
#include "cli/version.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

class PlainCommandsTest : public QuiltProgramTest {};

// info

TEST_F(PlainCommandsTest, InfoCarriesAllThatTheLibrarySees) {
  MediaSpec spec;
  spec.tags = {{"title", "A talk"}, {"artist", "Ada"}};
  spec.chapters = {{"One", 0}, {"Two", 1}};
  const std::filesystem::path file = makeMedia(spec);
  const json seen = quiltJson({"info", file})["result"][0];
  EXPECT_EQ(file.string(), seen["path"]);
  EXPECT_EQ("public.mpeg-4", seen["contentType"]);
  EXPECT_EQ("video/mp4", seen["mimeType"]);
  EXPECT_EQ("Movie", seen["category"]);
  EXPECT_THAT(seen["tags"], Not(IsEmpty()));
  EXPECT_EQ(true, seen["importable"]);
  EXPECT_EQ(std::filesystem::file_size(file), seen["size"]);
  EXPECT_EQ("H.264", seen["videoCodec"]);
  EXPECT_EQ("AAC", seen["audioCodec"]);
  EXPECT_EQ(320, seen["width"]);
  EXPECT_EQ(240, seen["height"]);
  EXPECT_NEAR(2, seen["duration"].get<double>(), 0.2);
  EXPECT_EQ("A talk", seen["title"]);
  EXPECT_EQ("Ada", seen["author"]);
  ASSERT_THAT(seen["chapters"], SizeIs(2));
  EXPECT_EQ("Two", seen["chapters"][1]["title"]);
  EXPECT_NEAR(1, seen["chapters"][1]["start"].get<double>(), 0.05);

  const Ended run = quilt({"info", file});
  EXPECT_THAT(run.out, HasSubstr("320 × 240"));
  EXPECT_THAT(run.out, HasSubstr("0:01    Two"));
  EXPECT_FALSE(std::filesystem::exists(library()));
}

TEST_F(PlainCommandsTest, InfoCountsThePagesOfDocuments) {
  const std::filesystem::path pdf = folder() / "a.pdf";
  write(pdf, makePages(3));
  makeBook(folder() / "a.epub", {"<h1>Loomings</h1>", "<h1>The Carpet-Bag</h1>"});
  const json seen = quiltJson({"info", pdf, folder() / "a.epub", makeMedia(m4aSound())})["result"];
  EXPECT_EQ(3, seen[0]["pages"]);
  EXPECT_EQ(2, seen[1]["pages"]);
  EXPECT_TRUE(seen[2]["pages"].is_null());
  const Ended run = quilt({"info", folder() / "a.epub"});
  EXPECT_THAT(run.out, HasSubstr("  Pages      2\n"));
}

TEST_F(PlainCommandsTest, InfoSaysWhyAFileCannotBeUsed) {
  write(folder() / "notes.xyz", "words");
  const json document = quiltJson({"info", folder() / "notes.xyz"}, 4);
  EXPECT_EQ("invalid", document["error"]["code"]);
  EXPECT_THAT(document["error"]["message"].get<std::string>(), HasSubstr("Cannot use \""));
  EXPECT_EQ(3, quilt({"info", folder() / "missing.mp4"}).exit);
  EXPECT_EQ(4, quilt({"info", folder()}).exit);
}

TEST_F(PlainCommandsTest, InfoOfSeveralDoesTheRest) {
  const json document = quiltJson({"info", folder() / "missing.mp4", makeMedia(m4aSound())}, 5);
  ASSERT_THAT(document["result"], SizeIs(1));
  EXPECT_EQ("Audio", document["result"][0]["category"]);
  EXPECT_EQ("not-found", document["error"]["causes"][0]["code"]);
}

TEST_F(PlainCommandsTest, InfoSeesEveryMediumOfTheCorpusOrSaysWhyNot) {
  const std::filesystem::path corpus = QUILT_MEDIA_FOLDER;
  if (!std::filesystem::is_directory(corpus)) GTEST_SKIP() << "the media corpus is not on this machine";
  std::vector<std::string> arguments{"info"};
  for (const auto& entry : std::filesystem::directory_iterator(corpus))
    if (entry.is_regular_file() && !entry.path().filename().string().starts_with("INDEX"))
      arguments.push_back(entry.path());
  const json document = quiltJson(arguments, 5);  // the corpus has damaged files
  EXPECT_EQ(arguments.size() - 1, document["result"].size() + document["error"]["causes"].size());
  for (const json& cause : document["error"]["causes"]) {
    const std::string name = std::filesystem::path(cause["path"].get<std::string>()).filename();
    EXPECT_EQ("invalid", cause["code"]) << name;
    EXPECT_THAT(cause["message"].get<std::string>(), HasSubstr(name));
  }
}

// doctor

TEST_F(PlainCommandsTest, DoctorListsCapabilitiesWithVersionsOrRemedies) {
  const json found = quiltJson({"doctor"})["result"];
  std::size_t capabilities = 0;
  for (const json& row : found) {
    EXPECT_FALSE(row["name"].get<std::string>().empty());
    if (row["type"] != "capability") continue;
    ++capabilities;
    if (!row["present"].get<bool>()) {
      EXPECT_NE("", row["remedy"]) << row["name"];
    }
  }
  EXPECT_GT(capabilities, 0U);
  EXPECT_THAT(quilt({"doctor"}).out, HasSubstr(found[0]["name"].get<std::string>()));
}

// help and version

TEST_F(PlainCommandsTest, HelpListsTheCommandsThatAreThere) {
  const Ended run = quilt({"help"});
  EXPECT_EQ(0, run.exit);
  for (const cli::CommandDescription& command : cli::commands()) {
    EXPECT_THAT(run.out, HasSubstr("\n  " + std::string(command.name) + " "));
    const Ended own = quilt({"help", std::string(command.name)});
    EXPECT_EQ(0, own.exit);
    EXPECT_THAT(own.out, HasSubstr(cli::usageOf(command)));
    EXPECT_EQ(own.out, quilt({std::string(command.name), "--help"}).out);
  }
  EXPECT_EQ(run.out, quilt({"--help"}).out);
  EXPECT_EQ(2, quilt({"help", "frobnicate"}).exit);
}

TEST_F(PlainCommandsTest, CommandsThatAreNotThereAreUsageErrors) {
  for (const char* name : {"frobnicate", "Import", "lis"}) EXPECT_EQ(2, quilt({name}).exit) << name;
  const json document = quiltJson({"frobnicate"}, 2);
  EXPECT_EQ("usage", document["error"]["code"]);
  EXPECT_EQ(2, quilt({}).exit);
}

TEST_F(PlainCommandsTest, TheVersionIsPrinted) {
  EXPECT_EQ(std::string("quilt ") + cli::version() + "\n", quilt({"--version"}).out);
  EXPECT_EQ(cli::version(), quiltJson({"--version"})["result"]["version"]);
}

// The library's place

TEST_F(PlainCommandsTest, TheEnvironmentNamesTheLibrary) {
  const auto run = [&](const std::vector<std::string>& arguments) {
    return RunningProgram(arguments, environment, "").wait();
  };
  environment["HOME"] = folder() / "home";
  EXPECT_EQ(0, run({"new", "collection", "Home"}).exit);
  EXPECT_TRUE(std::filesystem::exists(folder() / "home/.local/share/quilt/Library/Collections"));
  environment["XDG_DATA_HOME"] = folder() / "data";
  EXPECT_EQ(0, run({"new", "collection", "Data"}).exit);
  EXPECT_TRUE(std::filesystem::exists(folder() / "data/quilt/Library/Collections"));
  environment["QUILT_LIBRARY"] = folder() / "named";
  EXPECT_EQ(0, run({"new", "collection", "Named"}).exit);
  EXPECT_TRUE(std::filesystem::exists(folder() / "named/Collections"));
  EXPECT_EQ(0, run({"new", "collection", "Option", "--library", folder() / "option"}).exit);
  EXPECT_TRUE(std::filesystem::exists(folder() / "option/Collections"));
  EXPECT_THAT(run({"list"}).out, HasSubstr("Named"));
}

TEST_F(PlainCommandsTest, VerbosePrintsWhatTheLibraryLogsAndQuietNothing) {
  ASSERT_EQ(0, quilt({"new", "collection", "Talks"}).exit);
  EXPECT_EQ("", quilt({"new", "document", "A", "--collection", "Talks", "--quiet"}).err);
  EXPECT_THAT(quilt({"new", "document", "B", "--collection", "Talks", "--verbose"}).err,
              HasSubstr("debug: Created new document at"));
}

}  // namespace
}  // namespace quilt::support
