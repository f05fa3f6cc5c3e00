// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/TranscodePlan.h"

#include <gtest/gtest.h>

namespace quilt::platform::ffmpeg {
namespace {

std::string text(PictureSize size) { return std::to_string(size.width) + "x" + std::to_string(size.height); }
std::string text(AVRational base) { return std::to_string(base.num) + "/" + std::to_string(base.den); }

TEST(TranscodePlanTest, PicturesAreFittedAndSidesAreEven) {
  EXPECT_EQ(text(fittedSize({1920, 1080}, kHighDefinitionBox)), "1280x720");
  EXPECT_EQ(text(fittedSize({1920, 1080}, kStandardDefinitionBox)), "640x360");
  EXPECT_EQ(text(fittedSize({1080, 1920}, kHighDefinitionBox)), "406x720");
  EXPECT_EQ(text(fittedSize({1440, 1080}, kHighDefinitionBox)), "960x720");
  EXPECT_EQ(text(fittedSize({768, 576}, kStandardDefinitionBox)), "640x480");
  EXPECT_EQ(text(fittedSize({854, 480}, kStandardDefinitionBox)), "640x360");
  EXPECT_EQ(text(fittedSize({3840, 1600}, kHighDefinitionBox)), "1280x534");
}

TEST(TranscodePlanTest, PicturesAreNeverEnlarged) {
  EXPECT_EQ(text(fittedSize({320, 240}, kHighDefinitionBox)), "320x240");
  EXPECT_EQ(text(fittedSize({641, 481}, kHighDefinitionBox)), "640x480");
  EXPECT_EQ(text(fittedSize({319, 1}, kHighDefinitionBox)), "318x2") << "but for a side of one";
  EXPECT_EQ(text(fittedSize({20000, 10}, kHighDefinitionBox)), "1280x2");
}

TEST(TranscodePlanTest, TicksAreFineAndExact) {
  EXPECT_EQ(text(fineTimeBase({1, 25})), "1/90000");
  EXPECT_EQ(text(fineTimeBase({1, 600})), "1/90000");
  EXPECT_EQ(text(fineTimeBase({1, 1000})), "1/90000");
  EXPECT_EQ(text(fineTimeBase({1, 30000})), "1/30000");
  EXPECT_EQ(text(fineTimeBase({1, 15360})), "1/15360");
  EXPECT_EQ(text(fineTimeBase({1001, 24000})), "1/24000");
  EXPECT_EQ(text(fineTimeBase({1, 1'000'000'000})), "1/90000");
  EXPECT_EQ(text(fineTimeBase({0, 0})), "1/90000");
  for (int rate = 1; rate < 10'000; ++rate) {
    const AVRational fine = fineTimeBase({1, rate});
    EXPECT_EQ(fine.den % rate, 0) << rate;
    EXPECT_GE(fine.den, 24'000) << rate;
  }
}

class CopyingPictures : public ::testing::Test {
 protected:
  static VideoTraits common() {
    VideoTraits traits;
    traits.codec = AV_CODEC_ID_H264;
    traits.profile = FF_PROFILE_H264_HIGH;
    traits.pixelFormat = AV_PIX_FMT_YUV420P;
    traits.stored = {640, 480};
    traits.frameRate = {30, 1};
    traits.hasHeader = true;
    traits.isTimedWell = true;
    return traits;
  }
  static bool isCopied(const VideoTraits& traits, PictureSize box = kStandardDefinitionBox) {
    return planVideo(traits, box).isCopied;
  }
  template <class T, class Value>
  static bool isCopiedWith(T VideoTraits::*member, Value value) {
    VideoTraits traits = common();
    traits.*member = value;
    return isCopied(traits);
  }
};

TEST_F(CopyingPictures, IsForWhatFits) {
  EXPECT_TRUE(isCopied(common()));
  EXPECT_TRUE(isCopiedWith(&VideoTraits::profile, FF_PROFILE_H264_CONSTRAINED_BASELINE));
  EXPECT_TRUE(isCopiedWith(&VideoTraits::profile, FF_PROFILE_H264_MAIN));
  EXPECT_TRUE(isCopiedWith(&VideoTraits::pixelShape, AVRational{1, 1}));
  EXPECT_TRUE(isCopiedWith(&VideoTraits::frameRate, AVRational{60, 1}));
  VideoTraits larger = common();
  larger.stored = {642, 480};
  EXPECT_FALSE(isCopied(larger));
  EXPECT_TRUE(isCopied(larger, kHighDefinitionBox));
}

TEST_F(CopyingPictures, IsNotForWhatSomePlayersShowWrongly) {
  EXPECT_FALSE(isCopiedWith(&VideoTraits::codec, AV_CODEC_ID_HEVC));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::profile, FF_PROFILE_H264_HIGH_10));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::profile, FF_PROFILE_H264_HIGH_422));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::pixelFormat, AV_PIX_FMT_YUV444P));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::pixelFormat, AV_PIX_FMT_YUVJ420P));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::pixelShape, AVRational{4, 3}));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::orientation, Orientation{.mirrorX = true}));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::transfer, AVCOL_TRC_ARIB_STD_B67));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::primaries, AVCOL_PRI_BT2020));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::range, AVCOL_RANGE_JPEG));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::frameRate, AVRational{120, 1}));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::isInterlaced, true));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::hasHeader, false));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::isTimedWell, false));
  EXPECT_FALSE(isCopiedWith(&VideoTraits::startsAfter, 0.5));
}

TEST(TranscodePlanTest, TheShownSizeDecides) {
  VideoTraits traits;
  traits.codec = AV_CODEC_ID_MPEG2VIDEO;
  traits.stored = {720, 576};
  traits.pixelShape = {16, 15};
  EXPECT_EQ(text(planVideo(traits, kHighDefinitionBox).size), "768x576");
  traits.orientation.transpose = true;
  EXPECT_EQ(text(planVideo(traits, kHighDefinitionBox).size), "540x720");
  traits.orientation.transpose = false;
  traits.pixelShape = {0, 0};
  EXPECT_EQ(text(planVideo(traits, kHighDefinitionBox).size), "720x576");
}

class PlanningSound : public ::testing::Test {
 protected:
  static AudioTraits aac(int sampleRate, int channels) {
    return {.codec = AV_CODEC_ID_AAC,
            .profile = FF_PROFILE_AAC_LOW,
            .sampleRate = sampleRate,
            .channels = channels,
            .hasHeader = true,
            .isTimedWell = true,
            .startsAfter = 0};
  }
};

TEST_F(PlanningSound, PlainAacIsCopied) {
  EXPECT_TRUE(planAudio(aac(44100, 2)).isCopied);
  EXPECT_TRUE(planAudio(aac(48000, 1)).isCopied);
  EXPECT_FALSE(planAudio(aac(48000, 6)).isCopied);
  EXPECT_FALSE(planAudio(aac(22050, 2)).isCopied);
  AudioTraits traits = aac(48000, 2);
  traits.profile = FF_PROFILE_AAC_HE;
  EXPECT_FALSE(planAudio(traits).isCopied);
  traits = aac(48000, 2);
  traits.codec = AV_CODEC_ID_MP3;
  EXPECT_FALSE(planAudio(traits).isCopied);
  traits = aac(48000, 2);
  traits.startsAfter = 1;
  EXPECT_FALSE(planAudio(traits).isCopied);
}

TEST_F(PlanningSound, RatesOfDiscsAndOfVideoAreKept) {
  EXPECT_EQ(planAudio(aac(44100, 2)).sampleRate, 44100);
  EXPECT_EQ(planAudio(aac(48000, 2)).sampleRate, 48000);
  EXPECT_EQ(planAudio(aac(22050, 2)).sampleRate, 44100);
  EXPECT_EQ(planAudio(aac(11025, 2)).sampleRate, 44100);
  EXPECT_EQ(planAudio(aac(8000, 2)).sampleRate, 48000);
  EXPECT_EQ(planAudio(aac(96000, 2)).sampleRate, 48000);
}

TEST_F(PlanningSound, OneChannelStaysOneAndManyBecomeTwo) {
  EXPECT_EQ(planAudio(aac(48000, 1)).channels, 1);
  EXPECT_EQ(planAudio(aac(48000, 2)).channels, 2);
  EXPECT_EQ(planAudio(aac(48000, 6)).channels, 2);
  EXPECT_EQ(planAudio(aac(48000, 6)).bitRate, 160'000);
}

}  // namespace
}  // namespace quilt::platform::ffmpeg
