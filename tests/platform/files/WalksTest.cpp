// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <sys/stat.h>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/testing/ForgetfulDisk.h"
#include "tests/support/FaultWalk.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;
using support::namesIn;
using support::readPlainly;
using support::ScratchFolder;
using support::writePlainly;
using ::testing::UnorderedElementsAre;
using Repeat = FaultySystemCalls::Repeat;

class WalksTest : public ::testing::Test {
 protected:
  const ScratchFolder scratch;
  PosixFileManager files;
};

TEST_F(WalksTest, ASyncedCopySurvivesAPowerCut) {
  writePlainly(scratch / "from" / "a", "a");
  writePlainly(scratch / "from" / "deep" / "b", "b");
  fs::create_symlink("a", scratch / "from" / "link");
  for (const auto loss : {ForgetfulDisk::Loss::Names, ForgetfulDisk::Loss::Bytes, ForgetfulDisk::Loss::Both}) {
    fs::remove_all(scratch / "to");
    const auto disk = std::make_shared<ForgetfulDisk>(scratch.path());
    PosixFileManager onDisk(disk);
    ASSERT_EQ(0, onDisk.copyfile(scratch / "from", scratch / "to", nullptr, nullptr));
    EXPECT_EQ(0, onDisk.syncItem(scratch / "to"));
    disk->losePower(loss);
    EXPECT_EQ("a", readPlainly(scratch / "to" / "a"));
    EXPECT_EQ("b", readPlainly(scratch / "to" / "deep" / "b"));
    EXPECT_EQ("a", fs::read_symlink(scratch / "to" / "link"));
  }
}

TEST_F(WalksTest, WithoutASyncAPowerCutLosesTheCopy) {
  writePlainly(scratch / "from", "a");
  const auto disk = std::make_shared<ForgetfulDisk>(scratch.path());
  ASSERT_EQ(0, PosixFileManager(disk).copyfile(scratch / "from", scratch / "to", nullptr, nullptr));
  disk->losePower(ForgetfulDisk::Loss::Both);
  EXPECT_FALSE(fs::exists(scratch / "to"));
}

TEST_F(WalksTest, AFailedSyncIsReported) {
  writePlainly(scratch / "item" / "a", "a");
  support::failAtEveryCall(
      EIO, Repeat::Once, [] {},
      [&](PosixFileManager& faulty) {
        const int result = faulty.syncItem(scratch / "item");
        EXPECT_LE(result, 0);
        return result == 0;
      },
      [](std::size_t, bool) {});
  EXPECT_EQ(-ENOENT, files.syncItem(scratch / "none"));
}

TEST_F(WalksTest, TemporariesGoAtEveryLevelAndNothingElseDoes) {
  writePlainly(scratch / "library" / "collection.plist", "kept");
  writePlainly(scratch / "library" / hiddenNameBeside("collection.plist"), "half");
  writePlainly(scratch / "library" / "a.qpk" / "Media" / hiddenNameBeside("movie.mp4"), "half");
  writePlainly(scratch / "library" / "a.qpk" / "Media" / ".movie.tmp", "kept");
  writePlainly(scratch / "library" / hiddenNameBeside("b.qpk") / "properties.plist", "half deleted");
  const Result<std::size_t> removed = files.removeTemporariesIn(scratch / "library");
  ASSERT_TRUE(removed);
  EXPECT_EQ(3u, *removed);
  EXPECT_THAT(namesIn(scratch / "library"), UnorderedElementsAre("a.qpk", "collection.plist"));
  EXPECT_THAT(namesIn(scratch / "library" / "a.qpk" / "Media"), UnorderedElementsAre(".movie.tmp"));
}

TEST_F(WalksTest, TemporariesBehindALinkStay) {
  const std::string name = hiddenNameBeside("movie.mp4");
  writePlainly(scratch / "elsewhere" / name, "another library's");
  fs::create_directory(scratch / "library");
  fs::create_symlink("../elsewhere", scratch / "library" / "link");
  EXPECT_EQ(0u, *files.removeTemporariesIn(scratch / "library"));
  EXPECT_TRUE(fs::exists(scratch / "elsewhere" / name));
}

TEST_F(WalksTest, WhatCannotBeDeletedIsReported) {
  writePlainly(scratch / "library" / hiddenNameBeside("a"), "half");
  const auto system = std::make_shared<FaultySystemCalls>();
  system->failEvery(FaultySystemCalls::Call::Unlink, EACCES);
  EXPECT_FALSE(PosixFileManager(system).removeTemporariesIn(scratch / "library"));
  EXPECT_FALSE(files.removeTemporariesIn(scratch / "none"));
}

}  // namespace
}  // namespace quilt::platform
