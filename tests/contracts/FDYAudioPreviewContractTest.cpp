// SPDX-License-Identifier: Apache-2.0
// What every FDYAudioPreview promises; FfmpegAudioPreviewTest looks at the points.
#include <gmock/gmock.h>

#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/ffmpeg/FfmpegAudioPreview.h"
#include "tests/support/Candidate.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

using Preview = support::Candidate<FDYAudioPreview>;
const Preview kFfmpegPreview{"Ffmpeg", [] { return std::make_shared<FfmpegAudioPreview>(); }};
const Preview kNoPreview{"Absent", [] { return std::make_shared<AbsentAudioPreview>(); }};

class FDYAudioPreviewFailureContract : public support::ContractTest<FDYAudioPreview> {
 protected:
  Result<void> extract(const Path& from, const Path& to) const {
    return service->extractAudioSamplesFromAssetURL(Url::fileUrl(from), Url::fileUrl(to), [] { return true; });
  }
};
INSTANTIATE_TEST_SUITE_P(Implementations, FDYAudioPreviewFailureContract, ::testing::Values(kFfmpegPreview, kNoPreview),
                         support::candidateName);

TEST_P(FDYAudioPreviewFailureContract, AFailureNamesTheAssetAndLeavesNothing) {
  for (const Path& asset : {writeFile(folder() / "words.mp3", "words"), folder() / "missing.mp3"}) {
    support::expectTellingError(extract(asset, folder() / "samples.asc"), asset);
    EXPECT_THAT(namesIn(folder()), ElementsAre("words.mp3"));
  }
}

using FDYAudioPreviewContractThreadTest = FDYAudioPreviewFailureContract;
INSTANTIATE_TEST_SUITE_P(Implementations, FDYAudioPreviewContractThreadTest, ::testing::Values(kFfmpegPreview),
                         support::candidateName);

TEST_P(FDYAudioPreviewContractThreadTest, ThreadsExtractAtOnceAndGetTheSameFile) {
  const Path asset = support::makeMedia(support::m4aSound());
  std::atomic<int> number = 0;
  support::onThreads([&] { EXPECT_TRUE(extract(asset, folder() / (std::to_string(++number) + ".asc"))); });
  EXPECT_THAT(namesIn(folder()), ElementsAre("1.asc", "2.asc", "3.asc", "4.asc"));
  EXPECT_EQ(readFile(folder() / "1.asc"), readFile(folder() / "4.asc"));
  EXPECT_GT(readFile(folder() / "1.asc").size(), 24U);
}

}  // namespace
}  // namespace quilt::platform
