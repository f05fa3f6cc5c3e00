// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <random>

#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/MediaJudge.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;
using support::judge;
using support::JudgedFile;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class TranscoderCorpusTest : public ::testing::Test {
 protected:
  Result<void> makeSD(const fs::path& source, const TranscoderProgressBlock& block = {}) {
    return FfmpegTranscoder().transcodeToSD(Url::fileUrl(source), Url::fileUrl(output()), block);
  }
  Result<void> makeAudio(const fs::path& source) {
    return FfmpegTranscoder().transcodeToAudio(Url::fileUrl(source), Url::fileUrl(output()), {});
  }
  [[nodiscard]] fs::path output() const { return _folder / "made"; }

  // The movie in the smaller size, as judged.
  JudgedFile sd(const fs::path& source) {
    const Result<void> made = makeSD(source);
    if (!made) throw std::runtime_error(made.error().text);
    EXPECT_THAT(support::outermostBoxes(output()), ElementsAre("ftyp", "moov", "free", "mdat"));
    JudgedFile judged = judge(output());
    EXPECT_EQ(judged.video().codec, "h264");
    EXPECT_LE(judged.video().width, 640);
    EXPECT_LE(judged.video().height, 480);
    EXPECT_FALSE(judged.video().isTurned);
    if (judged.count("audio") > 0) {
      EXPECT_NEAR(judged.video().start, judged.audio().start, 0.1);
    }
    return judged;
  }

  // What fails leaves nothing; what succeeds is whole.
  void expectNoHarm(const fs::path& file) {
    const auto start = std::chrono::steady_clock::now();
    for (const bool isMovie : {true, false}) {
      const Result<void> made = isMovie ? makeSD(file) : makeAudio(file);
      if (made) {
        EXPECT_TRUE(fs::remove(output()));
      } else {
        EXPECT_FALSE(made.error().text.empty());
      }
      EXPECT_TRUE(fs::is_empty(_folder.path()));
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(20));
  }

 private:
  support::ScratchFolder _folder;
};

TEST_F(TranscoderCorpusTest, PhoneMoviesAreTurnedAndMadeSmall) {
  QUILT_CORPUS_FILE(file, "h264-aac-sideways-rot90.mov");
  const JudgedFile judged = sd(file);
  EXPECT_EQ(judged.video().width, 360);
  EXPECT_EQ(judged.video().height, 480);
  EXPECT_NEAR(judged.video().duration, 1.0, 0.1);
}

TEST_F(TranscoderCorpusTest, HighDynamicRangeOfAPhoneIsMapped) {
  QUILT_CORPUS_FILE(file, "hevc10-noaudio-rot90-hdr.mov");
  const JudgedFile judged = sd(file);
  EXPECT_EQ(judged.video().width, 270);
  EXPECT_EQ(judged.video().height, 480);
  EXPECT_EQ(judged.video().pixelFormat, "yuv420p");
  EXPECT_EQ(judged.video().transfer, "bt709");
  EXPECT_EQ(judged.video().frames, 40);
}

TEST_F(TranscoderCorpusTest, OldFormatsWork) {
  for (const auto& [name, frames] : {std::pair{"mpeg4p2-mp3-960x400.avi", 96},
                                     {"h263-noaudio-176x144.3gp", 15},
                                     {"mpeg4p2-noaudio-176x144.mp4", 15}}) {
    QUILT_CORPUS_FILE(file, name);
    SCOPED_TRACE(name);
    EXPECT_NEAR(sd(file).video().frames, frames, 2);
  }
}

TEST_F(TranscoderCorpusTest, StreamsWithSeveralTracksGiveOneOfEach) {
  QUILT_CORPUS_FILE(file, "h264-aac-multitrack-subtitles-nasa.mp4");
  const JudgedFile judged = sd(file);
  EXPECT_EQ(judged.count("video"), 1);
  EXPECT_EQ(judged.count("audio"), 1);
}

TEST_F(TranscoderCorpusTest, ChaptersOfBothFormsGoAlong) {
  QUILT_CORPUS_FILE(file, "h264-aac-chapters-qt.mp4");
  EXPECT_EQ(sd(file).chapters.size(), judge(file).chapters.size());
}

TEST_F(TranscoderCorpusTest, PictureSubtitlesDoNoHarm) {
  QUILT_CORPUS_FILE(file, "h264-ac3-vobsub.mp4");
  EXPECT_EQ(sd(file).audio().codec, "aac");
}

TEST_F(TranscoderCorpusTest, MoviesThatFitAreCopied) {
  for (const char* name : {"h264-aac-640x480-friday.mp4", "h264-aac-320x240-rabbit.mp4", "h264-aac-640x480.mov"}) {
    QUILT_CORPUS_FILE(file, name);
    SCOPED_TRACE(name);
    sd(file);
    EXPECT_EQ(support::packetChecksums(output(), "v"), support::packetChecksums(file, "v"));
    EXPECT_EQ(support::packetChecksums(output(), "a"), support::packetChecksums(file, "a"));
  }
}

TEST_F(TranscoderCorpusTest, SoundOfEveryFormatWorks) {
  for (const char* name : {"alac-11s.m4a", "aiff-8bit.aif", "mp3-id3-cover-chapters.mp3", "wav-16bit.wav", "aac-3s.m4a",
                           "audio-only-mp3.mp4"}) {
    QUILT_CORPUS_FILE(file, name);
    SCOPED_TRACE(name);
    const Result<void> made = makeAudio(file);
    ASSERT_TRUE(made) << made.error().text;
    EXPECT_EQ(judge(output()).audio().codec, "aac");
    EXPECT_EQ(judge(output()).count("video"), 0);
  }
}

TEST_F(TranscoderCorpusTest, PacketsOfManySpeechFramesAreHeardWhole) {
  QUILT_CORPUS_FILE(file, "h263-amr-176x144-15s.3gp");
  ASSERT_TRUE(makeAudio(file));
  const std::vector<float> sound = support::soundOf(output());
  const int rate = judge(output()).audio().sampleRate;
  int silent = 0;
  for (int tenth = 10; tenth < 100; ++tenth) {
    silent += support::loudness(sound, 1, 0, rate, tenth * 0.1, tenth * 0.1 + 0.1) < 1e-5 ? 1 : 0;
  }
  EXPECT_LT(silent, 5);
}

TEST_F(TranscoderCorpusTest, DamagedRealFilesDoNoHarm) {
  for (const char* name :
       {"bad-m4a-infinite-loop.m4a", "bad-m4a-truncated.m4a", "bad-mov-poc-ghsa.mov", "bad-mp3-excessive-alloc.mp3",
        "bad-mp4-chunk-out-of-range.mp4", "bad-mp4-clusterfuzz.mp4", "bad-mp4-free-box.mp4",
        "bad-mp4-invalid-userdata.mp4", "bad-mp4-missing-stsd.mp4", "bad-mp4-no-moov.mp4", "bad-mp4-poc-2340.mp4",
        "bad-mp4-poc-2377.mp4", "bad-mp4-truncated-media.mp4", "bad-aiff-cwe-835.aiff", "bad-aiff-segfault.aif"}) {
    QUILT_CORPUS_FILE(file, name);
    SCOPED_TRACE(name);
    expectNoHarm(file);
  }
}

TEST_F(TranscoderCorpusTest, DamagedFixturesDoNoHarm) {
  constexpr int each = 12;
  for (const char* extension : {"mp4", "mkv", "avi", "ts"}) {
    SCOPED_TRACE(extension);
    const std::string whole = support::readBytes(
        support::makeMedia({.extension = extension, .duration = 0.3, .width = 64, .height = 48, .pixelShape = "2/1"}));
    std::mt19937 random(20240229);  // NOLINT(cert-msc51-cpp): the same every time
    for (int i = 0; i < each; ++i) {
      std::string bytes = whole;
      for (int change = 0; change < 8; ++change) {
        const std::size_t range = change % 2 == 0 ? bytes.size() : std::min<std::size_t>(bytes.size(), 2048);
        const std::size_t place = random() % range;
        bytes[change % 4 < 2 ? place : bytes.size() - 1 - place] = static_cast<char>(random() % 256);
      }
      const fs::path file = support::freshPath(extension);
      support::writeBytes(file, bytes);
      expectNoHarm(file);
    }
  }
}

TEST_F(TranscoderCorpusTest, AGapOfDaysIsNotFilledWithSilence) {
  const fs::path two = support::runFfmpeg(
      {"-f", "lavfi", "-i", "sine=duration=1,asetpts='PTS+gte(T,0.5)*20000000*SR'", "-c:a", "flac"}, "mkv");
  const Result<void> made = makeAudio(two);
  ASSERT_TRUE(made) << made.error().text;
  EXPECT_LT(judge(output()).duration, 5);
}

}  // namespace
}  // namespace quilt::platform
