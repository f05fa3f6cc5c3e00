// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/PictureFilters.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

#include "quilt/platform/ffmpeg/FilterChain.h"

namespace quilt::platform::ffmpeg {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class PictureFiltersTest : public ::testing::Test {
 protected:
  static Frame picture(AVPixelFormat format, int width, int height) {
    Frame frame(av_frame_alloc());
    frame->format = format;
    frame->width = width;
    frame->height = height;
    frame->colorspace = AVCOL_SPC_BT709;
    frame->color_primaries = AVCOL_PRI_BT709;
    frame->color_trc = AVCOL_TRC_BT709;
    frame->color_range = AVCOL_RANGE_MPEG;
    return frame;
  }
  static std::string filters(const Frame& frame, PictureSize size, Fields fields = Fields::None,
                             const Orientation& orientation = {}) {
    return pictureFilters(*frame, size, orientation, fields);
  }
  // What a picture of one value becomes.
  static Frame filtered(AVFrame& frame, PictureSize size, std::uint16_t luma, std::uint16_t chroma) {
    if (av_frame_get_buffer(&frame, 0) < 0) throw std::runtime_error("no memory");
    for (int plane = 0; plane < 3; ++plane) {
      const int rows = plane == 0 ? frame.height : frame.height / 2;
      auto* values = reinterpret_cast<std::uint16_t*>(frame.data[plane]);
      std::fill_n(values, rows * frame.linesize[plane] / 2, plane == 0 ? luma : chroma);
    }
    Result<FilterChain> chain = FilterChain::create(frame, {1, 1000}, filters(Frame(av_frame_clone(&frame)), size), {});
    if (!chain) throw std::runtime_error(chain.error().text);
    Frame result(av_frame_alloc());
    if (chain->push(&frame) < 0 || chain->push(nullptr) < 0 || chain->pull(*result) < 0) {
      throw std::runtime_error("no picture");
    }
    return result;
  }
};

TEST_F(PictureFiltersTest, WhatIsRightAlreadyIsLeftAlone) {
  EXPECT_EQ(filters(picture(AV_PIX_FMT_YUV420P, 640, 480), {640, 480}), "format=yuv420p");
}

TEST_F(PictureFiltersTest, OnlyWhatIsNeededIsDone) {
  EXPECT_THAT(filters(picture(AV_PIX_FMT_YUV420P, 1280, 960), {640, 480}), HasSubstr("w=640:h=480"));
  EXPECT_THAT(filters(picture(AV_PIX_FMT_YUV420P10LE, 640, 480), {640, 480}), HasSubstr("dither=ordered"));
  EXPECT_THAT(filters(picture(AV_PIX_FMT_YUV420P, 641, 481), {640, 480}), HasSubstr("crop=w=640:h=480"));
  EXPECT_THAT(filters(picture(AV_PIX_FMT_YUV420P, 641, 481), {640, 480}), Not(HasSubstr("scale")));
}

TEST_F(PictureFiltersTest, UntaggedColoursGoByTheHeight) {
  Frame frame = picture(AV_PIX_FMT_YUV420P, 720, 576);
  frame->colorspace = AVCOL_SPC_UNSPECIFIED;
  EXPECT_THAT(filters(frame, {720, 576}), HasSubstr("min=6")) << "BT.601";
  frame->height = 578;
  EXPECT_THAT(filters(frame, {720, 578}), Not(HasSubstr("min="))) << "BT.709, as it is to be";
}

TEST_F(PictureFiltersTest, HighDynamicRangeIsMappedAfterScaling) {
  Frame frame = picture(AV_PIX_FMT_YUV420P10LE, 1920, 1080);
  frame->color_trc = AVCOL_TRC_SMPTE2084;
  const std::string row = filters(frame, {1280, 720});
  EXPECT_LT(row.find("w=1280:h=720"), row.find("tonemap"));
  EXPECT_THAT(row, HasSubstr("t=linear"));
}

TEST_F(PictureFiltersTest, TurningComesAfterScaling) {
  const Orientation quarter{.mirrorY = true, .transpose = true};
  const std::string row = filters(picture(AV_PIX_FMT_YUV420P, 1920, 1080), {406, 720}, Fields::None, quarter);
  EXPECT_THAT(row, HasSubstr("w=720:h=406"));
  EXPECT_THAT(row, ::testing::EndsWith("transpose=dir=clock"));
}

TEST_F(PictureFiltersTest, PicturesTooSmallToBeInterlacedPass) {
  EXPECT_THAT(filters(picture(AV_PIX_FMT_YUV420P, 32, 4), {32, 4}, Fields::AsFlagged), Not(HasSubstr("bwdif")));
  EXPECT_THAT(filters(picture(AV_PIX_FMT_YUV420P, 32, 32), {32, 32}, Fields::AsFlagged), HasSubstr("deint=interlaced"));
}

TEST_F(PictureFiltersTest, TenBitsAreDitheredRatherThanCutOff) {
  constexpr std::uint16_t between = 402;  // 100.5 in 8 bits
  const Frame result = filtered(*picture(AV_PIX_FMT_YUV420P10LE, 64, 64), {64, 64}, between, 512);
  ASSERT_EQ(result->format, AV_PIX_FMT_YUV420P);
  double sum = 0;
  for (int y = 0; y < 64; ++y) {
    for (int x = 0; x < 64; ++x) sum += result->data[0][y * result->linesize[0] + x];
  }
  EXPECT_NEAR(sum / (64 * 64), 100.5, 0.1);
}

TEST_F(PictureFiltersTest, TheLibraryInstalledHereHasWhatIsNeeded) {
  EXPECT_TRUE(hasFiltersFor(AVCOL_TRC_SMPTE2084, AVCOL_PRI_BT2020));
  EXPECT_TRUE(hasFiltersFor(AVCOL_TRC_BT709, AVCOL_PRI_BT709));
}

}  // namespace
}  // namespace quilt::platform::ffmpeg
