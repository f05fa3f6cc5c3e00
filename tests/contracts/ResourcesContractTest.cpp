// SPDX-License-Identifier: Apache-2.0
// What every Resources promises.
#include "quilt/platform/text/LocalizedResources.h"
#include "tests/support/Candidate.h"

namespace quilt::platform {
namespace {

using ResourcesContract = support::ContractTest<Resources>;
using ResourcesContractThreadTest = ResourcesContract;
const auto kResources = ::testing::Values(
    support::Candidate<Resources>{"English", [] { return std::make_shared<LocalizedResources>("en"); }},
    support::Candidate<Resources>{"Japanese", [] { return std::make_shared<LocalizedResources>("ja_JP.UTF-8"); }},
    support::Candidate<Resources>{"UnknownLanguage", [] { return std::make_shared<LocalizedResources>("xx"); }});
INSTANTIATE_TEST_SUITE_P(Implementations, ResourcesContract, kResources, support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, ResourcesContractThreadTest, kResources, support::candidateName);

TEST_P(ResourcesContract, TheTitlesOfTheUntitledAreInTheTable) {
  for (const char* key : {"Untitled Episode", "Untitled Podcast"})
    EXPECT_NE("fallback", service->localizedString(key, "fallback")) << key;
}

TEST_P(ResourcesContract, WhatIsNotInTheTableIsTheFallback) {
  EXPECT_EQ("fallback", service->localizedString("No such key", "fallback"));
}

TEST_P(ResourcesContract, TheArtworkIsThereAndIsAnImage) {
  const std::pair<const char*, const char*> names[] = {
      {"AudioPreview", "png"}, {"PlaceholderPoster", "png"}, {"WebPreview", "icns"}};
  for (const auto& [name, type] : names) {
    const auto image = services().images->imageWithData(service->artwork(name, type));
    ASSERT_TRUE(image) << name;
    EXPECT_GE((*image)->size().width, 100) << name;
  }
  EXPECT_TRUE(service->artwork("None", "png").empty());
}

TEST_P(ResourcesContract, ArtworkOutlivesTheService) {
  std::span<const unsigned char> bytes;
  {
    const auto another = GetParam().make();
    bytes = another->artwork("AudioPreview", "png");
  }
  EXPECT_EQ(service->artwork("AudioPreview", "png").data(), bytes.data());
}

TEST_P(ResourcesContractThreadTest, AnyThreadMayAsk) {
  const std::string title = service->localizedString("Untitled Episode", "");
  support::onThreads([&] {
    for (int i = 0; i < 100; ++i) EXPECT_EQ(title, service->localizedString("Untitled Episode", ""));
    EXPECT_FALSE(service->artwork("AudioPreview", "png").empty());
  });
}

}  // namespace
}  // namespace quilt::platform
