// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <algorithm>

#include "quilt/platform/ffmpeg/Capabilities.h"
#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform {
namespace {

TEST(FfmpegCapabilitiesTest, EachIsPresentWithAVersionOrAbsentWithARemedy) {
  const std::vector<Capability> capabilities = ffmpegCapabilities();
  EXPECT_GE(capabilities.size(), 10U);
  for (const Capability& each : capabilities) {
    EXPECT_FALSE(each.name.empty());
    EXPECT_NE(each.version.empty(), each.present) << each.name;
    EXPECT_EQ(each.remedy.empty(), each.present) << each.name;
  }
}

TEST(FfmpegCapabilitiesTest, TheH264EncoderIsListedAsTheLibraryHasIt) {
  const std::vector<Capability> capabilities = ffmpegCapabilities();
  const auto encoder = std::ranges::find(capabilities, "H.264 encoder", &Capability::name);
  ASSERT_NE(encoder, capabilities.end());
  EXPECT_EQ(encoder->present, avcodec_find_encoder_by_name("libx264") != nullptr);
}

}  // namespace
}  // namespace quilt::platform
