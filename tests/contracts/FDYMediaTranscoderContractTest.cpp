// SPDX-License-Identifier: Apache-2.0
// What every FDYMediaTranscoder promises when it fails.
#include <gmock/gmock.h>

#include "quilt/platform/absent/Absent.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

using FDYMediaTranscoderFailureContract = support::ContractTest<FDYMediaTranscoder>;
INSTANTIATE_TEST_SUITE_P(Implementations, FDYMediaTranscoderFailureContract,
                         ::testing::Values(support::Candidate<FDYMediaTranscoder>{"Installed",
                                                                                  [] { return services().transcoder; }},
                                           support::Candidate<FDYMediaTranscoder>{
                                               "Absent", [] { return std::make_shared<AbsentTranscoder>(); }}),
                         support::candidateName);

TEST_P(FDYMediaTranscoderFailureContract, AFailureNamesTheSourceAndKeepsWhatWasThere) {
  const auto operations = {&FDYMediaTranscoder::transcodeToAudio, &FDYMediaTranscoder::transcodeToHD,
                           &FDYMediaTranscoder::transcodeToSD};
  const Path old = writeFile(folder() / "old.mp4", "old");
  for (const Path& source : {writeFile(folder() / "words.mp4", "words"), folder() / "missing.mp4"}) {
    for (const auto operation : operations) {
      for (const Path& destination : {old, folder() / "new.mp4"}) {
        const auto result =
            ((*service).*operation)(Url::fileUrl(source), Url::fileUrl(destination), [](float, bool&) {});
        support::expectTellingError(result, source);
        EXPECT_EQ("old", readFile(old));
        EXPECT_THAT(namesIn(folder()), ElementsAre("old.mp4", "words.mp4"));
      }
    }
  }
}

TEST_P(FDYMediaTranscoderFailureContract, NoProgressBlockIsNeeded) {
  const Path missing = folder() / "missing.mp4";
  support::expectTellingError(service->transcodeToHD(Url::fileUrl(missing), Url::fileUrl(folder() / "new.mp4"), {}),
                              missing);
}

}  // namespace
}  // namespace quilt::platform
