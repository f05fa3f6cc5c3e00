// SPDX-License-Identifier: Apache-2.0
#include "cli/LogCollector.h"

#include <gtest/gtest.h>

#include <cstdlib>

#include "cli/Failure.h"

namespace quilt::cli {
namespace {

using platform::LogLevel;

class LogCollectorTest : public ::testing::Test {
 protected:
  ~LogCollectorTest() override {
    std::fclose(_stream);
    std::free(_bytes);
  }
  std::string printed() {
    std::fflush(_stream);
    return {_bytes, _size};
  }

 private:
  char* _bytes = nullptr;
  std::size_t _size = 0;
  std::FILE* _stream = open_memstream(&_bytes, &_size);
  Messages _messages{_stream, false, false};

 protected:
  LogCollector log{_messages, false};
  LogCollector verbose{_messages, true};
};

TEST_F(LogCollectorTest, TheCauseIsTheFirstLineOfTheFailure) {
  log.write(LogLevel::Debug, "Failed to do something that did not matter");
  log.write(LogLevel::Debug, "Created new document at \"/x\"");
  log.write(LogLevel::Debug, "Failed to create it at path \"/x\": \"The disk is full\"");
  log.write(LogLevel::Critical, "Failed to flatten document at path \"/x\"");
  EXPECT_EQ("The disk is full", log.cause());
  EXPECT_EQ(ExitCode::InputOutput, exitCodeForCause(log.cause()));
}

TEST_F(LogCollectorTest, ALineWithoutAnErrorIsTheCauseItself) {
  log.write(LogLevel::Critical, "Failed to flatten document at path \"/x\"");
  EXPECT_EQ("Failed to flatten document at path \"/x\"", log.cause());
}

TEST_F(LogCollectorTest, AFailedCopyIsNamedByItsNumber) {
  log.write(LogLevel::Debug, "Copy failed with error code (-28)");
  log.write(LogLevel::Critical, "Failed to flatten source derivative \"file:///a\" at \"file:///b\"");
  EXPECT_EQ("No space left on device", log.cause());
  EXPECT_EQ(ExitCode::InputOutput, exitCodeForCause(log.cause()));
}

TEST_F(LogCollectorTest, ACopyThatWasNotBegunIsNamedByTheReason) {
  log.write(LogLevel::Warning, "Source derivative at path \"/a\" cannot be sized: \"There is no such file\"");
  log.write(LogLevel::Critical, "Failed to flatten source derivative \"file:///a\" at \"file:///b\"");
  EXPECT_EQ("There is no such file", log.cause());
}

TEST_F(LogCollectorTest, WithoutAFailureThereIsNoCause) {
  EXPECT_EQ("", log.cause());
  log.write(LogLevel::Debug, "Failed to do it: \"x\"");
  log.beginOperation();
  EXPECT_EQ("", log.cause());
}

TEST_F(LogCollectorTest, WarningsAreShownOnceAndEscaped) {
  log.write(LogLevel::Debug, "a detail");
  log.write(LogLevel::Warning, "careful\x1b");
  log.showWarnings();
  log.showWarnings();
  EXPECT_EQ("quilt: warning: careful\\x1b\n", printed());
}

TEST_F(LogCollectorTest, VerbosePrintsEveryLineAsItComes) {
  verbose.write(LogLevel::Debug, "a detail");
  verbose.write(LogLevel::Warning, "careful");
  verbose.showWarnings();
  EXPECT_EQ("debug: a detail\nwarning: careful\n", printed());
}

TEST_F(LogCollectorTest, TheWarningThatBeginsSoIsFound) {
  log.write(LogLevel::Critical, "Failed to import document, critically");
  log.write(LogLevel::Warning, "Failed to import document \"A\"");
  EXPECT_EQ("Failed to import document \"A\"", log.warning("Failed to import document"));
  EXPECT_EQ("", log.warning("Failed to create import"));
}

}  // namespace
}  // namespace quilt::cli
