// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/MediaFixtures.h"
#include "tests/support/ModelFixture.h"
#include "tests/support/Program.h"

namespace quilt {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

/// The real program of examples/minimal.
class MinimalTest : public support::ModelFixture {
 protected:
  support::ProgramResult run(const Path& file) {
    std::filesystem::create_directories(destination);
    return support::runProgram({QUILT_MINIMAL, folder() / "library", file, destination});
  }
  const Path destination = folder() / "exported";
};

TEST_F(MinimalTest, ImportsAndExportsAMovie) {
  support::MediaSpec spec;
  spec.tags = {{"title", "Harbour"}};
  const auto result = run(support::makeMedia(spec));
  EXPECT_EQ(0, result.status) << result.output;
  EXPECT_THAT(result.output, HasSubstr("Movie, 2"));
  EXPECT_THAT(result.output, HasSubstr("Exported to " + (destination / "Harbour.qpk").native()));
  EXPECT_THAT(namesIn(destination), ElementsAre("Harbour.qpk"));
  EXPECT_EQ("Harbour", readRecord(destination / "Harbour.qpk" / "properties.plist").string("Title"));
}

TEST_F(MinimalTest, SaysWhatWentWrong) {
  const auto result = run(folder() / "gone.mp4");
  EXPECT_EQ(1, result.status);
  EXPECT_THAT(result.output, HasSubstr("gone.mp4"));
  EXPECT_TRUE(namesIn(destination).empty());
}

TEST_F(MinimalTest, SaysHowItIsUsed) {
  const auto result = support::runProgram({QUILT_MINIMAL});
  EXPECT_EQ(2, result.status);
  EXPECT_EQ("Usage: minimal LIBRARY FILE DESTINATION\n", result.output);
}

}  // namespace
}  // namespace quilt
