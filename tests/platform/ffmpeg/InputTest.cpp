// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Input.h"

#include <gtest/gtest.h>

#include "tests/support/MediaFixtures.h"

namespace quilt::platform::ffmpeg {
namespace {

// The library itself must not be asked twice: it then reads what the first answer freed.
TEST(InputTest, WhatIsMissingInTheHeaderIsFoundOnceAndMayBeAskedForAgain) {
  support::MediaSpec spec;
  spec.extension = "webm";
  spec.videoCodec = "libvpx";
  spec.audioCodec = "libvorbis";
  spec.channels = 2;
  Result<Input> input = Input::open(support::makeMedia(spec), 15);
  ASSERT_TRUE(input);
  ASSERT_TRUE(input->findStreamInfo());
  Input moved = *std::move(input);
  EXPECT_TRUE(moved.findStreamInfo());
  ASSERT_EQ(moved.context()->nb_streams, 2U);
  EXPECT_EQ(moved.context()->streams[0]->codecpar->width, 320);
}

}  // namespace
}  // namespace quilt::platform::ffmpeg
