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
using ::testing::ElementsAre;
using Repeat = FaultySystemCalls::Repeat;
namespace fs = std::filesystem;

// Two folders that answer as if they lay on different disks.
template <class Base>
class TwoDisks : public Base {
 public:
  using Base::Base;
  int renameAt(int fromFolder, const char* from, int toFolder, const char* to, unsigned flags) override {
    struct stat one {};
    struct stat other {};
    if (fstat(fromFolder, &one) == 0 && fstat(toFolder, &other) == 0 && one.st_ino != other.st_ino) {
      errno = EXDEV;
      return -1;
    }
    return Base::renameAt(fromFolder, from, toFolder, to, flags);
  }
};

class MoveItemTest : public ::testing::Test {
 protected:
  void setUpDisks() {
    fs::remove_all(scratch / "one");
    fs::remove_all(scratch / "two");
    writePlainly(from / "a", "a");
    writePlainly(from / "sub/b", "b");
    fs::create_directory(scratch / "two");
  }
  static bool isWhole(const fs::path& folder) {
    return readPlainly(folder / "a") == "a" && readPlainly(folder / "sub/b") == "b";
  }

  const ScratchFolder scratch;
  const fs::path from = scratch / "one/item";
  const fs::path to = scratch / "two/item";
};

TEST_F(MoveItemTest, MovesAcrossDisks) {
  setUpDisks();
  EXPECT_TRUE(PosixFileManager(std::make_shared<TwoDisks<SystemCalls>>()).moveItem(from, to));
  EXPECT_TRUE(isWhole(to));
  EXPECT_THAT(namesIn(scratch / "one"), ElementsAre());
  EXPECT_THAT(namesIn(scratch / "two"), ElementsAre("item"));
}

TEST_F(MoveItemTest, AcrossDisksNothingIsReplaced) {
  setUpDisks();
  writePlainly(to, "kept");
  const auto moved = PosixFileManager(std::make_shared<TwoDisks<SystemCalls>>()).moveItem(from, to);
  ASSERT_FALSE(moved);
  EXPECT_EQ(ErrorKind::AlreadyExists, moved.error().kind);
  EXPECT_EQ("kept", readPlainly(to));
  EXPECT_TRUE(isWhole(from));
}

TEST_F(MoveItemTest, AcrossDisksAFailedCallNeverLosesTheItem) {
  for (const auto repeat : {Repeat::Once, Repeat::ForEver})
    for (std::size_t n = 1;; ++n) {
      SCOPED_TRACE(n);
      ASSERT_LT(n, 1000U);
      setUpDisks();
      const auto system = std::make_shared<TwoDisks<FaultySystemCalls>>();
      system->failNth(n, EIO, repeat);
      const bool succeeded = PosixFileManager(system).moveItem(from, to).hasValue();
      const bool reached = system->calls().size() >= n;
      EXPECT_TRUE(isWhole(from) || isWhole(to));
      if (succeeded) {
        EXPECT_TRUE(isWhole(to));
        EXPECT_FALSE(fs::exists(from));
      }
      // No other name is left, but for the leavings of a disk that failed for good.
      if (repeat == Repeat::Once) {
        EXPECT_LE(namesIn(scratch / "one").size(), 1U);
        EXPECT_THAT(namesIn(scratch / "two"), AnyOf(ElementsAre(), ElementsAre("item")));
        EXPECT_EQ(isWhole(to), fs::exists(to));
      }
      if (!reached) {
        EXPECT_TRUE(succeeded);
        break;
      }
    }
}

TEST_F(MoveItemTest, AcrossDisksAPowerCutNeverLosesTheItem) {
  for (const auto loss : {ForgetfulDisk::Loss::Names, ForgetfulDisk::Loss::Bytes, ForgetfulDisk::Loss::Both}) {
    setUpDisks();
    const auto disk = std::make_shared<TwoDisks<ForgetfulDisk>>(scratch.path());
    EXPECT_TRUE(PosixFileManager(disk).moveItem(from, to));
    disk->losePower(loss);
    EXPECT_TRUE(isWhole(to));
  }
}

// A folder from which nothing may be deleted.
class KeepsItsItems final : public TwoDisks<SystemCalls> {
 public:
  explicit KeepsItsItems(const fs::path& folder) { EXPECT_EQ(0, stat(folder.c_str(), &_kept)); }
  int unlinkAt(int folder, const char* name, int flags) override {
    struct stat status {};
    if (fstat(folder, &status) != 0 || status.st_ino != _kept.st_ino)
      return TwoDisks<SystemCalls>::unlinkAt(folder, name, flags);
    errno = EROFS;
    return -1;
  }

 private:
  struct stat _kept {};
};

TEST_F(MoveItemTest, WhenTheSourceCannotBeDeletedTheCopyGoes) {
  setUpDisks();
  writePlainly(scratch / "one/file", "x");
  const auto moved = PosixFileManager(std::make_shared<KeepsItsItems>(scratch / "one"))
                         .moveItem(scratch / "one/file", scratch / "two/file");
  ASSERT_FALSE(moved);
  EXPECT_EQ("The disk can only be read", moved.error().text);
  EXPECT_EQ(scratch / "one/file", moved.error().file);
  EXPECT_EQ("x", readPlainly(scratch / "one/file"));
  EXPECT_THAT(namesIn(scratch / "two"), ElementsAre());
}

TEST_F(MoveItemTest, OnOneDiskAKilledProcessLeavesTheItemWhole) {
  support::dieAtEveryCall([&] { setUpDisks(); }, [&](PosixFileManager& files) { (void)files.moveItem(from, to); },
                          [&](std::size_t) { EXPECT_NE(isWhole(from), isWhole(to)); });
}

TEST_F(MoveItemTest, OnOneDiskAPowerCutKeepsTheMove) {
  setUpDisks();
  const auto disk = std::make_shared<ForgetfulDisk>(scratch.path());
  EXPECT_TRUE(PosixFileManager(disk).moveItem(from, to));
  disk->losePower(ForgetfulDisk::Loss::Both);
  EXPECT_TRUE(isWhole(to));
  EXPECT_FALSE(fs::exists(from));
}

}  // namespace
}  // namespace quilt::platform
