// SPDX-License-Identifier: Apache-2.0
// Several programs, and a host, at work in one library at the same time.
#include <gmock/gmock.h>

#include <csignal>

#include "quilt/collections/LibraryLock.h"
#include "quilt/collections/QuiltCollection.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

using nlohmann::json;
using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

class LockingTest : public QuiltProgramTest {
 protected:
  void SetUp() override {
    for (const char* title : {"One", "Two"}) ASSERT_EQ(0, quilt({"new", "document", title}).exit);
  }
  std::filesystem::path package(const std::string& title) const {
    return nlohmann::json(quiltJson({"show", title})["result"]["path"]).get<std::string>();
  }
  LibraryLock locked(const std::string& title) const { return *LibraryLock::ofDocument(package(title)); }
  void expectNothingHidden() const {
    for (const auto& item : std::filesystem::recursive_directory_iterator(library()))
      EXPECT_FALSE(item.path().filename().native().starts_with('.')) << item.path();
  }
  std::vector<Arguments> writersOf(const std::string& title) const {
    const std::string folder = this->folder() / "out";
    return {{"set", title, "author=Ada"},
            {"add", title, "https://example.org/"},
            {"convert", title, "--format", "720p"},
            {"finalize", title},
            {"export", title, folder},
            {"serve", title},
            {"remove", title, "--force"}};
  }
};

TEST_F(LockingTest, EveryWriterOfADocumentInUseIsRefusedWithItsHolder) {
  const std::string theme = "theme=" QUILT_SOURCE_FOLDER "/quilt/resources/themes/olive.qth";
  ASSERT_EQ(0, quilt({"set", "One", theme}).exit);
  const LibraryLock host = locked("One");
  const auto before = snapshot(package("One"));
  for (const Arguments& command : writersOf("One")) {
    const Ended run = quilt(command);
    EXPECT_EQ(6, run.exit) << command.front() << run.err;
    EXPECT_THAT(run.err, HasSubstr("is in use by process " + std::to_string(getpid()) + " on ")) << command.front();
    EXPECT_THAT(run.err, HasSubstr("--wait SECONDS waits for it"));
  }
  EXPECT_EQ(before, snapshot(package("One")));
}

TEST_F(LockingTest, OtherDocumentsAndReadersGoOn) {
  const LibraryLock host = locked("One");
  EXPECT_EQ(0, quilt({"set", "Two", "author=Ada"}).exit);
  EXPECT_EQ(0, quilt({"new", "document", "Three"}).exit);
  EXPECT_EQ(0, quilt({"remove", "Three", "--force"}).exit);
  EXPECT_EQ(0, quilt({"set", "Imports", "author=Ada"}).exit);
  EXPECT_EQ(0, quilt({"list"}).exit);
  EXPECT_EQ(0, quilt({"show", "One"}).exit);
  EXPECT_EQ(0, quilt({"check"}).exit);
  EXPECT_EQ(0, quilt({"set", "One", "author=Ada", "--dry-run"}).exit);
}

TEST_F(LockingTest, ALibraryInUseIsClosedToEveryWriter) {
  const LibraryLock host = *LibraryLock::ofLibrary(library());
  for (const Arguments& command :
       {Arguments{"set", "One", "author=Ada"}, {"new", "document", "Three"}, {"remove", "Imports", "--force"}}) {
    const Ended run = quilt(command);
    EXPECT_EQ(6, run.exit) << command.front() << run.err;
    EXPECT_THAT(run.err, HasSubstr("is in use by process "));
  }
  EXPECT_EQ(0, quilt({"list"}).exit);
}

TEST_F(LockingTest, WaitWaitsAndSaysForWhom) {
  auto host = std::make_unique<LibraryLock>(locked("One"));
  const auto waiting = start({"set", "One", "author=Ada", "--wait", "60"});
  EXPECT_TRUE(
      waitUntil([&] { return waiting->errorsSoFar().find("Waiting: It is in use by process ") != std::string::npos; }));
  EXPECT_FALSE(waiting->hasEnded());
  host.reset();
  EXPECT_EQ(0, waiting->wait().exit);
  EXPECT_EQ("Ada", quiltJson({"show", "One"})["result"]["Author"]);
}

TEST_F(LockingTest, WaitEndsInARefusalAndStopsAtCtrlC) {
  const LibraryLock host = locked("One");
  EXPECT_EQ(6, quilt({"set", "One", "author=Ada", "--wait", "0.3"}).exit);
  const auto waiting = start({"set", "One", "author=Ada", "--wait", "600"});
  EXPECT_TRUE(waitUntil([&] { return waiting->errorsSoFar().find("Waiting: ") != std::string::npos; }));
  waiting->signal(SIGINT);
  const Ended run = waiting->wait();
  EXPECT_EQ(130, run.exit);
  EXPECT_THAT(run.err, HasSubstr("Stopped. Nothing was changed"));
}

TEST_F(LockingTest, WaitIsANumberOfSeconds) {
  for (const char* bad : {"soon", "-1", "", "1s", "nan"})
    EXPECT_EQ(2, quilt({"set", "One", "author=Ada", std::string("--wait=") + bad}).exit) << bad;
  EXPECT_EQ(2, quilt({"list", "--wait", "1"}).exit) << "it never waits";
  EXPECT_EQ(0, quilt({"set", "One", "author=Ada", "--wait", "1e9"}).exit);
}

TEST_F(LockingTest, TwoDocumentsAreConvertedSideBySide) {
  MediaSpec spec;
  spec.width = 1920;
  spec.height = 1080;
  spec.duration = 4;
  const auto movie = makeMedia(spec);
  for (const char* title : {"One", "Two"}) ASSERT_EQ(0, quilt({"add", title, movie}).exit);
  const auto one = start({"convert", "One", "--format", "480p", "--progress=json"});
  ASSERT_TRUE(waitUntil([&] { return one->hasEnded() || one->errorsSoFar().find("percent") != std::string::npos; }));
  one->signal(SIGSTOP);  // in the middle of it
  ASSERT_FALSE(one->hasEnded());
  const Ended two = quilt({"convert", "Two", "--format", "480p"});
  EXPECT_EQ(0, two.exit) << two.err;
  EXPECT_EQ(6, quilt({"convert", "One", "--format", "480p"}).exit);
  one->signal(SIGCONT);
  EXPECT_EQ(0, one->wait().exit);
  EXPECT_EQ(0, quilt({"check"}).exit);
  expectNothingHidden();
}

TEST_F(LockingTest, ManyAtOnceLoseNothingAndLeaveNothing) {
  std::vector<std::unique_ptr<RunningProgram>> programs;
  for (const char* value : {"author=Ada", "description=d", "keywords=k", "category=c"})
    programs.push_back(start({"set", "One", value, "--wait", "60"}));
  for (int i = 0; i < 4; ++i) programs.push_back(start({"new", "document", "More " + std::to_string(i)}));
  for (const auto& program : programs) {
    const Ended run = program->wait();
    EXPECT_EQ(0, run.exit) << run.err;
  }
  const json record = quiltJson({"show", "One"})["result"];
  EXPECT_EQ("Ada", record["Author"]);
  EXPECT_EQ("d", record["Description"]);
  EXPECT_EQ("k", record["Keywords"]);
  EXPECT_EQ("c", record["Category"]);
  EXPECT_EQ(1U, quiltJson({"list"})["result"].size()) << "one collection for all of them";
  EXPECT_EQ(6U, quiltJson({"list"})["result"][0]["documents"].size());
  expectNothingHidden();
}

TEST_F(LockingTest, TheFirstOnesOfALibraryMakeOneCollection) {
  std::filesystem::remove_all(library());
  std::vector<std::unique_ptr<RunningProgram>> programs;
  for (int i = 0; i < 4; ++i) programs.push_back(start({"new", "document", "Talk " + std::to_string(i)}));
  for (const auto& program : programs) {
    const Ended run = program->wait();
    EXPECT_EQ(0, run.exit) << run.err;
  }
  EXPECT_EQ(1U, quiltJson({"list"})["result"].size());
  EXPECT_EQ(4U, quiltJson({"list"})["result"][0]["documents"].size());
  expectNothingHidden();
}

TEST_F(LockingTest, ACommandsEditAndAHostsBothStay) {
  const auto host = QuiltDocument::initWithPath(package("One"));
  ASSERT_EQ(0, quilt({"set", "One", "author=Ada"}).exit);
  ASSERT_EQ(0, quilt({"add", "One", "https://example.org/"}).exit);
  host->setKeywords("of the host");
  const json record = quiltJson({"show", "One"})["result"];
  EXPECT_EQ("Ada", record["Author"]);
  EXPECT_EQ("of the host", record["Keywords"]);
  EXPECT_EQ(1U, record["Media"].size());
  EXPECT_EQ(1U, host->mediaCount());
}

TEST_F(LockingTest, ADocumentThatGoesWhileACommandWaitsIsNotMadeAnew) {
  auto host = std::make_unique<LibraryLock>(locked("One"));
  const auto path = package("One");
  const auto waiting = start({"set", "One", "author=Ada", "--wait", "60"});
  EXPECT_TRUE(waitUntil([&] { return waiting->errorsSoFar().find("Waiting: ") != std::string::npos; }));
  std::filesystem::remove_all(path);
  host.reset();
  const Ended run = waiting->wait();
  EXPECT_EQ(3, run.exit) << run.err;
  EXPECT_FALSE(std::filesystem::exists(path));
  expectNothingHidden();
}

// The program opens what it was asked for, and nothing else.

TEST_F(LockingTest, AnEmptiedMovieDocumentSurvivesEveryOtherCommandAndGetsMediaAgain) {
  const auto movie = makeMedia({});
  const json imported = quiltJson({"import", movie})["result"][0];
  const std::string document = imported["uuid"];
  const std::string item = quiltJson({"show", document})["result"]["Media"][0]["UUID"];
  const Ended removed = quilt({"remove", item, "--from", document, "--force"});
  EXPECT_EQ(0, removed.exit);
  EXPECT_THAT(removed.err, HasSubstr("holds no media now"));
  EXPECT_EQ(0, quilt({"set", "One", "author=Ada"}).exit);
  EXPECT_EQ(0, quilt({"new", "document", "Three"}).exit);
  EXPECT_EQ(0, quilt({"set", "Imports", "author=Ada"}).exit);
  EXPECT_EQ(0, quilt({"add", document, movie}).exit);
  EXPECT_EQ(1U, quiltJson({"show", document})["result"]["Media"].size());
}

}  // namespace
}  // namespace quilt::support
