// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/copyfile_callback.h"

#include <gmock/gmock.h>

#include "quilt/sources/ModelFiles.h"
#include "tests/support/PackageFixture.h"
#include "tests/support/SourceServices.h"

namespace quilt {
namespace {

using platform::CopyAnswer;
using platform::CopyStage;
using platform::Services;
using support::Installed;
using support::ToldFiles;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class CopyfileCallbackTest : public support::PackageFixture {
 protected:
  /// What the callback answers at the stage; percentages go into `progress`.
  CopyAnswer at(CopyStage stage, std::int64_t copied = 0, std::int32_t total = 200) {
    CopyContext context{total, progress.block()};
    return copyfile_callback(0, stage, {copied}, "/from", "/to", &context);
  }
  double percentage(std::int64_t copied, std::int32_t total) {
    at(CopyStage::Progress, copied, total);
    return progress.values.back();
  }

  Progress progress;
};

TEST_F(CopyfileCallbackTest, StartAndFinishGoOnAndAnErrorQuitsWithoutAReport) {
  EXPECT_EQ(at(CopyStage::Start), CopyAnswer::Continue);
  EXPECT_EQ(at(CopyStage::Finish), CopyAnswer::Continue);
  EXPECT_EQ(at(CopyStage::Error), CopyAnswer::Quit);
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(CopyfileCallbackTest, ProgressReportsTheIntegerPercentage) {
  EXPECT_EQ(at(CopyStage::Progress, 50), CopyAnswer::Continue);
  EXPECT_THAT(progress.values, ElementsAre(25));
  EXPECT_EQ(percentage(0, 3), 0);
  EXPECT_EQ(percentage(1, 3), 33);
  EXPECT_EQ(percentage(2, 3), 66);
  EXPECT_EQ(percentage(3, 3), 100);
}

TEST_F(CopyfileCallbackTest, TheBlocksFalseQuits) {
  progress.cancelAt = 50;
  EXPECT_EQ(at(CopyStage::Progress, 99), CopyAnswer::Continue);
  EXPECT_EQ(at(CopyStage::Progress, 100), CopyAnswer::Quit);
}

TEST_F(CopyfileCallbackTest, BytesAreMultipliedInSixtyFourBits) {
  EXPECT_EQ(percentage(2'000'000'000, 2'147'483'647), 93);
}

TEST_F(CopyfileCallbackTest, AnEmptyTotalCountsAsNothingCopied) {
  EXPECT_EQ(at(CopyStage::Progress, 7, 0), CopyAnswer::Continue);
  EXPECT_THAT(progress.values, ElementsAre(0));
}

TEST_F(CopyfileCallbackTest, AnEmptyBlockGoesOn) {
  CopyContext context{200, {}};
  EXPECT_EQ(copyfile_callback(0, CopyStage::Progress, {50}, "/from", "/to", &context), CopyAnswer::Continue);
}

TEST_F(CopyfileCallbackTest, SizesBeyondTwoGigabytesWrap) {
  const Path from = writeFile(folder() / "from", "content");
  const Installed<ToldFiles> files(&Services::files);
  constexpr std::int64_t threeGigabytes = 3LL << 30;  // wraps to minus one gigabyte
  files->reports = {1LL << 30, threeGigabytes};
  EXPECT_EQ(copyReportingPercentage(from, folder() / "to", threeGigabytes, progress.block()), 0);
  EXPECT_THAT(progress.values, ElementsAre(-100, -300));
  progress.values.clear();
  files->reports = {1LL << 30};
  EXPECT_EQ(copyReportingPercentage(from, folder() / "again", 4LL << 30, progress.block()), 0);
  EXPECT_THAT(progress.values, ElementsAre(0)) << "four gigabytes wrap to nothing";
}

TEST_F(CopyfileCallbackTest, ACopyOfARealFileEndsAtAHundred) {
  const Path from = writeFile(folder() / "from", std::string(3 << 20, 'x'));
  EXPECT_EQ(copyReportingPercentage(from, folder() / "to", 3 << 20, progress.block()), 0);
  ASSERT_FALSE(progress.values.empty());
  EXPECT_TRUE(std::is_sorted(progress.values.begin(), progress.values.end()));
  EXPECT_EQ(progress.values.back(), 100);
  EXPECT_EQ(readFile(folder() / "to"), readFile(from));
}

TEST_F(CopyfileCallbackTest, AStoppedCopyAnswersANegativeNumberAndLeavesNothing) {
  const Path from = writeFile(folder() / "from", std::string(3 << 20, 'x'));
  progress.cancelAt = 0;
  EXPECT_EQ(copyReportingPercentage(from, folder() / "to", 3 << 20, progress.block()), -ECANCELED);
  EXPECT_THAT(namesIn(folder()), ElementsAre("from", "package.qpk"));
}

}  // namespace
}  // namespace quilt
