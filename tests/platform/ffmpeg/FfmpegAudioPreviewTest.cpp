// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstring>
#include <numbers>

#include "quilt/platform/ffmpeg/FfmpegAudioPreview.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ScratchFolder.h"
#include "tests/support/SourceServices.h"
#include "tests/support/Stopwatch.h"

namespace quilt::platform {
namespace {

using support::makeMedia;
using support::makeWav;
using support::MediaSpec;
using Samples = std::vector<std::int16_t>;

class FfmpegAudioPreviewTest : public ::testing::Test {
 protected:
  Result<void> extract(const std::filesystem::path& source, const ContinueBlock& goesOn = {}) {
    return FfmpegAudioPreview().extractAudioSamplesFromAssetURL(Url::fileUrl(source), Url::fileUrl(_output), goesOn);
  }
  // The bytes of the samples file.
  std::string samplesOf(const std::filesystem::path& source) {
    const Result<void> result = extract(source);
    if (!result) ADD_FAILURE() << source << ": " << result.error().text;
    return support::readBytes(_output);
  }

  static std::uint32_t field(const std::string& bytes, std::size_t offset) {
    std::uint32_t value = 0;
    std::memcpy(&value, bytes.data() + offset, 4);
    return value;
  }

  static std::string word(std::uint32_t value) { return {reinterpret_cast<const char*>(&value), 4}; }

  // What the layout makes of decoded frames, point by point.
  static std::string expectedFile(const Samples& samples, std::size_t channels, std::uint32_t sampleRate) {
    const std::size_t frames = samples.size() / channels;
    const std::size_t points = (frames + 255) / 256;
    std::string bytes = word(2) + word(1) + word(sampleRate) + word(256) + word(static_cast<std::uint32_t>(points)) +
                        word(static_cast<std::uint32_t>(channels));
    for (std::size_t point = 0; point < points; ++point) {
      for (std::size_t channel = 0; channel < channels; ++channel) {
        int least = 32767;
        int greatest = -32768;
        for (std::size_t i = point * 256; i < std::min(frames, (point + 1) * 256); ++i) {
          least = std::min<int>(least, samples[i * channels + channel]);
          greatest = std::max<int>(greatest, samples[i * channels + channel]);
        }
        bytes += static_cast<char>(least / 256);
        bytes += static_cast<char>(greatest / 256);
      }
    }
    return bytes;
  }

  // What the program decodes of the file.
  static Samples decoded(const std::filesystem::path& file, int channels) {
    const std::string bytes = support::readBytes(support::runFfmpeg(
        {"-i", file.string(), "-map", "0:a:0", "-f", "s16le", "-c:a", "pcm_s16le", "-ac", std::to_string(channels)},
        "raw"));
    Samples samples(bytes.size() / 2);
    std::memcpy(samples.data(), bytes.data(), samples.size() * 2);
    return samples;
  }

  static Samples sine(std::size_t frames, double amplitude) {
    Samples samples;
    for (std::size_t i = 0; i < frames; ++i) {
      const double angle = static_cast<double>(i) * 440 * 2 * std::numbers::pi / 48000;
      samples.push_back(static_cast<std::int16_t>(std::lround(amplitude * std::sin(angle))));
    }
    return samples;
  }

  support::ScratchFolder _folder;
  std::filesystem::path _output = _folder / "sound.asc";
};

TEST_F(FfmpegAudioPreviewTest, TheHeaderIsTheDocumentedOne) {
  // 48 kHz stereo, three points
  const std::string bytes = samplesOf(makeWav(Samples(2 * 600), 2));
  const std::string header(
      "\x02\0\0\0"
      "\x01\0\0\0"
      "\x80\xbb\0\0"
      "\0\x01\0\0"
      "\x03\0\0\0"
      "\x02\0\0\0",
      24);
  EXPECT_EQ(bytes.substr(0, 24), header);
  EXPECT_EQ(bytes.size(), 36U);
}

TEST_F(FfmpegAudioPreviewTest, PointsHoldMinimumAndMaximumOfEachChannel) {
  Samples samples;
  for (int i = 0; i < 512; ++i) {
    samples.push_back(static_cast<std::int16_t>(i % 2 == 0 ? 25600 : -12800));  // left: a square wave
    samples.push_back(static_cast<std::int16_t>(i < 256 ? 2560 : -2560));       // right: high, then low
  }
  const std::string bytes = samplesOf(makeWav(samples, 2));
  const std::string points(
      "\xce\x64"
      "\x0a\x0a"
      "\xce\x64"
      "\xf6\xf6",
      8);
  EXPECT_EQ(bytes.substr(24), points);
}

TEST_F(FfmpegAudioPreviewTest, SixteenBitsBecomeEightTowardZero) {
  Samples samples(256, -255);
  samples.insert(samples.end(), 256, 255);
  samples.insert(samples.end(), 128, -32768);
  samples.insert(samples.end(), 128, 32767);
  samples.insert(samples.end(), 256, -256);
  EXPECT_EQ(samplesOf(makeWav(samples, 1)).substr(24), std::string("\0\0\0\0\x80\x7f\xff\xff", 8));
}

TEST_F(FfmpegAudioPreviewTest, TheLastPointCoversTheRest) {
  for (const std::size_t frames : {1U, 255U, 256U, 257U, 511U, 512U, 513U, 100'000U}) {
    const Samples samples = sine(frames, 30000);
    const std::string bytes = samplesOf(makeWav(samples, 1));
    EXPECT_EQ(field(bytes, 16), (frames + 255) / 256) << frames;
    EXPECT_TRUE(bytes == expectedFile(samples, 1, 48000)) << frames;
  }
}

TEST_F(FfmpegAudioPreviewTest, EverySampleFormatGivesTheSamePoints) {
  const Samples samples = sine(20'000, 30000);
  const std::filesystem::path wav = makeWav(samples, 1);
  const std::string expected = expectedFile(samples, 1, 48000);
  for (const char* codec : {"pcm_s16be", "pcm_s24le", "pcm_s32le", "pcm_f32le", "pcm_f64le", "flac", "alac"}) {
    const std::filesystem::path file =
        support::runFfmpeg({"-i", wav.string(), "-c:a", codec}, std::string(codec) == "alac"   ? "m4a"
                                                                : std::string(codec) == "flac" ? "flac"
                                                                                               : "caf");
    EXPECT_TRUE(samplesOf(file) == expected) << codec;
  }
}

TEST_F(FfmpegAudioPreviewTest, EightBitSoundIsAsLoud) {
  const std::filesystem::path file =
      support::runFfmpeg({"-i", makeWav(sine(2'000, 30000), 1).string(), "-c:a", "pcm_u8"}, "wav");
  EXPECT_TRUE(samplesOf(file) == expectedFile(decoded(file, 1), 1, 48000));
}

TEST_F(FfmpegAudioPreviewTest, CompressedSoundGivesWhatIsPlayed) {
  for (MediaSpec spec : {support::m4aSound(), support::mp3Sound(), MediaSpec{}}) {
    for (const int channels : {1, 2}) {
      spec.channels = channels;
      spec.duration = 3;
      spec.sound = "aevalsrc=sin(300*t*t)*t/4|sin(700*t)*0.3";
      const std::filesystem::path file = makeMedia(spec);
      const Samples played = decoded(file, channels);
      EXPECT_TRUE(samplesOf(file) == expectedFile(played, static_cast<std::size_t>(channels), 44100))
          << spec.extension << " " << channels;
    }
  }
}

TEST_F(FfmpegAudioPreviewTest, EncoderDelayIsLeftOut) {
  // Silence, then a loud second: the step comes where it was put.
  MediaSpec spec = support::mp3Sound();
  spec.sound = "aevalsrc='if(lt(t,1),0,sin(3000*t))'";
  const std::string bytes = samplesOf(makeMedia(spec));
  const std::size_t point = 44100 / 256;
  const auto loudness = [&](std::size_t i) { return static_cast<int>(bytes[24 + i * 2 + 1]); };
  EXPECT_LT(loudness(point - 3), 10);
  EXPECT_GT(loudness(point + 3), 90);
}

TEST_F(FfmpegAudioPreviewTest, SurroundIsMixedDownToTwoChannels) {
  // Centre only: both sides hear it alike. 0.707 of it, in a mix scaled so that all channels together do not clip.
  Samples samples;
  for (int i = 0; i < 1024; ++i) samples.insert(samples.end(), {0, 0, 20000, 0, 0, 0});
  const std::filesystem::path file =
      support::runFfmpeg({"-channel_layout", "5.1", "-i", makeWav(samples, 6).string(), "-c:a", "pcm_s16le"}, "wav");
  const std::string bytes = samplesOf(file);
  EXPECT_EQ(field(bytes, 20), 2U);
  ASSERT_EQ(bytes.size(), 24U + 4 * 2 * 2);
  const double expected = 20000 * 0.70710678 / (1 + 2 * 0.70710678) / 256;
  for (std::size_t i = 24; i < bytes.size(); ++i) EXPECT_NEAR(bytes[i], expected, 1);
}

TEST_F(FfmpegAudioPreviewTest, TheLowFrequencyChannelIsLeftOut) {
  Samples samples;
  for (int i = 0; i < 256; ++i) samples.insert(samples.end(), {0, 0, 0, 20000, 0, 0});
  const std::filesystem::path file =
      support::runFfmpeg({"-channel_layout", "5.1", "-i", makeWav(samples, 6).string(), "-c:a", "pcm_s16le"}, "wav");
  EXPECT_EQ(samplesOf(file).substr(24), std::string(4, '\0'));
}

TEST_F(FfmpegAudioPreviewTest, ChannelsWithoutPlacesCountAlike) {
  Samples samples;
  for (int i = 0; i < 256; ++i) {
    for (int channel = 0; channel < 11; ++channel)
      samples.push_back(static_cast<std::int16_t>(channel == 5 ? 11264 : 0));
  }
  const std::string bytes = samplesOf(makeWav(samples, 11));
  EXPECT_EQ(bytes.substr(24), std::string(4, '\x04'));  // 11264 / 11 / 256
}

TEST_F(FfmpegAudioPreviewTest, PacketsOfManySpeechFramesAreTakenWhole) {
  QUILT_CORPUS_FILE(speech, "h263-amr-176x144-15s.3gp");
  const std::string bytes = samplesOf(speech);
  constexpr double points = 15.0 * 8000 / 256;
  EXPECT_NEAR(field(bytes, 16), points, points / 20);
}

TEST_F(FfmpegAudioPreviewTest, ALongFileIsWrittenWhole) {
  const Samples samples = sine(48'000 * 60, 20000);
  EXPECT_TRUE(samplesOf(makeWav(samples, 2)) == expectedFile(samples, 2, 48000));
}

TEST_F(FfmpegAudioPreviewTest, ATruncatedFileGivesThePointsThatAreThere) {
  const std::filesystem::path file = support::copyOf(makeMedia(support::mp3Sound()));
  std::filesystem::resize_file(file, std::filesystem::file_size(file) / 2);
  const std::string bytes = samplesOf(file);
  const std::uint32_t points = field(bytes, 16);
  EXPECT_GT(points, 100U);
  EXPECT_LT(points, 250U);
  EXPECT_EQ(bytes.size(), 24 + points * 2);
}

TEST_F(FfmpegAudioPreviewTest, NothingIsLeftWhenItFails) {
  const std::filesystem::path silent = makeMedia(support::silentMovie());
  const Result<void> result = extract(silent);
  ASSERT_FALSE(result);
  EXPECT_EQ(result.error().kind, ErrorKind::Unsupported);
  EXPECT_EQ(result.error().text, "The file holds no sound.");

  const std::filesystem::path garbage = support::copyOf(makeMedia(support::m4aSound()));
  std::string bytes = support::readBytes(garbage);
  const std::size_t media = bytes.find("mdat") + 4;
  std::fill_n(bytes.begin() + static_cast<std::ptrdiff_t>(media), bytes.find("moov") - 4 - media, '\xff');
  support::writeBytes(garbage, bytes);
  const Result<void> damaged = extract(garbage);
  ASSERT_FALSE(damaged);
  EXPECT_EQ(damaged.error().text, "No sound of the file can be decoded.");
  EXPECT_TRUE(std::filesystem::is_empty(_folder.path()));
}

TEST_F(FfmpegAudioPreviewTest, NoTemporaryFileIsLeftWhenItSucceeds) {
  samplesOf(makeWav(Samples(600), 1));
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(_folder.path()), {}), 1);
}

// ---- Stopping

TEST_F(FfmpegAudioPreviewTest, AFalseAnswerStopsALongFileAtOnceAndLeavesNothing) {
  const std::filesystem::path source = support::longSilence();
  int asked = 0;
  bool wroteMeanwhile = false;
  support::Stopwatch answered;
  const Result<void> result = extract(source, [&] {
    if (++asked < 1000) return true;
    wroteMeanwhile = !std::filesystem::is_empty(_folder.path());
    answered.start();
    return false;
  });
  EXPECT_LT(answered.seconds(), 1);
  ASSERT_FALSE(result);
  EXPECT_EQ(result.error().kind, ErrorKind::Cancelled);
  EXPECT_EQ(result.error().text, "Reading the sound was stopped.");
  EXPECT_EQ(result.error().file, source);
  EXPECT_EQ(asked, 1000) << "a false answer is final";
  EXPECT_TRUE(wroteMeanwhile) << "it was stopped before it began";
  EXPECT_TRUE(std::filesystem::is_empty(_folder.path()));
}

TEST_F(FfmpegAudioPreviewTest, ItAsksManyTimesASecond) {
  const std::filesystem::path source = support::longSilence();
  using Clock = std::chrono::steady_clock;
  const Clock::time_point start = Clock::now();
  support::Stopwatch last;
  double longest = 0;
  const Result<void> result = extract(source, [&] {
    longest = std::max(longest, last.seconds());
    last.start();
    return Clock::now() - start < std::chrono::milliseconds(500);
  });
  ASSERT_FALSE(result);
  EXPECT_EQ(result.error().kind, ErrorKind::Cancelled);
  EXPECT_LT(longest, 0.5);
}

TEST_F(FfmpegAudioPreviewTest, StoppingBeforeItBeginsOpensNoOutput) {
  const Result<void> result = extract(makeMedia(support::mp3Sound()), [] { return false; });
  ASSERT_FALSE(result);
  EXPECT_EQ(result.error().kind, ErrorKind::Cancelled);
  EXPECT_TRUE(std::filesystem::is_empty(_folder.path()));
}

TEST_F(FfmpegAudioPreviewTest, AnAnswerThatStaysTrueChangesNothing) {
  const std::filesystem::path source = makeMedia(support::mp3Sound());
  const std::string alone = samplesOf(source);
  int asked = 0;
  ASSERT_TRUE(extract(source, [&asked] { return ++asked > 0; }));
  EXPECT_GT(asked, 10);
  EXPECT_TRUE(support::readBytes(_output) == alone);
}

TEST_F(FfmpegAudioPreviewTest, AMissingFolderIsReported) {
  const Result<void> result = FfmpegAudioPreview().extractAudioSamplesFromAssetURL(
      Url::fileUrl(makeWav(Samples(600), 1)), Url::fileUrl(_folder / "missing" / "sound.asc"), {});
  ASSERT_FALSE(result);
  EXPECT_EQ(result.error().kind, ErrorKind::NotFound);
}

TEST_F(FfmpegAudioPreviewTest, WebAddressesAreRefused) {
  const Result<void> result = FfmpegAudioPreview().extractAudioSamplesFromAssetURL(
      *Url::parse("http://example.com/a.mp3"), Url::fileUrl(_output), {});
  ASSERT_FALSE(result);
  EXPECT_EQ(result.error().kind, ErrorKind::Unsupported);
}

}  // namespace
}  // namespace quilt::platform
