// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <thread>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/testing/FaultySystemCalls.h"
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
using ::testing::IsEmpty;
using Call = FaultySystemCalls::Call;
using Repeat = FaultySystemCalls::Repeat;
namespace fs = std::filesystem;

class RemoveItemTest : public ::testing::Test {
 protected:
  const ScratchFolder scratch;
  PosixFileManager files;
};

TEST_F(RemoveItemTest, DeletesFoldersNestedWithoutEnd) {
  int folder = open(scratch.path().c_str(), O_RDONLY | O_DIRECTORY);
  for (int depth = 0; depth < 500; ++depth) {
    ASSERT_EQ(0, mkdirat(folder, "deep", 0700));
    const int next = openat(folder, "deep", O_RDONLY | O_DIRECTORY);
    ASSERT_GE(next, 0);
    close(openat(next, "file", O_WRONLY | O_CREAT, 0600));
    close(folder);
    folder = next;
  }
  close(folder);
  EXPECT_TRUE(files.removeItem(scratch / "deep", scratch.path()));
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
}

TEST_F(RemoveItemTest, DeletesReadOnlyFolders) {
  writePlainly(scratch / "in/sub/file", "x");
  ASSERT_EQ(0, chmod((scratch / "in/sub").c_str(), 0555));
  ASSERT_EQ(0, chmod((scratch / "in").c_str(), 0555));
  EXPECT_TRUE(files.removeItem(scratch / "in", scratch.path()));
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
}

TEST_F(RemoveItemTest, AFailedCallLeavesTheItemWholeOrHidden) {
  support::failAtEveryCall(
      EIO, Repeat::Once,
      [&] {
        fs::remove_all(scratch / "in");
        writePlainly(scratch / "in/item/sub/a", "x");
        writePlainly(scratch / "in/item/b", "x");
      },
      [&](PosixFileManager& faulty) { return faulty.removeItem(scratch / "in/item", scratch / "in").hasValue(); },
      [&](std::size_t, bool succeeded) {
        if (succeeded) {
          EXPECT_THAT(namesIn(scratch / "in"), IsEmpty());
          return;
        }
        if (fs::exists(scratch / "in/item")) {
          EXPECT_TRUE(fs::exists(scratch / "in/item/sub/a"));
          EXPECT_TRUE(fs::exists(scratch / "in/item/b"));
        }
        (void)files.sweepFolder(scratch / "in", SweepDepth::Level, {});
        for (const std::string& name : namesIn(scratch / "in")) EXPECT_EQ("item", name);
      });
}

TEST_F(RemoveItemTest, AKilledProcessLeavesNoHalfFolderUnderItsName) {
  support::dieAtEveryCall(
      [&] {
        fs::remove_all(scratch / "in");
        writePlainly(scratch / "in/item/sub/a", "x");
        writePlainly(scratch / "in/item/b", "x");
      },
      [&](PosixFileManager& killed) { (void)killed.removeItem(scratch / "in/item", scratch / "in"); },
      [&](std::size_t) {
        if (!fs::exists(scratch / "in/item")) return;
        EXPECT_TRUE(fs::exists(scratch / "in/item/sub/a"));
        EXPECT_TRUE(fs::exists(scratch / "in/item/b"));
      });
}

TEST_F(RemoveItemTest, AFullDiskThatRefusesRenamesIsEmptiedAllTheSame) {
  writePlainly(scratch / "item/a", "x");
  const auto system = std::make_shared<FaultySystemCalls>();
  system->failEvery(Call::RenameIfFree, ENOSPC);
  EXPECT_TRUE(PosixFileManager(system).removeItem(scratch / "item", scratch.path()));
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
}

TEST_F(RemoveItemTest, EntersNoOtherFileSystem) {
  writePlainly(scratch / "item/a", "x");
  fs::create_directory(scratch / "item/mounted");
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    const fs::path mounted = scratch / "item/mounted";
    if (unshare(CLONE_NEWNS) != 0 || mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
        mount("none", mounted.c_str(), "tmpfs", 0, nullptr) != 0)
      _exit(2);
    writePlainly(mounted / "precious", "x");
    const auto removed = files.removeItem(scratch / "item", scratch.path());
    _exit(!removed && removed.error().kind == ErrorKind::Unsafe && fs::exists(mounted / "precious") ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(child, waitpid(child, &status, 0));
  ASSERT_TRUE(WIFEXITED(status));
  if (WEXITSTATUS(status) == 2) GTEST_SKIP() << "this user may not mount";
  EXPECT_EQ(0, WEXITSTATUS(status));
}

TEST_F(RemoveItemTest, KeepsNoDescriptor) {
  const std::size_t before = support::openDescriptors();
  writePlainly(scratch / "item/sub/a", "x");
  EXPECT_TRUE(files.removeItem(scratch / "item", scratch.path()));
  EXPECT_FALSE(files.removeItem(scratch / "item/none", scratch.path()));
  EXPECT_FALSE(files.isConfined(scratch / "../x", scratch.path()));
  EXPECT_EQ(before, support::openDescriptors());
}

// An old kernel, and someone who exchanges a folder for a link out between the look at it and its opening.
class ExchangedMeanwhile final : public FaultySystemCalls {
 public:
  explicit ExchangedMeanwhile(fs::path folder, fs::path outside)
      : _folder(std::move(folder)), _outside(std::move(outside)) {
    failEvery(Call::OpenBeneath, ENOSYS);
  }
  int openAt(int folder, const char* name, int flags, mode_t mode) override {
    if (_folder.filename() == name) {
      fs::remove_all(_folder);
      fs::create_directory_symlink(_outside, _folder);
    }
    return FaultySystemCalls::openAt(folder, name, flags, mode);
  }

 private:
  const fs::path _folder;
  const fs::path _outside;
};

TEST_F(RemoveItemTest, ALinkPutInTheWayAtTheLastMomentIsNotFollowed) {
  writePlainly(scratch / "outside/sub/file", "kept");
  for (const char* item : {"in/way/sub/file", "in/way/sub", "in/way"}) {
    fs::remove_all(scratch / "in");
    writePlainly(scratch / "in/way/sub/file", "x");
    PosixFileManager attacked(std::make_shared<ExchangedMeanwhile>(scratch / "in/way", scratch / "outside"));
    EXPECT_FALSE(attacked.removeItem(scratch / item, scratch / "in")) << item;
    EXPECT_FALSE(attacked.isConfined(scratch / "in/way", scratch / "in"));
    EXPECT_EQ("kept", readPlainly(scratch / "outside/sub/file"));
  }
}

// While someone exchanges a folder on the way for a link out, again and again, nothing outside is reached.
TEST(RemoveItemThreadTest, ALinkPutInTheWayMeanwhileIsNotFollowed) {
  for (const bool oldKernel : {false, true}) {
    const ScratchFolder scratch;
    const auto system = std::make_shared<FaultySystemCalls>();
    if (oldKernel) system->failEvery(Call::OpenBeneath, ENOSYS);
    PosixFileManager files(system);
    writePlainly(scratch / "outside/sub/file", "kept");
    fs::create_directories(scratch / "in");
    std::atomic<bool> stop = false;
    std::thread attacker([&] {
      while (!stop) {
        std::error_code ignored;
        fs::create_directories(scratch / "in/way/sub", ignored);
        fs::rename(scratch / "in/way", scratch / "in/aside", ignored);
        fs::create_directory_symlink(scratch / "outside", scratch / "in/way", ignored);
        fs::remove(scratch / "in/way", ignored);
        fs::remove_all(scratch / "in/aside", ignored);
      }
    });
    int removed = 0;
    for (int i = 0; i < 500; ++i) {
      removed += files.removeItem(scratch / "in/way/sub/file", scratch / "in").hasValue() ? 1 : 0;
      (void)files.removeItem(scratch / "in/way/sub", scratch / "in");
      (void)files.removeItem(scratch / "in/way", scratch / "in");
    }
    stop = true;
    attacker.join();
    EXPECT_EQ(0, removed);
    EXPECT_EQ("kept", readPlainly(scratch / "outside/sub/file"));
  }
}

}  // namespace
}  // namespace quilt::platform
