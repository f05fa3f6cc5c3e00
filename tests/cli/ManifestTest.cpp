// SPDX-License-Identifier: Apache-2.0
#include "cli/Manifest.h"

#include <gmock/gmock.h>

#include <fstream>

#include "cli/Failure.h"
#include "tests/support/Program.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::cli {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

/// What is wrong in a manifest: place and sentence of each problem; empty when nothing is.
using Wrong = std::vector<std::pair<std::string, std::string>>;

Wrong problemsOf(const std::string& text) {
  Wrong wrong;
  const auto add = [&wrong](const Failure& problem) {
    const std::string place = problem.details["place"];
    const std::string before = "The manifest \"talk.json\"" + (place.empty() ? std::string() : ", at " + place) + ": ";
    EXPECT_THAT(problem.message, ::testing::StartsWith(before));
    EXPECT_EQ(problem.code, ExitCode::Invalid);
    wrong.emplace_back(place, problem.message.substr(std::min(before.size(), problem.message.size())));
  };
  try {
    (void)parseManifest(text, "/home/ann/talk.json");
  } catch (const Failure& failure) {
    EXPECT_EQ(failure.code, ExitCode::Invalid);
    if (failure.causes.empty()) add(failure);
    for (const Failure& cause : failure.causes) add(cause);
  }
  return wrong;
}

/// A manifest whose one item has these members.
std::string withItem(const std::string& members) { return R"({"media": [{)" + members + "}]}"; }
/// A manifest with a link and these members.
std::string with(const std::string& members) {
  return R"({"media": [{"source": "https://example.org/"}], )" + members + "}";
}

struct Sample {
  std::string text;
  std::string place;    ///< of the one problem
  std::string message;  ///< the beginning of its sentence; empty: the manifest is right
};

const std::vector<Sample>& samples() {
  static const std::vector<Sample> all{
      {withItem(R"("source": "a.mp4")"), "", ""},
      {with(R"("title": "T", "author": "A", "description": "D\n\tE", "keywords": "K", "category": "C")"), "", ""},
      {with(R"("theme": "org.quilt.theme.olive", "poster": "a.jpg", "formats": ["Desktop", "720p", "480p"])"), "", ""},
      {with(R"("$schema": "manifest.schema.json")"), "", ""},
      {with(R"("collection": {"title": "C", "author": "A", "description": "D"})"), "", ""},
      {with(R"("formats": [], "title": "")"), "", ""},
      {withItem(R"("source": "a", "title": "T", "description": "D", "extras": ["b", {"file": "c", "title": "T"}])"), "",
       ""},
      {withItem(R"("source": "a", "commentary": "v.m4a")"), "", ""},
      {withItem(R"("source": "a", "commentary": {"file": "v.m4a", "description": "D"}, "extras": [])"), "", ""},
      {withItem(R"("category": "DualSource", "sources": ["a", {"file": "b", "timecode": 1}])"), "", ""},
      {withItem(R"("category": "Montage", "sources": [{"file": "a", "timecode": 4.5, "title": "T"}])"), "", ""},

      {"[]", "", "This is an array, and should be an object"},
      {"null", "", "This is null, and should be an object"},
      {"{}", "media", "This is missing"},
      {R"({"media": []})", "media", "This is empty"},
      {R"({"media": {}})", "media", "This is an object, and should be an array"},
      {R"({"media": ["a.mp4"]})", "media[0]", "This is a text, and should be an object"},
      {with(R"("titel": "T")"), "titel", "This key is unknown here; known are $schema, title, author"},
      {with(R"("title": 7)"), "title", "This is a number, and should be a text"},
      {with(R"("title": null)"), "title", "This is null, and should be a text"},
      {with(R"("title": "a\u0007b")"), "title", "The text has control characters"},
      {with(R"("title": "a\rb")"), "title", "The text has control characters"},
      {with(R"("keywords": ["a"])"), "keywords", "This is an array, and should be a text"},
      {with(R"("formats": "Desktop")"), "formats", "This is a text, and should be an array"},
      {with(R"("formats": ["Desktop", "1080p"])"), "formats[1]", "\"1080p\" is no format; Desktop, 720p and 480p are"},
      {with(R"("formats": [720])"), "formats[0]", "This is a number, and should be a text"},
      {with(R"("collection": "C")"), "collection", "This is a text, and should be an object"},
      {with(R"("collection": {})"), "collection.title", "A collection needs a title"},
      {with(R"("collection": {"title": ""})"), "collection.title", "A collection needs a title"},
      {with(R"("collection": {"title": "C", "theme": "x"})"), "collection.theme", "This key is unknown here"},
      {withItem(""), "media[0].source", "This is missing"},
      {withItem(R"("source": "")"), "media[0].source", "This names no file"},
      {withItem(R"("source": "a\u0000b")"), "media[0].source", "This names no file"},
      {withItem(R"("source": ["a"])"), "media[0].source", "This is an array, and should be a text"},
      {withItem(R"("source": "a", "file": "b")"), "media[0].file", "This key is unknown here; known are category"},
      {withItem(R"("source": "a", "odd key": 1)"), "media[0].odd key", "This key is unknown here"},
      {withItem(R"("sources": ["a", "b"])"), "media[0].sources", "Several sources need a category"},
      {withItem(R"("category": "Movie", "source": "a")"), "", "2"},
      {withItem(R"("category": "Montage")"), "media[0].sources", "This is missing"},
      {withItem(R"("category": "Montage", "sources": [])"), "media[0].sources", "This is empty"},
      {withItem(R"("category": "Montage", "sources": ["a"], "source": "b")"), "media[0].source",
       "An item with a category has \"sources\" instead"},
      {withItem(R"("category": "Montage", "sources": ["a", 1])"), "media[0].sources[1]",
       "This is a number, and should be a text or an object"},
      {withItem(R"("category": "Montage", "sources": [{"timecode": 1}])"), "media[0].sources[0].file",
       "This is missing"},
      {withItem(R"("category": "Montage", "sources": ["a", {"file": "b", "timecode": "1"}])"),
       "media[0].sources[1].timecode", "This is a text, and should be a number"},
      {withItem(R"("category": "Montage", "sources": [{"file": "b", "timecode": -1}])"), "media[0].sources[0].timecode",
       "This should be a number of seconds, 0 or more"},
      {withItem(R"("category": "Montage", "sources": [{"file": "b", "time": 1}])"), "media[0].sources[0].time",
       "This key is unknown here; known are file, title, description, timecode"},
      {withItem(R"("category": "DualSource", "sources": ["a"])"), "media[0].sources",
       "A dual-source item has two sources, not 1"},
      {withItem(R"("category": "DualSource", "sources": ["a", "b", "c"])"), "media[0].sources",
       "A dual-source item has two sources, not 3"},
      {withItem(R"("source": "a", "extras": "b")"), "media[0].extras", "This is a text, and should be an array"},
      {withItem(R"("source": "a", "extras": ["b", ""])"), "media[0].extras[1]", "This names no file"},
      {withItem(R"("source": "a", "extras": [{"file": "b", "timecode": 1}])"), "media[0].extras[0].timecode",
       "This key is unknown here"},
      {withItem(R"("source": "a", "commentary": true)"), "media[0].commentary",
       "This is a boolean, and should be a text"},
  };
  return all;
}

TEST(ManifestTest, EveryProblemHasItsPlaceAndSentence) {
  for (const Sample& sample : samples()) {
    const Wrong wrong = problemsOf(sample.text);
    if (sample.message.empty()) {
      EXPECT_THAT(wrong, IsEmpty()) << sample.text;
    } else if (sample.message == "2") {
      EXPECT_THAT(wrong, SizeIs(::testing::Ge(2U))) << sample.text;
    } else {
      ASSERT_THAT(wrong, SizeIs(1)) << sample.text;
      EXPECT_EQ(wrong[0].first, sample.place) << sample.text;
      EXPECT_THAT(wrong[0].second, ::testing::StartsWith(sample.message)) << sample.text;
    }
  }
}

TEST(ManifestTest, TheShippedSchemaSaysTheSameOfEverySample) {
  const std::string schema = std::string(QUILT_SOURCE_FOLDER) + "/schema/manifest.schema.json";
  if (support::runProgram({"python3", "-c", "import jsonschema"}).status != 0)
    GTEST_SKIP() << "python3-jsonschema is not installed";
  const support::ScratchFolder folder;
  std::vector<std::string> command{"python3", "-c",
                                   "import json, sys, jsonschema\n"
                                   "schema = json.load(open(sys.argv[1]))\n"
                                   "jsonschema.Draft202012Validator.check_schema(schema)\n"
                                   "validator = jsonschema.Draft202012Validator(schema)\n"
                                   "for file in sys.argv[2:]:\n"
                                   "  print('right' if validator.is_valid(json.load(open(file))) else 'wrong')",
                                   schema};
  std::string expected;
  for (std::size_t i = 0; i < samples().size(); ++i) {
    const std::filesystem::path file = folder / (std::to_string(i) + ".json");
    std::ofstream(file) << samples()[i].text;
    command.push_back(file);
    expected += samples()[i].message.empty() ? "right\n" : "wrong\n";
  }
  const support::ProgramResult run = support::runProgram(command);
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.output, expected);
}

TEST(ManifestTest, AllProblemsAreToldTogether) {
  const Wrong wrong = problemsOf(R"({"title": 1, "x": 2, "media": [{"source": "a", "y": 3}, {}]})");
  std::vector<std::string> places;
  for (const auto& [place, message] : wrong) places.push_back(place);
  EXPECT_THAT(places, ElementsAre("title", "media[0].y", "media[1].source", "x"));
}

TEST(ManifestTest, EverythingIsRead) {
  const Manifest manifest = parseManifest(R"({
    "title": "A talk", "author": "Ann", "description": "D", "keywords": "K", "category": "C",
    "theme": "t", "poster": "p.jpg", "formats": ["720p", "Desktop", "720p"],
    "collection": {"title": "School", "author": "S", "description": "E"},
    "media": [
      {"source": "opening.mp4", "title": "Opening", "description": "First",
       "extras": ["slides.pdf", {"file": "b.pdf", "title": "B"}], "commentary": "voice.m4a"},
      {"category": "Montage", "sources": ["a.jpg", {"file": "b.jpg", "timecode": 4.5, "title": "G", "description": "H"}]}
    ]})",
                                          "/x/talk.json");
  EXPECT_EQ(manifest.path, "/x/talk.json");
  EXPECT_EQ(manifest.title, "A talk");
  EXPECT_EQ(manifest.author, "Ann");
  EXPECT_EQ(manifest.description, "D");
  EXPECT_EQ(manifest.keywords, "K");
  EXPECT_EQ(manifest.category, "C");
  EXPECT_EQ(manifest.theme, "t");
  EXPECT_EQ(manifest.poster, "p.jpg");
  EXPECT_THAT(manifest.formats, ElementsAre("720p", "Desktop"));
  ASSERT_TRUE(manifest.collection);
  EXPECT_EQ(manifest.collection->title, "School");
  EXPECT_EQ(manifest.collection->author, "S");
  EXPECT_EQ(manifest.collection->description, "E");
  ASSERT_THAT(manifest.media, SizeIs(2));
  const ManifestItem& opening = manifest.media[0];
  EXPECT_EQ(opening.title, "Opening");
  EXPECT_EQ(opening.description, "First");
  EXPECT_EQ(opening.category, std::nullopt);
  EXPECT_EQ(opening.sources[0].location, "opening.mp4");
  EXPECT_EQ(opening.sources[0].place, "media[0].source");
  ASSERT_THAT(opening.extras, SizeIs(2));
  EXPECT_EQ(opening.extras[0].place, "media[0].extras[0]");
  EXPECT_EQ(opening.extras[1].place, "media[0].extras[1].file");
  EXPECT_EQ(opening.extras[1].title, "B");
  ASSERT_TRUE(opening.commentary);
  EXPECT_EQ(opening.commentary->location, "voice.m4a");
  const ManifestItem& montage = manifest.media[1];
  EXPECT_EQ(montage.category, "Montage");
  EXPECT_EQ(montage.sources[0].timecode, std::nullopt);
  EXPECT_EQ(montage.sources[1].timecode, 4.5);
  EXPECT_EQ(montage.sources[1].title, "G");
  EXPECT_EQ(montage.sources[1].description, "H");
}

TEST(ManifestTest, WhatIsNoJsonIsToldWithLineAndColumn) {
  const auto message = [](const std::string& text) {
    const Wrong wrong = problemsOf(text);
    return wrong.size() == 1 && wrong[0].first.empty() ? wrong[0].second : std::string();
  };
  EXPECT_THAT(message("{\n  \"media\": [,]\n}"), ::testing::StartsWith("It is no JSON: line 2, column 13: "));
  EXPECT_THAT(message(""), HasSubstr("It is no JSON"));
  EXPECT_THAT(message("{\"title\": \"\xff\"}"), HasSubstr("It is no JSON"));
  EXPECT_THAT(message(R"({"media": [{"source": 1e999}]})"), HasSubstr("It is no JSON"));
  EXPECT_THAT(message("{} {}"), HasSubstr("It is no JSON"));
}

TEST(ManifestTest, AKeyTwiceIsRefused) {
  EXPECT_THAT(problemsOf(R"({"media": [{"source": "a", "source": "b"}]})"),
              ElementsAre(std::pair("", "The key \"source\" stands twice in one object")));
  EXPECT_THAT(problemsOf(R"({"media": [{"source": "a"}, {"source": "b"}]})"), IsEmpty());
}

TEST(ManifestTest, LevelsWithoutEndAreRefused) {
  EXPECT_THAT(problemsOf(with("\"description\": " + std::string(100000, '[') + std::string(100000, ']'))),
              ::testing::Contains(std::pair("", "It has too many levels")));
}

TEST(ManifestTest, AByteOrderMarkIsNoTrouble) {
  EXPECT_THAT(problemsOf("\xEF\xBB\xBF" + withItem(R"("source": "a")")), IsEmpty());
}

}  // namespace
}  // namespace quilt::cli
