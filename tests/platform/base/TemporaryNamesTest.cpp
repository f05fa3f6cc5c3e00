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

TEST(TemporaryNamesTest, EachKindSaysWhatItGoesWith) {
  const std::string half = hiddenNameBeside("a.qpk");
  const std::string aside = asideNameBeside("a.qpk");
  const std::string mark = unfinishedNameBeside("a.qpk");
  EXPECT_EQ(HiddenKind::Half, hiddenNameFrom(half).kind);
  EXPECT_EQ(HiddenKind::Aside, hiddenNameFrom(aside).kind);
  EXPECT_EQ(HiddenKind::Unfinished, hiddenNameFrom(mark).kind);
  for (const std::string* name : {&half, &aside, &mark}) EXPECT_EQ("a.qpk", hiddenNameFrom(*name).of);
}

TEST(TemporaryNamesTest, ConversionsExportsAndArchivesUnderWayAreOfTheFamily) {
  const std::string uuid = "0F4B2C1A-0000-4000-8000-00000000000a";
  for (const std::string& name :
       {"." + uuid + ".m4v", "." + uuid + ".png", "." + uuid + ".qpk", "." + uuid + ".qpk.zip", ".Talk.qpk.zip." + uuid,
        "." + uuid + ".qpk.zip." + uuid, "." + uuid + ".qpk.zip." + uuid + ".aB3dE6"})
    EXPECT_EQ(HiddenKind::Half, hiddenNameFrom(name).kind) << name;
  for (const std::string& name : {uuid + ".m4v", "." + uuid, "." + uuid + ".", "." + uuid + ".a b",
                                  "." + uuid + "x.m4v", std::string(".0F4B2C1A.m4v"), ".Talk" + uuid})
    EXPECT_EQ(HiddenKind::None, hiddenNameFrom(name).kind) << name;
}

TEST(TemporaryNamesTest, WhatAMarkIsBesideIsNotFinished) {
  EXPECT_EQ((std::vector<std::string>{"b.qpk"}),
            finishedNames({"a.qpk", "b.qpk", ".hidden", unfinishedNameBeside("a.qpk"), hiddenNameBeside("b.qpk")}));
}

}  // namespace
}  // namespace quilt::platform
