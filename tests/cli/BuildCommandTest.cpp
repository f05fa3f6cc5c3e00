// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <csignal>

#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/Program.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

namespace fs = std::filesystem;
using nlohmann::json;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

/// Builds packages in "out" from a manifest beside its files, with the plain theme installed as the default one.
class BuildCommandTest : public QuiltProgramTest {
 protected:
  BuildCommandTest() {
    environment["XDG_DATA_HOME"] = data();
    environment["XDG_DATA_DIRS"] = "/nonexistent";
    fs::create_directories(data() / "quilt/Themes");
    fs::copy(plainTheme(), data() / "quilt/Themes/first.qth", fs::copy_options::recursive);
    std::string info = read(data() / "quilt/Themes/first.qth/Info.plist");
    info.replace(info.find("org.quilt.theme.plain"), 21, "org.quilt.theme.olive");
    write(data() / "quilt/Themes/first.qth/Info.plist", info);
  }

  fs::path data() const { return folder() / "data"; }
  fs::path out() const { return folder() / "made/out"; }
  static fs::path plainTheme() { return fs::path(QUILT_SOURCE_FOLDER) / "examples/themes/plain.qth"; }

  fs::path movie(const std::string& name) const { return copied(makeMedia({.duration = 1}), name); }
  fs::path sound(const std::string& name) const {
    MediaSpec spec = m4aSound();
    spec.duration = 1;
    return copied(makeMedia(spec), name);
  }
  fs::path image(const std::string& name, std::size_t width = 64) const {
    fs::create_directories((folder() / name).parent_path());
    return writeFile(folder() / name, encode(quadrants(width, 48), {.suffix = ".jpg"}));
  }
  fs::path pdf(const std::string& name) const {
    std::vector<std::string> objects = onePage("/MediaBox [0 0 100 200]");
    write(folder() / name, makePdf(objects));
    return folder() / name;
  }
  fs::path copied(const fs::path& file, const std::string& name) const {
    fs::copy_file(file, folder() / name);
    return folder() / name;
  }

  fs::path manifest(const json& content) const {
    write(folder() / "talk.json", content.dump(2));
    return folder() / "talk.json";
  }
  static json linkOnly() { return {{"title", "A talk"}, {"media", {{{"source", "https://example.org/"}}}}}; }

  /// Runs without a library of its own.
  Ended runBuild(const Arguments& arguments) const {
    Arguments all{"build"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    return RunningProgram(all, environment, "").wait();
  }
  Ended build(const json& content) const { return runBuild({manifest(content), "--output", out()}); }
  json buildJson(const json& content, int expectedExit) const {
    const Ended run = runBuild({manifest(content), "--output", out(), "--json"});
    EXPECT_EQ(expectedExit, run.exit) << run.out << run.err;
    return run.json();
  }
  /// The places of all problems in a refused manifest.
  std::vector<std::string> placesOf(const json& content, int expectedExit) const {
    const json error = buildJson(content, expectedExit)["error"];
    std::vector<std::string> places;
    if (error.contains("place")) places.push_back(error["place"]);
    if (error.contains("causes"))
      for (const json& cause : error["causes"]) places.push_back(cause["place"]);
    EXPECT_FALSE(fs::exists(folder() / "made")) << "nothing is exported";
    return places;
  }

  static json dataOf(const fs::path& package) {
    const std::string script = read(package / "controllers/data.js");
    EXPECT_THAT(script, ::testing::StartsWith("var appData = "));
    return json::parse(script.substr(14, script.size() - 15));
  }
  static std::vector<std::string> namesIn(const fs::path& in) {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(in)) names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }
};

TEST_F(BuildCommandTest, MakesAPackageWithAnItemOfEveryCategory) {
  movie("opening.mp4");
  movie("speaker.mp4");
  movie("slides.mp4");
  sound("voice.m4a");
  image("a.jpg");
  image("b.jpg");
  image("cover.jpg");
  pdf("paper.pdf");
  const json content{
      {"title", "A talk"},
      {"author", "Ann"},
      {"description", "All of it"},
      {"keywords", "one, two"},
      {"category", "Talks"},
      {"poster", "cover.jpg"},
      {"collection", {{"title", "Autumn school"}, {"author", "The school"}, {"description", "Each year"}}},
      {"media",
       {{{"source", "opening.mp4"},
         {"title", "Opening"},
         {"description", "First"},
         {"extras", {"paper.pdf"}},
         {"commentary", "voice.m4a"}},
        {{"source", "voice.m4a"}},
        {{"source", "a.jpg"}},
        {{"source", "paper.pdf"}, {"title", "Paper"}},
        {{"category", "DualSource"}, {"title", "Lecture"}, {"sources", {"speaker.mp4", "slides.mp4"}}},
        {{"category", "Montage"},
         {"title", "Walk"},
         {"commentary", "voice.m4a"},
         {"sources",
          {{{"file", "a.jpg"}, {"timecode", 0}}, {{"file", "b.jpg"}, {"timecode", 0.5}, {"title", "The gate"}}}}},
        {{"source", "https://example.org/"}, {"title", "Read more"}}}}};
  const Ended run = build(content);
  ASSERT_EQ(0, run.exit) << run.err;
  EXPECT_EQ((out() / "A talk.qpk").string() + "\n", run.out);
  EXPECT_THAT(namesIn(out()), ElementsAre("A talk.qpk")) << "nothing else is left";

  const fs::path package = out() / "A talk.qpk";
  EXPECT_THAT(namesIn(package),
              ElementsAre("Glance", "JukeboxArtwork", "JukeboxMetadata.plist", "controllers", "index.html", "media",
                          "plain.css", "plain.js", "poster.png", "properties.plist"));
  const json data = dataOf(package);
  EXPECT_EQ("A talk", data["Title"]);
  EXPECT_EQ("Ann", data["Author"]);
  EXPECT_EQ("All of it", data["Description"]);
  EXPECT_EQ("one, two", data["Keywords"]);
  EXPECT_EQ("Talks", data["Category"]);
  EXPECT_EQ("Interactive", data["Type"]);
  EXPECT_EQ("Autumn school", data["CollectionOwner"]["Title"]);
  EXPECT_EQ("Each year", data["CollectionOwner"]["Description"]);
  std::vector<std::string> items;
  for (const json& item : data["Media"])
    items.push_back(item["Title"].get<std::string>() + " " + item["ContentCategory"].get<std::string>());
  EXPECT_THAT(items, ElementsAre("Opening Movie", "voice Audio", "a Image", "Paper Document", "Lecture DualSource",
                                 "Walk Montage", "Read more Web"));
  const json& opening = data["Media"][0];
  EXPECT_EQ("First", opening["Description"]);
  EXPECT_THAT(opening["Extras"], SizeIs(1));
  EXPECT_TRUE(fs::exists(package / opening["AudioCommentarySource"]["Derivatives"][0]["RelativePath"]));
  const json& walk = data["Media"][5]["Sources"];
  EXPECT_EQ(0, walk[0]["Timecode"]);
  EXPECT_EQ(0.5, walk[1]["Timecode"]);
  EXPECT_EQ("The gate", walk[1]["Title"]);
  for (const json& item : data["Media"])
    for (const json& source : item["Sources"])
      for (const json& derivative : source["Derivatives"])
        if (source["ContentCategory"] != "Web") {
          EXPECT_TRUE(fs::exists(package / derivative["RelativePath"])) << derivative;
        }
}

TEST_F(BuildCommandTest, WritesAnArchive) {
  const Ended run = runBuild({manifest(linkOnly()), "--output", out(), "--zip"});
  ASSERT_EQ(0, run.exit) << run.err;
  EXPECT_EQ((out() / "A talk.qpk.zip").string() + "\n", run.out);
  EXPECT_THAT(namesIn(out()), ElementsAre("A talk.qpk.zip"));
  EXPECT_THAT(runProgram({"unzip", "-l", out() / "A talk.qpk.zip"}).output,
              HasSubstr("A talk.qpk/controllers/data.js"));
}

TEST_F(BuildCommandTest, BuildingTwiceGivesTwoPackages) {
  EXPECT_EQ(0, build(linkOnly()).exit);
  EXPECT_EQ((out() / "A talk-2.qpk").string() + "\n", build(linkOnly()).out);
}

TEST_F(BuildCommandTest, TheResultIsOneJsonDocument) {
  const json result = buildJson(linkOnly(), 0)["result"];
  EXPECT_EQ("A talk", result["title"]);
  EXPECT_EQ("Interactive", result["type"]);
  EXPECT_EQ((out() / "A talk.qpk").string(), result["path"]);
  EXPECT_EQ(json({"Desktop"}), result["formats"]);
  EXPECT_EQ(false, result["zip"]);
  EXPECT_EQ("org.quilt.theme.olive", result["theme"]);
  ASSERT_THAT(result["items"], SizeIs(1));
  EXPECT_EQ("Web", result["items"][0]["category"]);
  EXPECT_EQ(dataOf(out() / "A talk.qpk")["UUID"], result["uuid"]);
}

TEST_F(BuildCommandTest, NamesAreMeantFromTheManifestsFolder) {
  image("deep/er/a.jpg");
  write(folder() / "deep/talk.json", R"({"poster": "er/a.jpg", "media": [{"source": "er/a.jpg"}]})");
  EXPECT_EQ(0, runBuild({folder() / "deep/talk.json", "--output", out()}).exit);
}

TEST_F(BuildCommandTest, APackageWithoutATitleGetsTheFallBackName) {
  json content = linkOnly();
  content.erase("title");
  EXPECT_EQ((out() / "Untitled Episode.qpk").string() + "\n", build(content).out);
}

TEST_F(BuildCommandTest, WithoutACollectionThePackageBelongsToNone) {
  ASSERT_EQ(0, build(linkOnly()).exit);
  EXPECT_EQ(json::object(), dataOf(out() / "A talk.qpk")["CollectionOwner"]);
}

TEST_F(BuildCommandTest, HostileTitlesStayTexts) {
  json content = linkOnly();
  const std::string title = "</script><!-- \xE2\x80\xA8 ../x \"q\" $(y)";
  content["title"] = title;
  content["media"][0]["title"] = title;
  ASSERT_EQ(0, build(content).exit);
  EXPECT_THAT(namesIn(out()), SizeIs(1));
  const fs::path package = out() / namesIn(out()).front();
  EXPECT_EQ(title, dataOf(package)["Title"]);
  EXPECT_EQ(title, dataOf(package)["Media"][0]["Title"]);
  EXPECT_EQ(read(package / "controllers/data.js").find('<'), std::string::npos);
}

// The theme

TEST_F(BuildCommandTest, TheManifestsThemeIsTakenFromItsFolderAndTheOptionGoesBeforeIt) {
  fs::copy(plainTheme(), folder() / "mine.qth", fs::copy_options::recursive);
  write(folder() / "mine.qth/Resources/Template/mine.txt", "mine");
  json content = linkOnly();
  content["theme"] = "mine.qth";
  ASSERT_EQ(0, build(content).exit);
  EXPECT_TRUE(fs::exists(out() / "A talk.qpk/mine.txt"));
  ASSERT_EQ(0, runBuild({manifest(content), "--output", out(), "--theme", "org.quilt.theme.olive"}).exit);
  EXPECT_FALSE(fs::exists(out() / "A talk-2.qpk/mine.txt"));
}

TEST_F(BuildCommandTest, AThemeThatIsNotThereIsTold) {
  json content = linkOnly();
  content["theme"] = "org.example.nowhere";
  EXPECT_THAT(placesOf(content, 3), ElementsAre("theme"));
  EXPECT_EQ(3, runBuild({manifest(linkOnly()), "--output", out(), "--theme", "org.example.nowhere"}).exit);
  content["theme"] = ".";
  EXPECT_THAT(placesOf(content, 4), ElementsAre("theme"));
}

// Formats

TEST_F(BuildCommandTest, TheOptionsFormatsGoBeforeTheManifests) {
  json content = linkOnly();
  content["formats"] = {"720p", "480p"};
  EXPECT_EQ(json({"720p", "480p"}), buildJson(content, 0)["result"]["formats"]);
  const Ended run = runBuild({manifest(content), "--output", out(), "--json", "--format", "480p"});
  EXPECT_EQ(json({"480p"}), run.json()["result"]["formats"]);
}

// What is wrong

TEST_F(BuildCommandTest, EveryMissingOrUnsupportedFileIsToldWithItsPlace) {
  movie("movie.mp4");
  image("a.jpg");
  sound("voice.m4a");
  write(folder() / "notes.xyz", "nothing to show");
  write(folder() / "broken.mp4", "no movie");
  const json content{{"title", "A talk"},
                     {"poster", "notes.xyz"},
                     {"media",
                      {{{"source", "nowhere.mp4"}},
                       {{"source", "notes.xyz"}},
                       {{"source", "broken.mp4"}},
                       {{"source", "movie.mp4"}, {"extras", {"a.jpg", "nowhere.pdf"}}, {"commentary", "a.jpg"}},
                       {{"category", "Montage"}, {"sources", {{{"file", "a.jpg"}}, {{"file", "movie.mp4"}}}}},
                       {{"category", "DualSource"}, {"sources", {"movie.mp4", "a.jpg"}}},
                       {{"source", "javascript://x"}},
                       {{"source", "."}}}}};
  EXPECT_THAT(placesOf(content, 4), ElementsAre("poster", "media[0].source", "media[1].source", "media[2].source",
                                                "media[3].extras[1]", "media[3].commentary", "media[4].sources[1].file",
                                                "media[5].sources", "media[6].source", "media[7].source"));
  const Ended run = build(content);
  EXPECT_THAT(run.err,
              HasSubstr("The manifest \"talk.json\", at media[3].commentary: Cannot use \"a\" as a commentary"));
  EXPECT_THAT(run.err, HasSubstr("The manifest \"talk.json\" has 10 problems; nothing was exported"));
  EXPECT_EQ("", run.out);
}

TEST_F(BuildCommandTest, ADocumentWithoutPagesIsRefusedByTheNameThatTheAuthorGaveIt) {
  write(folder() / "empty.pdf", makePdf({"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [] /Count 0 >>"}));
  const Ended run =
      quilt({"build", manifest({{"title", "A talk"}, {"media", {{{"source", "empty.pdf"}}}}}), "--output", out()});
  EXPECT_EQ(4, run.exit);
  EXPECT_THAT(run.err, HasSubstr("at media[0].source: Cannot use \"empty.pdf\": The document is damaged"));
}

TEST_F(BuildCommandTest, AFileThatIsMissingIsNotFound) {
  EXPECT_THAT(placesOf({{"media", {{{"source", "nowhere.mp4"}}}}}, 3), ElementsAre("media[0].source"));
}

TEST_F(BuildCommandTest, AManifestThatIsWrongIsInvalid) {
  EXPECT_THAT(placesOf({{"media", {{{"source", 1}}}}}, 4), ElementsAre("media[0].source"));
  EXPECT_THAT(placesOf({{"titel", "T"}, {"media", json::array()}}, 4), ElementsAre("media", "titel"));
  write(folder() / "talk.json", "{");
  EXPECT_EQ(4, runBuild({folder() / "talk.json", "--output", out()}).exit);
  EXPECT_EQ(3, runBuild({folder() / "nowhere.json", "--output", out()}).exit);
  EXPECT_NE(0, runBuild({folder(), "--output", out()}).exit);
  EXPECT_FALSE(fs::exists(folder() / "made"));
}

TEST_F(BuildCommandTest, TheOutputMustBeNamedAndBeAFolder) {
  EXPECT_EQ(2, runBuild({manifest(linkOnly())}).exit);
  EXPECT_EQ(4, runBuild({manifest(linkOnly()), "--output", folder() / "talk.json"}).exit);
}

// Libraries

TEST_F(BuildCommandTest, WithALibraryTheDocumentIsKeptInItsCollection) {
  json content = linkOnly();
  content["collection"] = {{"title", "School"}, {"author", "The school"}};
  const Ended run = quilt({"build", manifest(content), "--output", out()});
  ASSERT_EQ(0, run.exit) << run.err;
  EXPECT_TRUE(fs::exists(out() / "A talk.qpk/index.html"));
  const json collection = quiltJson({"show", "School"})["result"];
  EXPECT_EQ("The school", collection["Author"]);
  const json document = quiltJson({"show", "A talk"})["result"];
  EXPECT_EQ("The school", document["Author"]) << "of the collection, when the manifest names none";
  EXPECT_THAT(document["Media"], SizeIs(1));
  // The second build goes into the same collection.
  EXPECT_EQ(0, quilt({"build", manifest(content), "--output", out()}).exit);
  const json list = quiltJson({"list"})["result"];
  ASSERT_THAT(list, SizeIs(1));
  EXPECT_THAT(list[0]["documents"], SizeIs(2));
  EXPECT_THAT(namesIn(out()), ElementsAre("A talk-2.qpk", "A talk.qpk"));
}

TEST_F(BuildCommandTest, AWrongManifestLeavesTheLibraryAlone) {
  quiltJson({"new", "document", "Other"});
  const auto before = snapshot(library());
  EXPECT_EQ(4, quilt({"build", manifest({{"media", {{{"source", 1}}}}}), "--output", out()}).exit);
  EXPECT_EQ(2, quilt({"build", manifest(linkOnly()), "--output", library() / "out"}).exit);
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(BuildCommandTest, WithoutALibraryNoneIsTouched) {
  environment["QUILT_LIBRARY"] = library();
  ASSERT_EQ(0, build(linkOnly()).exit);
  EXPECT_FALSE(fs::exists(library()));
  EXPECT_THAT(namesIn(data() / "quilt"), ElementsAre("Themes"));
}

// Dry runs, progress, stops

TEST_F(BuildCommandTest, ADryRunPrintsThePlanAndChangesNothing) {
  image("a.jpg");
  const json content{{"title", "A talk"}, {"media", {{{"source", "a.jpg"}}}}};
  const fs::path file = manifest(content);
  const auto before = snapshot(folder());
  const Ended run = runBuild({file, "--output", out(), "--dry-run"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_THAT(run.out, HasSubstr("Would add the Image item \"a\"\n"));
  EXPECT_THAT(run.out, HasSubstr("Would export \"A talk\" to "));
  EXPECT_EQ(before, snapshot(folder()));
  EXPECT_EQ(3, runBuild({manifest({{"media", {{{"source", "b.jpg"}}}}}), "--output", out(), "--dry-run"}).exit);
}

TEST_F(BuildCommandTest, ProgressNeverGoesBackAndEndsAtOneHundred) {
  image("a.jpg");
  movie("b.mp4");
  const json content{{"media", {{{"source", "a.jpg"}}, {{"source", "b.mp4"}}}}};
  const Ended run = runBuild({manifest(content), "--output", out(), "--zip", "--progress=json"});
  ASSERT_EQ(0, run.exit) << run.err;
  std::istringstream lines(run.err);
  double last = -1;
  std::vector<std::string> stages;
  for (std::string line; std::getline(lines, line);) {
    const json event = json::parse(line);
    EXPECT_GE(event["percent"], last);
    last = event["percent"];
    if (stages.empty() || stages.back() != event["stage"]) stages.push_back(event["stage"]);
  }
  EXPECT_EQ(100, last);
  EXPECT_THAT(stages, ::testing::IsSupersetOf({"Looking at the files", "Adding b", "Finalizing", "Archiving"}));
}

TEST_F(BuildCommandTest, CtrlCInAnyStageLeavesNothing) {
  json content{{"title", "A talk"}, {"media", json::array()}};
  for (int i = 0; i < 80; ++i) {
    const std::string name = "picture" + std::to_string(i) + ".jpg";
    image(name, 640);
    content["media"].push_back({{"source", name}});
  }
  const fs::path file = manifest(content);
  for (const bool inLibrary : {false, true})
    for (const char* stage : {"Looking at the files", "Adding", "Finalizing"}) {
      SCOPED_TRACE(std::string(stage) + (inLibrary ? ", in a library" : ""));
      Arguments arguments{"build", file, "--output", out(), "--progress=json"};
      if (inLibrary) arguments.insert(arguments.begin(), {"--library", library()});
      RunningProgram program(arguments, environment, "");
      ASSERT_TRUE(
          waitUntil([&] { return program.hasEnded() || program.errorsSoFar().find(stage) != std::string::npos; }));
      ASSERT_FALSE(program.hasEnded());
      program.signal(SIGINT);
      const Ended run = program.wait();
      EXPECT_EQ(130, run.exit) << run.err;
      EXPECT_THAT(run.err, HasSubstr("Stopped. Nothing was exported"));
      EXPECT_EQ("", run.out);
      EXPECT_FALSE(fs::exists(folder() / "made"));
      EXPECT_FALSE(fs::exists(library())) << "what was made for it is gone";
    }
}

}  // namespace
}  // namespace quilt::support
