// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cmath>
#include <cstdlib>
#include <nlohmann/json.hpp>
#include <sstream>

#include "cli/Progress.h"

namespace quilt::cli {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

/// A stream in memory that looks like stderr to the program.
class Stream {
 public:
  Stream() : _file(open_memstream(&_bytes, &_size)) {}
  Stream(const Stream&) = delete;
  Stream& operator=(const Stream&) = delete;
  ~Stream() {
    std::fclose(_file);
    std::free(_bytes);
  }
  std::FILE* file() { return _file; }
  std::string text() {
    std::fflush(_file);
    return {_bytes, _size};
  }
  std::vector<std::string> lines() {
    std::vector<std::string> all;
    std::istringstream in(text());
    for (std::string line; std::getline(in, line);) all.push_back(line);
    return all;
  }

 private:
  char* _bytes = nullptr;
  std::size_t _size = 0;
  std::FILE* _file;
};

class ProgressTest : public ::testing::Test {
 protected:
  void begin(ProgressStyle style, bool isTerminal) {
    _messages.emplace(stream.file(), isTerminal, false);
    progress.emplace(*_messages, style, [this] { return now; });
  }

  std::vector<double> percentsOfEvents() {
    std::vector<double> percents;
    for (const std::string& line : stream.lines()) percents.push_back(nlohmann::json::parse(line)["percent"]);
    return percents;
  }

  Stream stream;
  Progress::Time now{1h};

 private:
  std::optional<Messages> _messages;

 protected:
  std::optional<Progress> progress;  // ends before what it prints to
};

TEST_F(ProgressTest, EventsNeverGoBackAndReachTheEndOnlyWhenFinished) {
  begin(ProgressStyle::Json, false);
  for (const double percent : {0.0, 50.0, 20.0, 60.0, 100.0, 250.0, -3.0}) progress->report("Copying", percent);
  EXPECT_THAT(percentsOfEvents(), ElementsAre(0, 50, 60, 99.9));
  progress->finish();
  EXPECT_THAT(percentsOfEvents(), ElementsAre(0, 50, 60, 99.9, 100));
}

TEST_F(ProgressTest, AnEventTellsTheStageAndTheTimeLeft) {
  begin(ProgressStyle::Json, false);
  progress->report("Copying \"a\"", 0);
  now += 10s;
  progress->report("Copying \"a\"", 25);
  const auto first = nlohmann::json::parse(stream.lines()[0]);
  const auto second = nlohmann::json::parse(stream.lines()[1]);
  EXPECT_EQ("progress", second["event"]);
  EXPECT_EQ("Copying \"a\"", second["stage"]);
  EXPECT_TRUE(first["remaining"].is_null());
  EXPECT_EQ(30, second["remaining"]);
}

TEST_F(ProgressTest, NothingThatIsNoNumberIsShown) {
  begin(ProgressStyle::Json, false);
  progress->report("Copying", std::nan(""));
  EXPECT_THAT(stream.text(), IsEmpty());
}

TEST_F(ProgressTest, LinesComeAtMostOnceASecond) {
  begin(ProgressStyle::Automatic, false);
  for (int i = 0; i < 100; ++i) {
    progress->report("Copying", i);
    now += 50ms;
  }
  EXPECT_THAT(stream.lines(), SizeIs(4));
  EXPECT_EQ("Copying: 20 %, 0:04 left", stream.lines()[0]);
  progress->finish();
  EXPECT_EQ("Copying: 100 %", stream.lines().back());
}

TEST_F(ProgressTest, WhatIsOverAtOnceSaysNothing) {
  begin(ProgressStyle::Automatic, false);
  progress->report("Copying", 0);
  progress->report("Copying", 50);
  progress->finish();
  EXPECT_THAT(stream.text(), IsEmpty());
}

TEST_F(ProgressTest, ABarIsDrawnOverItselfAndTakenAway) {
  begin(ProgressStyle::Automatic, true);
  progress->report("Copying", 0);
  now += 5s;
  progress->report("Copying", 50);
  EXPECT_THAT(stream.text(), HasSubstr(" 50 %  0:05 left"));
  EXPECT_THAT(stream.text(), Not(HasSubstr("\n")));
  progress->finish();
  EXPECT_TRUE(stream.text().ends_with("\r\x1b[K"));
}

TEST_F(ProgressTest, ABarEscapesItsStage) {
  begin(ProgressStyle::Automatic, true);
  progress->report("Importing a\x1b[2Jb", 10);
  EXPECT_THAT(stream.text(), HasSubstr("a\\x1b[2Jb"));
}

TEST_F(ProgressTest, NoneShowsNothing) {
  begin(ProgressStyle::None, true);
  progress->report("Copying", 10);
  now += 5s;
  progress->report("Copying", 50);
  progress->finish();
  EXPECT_THAT(stream.text(), IsEmpty());
}

TEST(MessagesTest, ALinePushesTheStatusAside) {
  Stream stream;
  Messages messages(stream.file(), true, false);
  messages.setStatus("50 %");
  messages.warning("careful");
  EXPECT_EQ("50 %\r\x1b[Kquilt: warning: careful\n50 %", stream.text());
}

TEST(MessagesTest, QuietLeavesErrors) {
  Stream stream;
  Messages messages(stream.file(), false, false);
  messages.setQuiet(true);
  messages.warning("careful");
  messages.note("by the way");
  messages.error("no");
  EXPECT_EQ("quilt: error: no\n", stream.text());
}

/// The percentages that an export in two formats reports.
TEST(ExportProgressTest, EachFormatGetsItsShareOfTheBar) {
  ExportProgress progress(2, false);
  EXPECT_DOUBLE_EQ(8, progress.percent(8));
  EXPECT_STREQ("Copying", progress.stage());
  EXPECT_NEAR(16.67, progress.percent(16.667), 0.01);
  EXPECT_STREQ("Converting", progress.stage());
  EXPECT_NEAR(25, progress.percent(25), 0.01);
  EXPECT_NEAR(25, progress.percent(16.667), 0.01);  // the second format begins where the first began
  EXPECT_NEAR(33.33, progress.percent(25), 0.01);
  EXPECT_NEAR(40, progress.percent(40), 0.01);
  EXPECT_STREQ("Finalizing", progress.stage());
  EXPECT_NEAR(90, progress.percent(90), 0.01);
  EXPECT_STREQ("Finalizing the package", progress.stage());
}

TEST(ExportProgressTest, AnArchiveIsTheLastStage) {
  ExportProgress progress(1, true);
  EXPECT_NEAR(90, progress.percent(90), 0.01);
  EXPECT_STREQ("Archiving", progress.stage());
}

}  // namespace
}  // namespace quilt::cli
