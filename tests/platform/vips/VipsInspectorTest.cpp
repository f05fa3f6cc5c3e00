// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/vips/VipsInspector.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using namespace quilt::support;

/// Answers "mime of <identifier>".
class EchoTypes final : public TypeIdentifiers {
 public:
  [[nodiscard]] std::optional<std::string> preferredIdentifier(const std::filesystem::path&) const override {
    return std::nullopt;
  }
  [[nodiscard]] bool conformsTo(std::string_view, std::string_view) const override { return false; }
  [[nodiscard]] std::optional<std::string> mimeType(std::string_view identifier) const override {
    return "mime of " + std::string(identifier);
  }
};

class VipsInspectorTest : public ::testing::Test {
 protected:
  MediaFacts inspect(const std::string& bytes) {
    const Result<MediaFacts> facts = VipsInspector().inspect(writeFile(folder / "file.dat", bytes));
    EXPECT_TRUE(facts) << (facts ? "" : facts.error().text);
    return facts ? *facts : MediaFacts{};
  }

  ScopedService<TypeIdentifiers> types{&Services::types, std::make_shared<EchoTypes>()};
  ScratchFolder folder;
};

TEST_F(VipsInspectorTest, AnswersTheDisplayedSizeAndTheTypeOfTheContent) {
  const MediaFacts facts = inspect(encode(quadrants(300, 200), {.orientation = 8}));
  EXPECT_EQ(facts.width, 200);
  EXPECT_EQ(facts.height, 300);
  EXPECT_EQ(facts.mimeType, "mime of public.jpeg");
  EXPECT_FALSE(facts.hasAudio);
  EXPECT_FALSE(facts.hasVideo);
  EXPECT_EQ(facts.duration, 0);
  EXPECT_EQ(inspect(encode(quadrants(3, 2), {.suffix = ".png"})).mimeType, "mime of public.png");
}

TEST_F(VipsInspectorTest, AnswersWhatTheCameraNoted) {
  const MediaFacts facts = inspect(
      encode(quadrants(300, 200), {.exif = {{"ImageDescription", "A bridge (old), at night"}, {"Artist", "Ann O."}}}));
  EXPECT_EQ(facts.metadataInformation, "A bridge (old), at night");
  EXPECT_EQ(facts.metadataAuthor, "Ann O.");
  EXPECT_EQ(facts.metadataTitle, std::nullopt);
}

TEST_F(VipsInspectorTest, RefusesWhatIsNoImage) {
  const Result<MediaFacts> facts = VipsInspector().inspect(writeFile(folder / "a.jpg", "words"));
  ASSERT_FALSE(facts);
  EXPECT_EQ(facts.error().kind, ErrorKind::Unsupported);
}

}  // namespace
}  // namespace quilt::platform
