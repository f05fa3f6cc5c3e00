// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <clocale>
#include <thread>
#include <vector>

#include "quilt/platform/base/FDYLogger.h"
#include "quilt/platform/testing/RecordingLogSink.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pair;
using ::testing::SizeIs;

TEST(FormatMessageTest, FillsPlaceholdersFromLeftToRight) {
  EXPECT_EQ("a 7 \"b\" 1.500000 -3", formatMessage("%@ %ld \"%@\" %lf %d", {"a", 7, "b", 1.5, -3}));
}

TEST(FormatMessageTest, AMissingObjectIsNull) {
  EXPECT_EQ("(null)", formatMessage("%@", {std::nullopt}));
  EXPECT_EQ("(null)", formatMessage("%@", {std::optional<std::string>()}));
  EXPECT_EQ("(null)", formatMessage("%@", {std::optional<Url>()}));
  EXPECT_EQ("(null)", formatMessage("%@", {std::filesystem::path()}));
  EXPECT_EQ("(null)", formatMessage("%@", {static_cast<const char*>(nullptr)}));
}

TEST(FormatMessageTest, APlaceholderWithoutAnArgumentIsNullOrZero) {
  EXPECT_EQ("(null) 0 0.000000 0", formatMessage("%@ %ld %lf %d", {}));
}

TEST(FormatMessageTest, ABareAtSignIsKeptAndItsArgumentNotPrinted) {
  EXPECT_EQ("\"@\" and a", formatMessage("\"@\" and %@", {"a", "b"}));
}

TEST(FormatMessageTest, OtherPercentSignsAreKept) {
  EXPECT_EQ("100 %", formatMessage("100 %", {}));
  EXPECT_EQ("100%", formatMessage("100%%", {}));
  EXPECT_EQ("%s%l%", formatMessage("%s%l%", {"a"}));
}

TEST(FormatMessageTest, AnArgumentIsNoFormat) { EXPECT_EQ("%@ x", formatMessage("%@ %@", {"%@", "x"})); }

TEST(FormatMessageTest, PrintsEveryKindAsAnObject) {
  EXPECT_EQ("/a/b", formatMessage("%@", {std::filesystem::path("/a/b")}));
  EXPECT_EQ("file:///a%20b", formatMessage("%@", {Url::fileUrl("/a b")}));
  EXPECT_EQ("The disk is full", formatMessage("%@", {Error{ErrorKind::NoSpace, "The disk is full", "/a"}}));
  EXPECT_EQ("text", formatMessage("%@", {std::optional<std::string>("text")}));
  EXPECT_EQ("text", formatMessage("%@", {std::string_view("text")}));
  EXPECT_EQ("7", formatMessage("%@", {7}));
  EXPECT_EQ("1.25", formatMessage("%@", {1.25}));
  EXPECT_EQ("100", formatMessage("%@", {100.0}));
}

TEST(FormatMessageTest, NumbersConvertBetweenTheirPlaceholders) {
  EXPECT_EQ("2 -2 3.000000", formatMessage("%ld %d %lf", {2.9, -2.9, 3}));
  EXPECT_EQ("0 0", formatMessage("%ld %ld", {1e300, "text"}));
  EXPECT_EQ("0.000000", formatMessage("%lf", {"text"}));
  EXPECT_EQ("18446744073709551", formatMessage("%ld", {std::size_t{18446744073709551}}));
  EXPECT_EQ("340282346638528859811704183484516925440.000000", formatMessage("%lf", {3.4028234663852886e38}));
}

TEST(FormatMessageTest, TheHostsLocaleChangesNoDigit) {
  const std::string before = std::setlocale(LC_ALL, nullptr);
  const bool hasComma = std::setlocale(LC_ALL, "de_DE.UTF-8") != nullptr;
  const std::string text = formatMessage("%lf %@", {1234.5, 0.25});
  std::setlocale(LC_ALL, before.c_str());
  EXPECT_EQ("1234.500000 0.25", text);
  if (!hasComma) GTEST_SKIP() << "no locale with a decimal comma is installed";
}

TEST(FDYLoggerTest, WritesEveryLevelToItsSinksInOrder) {
  const ScopedLog first;
  const ScopedLog second;
  FDYLogger::logCritical("Document \"%@\" is damaged", "A");
  FDYLogger::logWarning("%ld items", 3);
  FDYLogger::logDebug("plain");
  const auto lines = ElementsAre(Pair(LogLevel::Critical, "Document \"A\" is damaged"),
                                 Pair(LogLevel::Warning, "3 items"), Pair(LogLevel::Debug, "plain"));
  EXPECT_THAT(first->lines(), lines);
  EXPECT_THAT(second->lines(), lines);
  EXPECT_THAT(first->messages(LogLevel::Warning), ElementsAre("3 items"));
}

TEST(FDYLoggerTest, ARemovedSinkHearsNothing) {
  const auto sink = std::make_shared<RecordingLogSink>();
  FDYLogger::addSink(sink);
  FDYLogger::removeSink(sink);
  FDYLogger::logCritical("unheard");
  EXPECT_THAT(sink->lines(), IsEmpty());
}

TEST(FDYLoggerTest, ASinkMayLogAndRemoveItself) {
  class Once final : public LogSink, public std::enable_shared_from_this<Once> {
   public:
    void write(LogLevel, const std::string&) override {
      ++lines;
      FDYLogger::removeSink(shared_from_this());
      FDYLogger::logDebug("from the sink");
    }
    int lines = 0;
  };
  const auto once = std::make_shared<Once>();
  const ScopedLog log;
  FDYLogger::addSink(once);
  FDYLogger::logDebug("first");
  FDYLogger::logDebug("second");
  EXPECT_EQ(1, once->lines);
  EXPECT_THAT(log->messages(LogLevel::Debug), ElementsAre("first", "from the sink", "second"));
}

TEST(FDYLoggerThreadTest, LinesFromManyThreadsAreWhole) {
  const ScopedLog log;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t)
    threads.emplace_back([t] {
      for (int i = 0; i < 500; ++i) {
        const ScopedLog passing;
        FDYLogger::logDebug("%ld:%ld", t, i);
      }
    });
  for (std::thread& thread : threads) thread.join();
  EXPECT_THAT(log->lines(), SizeIs(2000));
  std::vector<int> next(4);
  for (const std::string& message : log->messages(LogLevel::Debug)) {
    const std::size_t t = static_cast<std::size_t>(message[0] - '0');
    EXPECT_EQ(std::to_string(t) + ":" + std::to_string(next[t]++), message);
  }
}

}  // namespace
}  // namespace quilt::platform
