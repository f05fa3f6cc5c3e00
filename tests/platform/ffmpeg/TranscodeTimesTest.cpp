// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "tests/support/ConversionTest.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/MediaJudge.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;
using support::judge;
using support::makeMedia;
using support::MediaSpec;
using support::pictureTimes;
using ::testing::SizeIs;

using TranscodeTimesTest = support::ConversionTest;

TEST_F(TranscodeTimesTest, UnevenTimesAreKept) {
  MediaSpec spec = clip(2);
  spec.extension = "mkv";
  spec.pictureFilter = "select='not(mod(n,3))+not(mod(n,7))'";
  spec.options = {"-q:v", "2", "-vsync", "vfr"};
  const fs::path source = makeMedia(spec);
  const std::vector<double> before = pictureTimes(source);
  const std::vector<double> after = pictureTimes(hd(source));
  ASSERT_EQ(after.size(), before.size());
  for (std::size_t i = 0; i < before.size(); ++i) EXPECT_NEAR(after[i], before[i] - before[0], 0.0015) << i;
}

TEST_F(TranscodeTimesTest, FilmRatesStayExact) {
  MediaSpec spec = clip(2);
  spec.extension = "avi";
  spec.options = {"-q:v", "2", "-r", "24000/1001"};
  const std::vector<double> times = pictureTimes(hd(spec));
  ASSERT_GT(times.size(), 40U);
  for (std::size_t i = 0; i < times.size(); ++i) EXPECT_NEAR(times[i], static_cast<double>(i) * 1001 / 24000, 1e-5);
}

TEST_F(TranscodeTimesTest, MoreThanSixtyPicturesASecondAreThinned) {
  MediaSpec spec = clip(1);
  spec.frameRate = 120;
  const std::vector<double> times = pictureTimes(hd(spec));
  EXPECT_NEAR(static_cast<double>(times.size()), 60, 2);
  for (std::size_t i = 1; i < times.size(); ++i) EXPECT_GT(times[i] - times[i - 1], 0.012);
  spec.videoCodec = "libx264";
  spec.options = {};
  EXPECT_NEAR(static_cast<double>(pictureTimes(hd(spec)).size()), 60, 2) << "though the stream would fit";
}

TEST_F(TranscodeTimesTest, SoundAndPictureStayTogetherForALongTime) {
  // At most 40 ms apart after an hour would be 2.7 ms after these four minutes.
  MediaSpec spec = clip(240);
  spec.width = 16;
  spec.height = 16;
  spec.extension = "mkv";
  spec.videoCodec = "ffv1";
  spec.options = {};
  spec.audioCodec = "pcm_u8";
  spec.sampleRate = 8000;
  spec.frameRate = 1;
  spec.picture = "color=c=black";
  spec.sound = "aevalsrc='if(gte(t,235),0.7*sin(2*PI*440*t),0)':s=8000";
  const fs::path file = hd(spec);
  const std::vector<double> times = pictureTimes(file);
  ASSERT_THAT(times, SizeIs(240));
  EXPECT_NEAR(times[235], 235, 0.001);
  const std::vector<float> sound = support::soundOf(file);
  const auto tone = std::ranges::find_if(sound, [](float value) { return std::abs(value) > 0.1F; }) - sound.begin();
  EXPECT_NEAR(static_cast<double>(tone) / 48000, 235, 0.0027);
}

TEST_F(TranscodeTimesTest, TheLastPictureLastsAsLongAsInTheSource) {
  for (const bool isCopied : {true, false}) {
    MediaSpec spec = isCopied ? support::silentMovie() : clip(1);
    spec.duration = 1;
    spec.frameRate = 5;
    EXPECT_NEAR(judge(hd(spec)).video().duration, 1, 0.002) << isCopied;
  }
}

TEST_F(TranscodeTimesTest, CountersOfBroadcastsThatStartAnewRunOn) {
  MediaSpec spec = clip(1);
  spec.extension = "ts";
  spec.videoCodec = "mpeg2video";
  spec.sound = "sine=frequency=440";
  spec.audioCodec = "mp2";
  spec.options = {"-output_ts_offset", "95443"};  // 33 bits of 90,000 a second are over soon after
  const fs::path file = hd(spec);
  const std::vector<double> times = pictureTimes(file);
  EXPECT_GE(times.size(), 23U);
  EXPECT_NEAR(times.back(), 0.96, 0.1);
  EXPECT_NEAR(judge(file).audio().duration, 1, 0.1);
}

TEST_F(TranscodeTimesTest, SoundAndPictureStayTogether) {
  // A flash and a tone at 1 s.
  const auto spec = [](const std::string& extension, std::vector<std::string> options) {
    MediaSpec result = clip(2);
    result.extension = extension;
    result.picture = "color=c=black";
    result.pictureFilter = "format=yuv420p,geq=lum='if(eq(N,25),235,16)':cb=128:cr=128";
    result.sound = "aevalsrc='0.8*sin(2*PI*1000*t)*between(t,1,1.04)'";
    result.audioCodec = extension == "mov" || extension == "mkv" ? "pcm_s16le" : "mp2";
    result.options = std::move(options);
    return result;
  };
  for (const MediaSpec& source : {spec("mov", {}), spec("mkv", {}), spec("avi", {}), spec("ts", {"-c:v", "mpeg2video"}),
                                  spec("mov", {"-output_ts_offset", "3"})}) {
    SCOPED_TRACE(source.extension);
    const fs::path file = hd(source);
    const std::vector<double> times = pictureTimes(file);
    const std::vector<int> brightness = support::middleBrightness(file);
    ASSERT_EQ(times.size(), brightness.size());
    const auto flash = static_cast<std::size_t>(std::ranges::max_element(brightness) - brightness.begin());
    const std::vector<float> sound = support::soundOf(file);
    const auto tone = std::ranges::find_if(sound, [](float value) { return std::abs(value) > 0.2F; }) - sound.begin();
    EXPECT_NEAR(times[flash], static_cast<double>(tone) / 44100, 0.02);
    EXPECT_NEAR(times[flash], 1, 0.05);
    EXPECT_NEAR(judge(file).video().start, 0, 0.001);
    EXPECT_NEAR(judge(file).audio().start, 0, 0.001);
  }
}

TEST_F(TranscodeTimesTest, WhatStartsLateStaysLateButBothBeginAtTheStart) {
  const fs::path picture = makeMedia(clip(2));
  MediaSpec tone = support::m4aSound();
  tone.extension = "wav";
  tone.audioCodec = "pcm_s16le";
  tone.duration = 1;
  const fs::path sound = makeMedia(tone);
  const fs::path lateSound = support::runFfmpeg(
      {"-i", picture.string(), "-itsoffset", "0.7", "-i", sound.string(), "-map", "0:v", "-map", "1:a", "-c", "copy"},
      "mov");
  const fs::path made = hd(lateSound);
  EXPECT_NEAR(judge(made).audio().start, 0, 0.001);
  const std::vector<float> samples = support::soundOf(made);
  EXPECT_LT(support::loudness(samples, 1, 0, 44100, 0, 0.68), 0.002);
  EXPECT_GT(support::loudness(samples, 1, 0, 44100, 0.72, 1.6), 0.05);

  const fs::path latePicture = support::runFfmpeg(
      {"-i", sound.string(), "-itsoffset", "0.6", "-i", picture.string(), "-map", "1:v", "-map", "0:a", "-c", "copy"},
      "mov");
  const std::vector<double> times = pictureTimes(hd(latePicture));
  EXPECT_EQ(times[0], 0);
  EXPECT_NEAR(times[1], 0.64, 0.001);
}

TEST_F(TranscodeTimesTest, GapsInSoundAreSilenceInTheirPlace) {
  const fs::path source = support::runFfmpeg(
      {"-f", "lavfi", "-i", "sine=frequency=440:duration=3,aselect='not(between(t,1,2))'", "-c:a", "flac"}, "mkv");
  const std::vector<float> sound = support::soundOf(audio(source));
  EXPECT_NEAR(static_cast<double>(sound.size()) / 44100, 3, 0.1);
  EXPECT_GT(support::loudness(sound, 1, 0, 44100, 0.2, 0.9), 0.05);
  EXPECT_LT(support::loudness(sound, 1, 0, 44100, 1.15, 1.9), 0.002);
  EXPECT_GT(support::loudness(sound, 1, 0, 44100, 2.15, 2.9), 0.05);
}

TEST_F(TranscodeTimesTest, WhatAnEditListCutsOffIsNotShown) {
  MediaSpec spec = MediaSpec{.duration = 2, .width = 64, .height = 48, .keyFrameInterval = 100, .sound = ""};
  spec.picture = "color=c=black";
  spec.pictureFilter = "format=yuv420p,geq=lum='20+4*N':cb=128:cr=128";
  const fs::path whole = makeMedia(spec);
  const fs::path cut = support::runFfmpeg({"-ss", "1", "-i", whole.string(), "-c", "copy"}, "mp4");
  const fs::path made = hd(cut);
  EXPECT_NEAR(support::middleBrightness(made)[0], 20 + 4 * 25, 3);
  EXPECT_NEAR(judge(made).video().duration, 1, 0.05);
  EXPECT_EQ(pictureTimes(made)[0], 0);
}

TEST_F(TranscodeTimesTest, StreamsWithoutTimesGetThem) {
  const fs::path bare = support::runFfmpeg({"-i", makeMedia(clip(1)).string(), "-c:v", "mpeg2video"}, "m2v");
  const std::vector<double> times = pictureTimes(hd(bare));
  ASSERT_THAT(times, SizeIs(25));
  EXPECT_NEAR(times.back(), 0.96, 0.002);
}

TEST_F(TranscodeTimesTest, RecordingsJoinedAnywhereRunOn) {
  MediaSpec spec = clip(1.2);
  spec.extension = "ts";
  spec.videoCodec = "mpeg2video";
  spec.sound = "sine=frequency=440";
  spec.audioCodec = "mp2";
  const std::string one = support::readBytes(makeMedia(spec));
  spec.options.insert(spec.options.end(), {"-output_ts_offset", "5000"});
  const std::string other = support::readBytes(makeMedia(spec));
  const fs::path joined = support::freshPath("ts");
  support::writeBytes(joined, one + other + one);
  const fs::path made = hd(joined);
  EXPECT_NEAR(judge(made).duration, 3.6, 0.3);
  const std::vector<double> times = pictureTimes(made);
  EXPECT_NEAR(static_cast<double>(times.size()), 90, 3);
  for (std::size_t i = 1; i < times.size(); ++i) EXPECT_LT(times[i] - times[i - 1], 0.3) << i;
}

}  // namespace
}  // namespace quilt::platform
