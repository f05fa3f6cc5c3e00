// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/testing/FailNthFileManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "quilt/platform/files/PosixFileManager.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using support::namesIn;
using support::ScratchFolder;
using ::testing::UnorderedElementsAre;
using Which = FailNthFileManager::Which;
using FileRepeat = FailNthFileManager::Repeat;

class FailNthFileManagerTest : public ::testing::Test {
 protected:
  bool save(const char* name) { return files.writeAtomically(scratch / name, "x").hasValue(); }

  const ScratchFolder scratch;
  FailNthFileManager files{std::make_shared<PosixFileManager>()};
};

TEST_F(FailNthFileManagerTest, FailsOnceWithoutCarryingOut) {
  files.failNth(2, ErrorKind::NoSpace);
  EXPECT_TRUE(save("a"));
  const auto failed = files.writeAtomically(scratch / "b", "x");
  ASSERT_FALSE(failed);
  EXPECT_EQ(ErrorKind::NoSpace, failed.error().kind);
  EXPECT_EQ(scratch / "b", failed.error().file);
  EXPECT_TRUE(save("c"));
  EXPECT_EQ(3U, files.operations());
  EXPECT_THAT(namesIn(scratch.path()), UnorderedElementsAre("a", "c"));
}

TEST_F(FailNthFileManagerTest, FailsForEverAfter) {
  files.failNth(2, ErrorKind::InputOutput, FileRepeat::ForEver);
  EXPECT_TRUE(save("a"));
  EXPECT_FALSE(save("b"));
  EXPECT_FALSE(save("c"));
  files.failNth(0, ErrorKind::InputOutput);
  EXPECT_TRUE(save("d"));
}

TEST_F(FailNthFileManagerTest, CountsReadsOnlyWhenAsked) {
  EXPECT_TRUE(save("a"));
  files.failNth(1, ErrorKind::InputOutput);
  EXPECT_TRUE(files.readFile(scratch / "a", 10));
  EXPECT_TRUE(files.fileExistsAtPath(scratch / "a"));
  EXPECT_EQ(0U, files.operations());
  files.failNth(1, ErrorKind::InputOutput, FileRepeat::ForEver, Which::All);
  EXPECT_FALSE(files.readFile(scratch / "a", 10));
  EXPECT_FALSE(files.contentsOfDirectoryAtPath(scratch.path()));
  EXPECT_FALSE(files.attributesOfItemAtPath(scratch / "a"));
  EXPECT_TRUE(files.fileExistsAtPath(scratch / "a"));
}

TEST_F(FailNthFileManagerTest, EveryChangeCanFail) {
  EXPECT_TRUE(save("a"));
  files.failNth(1, ErrorKind::InputOutput, FileRepeat::ForEver);
  EXPECT_FALSE(files.createDirectoryAtPath(scratch / "b"));
  EXPECT_FALSE(files.copyItem(scratch / "a", scratch / "b"));
  EXPECT_FALSE(files.moveItem(scratch / "a", scratch / "b"));
  EXPECT_FALSE(files.removeItem(scratch / "a", scratch.path()));
  EXPECT_FALSE(files.lockFile(scratch / "b", "x"));
  std::vector<CopyStage> stages;
  const auto note = [](int, CopyStage stage, const CopyState&, const std::filesystem::path&,
                       const std::filesystem::path&, void* context) {
    static_cast<std::vector<CopyStage>*>(context)->push_back(stage);
    return CopyAnswer::Continue;
  };
  EXPECT_EQ(-1, files.copyfile(scratch / "a", scratch / "b", note, &stages));
  EXPECT_THAT(stages, ::testing::ElementsAre(CopyStage::Start, CopyStage::Error));
  EXPECT_THAT(namesIn(scratch.path()), UnorderedElementsAre("a"));
}

}  // namespace
}  // namespace quilt::platform
