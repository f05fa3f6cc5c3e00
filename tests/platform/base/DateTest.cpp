// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/base/Date.h"

namespace quilt::platform {
namespace {

using namespace std::chrono_literals;

TEST(DateTest, WritesUtcToTheSecond) {
  EXPECT_EQ("1970-01-01T00:00:00Z", formatIso8601(Date{}));
  EXPECT_EQ("2026-03-05T14:07:09Z", formatIso8601(Date{1772719629s}));
  EXPECT_EQ("1969-12-31T23:59:59Z", formatIso8601(Date{-1s}));
}

TEST(DateTest, DropsFractionsTowardThePast) {
  EXPECT_EQ("1970-01-01T00:00:00Z", formatIso8601(Date{999ms}));
  EXPECT_EQ("1969-12-31T23:59:59Z", formatIso8601(Date{-1ms}));
}

TEST(DateTest, ReadsWhatItWrites) {
  for (const char* text : {"1970-01-01T00:00:00Z", "2026-03-05T14:07:09Z", "2024-02-29T23:59:59Z",
                           "1678-01-01T00:00:00Z", "2261-12-31T23:59:59Z"}) {
    const auto date = parseIso8601(text);
    ASSERT_TRUE(date) << text;
    EXPECT_EQ(text, formatIso8601(*date));
  }
}

TEST(DateTest, ClampsWhatTheClockCannotHold) {
  EXPECT_EQ("1678-01-01T00:00:00Z", formatIso8601(*parseIso8601("0001-01-01T00:00:00Z")));
  EXPECT_EQ("2262-01-01T23:00:00Z", formatIso8601(*parseIso8601("9999-12-31T23:00:00Z")));
  EXPECT_EQ("2262-01-01T23:59:59Z", formatIso8601(*parseIso8601("9999-12-31T23:59:60Z")));
}

TEST(DateTest, RefusesEverythingElse) {
  for (const char* text :
       {"", "2026-03-05", "2026-03-05T14:07:09", "2026-03-05T14:07:09+00:00", "2026-03-05 14:07:09Z",
        "2026-03-05T14:07:09.5Z", "2026-3-05T14:07:09ZZ", "2026-02-30T00:00:00Z", "2025-02-29T00:00:00Z",
        "2026-13-01T00:00:00Z", "2026-00-01T00:00:00Z", "2026-01-00T00:00:00Z", "2026-01-01T24:00:00Z",
        "2026-01-01T00:60:00Z", "2026-01-01T00:00:61Z", "-026-01-01T00:00:00Z", "2026-01-01T00:00:0xZ"})
    EXPECT_FALSE(parseIso8601(text)) << text;
}

}  // namespace
}  // namespace quilt::platform
