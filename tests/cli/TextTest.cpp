// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "cli/Text.h"

namespace quilt::cli {
namespace {

using namespace std::string_literals;

TEST(TextTest, EscapesWhatCouldMoveTheCursorOrHideText) {
  EXPECT_EQ("a\\nb\\tc\\rd", escaped("a\nb\tc\rd"));
  EXPECT_EQ("\\x1b[31m\\x07\\x00\\x7f", escaped("\x1b[31m\x07\0\x7f"s));
  EXPECT_EQ("\\u009b", escaped("\xc2\x9b"));                          // a control character in UTF-8
  EXPECT_EQ("\\u202e\\u2028\\u2067", escaped("\u202e\u2028\u2067"));  // direction marks, line separator
  EXPECT_EQ("a\\\\b", escaped("a\\b"));
}

TEST(TextTest, KeepsOrdinaryText) { EXPECT_EQ("Grüße, 日本語 🎬", escaped("Grüße, 日本語 🎬")); }

TEST(TextTest, EscapesBytesThatAreNoUtf8) {
  EXPECT_EQ("a\\xffb", escaped("a\xff"
                               "b"));
  EXPECT_EQ("\\xc0\\xaf", escaped("\xc0\xaf"));           // an overlong "/"
  EXPECT_EQ("\\xed\\xa0\\x80", escaped("\xed\xa0\x80"));  // half of a surrogate pair
  EXPECT_EQ("\\xe2\\x82", escaped("\xe2\x82"));           // cut off
}

TEST(TextTest, TellsWhatCanBeKeptAsAText) {
  EXPECT_TRUE(isText("Grüße 🎬"));
  EXPECT_TRUE(isText("two\nlines\tand a tab"));
  EXPECT_FALSE(isText("Gr\xfc\xdf"));
  EXPECT_FALSE(isText("\xf4\x90\x80\x80"));
  EXPECT_FALSE(isText("\x1b[31m"));
}

TEST(TextTest, MakesATitleOfAnyFileName) {
  EXPECT_EQ("a b\xef\xbf\xbd", asTitle("a\nb\xff"));
  EXPECT_EQ("Grüße", asTitle("Grüße"));
}

TEST(TextTest, WritesSizesDurationsAndColumns) {
  EXPECT_EQ("999 B", sizeText(999));
  EXPECT_EQ("1.0 kB", sizeText(1000));
  EXPECT_EQ("1.0 MB", sizeText(999'950));
  EXPECT_EQ("12.3 GB", sizeText(12'345'678'901));
  EXPECT_EQ("0:00", durationText(0));
  EXPECT_EQ("0:07", durationText(6.6));
  EXPECT_EQ("1:00:00", durationText(3599.7));
  EXPECT_EQ(5U, columns("Grüße"));
  EXPECT_EQ("ü  ", padded("ü", 3));
  EXPECT_EQ("long", padded("long", 3));
}

}  // namespace
}  // namespace quilt::cli
