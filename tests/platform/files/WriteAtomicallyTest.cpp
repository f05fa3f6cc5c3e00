// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/testing/FaultySystemCalls.h"
#include "quilt/platform/testing/ForgetfulDisk.h"
#include "tests/support/FaultWalk.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using support::namesIn;
using support::readPlainly;
using support::ScratchFolder;
using support::writePlainly;
using ::testing::AnyOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using Call = FaultySystemCalls::Call;
using Repeat = FaultySystemCalls::Repeat;

class WriteAtomicallyTest : public ::testing::Test {
 protected:
  void setUpOld() { writePlainly(file, old); }

  const ScratchFolder scratch;
  const std::filesystem::path file = scratch / "properties.plist";
  const std::string old = "old content";
  const std::string fresh = std::string(100000, 'n') + "new content";
};

TEST_F(WriteAtomicallyTest, AFailedCallLeavesTheOldFileAndNoTemporary) {
  for (const int error : {ENOSPC, EIO}) {
    Result<void> result;
    support::failAtEveryCall(
        error, Repeat::Once, [&] { setUpOld(); },
        [&](PosixFileManager& files) {
          result = files.writeAtomically(file, fresh);
          return result.hasValue();
        },
        [&](std::size_t, bool succeeded) {
          EXPECT_THAT(readPlainly(file), AnyOf(fresh, succeeded ? fresh : old));
          EXPECT_THAT(namesIn(scratch.path()), ElementsAre("properties.plist"));
          if (succeeded) return;
          EXPECT_EQ(error == ENOSPC ? ErrorKind::NoSpace : ErrorKind::InputOutput, result.error().kind);
        });
  }
}

TEST_F(WriteAtomicallyTest, UntilTheRenameNothingHappensToTheOldFile) {
  for (const Call call : {Call::Open, Call::Write, Call::Sync, Call::Close, Call::ChangeMode, Call::Rename}) {
    setUpOld();
    const auto system = std::make_shared<FaultySystemCalls>();
    system->failEvery(call, ENOSPC);
    const Result<void> result = PosixFileManager(system).writeAtomically(file, fresh);
    ASSERT_FALSE(result);
    EXPECT_EQ("The disk is full", result.error().text);
    EXPECT_EQ(file, result.error().file);
    EXPECT_EQ(old, readPlainly(file));
    EXPECT_THAT(namesIn(scratch.path()), ElementsAre("properties.plist"));
  }
}

TEST_F(WriteAtomicallyTest, ADiskThatFailsForEverKeepsTheOldOrTheNewFile) {
  support::failAtEveryCall(
      EIO, Repeat::ForEver, [&] { setUpOld(); },
      [&](PosixFileManager& files) { return files.writeAtomically(file, fresh).hasValue(); },
      [&](std::size_t, bool) { EXPECT_THAT(readPlainly(file), AnyOf(old, fresh)); });
}

TEST_F(WriteAtomicallyTest, AKilledProcessLeavesTheOldOrTheNewFile) {
  support::dieAtEveryCall([&] { setUpOld(); },
                          [&](PosixFileManager& files) { (void)files.writeAtomically(file, fresh); },
                          [&](std::size_t) { EXPECT_THAT(readPlainly(file), AnyOf(old, fresh)); });
}

TEST_F(WriteAtomicallyTest, ShortWritesAreContinued) {
  const auto system = std::make_shared<FaultySystemCalls>();
  system->transferAtMost(999);
  EXPECT_TRUE(PosixFileManager(system).writeAtomically(file, fresh));
  EXPECT_EQ(fresh, readPlainly(file));
}

TEST_F(WriteAtomicallyTest, SyncsTheFileBeforeTheRenameAndTheFolderAfterIt) {
  const auto system = std::make_shared<FaultySystemCalls>();
  EXPECT_TRUE(PosixFileManager(system).writeAtomically(file, "x"));
  EXPECT_THAT(system->calls(),
              ElementsAre(Call::Open, Call::Open, Call::Write, Call::Sync, Call::Close, Call::Rename, Call::Sync));
}

TEST_F(WriteAtomicallyTest, SurvivesAPowerCut) {
  for (const auto loss : {ForgetfulDisk::Loss::Names, ForgetfulDisk::Loss::Bytes, ForgetfulDisk::Loss::Both}) {
    setUpOld();
    const auto disk = std::make_shared<ForgetfulDisk>(scratch.path());
    EXPECT_TRUE(PosixFileManager(disk).writeAtomically(file, fresh));
    EXPECT_TRUE(PosixFileManager(disk).writeAtomically(scratch / "first", "first"));
    disk->losePower(loss);
    EXPECT_EQ(fresh, readPlainly(file));
    EXPECT_EQ("first", readPlainly(scratch / "first"));
  }
}

TEST_F(WriteAtomicallyTest, SurvivesAPowerCutInAFolderJustMade) {
  const auto disk = std::make_shared<ForgetfulDisk>(scratch.path());
  PosixFileManager files(disk);
  ASSERT_TRUE(files.createDirectoryAtPath(scratch / "a/b"));
  ASSERT_TRUE(files.writeAtomically(scratch / "a/b/file", fresh));
  ASSERT_TRUE(files.moveItem(scratch / "a/b", scratch / "c"));
  disk->losePower(ForgetfulDisk::Loss::Both);
  EXPECT_EQ(fresh, readPlainly(scratch / "c/file"));
  EXPECT_FALSE(std::filesystem::exists(scratch / "a/b"));
}

// The double itself: without syncs it loses what a disk would.
class UnsyncedDisk final : public ForgetfulDisk {
 public:
  using ForgetfulDisk::ForgetfulDisk;
  int sync(int) override { return 0; }
};

TEST_F(WriteAtomicallyTest, WithoutSyncsAPowerCutLosesTheNewFile) {
  setUpOld();
  const auto forgetsNames = std::make_shared<UnsyncedDisk>(scratch.path());
  ASSERT_TRUE(PosixFileManager(forgetsNames).writeAtomically(file, fresh));
  forgetsNames->losePower(ForgetfulDisk::Loss::Names);
  EXPECT_EQ(old, readPlainly(file));
  ASSERT_TRUE(PosixFileManager(forgetsNames).writeAtomically(file, fresh));
  forgetsNames->losePower(ForgetfulDisk::Loss::Bytes);
  EXPECT_EQ("", readPlainly(file));
}

TEST_F(WriteAtomicallyTest, AFolderThatCannotBeSyncedNeedsNoSync) {
  class NoFolderSync final : public SystemCalls {
    int sync(int item) override {
      struct stat status {};
      if (fstat(item, &status) != 0 || !S_ISDIR(status.st_mode)) return SystemCalls::sync(item);
      errno = EINVAL;
      return -1;
    }
  };
  EXPECT_TRUE(PosixFileManager(std::make_shared<NoFolderSync>()).writeAtomically(file, fresh));
}

TEST_F(WriteAtomicallyTest, SecretsAreNeverReadableByOthers) {
  class WatchedMode final : public SystemCalls {
   public:
    int sync(int item) override {
      struct stat status {};
      if (fstat(item, &status) == 0 && S_ISREG(status.st_mode)) modes.push_back(status.st_mode & 0777);
      return SystemCalls::sync(item);
    }
    ssize_t write(int item, const void* bytes, std::size_t count) override {
      struct stat status {};
      if (fstat(item, &status) == 0) modes.push_back(status.st_mode & 0777);
      return SystemCalls::write(item, bytes, count);
    }
    std::vector<mode_t> modes;
  };
  setUpOld();
  ASSERT_EQ(0, chmod(file.c_str(), 0600));
  const auto system = std::make_shared<WatchedMode>();
  EXPECT_TRUE(PosixFileManager(system).writeAtomically(file, fresh));
  EXPECT_THAT(system->modes, ElementsAre(0600U, 0600U));
}

TEST_F(WriteAtomicallyTest, KeepsNoDescriptor) {
  const std::size_t before = support::openDescriptors();
  support::failAtEveryCall(
      EIO, Repeat::Once, [&] { setUpOld(); },
      [&](PosixFileManager& files) { return files.writeAtomically(file, fresh).hasValue(); },
      [&](std::size_t, bool) { EXPECT_EQ(before, support::openDescriptors()); });
}

TEST_F(WriteAtomicallyTest, TemporariesOfOtherProcessesAreLeftAlone) {
  writePlainly(scratch / ".properties.plist.abcdefgh.tmp", "of another");
  EXPECT_TRUE(PosixFileManager().writeAtomically(file, fresh));
  EXPECT_THAT(namesIn(scratch.path()), Contains(".properties.plist.abcdefgh.tmp"));
}

}  // namespace
}  // namespace quilt::platform
