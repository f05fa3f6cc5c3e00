// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
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

class TranscodeSoundTest : public support::ConversionTest {
 protected:
  // Sound of several channels, each 1 s; channel i is `expressions[i]`.
  static fs::path channels(const std::vector<std::string>& expressions, const std::string& layout) {
    std::string all;
    for (const std::string& expression : expressions) all += (all.empty() ? "" : "|") + expression;
    return support::runFfmpeg(
        {"-f", "lavfi", "-i", "aevalsrc=" + all + ":d=1:s=48000" + (layout.empty() ? "" : ":c=" + layout), "-c:a",
         "pcm_f32le"},
        "wav");
  }
  static constexpr const char* kTone = "0.5*sin(2*PI*440*t)";
  static constexpr double kToneLoudness = 0.3536;

  // How loud left and right come out.
  std::array<double, 2> sides(const fs::path& source) {
    const fs::path file = audio(source);
    EXPECT_EQ(judge(file).audio().channels, 2);
    const std::vector<float> sound = support::soundOf(file);
    return {support::loudness(sound, 2, 0, 48000, 0.2, 0.8), support::loudness(sound, 2, 1, 48000, 0.2, 0.8)};
  }
  // Of 5.1 with a tone in one channel.
  std::array<double, 2> withToneIn(std::size_t channel) {
    std::vector<std::string> expressions(6, "0");
    expressions[channel] = kTone;
    return sides(channels(expressions, "5.1"));
  }
  static void expectLoudness(const std::array<double, 2>& actual, double left, double right) {
    EXPECT_NEAR(actual[0], left * kToneLoudness, 0.01);
    EXPECT_NEAR(actual[1], right * kToneLoudness, 0.01);
  }
};

TEST_F(TranscodeSoundTest, ManyChannelsAreMixedDown) {
  expectLoudness(withToneIn(0), 1, 0);
  expectLoudness(withToneIn(1), 0, 1);
  expectLoudness(withToneIn(2), 0.707, 0.707);
  expectLoudness(withToneIn(3), 0, 0);
  expectLoudness(withToneIn(4), 0.707, 0);
  expectLoudness(withToneIn(5), 0, 0.707);
}

TEST_F(TranscodeSoundTest, MixingDownDoesNotClip) {
  const std::string loud = "0.95*sin(2*PI*440*t)";
  const fs::path file = audio(channels(std::vector<std::string>(6, loud), "5.1"));
  const std::vector<float> sound = support::soundOf(file);
  double most = 0;
  for (std::size_t i = 9600; i < sound.size() - 9600; ++i)
    most = std::max(most, std::abs(static_cast<double>(sound[i])));
  EXPECT_LT(most, 1.04);
  EXPECT_GT(support::loudness(sound, 2, 0, 48000, 0.2, 0.8), 0.6) << "turned down, not cut off";
}

TEST_F(TranscodeSoundTest, ChannelsWithoutPlacesCountAsUsual) {
  std::vector<std::int16_t> samples;
  for (int i = 0; i < 48000; ++i) {
    for (int channel = 0; channel < 6; ++channel) {  // the third is the centre
      samples.push_back(channel == 2 ? static_cast<std::int16_t>(16384 * std::sin(i * 0.0576)) : std::int16_t{0});
    }
  }
  expectLoudness(sides(support::makeWav(samples, 6)), 0.707, 0.707);
}

TEST_F(TranscodeSoundTest, MoreChannelsThanAnyLayoutHasAreHeardOnBothSides) {
  std::string nine = kTone;
  for (int i = 1; i < 9; ++i) nine += std::string("|") + kTone;
  const fs::path many =
      support::runFfmpeg({"-f", "lavfi", "-i", "aevalsrc=" + nine + ":d=1:s=48000", "-c:a", "pcm_f32le"}, "wav");
  expectLoudness(sides(many), 1, 1);
}

TEST_F(TranscodeSoundTest, RatesOfDiscsAndVideoAreKeptAndOthersAreNot) {
  for (const auto& [rate, expected] :
       {std::pair{44100, 44100}, {48000, 48000}, {22050, 44100}, {96000, 48000}, {8000, 48000}}) {
    MediaSpec spec = support::aiffSound();
    spec.sampleRate = rate;
    spec.duration = 1;
    const fs::path file = audio(spec);
    EXPECT_EQ(judge(file).audio().sampleRate, expected);
    EXPECT_EQ(judge(file).audio().channels, 1) << "one channel stays one";
    const std::vector<float> sound = support::soundOf(file);
    EXPECT_NEAR(judge(file).audio().duration, 1, 0.001);
    EXPECT_NEAR(support::loudness(sound, 1, 0, expected, 0.2, 0.8), 0.0884, 0.01);
  }
}

TEST_F(TranscodeSoundTest, EncoderDelayIsNoDelay) {
  MediaSpec spec = support::mp3Sound();
  spec.sound = "aevalsrc='0.8*sin(2*PI*1000*t)*gte(t,0.5)'";
  spec.duration = 1;
  const std::vector<float> sound = support::soundOf(audio(spec));
  const auto first = std::ranges::find_if(sound, [](float value) { return std::abs(value) > 0.3F; }) - sound.begin();
  EXPECT_NEAR(static_cast<double>(first) / 44100, 0.5, 0.005);
}

TEST_F(TranscodeSoundTest, SoundThatChangesInTheMiddleRunsOn) {
  MediaSpec spec = support::mp3Sound();
  spec.duration = 1;
  spec.options = {"-write_xing", "0", "-id3v2_version", "0"};
  const std::string mono = support::readBytes(makeMedia(spec));
  spec.channels = 2;
  spec.sampleRate = 48000;
  const std::string stereo = support::readBytes(makeMedia(spec));
  const fs::path both = support::freshPath("mp3");
  support::writeBytes(both, mono + stereo);
  const fs::path file = audio(both);
  EXPECT_NEAR(judge(file).duration, 2, 0.15);
}

}  // namespace
}  // namespace quilt::platform
