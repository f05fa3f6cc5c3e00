// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <thread>
#include <vector>

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
using ::testing::IsEmpty;

class FileLockTest : public ::testing::Test {
 protected:
  // A process that takes the lock and keeps it until it is killed.
  pid_t startHolder(const std::string& owner) {
    int ready[2];
    EXPECT_EQ(0, pipe(ready));
    const pid_t child = fork();
    if (child == 0) {
      auto lock = files.lockFile(path, owner);
      const char answer = lock ? 'y' : 'n';
      if (write(ready[1], &answer, 1) == 1) pause();
      _exit(1);
    }
    char answer = 0;
    EXPECT_EQ(1, read(ready[0], &answer, 1));
    EXPECT_EQ('y', answer);
    close(ready[0]);
    close(ready[1]);
    return child;
  }
  static void kill(pid_t process) {
    ASSERT_EQ(0, ::kill(process, SIGKILL));
    ASSERT_EQ(process, waitpid(process, nullptr, 0));
  }

  const ScratchFolder scratch;
  const std::filesystem::path path = scratch / "lock";
  PosixFileManager files;
};

TEST_F(FileLockTest, IsRefusedWhileAnotherProcessHoldsIt) {
  const pid_t holder = startHolder("pid 123 on host");
  const auto lock = files.lockFile(path, "me");
  ASSERT_FALSE(lock);
  EXPECT_EQ(ErrorKind::Locked, lock.error().kind);
  EXPECT_EQ("It is in use by pid 123 on host", lock.error().text);
  EXPECT_EQ(path, lock.error().file);
  kill(holder);
}

TEST_F(FileLockTest, IsTakenOverWhenItsOwnerIsGone) {
  kill(startHolder("a much longer text, pid 123 on host"));
  EXPECT_EQ("a much longer text, pid 123 on host", readPlainly(path));
  const auto lock = files.lockFile(path, "me");
  ASSERT_TRUE(lock);
  EXPECT_EQ("me", readPlainly(path));
}

TEST_F(FileLockTest, LeavesNoFileBehind) {
  const std::size_t before = support::openDescriptors();
  { const auto lock = files.lockFile(path, "me"); }
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
  EXPECT_EQ(before, support::openDescriptors());
}

TEST_F(FileLockTest, NamesAnotherProgramWhenTheHolderLeftNoText) {
  const auto lock = files.lockFile(path, "");
  const auto second = files.lockFile(path, "me");
  ASSERT_FALSE(second);
  EXPECT_EQ("It is in use by another program", second.error().text);
}

TEST_F(FileLockTest, HoldsThoughTheDiskIsTooFullForTheText) {
  const auto system = std::make_shared<FaultySystemCalls>();
  system->failEvery(FaultySystemCalls::Call::Write, ENOSPC);
  const auto lock = PosixFileManager(system).lockFile(path, "me");
  ASSERT_TRUE(lock);
  EXPECT_FALSE(files.lockFile(path, "you"));
}

TEST_F(FileLockTest, TellsWhetherItsLastHolderGaveItUp) {
  EXPECT_FALSE((*files.lockFile(path, "me"))->wasAbandoned());
  EXPECT_FALSE((*files.lockFile(path, "me"))->wasAbandoned());
  support::writePlainly(path, "process 1 on a machine that lost power");
  EXPECT_TRUE((*files.lockFile(path, "me"))->wasAbandoned());
}

TEST_F(FileLockTest, FollowsNoLink) {
  support::writePlainly(scratch / "precious", "kept");
  std::filesystem::create_symlink("precious", path);
  const auto lock = files.lockFile(path, "me");
  ASSERT_FALSE(lock);
  EXPECT_EQ(ErrorKind::Unsafe, lock.error().kind);
  EXPECT_EQ("kept", readPlainly(scratch / "precious"));
}

// The last holder gives up, and deletes its file, between our opening it and our locking it.
class DeletedMeanwhile final : public SystemCalls {
 public:
  int openAt(int folder, const char* name, int flags, mode_t mode) override {
    const int file = SystemCalls::openAt(folder, name, flags, mode);
    if (!_done && (flags & O_CREAT) != 0) unlinkAt(folder, name, 0);
    _done = true;
    return file;
  }

 private:
  bool _done = false;
};

TEST_F(FileLockTest, IsNeverTakenOnAFileThatIsGone) {
  const auto lock = PosixFileManager(std::make_shared<DeletedMeanwhile>()).lockFile(path, "me");
  ASSERT_TRUE(lock);
  EXPECT_EQ("me", readPlainly(path));
  EXPECT_FALSE(files.lockFile(path, "you"));
}

TEST(FileLockThreadTest, OneHolderAtATime) {
  const ScratchFolder scratch;
  PosixFileManager files;
  std::atomic<int> holders = 0;
  std::atomic<int> taken = 0;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t)
    threads.emplace_back([&] {
      for (int i = 0; i < 500; ++i) {
        const auto lock = files.lockFile(scratch / "lock", "thread");
        if (!lock) continue;
        EXPECT_EQ(1, ++holders);
        ++taken;
        --holders;
      }
    });
  for (std::thread& thread : threads) thread.join();
  EXPECT_GT(taken, 0);
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
}

}  // namespace
}  // namespace quilt::platform
