// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <filesystem>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/PosixFileManager.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;
using support::namesIn;
using support::readPlainly;
using support::ScratchFolder;
using support::writePlainly;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

IsRecorded recorded(bool answer) {
  return [answer](const fs::path&) -> std::optional<bool> { return answer; };
}

class SweepTest : public ::testing::Test {
 protected:
  const ScratchFolder scratch;
  PosixFileManager files;
};

TEST_F(SweepTest, WhatIsHalfMadeGoes) {
  writePlainly(scratch / "in" / hiddenNameBeside("a"), "half");
  writePlainly(scratch / "in" / hiddenNameBeside("b") / "sub" / "c", "half deleted");
  writePlainly(scratch / "in" / ".0F4B2C1A-0000-4000-8000-000000000001.m4v", "half converted");
  writePlainly(scratch / "in" / ".profile", "the user's own");
  EXPECT_EQ(3U, files.sweepFolder(scratch / "in", SweepDepth::Level, {}));
  EXPECT_THAT(namesIn(scratch / "in"), ElementsAre(".profile"));
}

TEST_F(SweepTest, ALevelIsNoTree) {
  writePlainly(scratch / "in" / "sub" / hiddenNameBeside("a"), "half");
  EXPECT_EQ(0U, files.sweepFolder(scratch / "in", SweepDepth::Level, {}));
  EXPECT_EQ(1U, files.sweepFolder(scratch / "in", SweepDepth::Tree, {}));
  EXPECT_THAT(namesIn(scratch / "in" / "sub"), IsEmpty());
}

TEST_F(SweepTest, WhatSomebodyHoldsStays) {
  writePlainly(scratch / "in" / hiddenNameBeside("a"), "being made");
  auto hold = files.holdFolder(scratch / "in");
  EXPECT_EQ(0U, files.sweepFolder(scratch / "in", SweepDepth::Tree, {}));
  hold = nullptr;
  EXPECT_EQ(1U, files.sweepFolder(scratch / "in", SweepDepth::Tree, {}));
}

TEST_F(SweepTest, WhatIsSetAsideComesBackWhenTheRecordNamesIt) {
  writePlainly(scratch / "in" / "item" / "a", "x");
  ASSERT_TRUE(files.setAside(scratch / "in" / "item", scratch.path(), false));
  EXPECT_FALSE(fs::exists(scratch / "in" / "item"));
  files.sweepFolder(scratch / "in", SweepDepth::Tree, {});
  EXPECT_THAT(namesIn(scratch / "in"), SizeIs(1)) << "without a record nobody knows";
  files.sweepFolder(scratch / "in", SweepDepth::Tree, recorded(true));
  EXPECT_EQ("x", readPlainly(scratch / "in" / "item" / "a"));
  ASSERT_TRUE(files.setAside(scratch / "in" / "item", scratch.path(), false));
  files.sweepFolder(scratch / "in", SweepDepth::Tree, recorded(false));
  EXPECT_THAT(namesIn(scratch / "in"), IsEmpty());
}

TEST_F(SweepTest, WhatWasReplacedMeanwhileDoesNotComeBack) {
  writePlainly(scratch / "in" / "item", "old");
  ASSERT_TRUE(files.setAside(scratch / "in" / "item", scratch.path(), false));
  writePlainly(scratch / "in" / "item", "new");
  files.sweepFolder(scratch / "in", SweepDepth::Level, recorded(true));
  EXPECT_THAT(namesIn(scratch / "in"), ElementsAre("item"));
  EXPECT_EQ("new", readPlainly(scratch / "in" / "item"));
}

TEST_F(SweepTest, WhatIsMarkedGoesWithItsMarkUnlessItIsRecorded) {
  for (const bool isRecorded : {false, true}) {
    ASSERT_TRUE(files.markUnfinished(scratch / "item"));
    writePlainly(scratch / "item" / "a", "x");
    files.sweepFolder(scratch.path(), SweepDepth::Level, recorded(isRecorded));
    EXPECT_EQ(isRecorded, fs::exists(scratch / "item" / "a"));
    EXPECT_THAT(namesIn(scratch.path()), SizeIs(isRecorded ? 1 : 0));
  }
}

TEST_F(SweepTest, NothingOutsideCanBeSetAside) {
  writePlainly(scratch / "outside" / "file", "kept");
  fs::create_directory(scratch / "in");
  fs::create_directory_symlink(scratch / "outside", scratch / "in" / "link");
  EXPECT_FALSE(files.setAside(scratch / "in" / "link" / "file", scratch / "in", false));
  EXPECT_FALSE(files.setAside(scratch / "outside" / "file", scratch / "in", true));
  EXPECT_FALSE(files.setAside(scratch / "in" / "none", scratch / "in", true));
  EXPECT_EQ("kept", readPlainly(scratch / "outside" / "file"));
}

}  // namespace
}  // namespace quilt::platform
