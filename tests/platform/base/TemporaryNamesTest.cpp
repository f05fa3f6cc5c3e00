// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/TemporaryNames.h"

#include <gtest/gtest.h>

namespace quilt::platform {
namespace {

TEST(TemporaryNamesTest, ANameIsHiddenAndSaysWhatItIsFor) {
  const std::string name = hiddenNameBeside("movie.mp4");
  EXPECT_TRUE(name.starts_with(".movie.mp4.")) << name;
  EXPECT_NE(name, hiddenNameBeside("movie.mp4"));
}

TEST(TemporaryNamesTest, ALongNameIsCutBetweenCharacters) {
  const std::string name = hiddenNameBeside("\xC3\xA4" + std::string(238, 'a') + "\xC3\xA4\xC3\xA4\xC3\xA4\xC3\xA4");
  EXPECT_EQ(254u, name.size()) << "one byte is left where half a character would have been";
  EXPECT_TRUE(isHiddenTemporaryName(name));
}

TEST(TemporaryNamesTest, OnlySuchNamesAreTakenForTemporaries) {
  for (const char* beside : {"a", "", "movie.mp4", ".hidden", "a.b.c.tmp"})
    EXPECT_TRUE(isHiddenTemporaryName(hiddenNameBeside(beside))) << beside;
  for (const char* name : {"", ".", ".tmp", "movie.tmp", "movie.abcdefgh.tmp", ".movie.tmp", ".movie.abcdefg.tmp",
                           ".movie.abcdefgH.tmp", ".movie.abcdefgh.tmp2", ".abcdefgh.tmp", "..DS_Store"})
    EXPECT_FALSE(isHiddenTemporaryName(name)) << name;
}

}  // namespace
}  // namespace quilt::platform
