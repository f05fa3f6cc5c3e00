// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <cstring>
#include <random>

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
using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;
using ::testing::Not;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;
using Call = FaultySystemCalls::Call;
using Repeat = FaultySystemCalls::Repeat;
namespace fs = std::filesystem;

constexpr std::int64_t kMiB = 1 << 20;

std::string randomBytes(std::size_t size) {
  std::mt19937 random(42);
  std::string bytes(size, '\0');
  for (std::size_t i = 0; i + 4 <= size; i += 4) {
    const auto word = random();
    std::memcpy(bytes.data() + i, &word, 4);
  }
  return bytes;
}

// What a callback heard, and where it stops.
struct Heard {
  std::vector<std::int64_t> stretches;
  std::vector<CopyStage> stages;
  std::int64_t quitAfter = INT64_MAX;
  std::vector<std::string> namesMeanwhile;

  static CopyAnswer hear(int, CopyStage stage, const CopyState& state, const fs::path&, const fs::path& destination,
                         void* context) {
    auto& self = *static_cast<Heard*>(context);
    self.stages.push_back(stage);
    if (stage != CopyStage::Progress) return CopyAnswer::Continue;
    self.stretches.push_back(state.copiedBytes);
    self.namesMeanwhile = namesIn(destination.parent_path());
    return state.copiedBytes >= self.quitAfter ? CopyAnswer::Quit : CopyAnswer::Continue;
  }
};

class CopyfileTest : public ::testing::Test {
 protected:
  int copy(const std::shared_ptr<SystemCalls>& system = std::make_shared<SystemCalls>()) {
    return PosixFileManager(system).copyfile(from, to, &Heard::hear, &heard);
  }
  std::vector<std::int64_t> steps() const {
    std::vector<std::int64_t> steps;
    for (std::size_t i = 0; i < heard.stretches.size(); ++i)
      steps.push_back(heard.stretches[i] - (i == 0 ? 0 : heard.stretches[i - 1]));
    return steps;
  }

  const ScratchFolder scratch;
  const fs::path from = scratch / "from";
  const fs::path to = scratch / "to";
  Heard heard;
};

TEST_F(CopyfileTest, ReportsALargeFileInStretchesUnderAHiddenName) {
  const std::string bytes = randomBytes(20 * kMiB + 12345);
  writePlainly(from, bytes);
  const auto system = std::make_shared<FaultySystemCalls>();
  system->failEvery(Call::CloneFile, EOPNOTSUPP);
  EXPECT_EQ(0, copy(system));
  EXPECT_EQ(bytes, readPlainly(to));
  EXPECT_THAT(heard.stretches, SizeIs(Ge(3U)));
  EXPECT_THAT(steps(), Each(Le(8 * kMiB)));
  EXPECT_EQ(20 * kMiB + 12345, heard.stretches.back());
  EXPECT_THAT(heard.namesMeanwhile, SizeIs(2));
  EXPECT_THAT(heard.namesMeanwhile, Not(Contains("to")));
}

TEST_F(CopyfileTest, StopsInTheMiddleOfALargeFile) {
  writePlainly(from, randomBytes(20 * kMiB));
  for (const bool inKernel : {true, false}) {
    const auto system = std::make_shared<FaultySystemCalls>();
    system->failEvery(Call::CloneFile, EOPNOTSUPP);
    if (!inKernel) system->failEvery(Call::CopyFileRange, EXDEV);
    heard = {};
    heard.quitAfter = 8 * kMiB;
    EXPECT_EQ(-ECANCELED, copy(system));
    EXPECT_LT(heard.stretches.back(), 20 * kMiB);
    EXPECT_EQ(CopyStage::Progress, heard.stages.back());
    EXPECT_THAT(namesIn(scratch.path()), ElementsAre("from"));
  }
}

TEST_F(CopyfileTest, CopiesThroughABufferWhereTheKernelDoesNot) {
  const std::string bytes = randomBytes(3 * kMiB + 7);
  writePlainly(from, bytes);
  for (const int error : {EXDEV, EINVAL, ENOSYS, EOPNOTSUPP, EPERM}) {
    const auto system = std::make_shared<FaultySystemCalls>();
    system->failEvery(Call::CloneFile, EOPNOTSUPP);
    system->failEvery(Call::CopyFileRange, error);
    EXPECT_EQ(0, copy(system));
    EXPECT_EQ(bytes, readPlainly(to));
    EXPECT_THAT(system->calls(), Contains(Call::Write));
  }
}

TEST_F(CopyfileTest, BelievesNoEarlyEndOfTheKernelsCopy) {
  class EndsEarly final : public SystemCalls {
    int cloneFile(int, int) override {
      errno = EXDEV;
      return -1;
    }
    ssize_t copyFileRange(int, int, std::size_t) override { return 0; }
  };
  writePlainly(from, "all of it");
  EXPECT_EQ(0, copy(std::make_shared<EndsEarly>()));
  EXPECT_EQ("all of it", readPlainly(to));
}

TEST_F(CopyfileTest, ContinuesAfterShortTransfers) {
  const std::string bytes = randomBytes(100001);
  writePlainly(from, bytes);
  for (const bool inKernel : {true, false}) {
    const auto system = std::make_shared<FaultySystemCalls>();
    system->failEvery(Call::CloneFile, EOPNOTSUPP);
    if (!inKernel) system->failEvery(Call::CopyFileRange, EXDEV);
    system->transferAtMost(997);
    EXPECT_EQ(0, copy(system));
    EXPECT_EQ(bytes, readPlainly(to));
  }
}

TEST_F(CopyfileTest, SharesBlocksWhereTheDiskCan) {
  class Clones final : public FaultySystemCalls {
   public:
    int cloneFile(int source, int copy) override {
      char bytes[6];
      return pread(source, bytes, sizeof bytes, 0) == 6 && pwrite(copy, bytes, sizeof bytes, 0) == 6 ? 0 : -1;
    }
  };
  writePlainly(from, "shared");
  const auto system = std::make_shared<Clones>();
  EXPECT_EQ(0, copy(system));
  EXPECT_EQ("shared", readPlainly(to));
  EXPECT_THAT(heard.stretches, ElementsAre(6));
  for (const Call call : {Call::CopyFileRange, Call::Read, Call::Write})
    EXPECT_THAT(system->calls(), Not(Contains(call)));
}

TEST_F(CopyfileTest, FollowsALinkThatIsItsSource) {
  writePlainly(scratch / "real", "real bytes");
  fs::create_symlink("real", from);
  EXPECT_EQ(0, copy());
  EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(to)));
  EXPECT_EQ("real bytes", readPlainly(to));
}

TEST_F(CopyfileTest, CopyingAFileOverItselfKeepsIt) {
  writePlainly(from, "same");
  EXPECT_EQ(0, PosixFileManager().copyfile(from, from, nullptr, nullptr));
  EXPECT_EQ("same", readPlainly(from));
}

TEST_F(CopyfileTest, ReplacesNoFolder) {
  writePlainly(from, "x");
  writePlainly(to / "inside", "kept");
  EXPECT_EQ(-EISDIR, copy());
  EXPECT_EQ("kept", readPlainly(to / "inside"));
  EXPECT_THAT(heard.stages, ElementsAre(CopyStage::Start, CopyStage::Error));
}

TEST_F(CopyfileTest, WaitsForNoPipe) {
  ASSERT_EQ(0, mkfifo(from.c_str(), 0600));
  EXPECT_EQ(-ENODEV, copy());
}

TEST_F(CopyfileTest, AttributesThatTheDiskCannotHoldAreLeftOut) {
  writePlainly(from, "x");
  if (setxattr(from.c_str(), "user.quilt.note", "kept", 4, 0) != 0) GTEST_SKIP() << "no extended attributes here";
  for (const int error : {EOPNOTSUPP, EPERM, ENOSPC, E2BIG}) {
    const auto system = std::make_shared<FaultySystemCalls>();
    system->failEvery(Call::SetExtendedAttribute, error);
    EXPECT_EQ(0, copy(system));
  }
  const auto system = std::make_shared<FaultySystemCalls>();
  system->failEvery(Call::SetExtendedAttribute, EIO);
  EXPECT_EQ(-EIO, copy(system));
}

TEST_F(CopyfileTest, AFailedCallLeavesTheOldFileAndNoTemporary) {
  const std::string bytes = randomBytes(20 * 1000);
  const auto prepare = [&] {
    writePlainly(from, bytes);
    writePlainly(to, "old");
    setxattr(from.c_str(), "user.quilt.note", "kept", 4, 0);
  };
  const std::size_t descriptors = support::openDescriptors();
  for (const int error : {ENOSPC, EIO, EXDEV})
    support::failAtEveryCall(
        error, Repeat::Once, prepare,
        [&](PosixFileManager& files) {
          heard = {};
          return files.copyfile(from, to, &Heard::hear, &heard) == 0;
        },
        [&](std::size_t, bool succeeded) {
          EXPECT_EQ(succeeded ? bytes : "old", readPlainly(to));
          EXPECT_EQ(bytes, readPlainly(from));
          EXPECT_EQ(succeeded ? CopyStage::Finish : CopyStage::Error, heard.stages.back());
          EXPECT_THAT(namesIn(scratch.path()), UnorderedElementsAre("from", "to"));
          EXPECT_EQ(descriptors, support::openDescriptors());
        });
}

TEST_F(CopyfileTest, AFailedCallLeavesNothingOfAFolder) {
  writePlainly(from / "a", "a");
  writePlainly(from / "deep/er/b", "b");
  fs::create_symlink("a", from / "link");
  support::failAtEveryCall(
      ENOSPC, Repeat::Once, [&] { fs::remove_all(to); },
      [&](PosixFileManager& files) { return files.copyfile(from, to, nullptr, nullptr) == 0; },
      [&](std::size_t, bool succeeded) {
        if (succeeded) {
          EXPECT_EQ("b", readPlainly(to / "deep/er/b"));
          EXPECT_EQ("a", fs::read_symlink(to / "link"));
        } else {
          EXPECT_THAT(namesIn(scratch.path()), ElementsAre("from"));
        }
      });
}

TEST_F(CopyfileTest, AKilledProcessLeavesNothingHalfUnderTheFinalName) {
  const std::string bytes = randomBytes(20 * 1000);
  support::dieAtEveryCall(
      [&] {
        writePlainly(from, bytes);
        writePlainly(to, "old");
      },
      [&](PosixFileManager& files) { files.copyfile(from, to, nullptr, nullptr); },
      [&](std::size_t) {
        EXPECT_THAT(readPlainly(to), AnyOf("old", bytes));
        EXPECT_EQ(bytes, readPlainly(from));
      });
}

TEST_F(CopyfileTest, StoppedAFolderLeavesNothing) {
  writePlainly(from / "a", "12345");
  writePlainly(from / "b", "12345");
  heard.quitAfter = 6;
  EXPECT_EQ(-ECANCELED, copy());
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("from"));
}

TEST_F(CopyfileTest, RefusesFoldersNestedWithoutEnd) {
  int folder = open(scratch.path().c_str(), O_RDONLY | O_DIRECTORY);
  ASSERT_EQ(0, mkdirat(folder, "from", 0700));
  for (const char* name = "from"; folder >= 0;) {
    static int depth = 0;
    const int next = openat(folder, name, O_RDONLY | O_DIRECTORY);
    close(folder);
    folder = next;
    name = "d";
    if (++depth > 400) break;
    ASSERT_EQ(0, mkdirat(folder, "d", 0700));
  }
  close(folder);
  EXPECT_EQ(-ENAMETOOLONG, copy());
  EXPECT_THAT(namesIn(scratch.path()), ElementsAre("from"));
}

}  // namespace
}  // namespace quilt::platform
