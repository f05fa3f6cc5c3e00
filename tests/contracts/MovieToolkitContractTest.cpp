// SPDX-License-Identifier: Apache-2.0
// What every MovieToolkit and every Movie promises; FfmpegMovieToolkitTest looks at the frames.
#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"
#include "tests/support/Candidate.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

using support::expectTellingError;

using MovieCandidate = support::Candidate<MovieToolkit>;
const MovieCandidate kFfmpeg{"Ffmpeg", [] { return std::make_shared<FfmpegMovieToolkit>(); }};
const MovieCandidate kNoFfmpeg{"Absent", [] { return std::make_shared<AbsentMovieToolkit>(); }};

/// Holds of a build with movies and of one without.
using MovieToolkitFailureContract = support::ContractTest<MovieToolkit>;
INSTANTIATE_TEST_SUITE_P(Implementations, MovieToolkitFailureContract, ::testing::Values(kFfmpeg, kNoFfmpeg),
                         support::candidateName);

TEST_P(MovieToolkitFailureContract, WhatIsNoMovieIsRefusedWithItsFile) {
  for (const Path& file : {writeFile(folder() / "words.mp4", "words"), writeFile(folder() / "empty.mp4", ""),
                           folder() / "missing.mp4", folder()})
    expectTellingError(service->openMovie(file), file);
}

/// Holds of every implementation that opens movies.
class MovieContract : public support::ContractTest<MovieToolkit> {
 protected:
  std::unique_ptr<Movie> open(const support::MediaSpec& spec = {}) const {
    auto movie = service->openMovie(makeMedia(spec));
    EXPECT_TRUE(movie);
    return movie ? *std::move(movie) : nullptr;
  }
};
using MovieContractThreadTest = MovieContract;
INSTANTIATE_TEST_SUITE_P(Implementations, MovieContract, ::testing::Values(kFfmpeg), support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, MovieContractThreadTest, ::testing::Values(kFfmpeg), support::candidateName);

TEST_P(MovieContract, WhatIsNotRecordedIsNoneEmptyOrNull) {
  const auto movie = open();
  EXPECT_EQ(std::nullopt, movie->posterTime());
  EXPECT_TRUE(movie->chapters().empty());
  EXPECT_EQ(nullptr, movie->albumArtworkMovie());
}

TEST_P(MovieContract, TimesAreSecondsFromTheStart) {
  const auto movie = open({.chapters = {{"One", 0}, {"Two", 1}}});
  EXPECT_NEAR(2, movie->duration().value_or(0), 0.1);
  ASSERT_EQ(2U, movie->chapters().size());
  EXPECT_EQ("Two", movie->chapters()[1].name);
  EXPECT_NEAR(1, movie->chapters()[1].start, 0.01);
  EXPECT_NEAR(1, movie->keyFrameTimeAtOrBefore(1.5).value_or(-1), 0.05);
}

TEST_P(MovieContract, AFrameIsUprightAndPastTheEndIsTheLast) {
  const auto movie = open();
  const auto last = movie->frameAtTime(2), beyond = movie->frameAtTime(1000);
  ASSERT_TRUE(last && beyond);
  EXPECT_EQ((Size{320, 240}), (*last)->size());
  EXPECT_EQ((*last)->bitmap()->pixels, (*beyond)->bitmap()->pixels);
}

TEST_P(MovieContractThreadTest, EveryThreadMayOpenAMovieOfItsOwn) {
  const Path file = support::makeMedia({});
  support::onThreads([&] {
    const auto movie = service->openMovie(file);
    ASSERT_TRUE(movie);
    EXPECT_TRUE((*movie)->frameAtTime(1));
  });
}

}  // namespace
}  // namespace quilt::platform
