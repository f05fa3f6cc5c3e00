// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
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
  EXPECT_EQ("quilt lock\na much longer text, pid 123 on host", readPlainly(path));
  const auto lock = files.lockFile(path, "me");
  ASSERT_TRUE(lock);
  EXPECT_EQ("quilt lock\nme", readPlainly(path));
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
  support::writePlainly(path, "quilt lock\nprocess 1 on a machine that lost power");
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
  EXPECT_EQ("quilt lock\nme", readPlainly(path));
  EXPECT_FALSE(files.lockFile(path, "you"));
}

TEST_F(FileLockTest, SeveralShareItAndNobodyGetsItAloneMeanwhile) {
  auto one = files.shareLockFile(path, nullptr);
  auto other = files.shareLockFile(path, nullptr);
  ASSERT_TRUE(one && other);
  const auto refused = files.lockFile(path, "me");
  ASSERT_FALSE(refused);
  EXPECT_EQ("It is in use by another program", refused.error().text);
  one->reset();
  EXPECT_FALSE(files.lockFile(path, "me"));
  other->reset();
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
  EXPECT_TRUE(files.lockFile(path, "me"));
}

TEST_F(FileLockTest, NobodySharesWhatOneHasAlone) {
  const pid_t holder = startHolder("pid 123 on host");
  const auto shared = files.shareLockFile(path, nullptr);
  ASSERT_FALSE(shared);
  EXPECT_EQ("It is in use by pid 123 on host", shared.error().text);
  kill(holder);
  EXPECT_TRUE(files.shareLockFile(path, nullptr));
}

TEST_F(FileLockTest, WhoSharesWhatAKilledHolderLeftClearsUpAloneFirst) {
  kill(startHolder("pid 123 on host"));
  bool wasAlone = false;
  const auto lock = files.shareLockFile(path, [&] { wasAlone = !files.lockFile(path, "you"); });
  ASSERT_TRUE(lock);
  EXPECT_TRUE(wasAlone);
  EXPECT_TRUE((*lock)->wasAbandoned());
  bool again = false;
  EXPECT_TRUE(files.shareLockFile(path, [&again] { again = true; }));
  EXPECT_FALSE(again) << "the first still shares it";
}

// What lies in the lock's place, and must lie there afterwards, untouched.
class FileLockPlaceTest : public FileLockTest {
 protected:
  void expectRefused(ErrorKind kind) {
    for (const auto& lock : {files.lockFile(path, "me").hasValue(), files.shareLockFile(path, nullptr).hasValue()})
      EXPECT_FALSE(lock);
    EXPECT_EQ(kind, files.lockFile(path, "me").error().kind);
  }
};

TEST_F(FileLockPlaceTest, AForeignFileIsNotOverwritten) {
  support::writePlainly(path, "somebody's notes");
  expectRefused(ErrorKind::Unsafe);
  EXPECT_EQ("somebody's notes", readPlainly(path));
}

TEST_F(FileLockPlaceTest, NorIsAFileOfTwoNames) {
  support::writePlainly(scratch / "precious", "quilt lock\nkept");
  std::filesystem::create_hard_link(scratch / "precious", path);
  expectRefused(ErrorKind::Unsafe);
  EXPECT_EQ("quilt lock\nkept", readPlainly(scratch / "precious"));
  EXPECT_TRUE(std::filesystem::exists(path));
}

TEST_F(FileLockPlaceTest, APipeIsNotWaitedForAndAFolderStays) {
  ASSERT_EQ(0, mkfifo(path.c_str(), 0600));
  expectRefused(ErrorKind::Unsafe);
  std::filesystem::remove(path);
  std::filesystem::create_directory(path);
  expectRefused(ErrorKind::Unsafe);
  EXPECT_TRUE(std::filesystem::is_directory(path));
}

// As network file systems answer without a lock service, and old kernels to the first way of locking.
class FileLockSupportTest : public FileLockTest {
 protected:
  using Call = FaultySystemCalls::Call;
  const std::shared_ptr<FaultySystemCalls> system = std::make_shared<FaultySystemCalls>();
  PosixFileManager faulty{system};
};

TEST_F(FileLockSupportTest, WithoutLocksItSaysSoAndLeavesNothing) {
  for (const int error : {ENOLCK, EOPNOTSUPP, ENOSYS}) {
    system->failEvery(Call::Lock, error);
    const auto lock = faulty.lockFile(path, "me");
    ASSERT_FALSE(lock);
    EXPECT_EQ(ErrorKind::Unsupported, lock.error().kind);
    EXPECT_THAT(lock.error().text, ::testing::HasSubstr("does not support locks"));
    EXPECT_FALSE(faulty.shareLockFile(path, nullptr));
    EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
  }
}

TEST_F(FileLockSupportTest, TheOtherWayServesWhereThereIsNoFirst) {
  system->failEvery(Call::Lock, EINVAL);
  {
    const auto lock = faulty.lockFile(path, "me");
    ASSERT_TRUE(lock);
    EXPECT_EQ("It is in use by me", faulty.lockFile(path, "you").error().text);
  }
  {
    const auto one = faulty.shareLockFile(path, nullptr);
    const auto other = faulty.shareLockFile(path, nullptr);
    EXPECT_TRUE(one && other);
    EXPECT_FALSE(faulty.lockFile(path, "me"));
  }
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
}

TEST_F(FileLockSupportTest, AnErrorOfTheDiskIsToldAsOne) {
  system->failEvery(Call::Lock, EIO);
  EXPECT_EQ(ErrorKind::InputOutput, faulty.lockFile(path, "me").error().kind);
}

TEST(FileLockThreadTest, ManyShareItAndTheLastLeavesNothing) {
  const ScratchFolder scratch;
  PosixFileManager files;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t)
    threads.emplace_back([&] {
      for (int i = 0; i < 300; ++i) EXPECT_TRUE(files.shareLockFile(scratch / "lock", nullptr)) << i;
    });
  for (std::thread& thread : threads) thread.join();
  EXPECT_THAT(namesIn(scratch.path()), IsEmpty());
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
