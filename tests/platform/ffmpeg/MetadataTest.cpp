// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/Metadata.h"

namespace quilt::platform::ffmpeg {
namespace {

TEST(RepairedTextTest, Utf8StaysAsItIs) { EXPECT_EQ(repairedText("naïve 日本 😀"), "naïve 日本 😀"); }

TEST(RepairedTextTest, OtherBytesAreLatin1) { EXPECT_EQ(repairedText("na\xefve \xa9"), "naïve ©"); }

TEST(RepairedTextTest, OverlongFormsAndSurrogatesAreNotUtf8) {
  EXPECT_EQ(repairedText("\xc0\xaf"), "À¯");
  EXPECT_EQ(repairedText("\xed\xa0\x80x"), "í\xc2\xa0\xc2\x80x");
  EXPECT_EQ(repairedText("x\xf4\x90\x80\x80x").substr(0, 3), "xô");
}

TEST(RepairedTextTest, BlanksAroundTheTextGo) { EXPECT_EQ(repairedText(" \n two words \r\n\t"), "two words"); }

TEST(RepairedTextTest, LongTextIsCutBetweenCharacters) {
  std::string text(kMaximumTagBytes - 1, 'a');
  text += "éé";
  EXPECT_EQ(repairedText(text), std::string(kMaximumTagBytes - 1, 'a'));
}

}  // namespace
}  // namespace quilt::platform::ffmpeg
