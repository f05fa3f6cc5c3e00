// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/StreamLogSink.h"

#include <gtest/gtest.h>

#include <sstream>
#include <thread>
#include <vector>

namespace quilt::platform {
namespace {

/// What a sink up to the level writes of one line of every level.
std::string linesUpTo(LogLevel level) {
  std::ostringstream stream;
  StreamLogSink sink(stream, level);
  sink.write(LogLevel::Critical, "a");
  sink.write(LogLevel::Warning, "b");
  sink.write(LogLevel::Debug, "c");
  return stream.str();
}

TEST(StreamLogSinkTest, LinesNameTheirLevelAndStopAtTheOneAsked) {
  EXPECT_EQ("error: a\n", linesUpTo(LogLevel::Critical));
  EXPECT_EQ("error: a\nwarning: b\n", linesUpTo(LogLevel::Warning));
  EXPECT_EQ("error: a\nwarning: b\ndebug: c\n", linesUpTo(LogLevel::Debug));
}

TEST(StreamLogSinkThreadTest, LinesOfManyThreadsStayWhole) {
  std::ostringstream stream;
  const auto sink = std::make_shared<StreamLogSink>(stream, LogLevel::Warning);
  FDYLogger::addSink(sink);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int j = 0; j < 200; ++j) FDYLogger::logWarning("%@", std::string(50, 'x'));
    });
  }
  for (std::thread& thread : threads) thread.join();
  FDYLogger::removeSink(sink);
  std::istringstream lines(stream.str());
  int count = 0;
  for (std::string line; std::getline(lines, line); ++count) ASSERT_EQ("warning: " + std::string(50, 'x'), line);
  EXPECT_EQ(800, count);
}

}  // namespace
}  // namespace quilt::platform
