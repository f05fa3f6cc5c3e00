// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <csignal>
#include <fstream>
#include <set>

#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::StartsWith;

MediaSpec titled(const std::string& title) {
  MediaSpec spec;
  spec.duration = 1;
  if (!title.empty()) spec.tags = {{"title", title}};
  return spec;
}

class ImportCommandTest : public QuiltProgramTest {
 protected:
  ImportCommandTest() { std::filesystem::create_directory(folder() / "in"); }

  /// A movie under the name, without a title of its own.
  std::filesystem::path movie(const std::string& name = "opening.mp4") const {
    const std::filesystem::path file = folder() / "in" / name;
    std::filesystem::copy_file(makeMedia(titled("")), file);
    return file;
  }

  /// A movie that takes a while to copy: something of so many bytes that no player looks at follows it.
  std::filesystem::path bigMovie(std::uint64_t bytes) const {
    const std::filesystem::path file = movie("big.mp4");
    std::ofstream out(file, std::ios::binary | std::ios::app);
    const std::uint64_t size = bytes + 16;
    out.write("\0\0\0\1free", 8);
    for (int shift = 56; shift >= 0; shift -= 8) out.put(static_cast<char>(size >> shift & 0xffU));
    out.close();
    std::filesystem::resize_file(file, std::filesystem::file_size(file) + bytes);
    return file;
  }

  json listed() const { return quiltJson({"list"})["result"]; }

  std::filesystem::path onlyPackage() const {
    const json collections = listed();
    EXPECT_THAT(collections, SizeIs(1));
    EXPECT_THAT(collections[0]["documents"], SizeIs(1));
    return collections[0]["documents"][0]["path"].get<std::string>();
  }

  std::vector<std::string> namesOfPackages() const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(library()))
      if (entry.path().extension() == ".qpk") names.push_back(entry.path().filename());
    return names;
  }
};

TEST_F(ImportCommandTest, MakesADocumentInImportsAndPrintsIt) {
  const Ended run = quilt({"import", movie()});
  EXPECT_EQ(0, run.exit) << run.err;
  const json collections = listed();
  ASSERT_THAT(collections, SizeIs(1));
  EXPECT_EQ("Imports", collections[0]["title"]);
  ASSERT_THAT(collections[0]["documents"], SizeIs(1));
  const json document = collections[0]["documents"][0];
  EXPECT_EQ("opening", document["title"]);
  EXPECT_EQ("Movie", document["type"]);
  EXPECT_EQ(document["uuid"].get<std::string>() + "\tMovie\topening\n", run.out);
}

TEST_F(ImportCommandTest, TellsTheSameInJson) {
  const json document = quiltJson({"import", movie()});
  ASSERT_THAT(document["result"], SizeIs(1));
  const json made = document["result"][0];
  EXPECT_EQ("opening", made["title"]);
  EXPECT_EQ("Movie", made["type"]);
  EXPECT_EQ((folder() / "in/opening.mp4").string(), made["source"]);
  EXPECT_TRUE(std::filesystem::exists(made["path"].get<std::string>() + "/properties.plist"));
  EXPECT_EQ(made["uuid"], listed()[0]["documents"][0]["uuid"]);
}

TEST_F(ImportCommandTest, KeepsTheTitleThatTheFileCarries) {
  const json made = quiltJson({"import", makeMedia(titled("A talk"))})["result"][0];
  EXPECT_EQ("A talk", made["title"]);
}

TEST_F(ImportCommandTest, LeavesTheSourceAloneAndThePackageStandsAlone) {
  const auto before = snapshot(folder() / "in");
  const std::filesystem::path file = movie();
  const auto withMovie = snapshot(folder() / "in");
  ASSERT_EQ(0, quilt({"import", file}).exit);
  EXPECT_EQ(withMovie, snapshot(folder() / "in"));
  EXPECT_NE(before, withMovie);
  const json record = quiltJson({"show", "opening"})["result"];
  EXPECT_EQ(true, record["IsFlattened"]);
  EXPECT_THAT(read(onlyPackage() / "properties.plist"), ::testing::Not(HasSubstr((folder() / "in").string())));
}

TEST_F(ImportCommandTest, UsesTheCollectionNamedAndTheDefaultOneAgain) {
  ASSERT_EQ(0, quilt({"new", "collection", "Talks"}).exit);
  ASSERT_EQ(0, quilt({"import", movie("a.mp4"), "--collection", "Talks"}).exit);
  ASSERT_EQ(0, quilt({"import", movie("b.mp4")}).exit);
  ASSERT_EQ(0, quilt({"import", movie("c.mp4")}).exit);
  const json collections = listed();
  ASSERT_THAT(collections, SizeIs(2));
  EXPECT_EQ("Imports", collections[0]["title"]);
  EXPECT_THAT(collections[0]["documents"], SizeIs(2));
  EXPECT_THAT(collections[1]["documents"], SizeIs(1));
}

TEST_F(ImportCommandTest, AnUnknownCollectionIsNotFoundAndNothingIsMade) {
  const Ended run = quilt({"import", movie(), "--collection", "Nowhere"});
  EXPECT_EQ(3, run.exit);
  EXPECT_THAT(run.err, HasSubstr("There is no collection \"Nowhere\""));
  EXPECT_FALSE(std::filesystem::exists(library()));
}

TEST_F(ImportCommandTest, AMissingFileIsNotFoundAndNothingIsMade) {
  const json document = quiltJson({"import", folder() / "nothing.mp4"}, 3);
  EXPECT_EQ("not-found", document["error"]["code"]);
  EXPECT_EQ((folder() / "nothing.mp4").string(), document["error"]["path"]);
  EXPECT_THAT(document["result"], IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(library()));
}

TEST_F(ImportCommandTest, FilesThatMakeNoDocumentAreInvalid) {
  write(folder() / "in/notes.txt", "words");
  write(folder() / "in/fake.mp4", "words that are no movie");
  write(folder() / "in/empty.mp4", "");
  for (const char* name : {"notes.txt", "fake.mp4", "empty.mp4", "."}) {
    const Ended run = quilt({"import", folder() / "in" / name});
    EXPECT_EQ(4, run.exit) << name << run.err;
    EXPECT_THAT(run.err, HasSubstr("Cannot import ")) << name;
  }
  EXPECT_FALSE(std::filesystem::exists(library()));
}

TEST_F(ImportCommandTest, OneBadFileAmongSeveralIsReportedAndTheRestIsDone) {
  write(folder() / "in/notes.txt", "words");
  const json document =
      quiltJson({"import", movie("a.mp4"), folder() / "in/notes.txt", folder() / "missing.mp4", movie("b.mp4")}, 5);
  EXPECT_THAT(document["result"], SizeIs(2));
  EXPECT_EQ("partial", document["error"]["code"]);
  ASSERT_THAT(document["error"]["causes"], SizeIs(2));
  EXPECT_EQ("invalid", document["error"]["causes"][0]["code"]);
  EXPECT_EQ("not-found", document["error"]["causes"][1]["code"]);
  EXPECT_THAT(listed()[0]["documents"], SizeIs(2));
}

TEST_F(ImportCommandTest, ReadsNamesFromTheInput) {
  const std::string lines = movie("one one.mp4").string() + "\n\n" + movie("two.mp4").string();
  EXPECT_EQ(0, quilt({"import", "-"}, lines).exit);
  const std::string nul = movie("three\nthree.mp4").string() + std::string(1, '\0');
  EXPECT_EQ(0, quilt({"import", "-0"}, nul).exit);
  std::set<std::string> titles;
  const json collections = listed();
  for (const json& document : collections[0]["documents"]) titles.insert(document["title"]);
  EXPECT_EQ((std::set<std::string>{"one one", "two", "three three"}), titles);
  EXPECT_EQ(2, quilt({"import", "-"}).exit);
}

TEST_F(ImportCommandTest, NamesAreNamesWhateverTheyLookLike) {
  std::vector<std::string> names{"-v.mp4", "$(touch x).mp4", "a;b|c.mp4", "Grüße 🎬.mp4", "%2e%2e.mp4", "[a,b].mp4"};
  const std::filesystem::path start = std::filesystem::current_path();
  for (const std::string& name : names) movie(name);
  std::filesystem::current_path(folder() / "in");
  std::vector<std::string> arguments{"import", "--"};
  arguments.insert(arguments.end(), names.begin(), names.end());
  const Ended run = quilt(arguments);
  std::filesystem::current_path(start);
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_THAT(listed()[0]["documents"], SizeIs(names.size()));
  EXPECT_FALSE(std::filesystem::exists(folder() / "in/x"));
}

TEST_F(ImportCommandTest, ControlCharactersOfATitleDoNotReachTheTerminal) {
  const Ended run = quilt({"import", movie("a\x1b[31mb\nc.mp4")});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_EQ(std::string::npos, run.out.find('\x1b'));
  EXPECT_EQ(1, std::count(run.out.begin(), run.out.end(), '\n'));
}

TEST_F(ImportCommandTest, ADryRunPrintsThePlanAndMakesNothing) {
  const Ended run = quilt({"import", movie(), "--dry-run"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_THAT(run.out, StartsWith("Would import \"" + (folder() / "in/opening.mp4").string()));
  EXPECT_THAT(run.out, HasSubstr("new collection \"Imports\""));
  EXPECT_FALSE(std::filesystem::exists(library()));

  ASSERT_EQ(0, quilt({"import", folder() / "in/opening.mp4"}).exit);
  const auto before = snapshot(library());
  const json plan = quiltJson({"import", folder() / "in/opening.mp4", "--dry-run"});
  EXPECT_EQ(false, plan["result"][0]["makesCollection"]);
  EXPECT_EQ(3, quilt({"import", "/missing.mp4", "--dry-run"}).exit);
  EXPECT_EQ(before, snapshot(library()));
}

TEST_F(ImportCommandTest, ProgressEventsClimbToAHundred) {
  const Ended run = quilt({"import", movie("a.mp4"), movie("b.mp4"), "--progress=json"});
  ASSERT_EQ(0, run.exit);
  std::istringstream lines(run.err);
  double last = -1;
  for (std::string line; std::getline(lines, line);) {
    const json event = json::parse(line);
    EXPECT_GE(event["percent"], last);
    last = event["percent"];
  }
  EXPECT_EQ(100, last);
}

TEST_F(ImportCommandTest, ProgressOfAFailureDoesNotReachAHundred) {
  const Ended run = quilt({"import", movie("a.mp4"), "/missing.mp4", "--progress=json"});
  EXPECT_EQ(5, run.exit);
  EXPECT_THAT(run.err, HasSubstr("\"percent\":"));
  EXPECT_EQ(std::string::npos, run.err.find("\"percent\":100"));
}

class StoppedImportTest : public ImportCommandTest {
 protected:
  static constexpr std::uint64_t kBytes = 6'000'000'000;  // of a hole: only a copy would write them

  std::unique_ptr<RunningProgram> startBigImport() const {
    const std::size_t before = copiedFiles().size();
    auto program = start({"import", bigMovie(kBytes)});
    EXPECT_TRUE(waitUntil([&] { return program->hasEnded() || copiedFiles().size() > before; }));
    EXPECT_FALSE(program->hasEnded());
    return program;
  }

  /// The files below the package's media folder, under whatever name.
  std::vector<std::string> copiedFiles() const {
    std::vector<std::string> files;
    std::error_code error;
    for (std::filesystem::recursive_directory_iterator at(library(), error), end; at != end; at.increment(error)) {
      if (error) break;
      if (at->path().string().find("/derivatives/") != std::string::npos) files.push_back(at->path());
    }
    return files;
  }

  /// Everything hidden in the library.
  std::vector<std::string> hiddenFiles() const {
    std::vector<std::string> files;
    for (const auto& item : std::filesystem::recursive_directory_iterator(library()))
      if (item.path().filename().native().starts_with('.')) files.push_back(item.path());
    return files;
  }

  void expectNothingLeft() const { EXPECT_FALSE(std::filesystem::exists(library())) << copiedFiles().size(); }
};

TEST_F(StoppedImportTest, CtrlCLeavesNothingAndSaysSo) {
  const auto program = startBigImport();
  const auto asked = std::chrono::steady_clock::now();
  program->signal(SIGINT);
  const Ended run = program->wait();
  EXPECT_LT(std::chrono::steady_clock::now() - asked, std::chrono::seconds(10));
  EXPECT_EQ(130, run.exit) << run.err;
  EXPECT_THAT(run.err, HasSubstr("Stopped. 0 of 1 files were imported"));
  EXPECT_EQ("", run.out);
  expectNothingLeft();
}

TEST_F(StoppedImportTest, SoDoesATermination) {
  const auto program = startBigImport();
  program->signal(SIGTERM);
  EXPECT_EQ(143, program->wait().exit);
  expectNothingLeft();
}

TEST_F(StoppedImportTest, ALibraryThatWasThereIsAsItWas) {
  ASSERT_EQ(0, quilt({"import", movie()}).exit);
  const auto before = listed();
  const auto packages = namesOfPackages();
  const auto program = startBigImport();
  program->signal(SIGINT);
  EXPECT_EQ(130, program->wait().exit);
  EXPECT_EQ(before, listed());
  EXPECT_EQ(packages, namesOfPackages());
  EXPECT_THAT(hiddenFiles(), IsEmpty());
}

TEST_F(StoppedImportTest, ItsCollectionCannotBeRemovedMeanwhileAndAllElseGoesOn) {
  const auto program = startBigImport();
  program->signal(SIGSTOP);
  const Ended refused = quilt({"remove", "Imports", "--force"});
  EXPECT_EQ(6, refused.exit);
  EXPECT_THAT(refused.err, HasSubstr("is in use by process "));
  EXPECT_EQ("locked", quiltJson({"remove", "Imports", "--force"}, 6)["error"]["code"]);
  EXPECT_EQ(0, quilt({"list"}).exit);
  EXPECT_EQ(0, quilt({"import", movie()}).exit);
  EXPECT_EQ(0, quilt({"set", "Imports", "author=Ada"}).exit);
  EXPECT_EQ(0, quilt({"new", "collection", "Plans", "--dry-run"}).exit);
  program->signal(SIGCONT);
  program->signal(SIGINT);
  EXPECT_EQ(130, program->wait().exit);
  EXPECT_EQ(0, quilt({"new", "collection", "Talks"}).exit);
}

TEST_F(StoppedImportTest, WhatOthersPutIntoTheLibraryThatItMadeStays) {
  const auto program = startBigImport();
  program->signal(SIGSTOP);
  ASSERT_EQ(0, quilt({"new", "document", "Talk"}).exit);  // in the collection that the import has made
  write(library() / "notes.txt", "mine");
  program->signal(SIGCONT);
  program->signal(SIGINT);
  EXPECT_EQ(130, program->wait().exit);
  EXPECT_EQ("mine", read(library() / "notes.txt"));
  EXPECT_EQ(0, quilt({"show", "Talk"}).exit);
  EXPECT_EQ(1U, namesOfPackages().size());
}

TEST_F(StoppedImportTest, TheLockOfAKilledWriterIsTakenOverAndItsTemporariesGo) {
  const auto program = startBigImport();
  program->signal(SIGKILL);
  EXPECT_EQ(-SIGKILL, program->wait().exit);
  EXPECT_EQ(0, quilt({"new", "collection", "Talks"}).exit);
  EXPECT_THAT(hiddenFiles(), IsEmpty());
}

}  // namespace
}  // namespace quilt::support
