// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/resource.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cmath>
#include <csignal>

#include "tests/support/MediaFixtures.h"
#include "tests/support/MediaJudge.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;
using support::judge;
using support::JudgedFile;
using support::JudgedPicture;
using support::JudgedStream;
using support::makeMedia;
using support::MediaSpec;
using support::pictureOf;
using support::pictureTimes;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

constexpr auto kPatience = [](float, bool&) {};

class FfmpegTranscoderTest : public ::testing::Test {
 protected:
  fs::path hd(const fs::path& source) { return made(&FfmpegTranscoder::transcodeToHD, source, "m4v"); }
  fs::path sd(const fs::path& source) { return made(&FfmpegTranscoder::transcodeToSD, source, "m4v"); }
  fs::path audio(const fs::path& source) { return made(&FfmpegTranscoder::transcodeToAudio, source, "m4a"); }
  fs::path hd(const MediaSpec& spec) { return hd(makeMedia(spec)); }
  fs::path sd(const MediaSpec& spec) { return sd(makeMedia(spec)); }
  fs::path audio(const MediaSpec& spec) { return audio(makeMedia(spec)); }

  // The error of a conversion that leaves nothing behind.
  Error failureOf(const fs::path& source, const TranscoderProgressBlock& block = kPatience) {
    const Result<void> done =
        FfmpegTranscoder().transcodeToHD(Url::fileUrl(source), Url::fileUrl(_folder / "no"), block);
    EXPECT_THAT(leftovers(), IsEmpty());
    return done ? Error{ErrorKind::AlreadyExists, "It succeeded.", {}} : done.error();
  }

  std::vector<std::string> leftovers() {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(_folder.path())) names.push_back(entry.path().filename());
    return names;
  }

  // A short silent movie that has to be encoded, because it is no H.264.
  static MediaSpec clip(double duration = 0.4) {
    MediaSpec spec = support::silentMovie();
    spec.duration = duration;
    spec.width = 160;
    spec.height = 120;
    spec.videoCodec = "mpeg4";
    spec.extension = "mov";
    spec.options = {"-q:v", "2"};
    return spec;
  }

  // Its left upper quarter is red, the right one green, the left lower one blue, the right one white.
  static MediaSpec quarters() {
    MediaSpec spec = clip();
    spec.picture = "color=c=black";
    spec.pictureFilter =
        "format=gbrp,geq=r='255*(lt(X,W/2)*lt(Y,H/2)+gte(X,W/2)*gte(Y,H/2))':g='255*gte(X,W/2)'"
        ":b='255*gte(Y,H/2)'";
    return spec;
  }
  // The colours of a picture's corners: "RGBW" for the above.
  static std::string corners(const fs::path& file) {
    const JudgedPicture picture = pictureOf(file, 0);
    std::string result;
    for (const auto& [x, y] : {std::pair{0.2, 0.2}, {0.8, 0.2}, {0.2, 0.8}, {0.8, 0.8}}) {
      const auto [red, green, blue] = picture.at(x, y);
      const bool r = red > 128;
      const bool g = green > 128;
      const bool b = blue > 128;
      result += r && g && b ? 'W' : r ? 'R' : g ? 'G' : b ? 'B' : '?';
    }
    return result;
  }

  static void expectSize(const fs::path& file, int width, int height) {
    const JudgedStream video = judge(file).video();
    EXPECT_EQ(std::to_string(video.width) + "x" + std::to_string(video.height),
              std::to_string(width) + "x" + std::to_string(height));
    EXPECT_EQ(video.pixelShape, "1:1");
    EXPECT_FALSE(video.isTurned);
  }

  static void expectPlainColours(const fs::path& file) {
    const JudgedStream video = judge(file).video();
    EXPECT_EQ(video.codec, "h264");
    EXPECT_EQ(video.profile, "High");
    EXPECT_EQ(video.pixelFormat, "yuv420p");
    EXPECT_EQ(video.range, "tv");
    EXPECT_EQ(video.matrix, "bt709");
    EXPECT_EQ(video.primaries, "bt709");
    EXPECT_EQ(video.transfer, "bt709");
    EXPECT_NE(support::readBytes(file).find("colrnclx"), std::string::npos) << "the container says so too";
  }

  static void expectColour(const std::array<int, 3>& actual, const std::array<int, 3>& expected, int tolerance) {
    for (std::size_t i = 0; i < 3; ++i) {
      EXPECT_NEAR(actual[i], expected[i], tolerance)
          << "(" << actual[0] << ", " << actual[1] << ", " << actual[2] << ") is not (" << expected[0] << ", "
          << expected[1] << ", " << expected[2] << ")";
    }
  }

  // One colour (200, 60, 20), stored as `filter` and the options say, converted and decoded again.
  std::array<int, 3> colourAfter(const std::string& filter, int height, std::vector<std::string> options,
                                 const std::string& codec = "libx264", const std::string& pixelFormat = "yuv420p") {
    MediaSpec spec = support::silentMovie();
    spec.extension = "mov";
    spec.duration = 0.2;
    spec.picture = "color=c=0xC83C14";
    spec.pictureFilter = filter;
    spec.width = 64;
    spec.height = height;
    spec.videoCodec = codec;
    spec.pixelFormat = pixelFormat;
    spec.pixelShape = "2/1";  // so that it is not copied
    spec.options = std::move(options);
    const fs::path file = hd(spec);
    expectPlainColours(file);
    return pictureOf(file, 0).at(0.5, 0.5);
  }

  support::ScratchFolder _folder;

 private:
  using Operation = Result<void> (FfmpegTranscoder::*)(const Url&, const Url&, const TranscoderProgressBlock&);

  fs::path made(Operation operation, const fs::path& source, const std::string& extension) {
    const fs::path file = support::freshPath(extension);
    FfmpegTranscoder transcoder;
    const Result<void> done = (transcoder.*operation)(Url::fileUrl(source), Url::fileUrl(file), kPatience);
    if (!done) throw std::runtime_error(done.error().text);
    EXPECT_THAT(support::outermostBoxes(file), ElementsAre("ftyp", "moov", "free", "mdat")) << "the index first";
    return file;
  }
};

// What comes out

TEST_F(FfmpegTranscoderTest, AMovieBecomesH264AndAacInEachSize) {
  MediaSpec spec = clip(1);
  spec.width = 1440;
  spec.height = 810;
  spec.sound = "sine=frequency=440";
  spec.audioCodec = "pcm_s16le";
  for (const bool isHigh : {true, false}) {
    const fs::path file = isHigh ? hd(spec) : sd(spec);
    expectSize(file, isHigh ? 1280 : 640, isHigh ? 720 : 360);
    expectPlainColours(file);
    const JudgedFile judged = judge(file);
    EXPECT_EQ(judged.video().frames, 25);
    EXPECT_NEAR(judged.video().duration, 1, 0.001);
    EXPECT_EQ(judged.audio().codec, "aac");
    EXPECT_EQ(judged.audio().profile, "LC");
    EXPECT_NEAR(judged.audio().duration, 1, 0.001);
    EXPECT_EQ(judged.tags.at("major_brand"), "M4V ");
  }
}

TEST_F(FfmpegTranscoderTest, SoundBecomesAac) {
  const fs::path file = audio(support::mp3Sound());
  const JudgedFile judged = judge(file);
  EXPECT_THAT(judged.streams, SizeIs(1));
  EXPECT_EQ(judged.audio().codec, "aac");
  EXPECT_EQ(judged.audio().profile, "LC");
  EXPECT_NEAR(judged.duration, 2, 0.03);
  EXPECT_EQ(judged.tags.at("major_brand"), "M4A ");
}

TEST_F(FfmpegTranscoderTest, OfAMovieTheSoundAloneCanBeMade) {
  const JudgedFile judged = judge(audio(MediaSpec{}));
  EXPECT_EQ(judged.count("video"), 0);
  EXPECT_EQ(judged.count("audio"), 1);
}

TEST_F(FfmpegTranscoderTest, AMovieWithoutSoundAndSoundWithoutAMovieWork) {
  EXPECT_EQ(judge(hd(clip())).count("audio"), 0);
  const JudgedFile judged = judge(hd(support::mp3Sound()));
  EXPECT_EQ(judged.count("video"), 0);
  EXPECT_EQ(judged.count("audio"), 1);
}

TEST_F(FfmpegTranscoderTest, StreamsThatFitAreCopied) {
  const fs::path source = makeMedia({});
  const fs::path copy = hd(source);
  EXPECT_EQ(support::packetChecksums(copy, "v"), support::packetChecksums(source, "v"));
  EXPECT_EQ(support::packetChecksums(copy, "a"), support::packetChecksums(source, "a"));
  EXPECT_EQ(pictureTimes(copy), pictureTimes(source));
  EXPECT_EQ(support::soundOf(copy).size(), support::soundOf(source).size());
  const fs::path sound = makeMedia(support::m4aSound());
  EXPECT_EQ(support::packetChecksums(audio(sound), "a"), support::packetChecksums(sound, "a"));
}

TEST_F(FfmpegTranscoderTest, AStreamIsCopiedBesideOneThatIsEncoded) {
  MediaSpec spec;
  spec.audioCodec = "libmp3lame";
  const fs::path source = makeMedia(spec);
  const fs::path made = hd(source);
  EXPECT_EQ(support::packetChecksums(made, "v"), support::packetChecksums(source, "v"));
  EXPECT_EQ(judge(made).audio().codec, "aac");
  MediaSpec large{.duration = 0.4, .width = 800, .height = 600};
  const fs::path largeSource = makeMedia(large);
  const fs::path small = sd(largeSource);
  expectSize(small, 640, 480);
  EXPECT_EQ(support::packetChecksums(small, "a"), support::packetChecksums(largeSource, "a"));
}

TEST_F(FfmpegTranscoderTest, FragmentedFilesAndMatroskaAreCopiedIntoPlainOnes) {
  MediaSpec fragmented{.duration = 1, .options = {"-movflags", "frag_keyframe+empty_moov"}};
  MediaSpec matroska{.extension = "mkv", .duration = 1};
  for (const MediaSpec& spec : {fragmented, matroska}) {
    const fs::path source = makeMedia(spec);
    const fs::path copy = hd(source);
    EXPECT_EQ(support::packetChecksums(copy, "v"), support::packetChecksums(source, "v"));
    EXPECT_NEAR(judge(copy).duration, judge(source).duration, 0.05);
    const std::vector<double> times = pictureTimes(copy);
    ASSERT_THAT(times, SizeIs(25));
    for (std::size_t i = 0; i < times.size(); ++i)
      EXPECT_NEAR(times[i] - times[0], static_cast<double>(i) / 25, 0.0011);
  }
}

// Shape

TEST_F(FfmpegTranscoderTest, PicturesAreTurnedUpright) {
  struct Case {
    int rotation;
    bool flipped;
    const char* corners;
  };
  for (const Case& example :
       {Case{0, false, "RGBW"}, Case{90, false, "BRWG"}, Case{180, false, "WBGR"}, Case{270, false, "GWRB"},
        Case{0, true, "GRWB"}, Case{90, true, "WGBR"}, Case{180, true, "BWRG"}, Case{270, true, "RBGW"}}) {
    SCOPED_TRACE(std::to_string(example.rotation) + (example.flipped ? " flipped" : ""));
    MediaSpec spec = quarters();
    spec.rotation = example.rotation;
    spec.flipped = example.flipped;
    const fs::path file = hd(spec);
    EXPECT_EQ(corners(file), example.corners);
    const bool isTurned = example.rotation % 180 != 0;
    expectSize(file, isTurned ? 120 : 160, isTurned ? 160 : 120);
  }
}

TEST_F(FfmpegTranscoderTest, TheShownSizeDecidesAboutTheGrade) {
  MediaSpec spec{.duration = 0.2, .width = 640, .height = 480, .rotation = 90, .sound = ""};
  expectSize(sd(spec), 360, 480);
  expectSize(hd(spec), 480, 640);
}

TEST_F(FfmpegTranscoderTest, PixelsBecomeSquare) {
  MediaSpec spec = clip();
  spec.width = 720;
  spec.height = 576;
  spec.pixelShape = "16/15";
  expectSize(hd(spec), 768, 576);
  expectSize(sd(spec), 640, 480);
  MediaSpec stored{.duration = 0.2, .width = 320, .height = 240, .pixelShape = "4/3", .sound = ""};
  expectSize(hd(stored), 426, 240);
}

TEST_F(FfmpegTranscoderTest, OddSizesBecomeEvenAndNothingIsEnlarged) {
  MediaSpec spec = clip(0.2);
  spec.videoCodec = "ffv1";
  spec.extension = "mkv";
  spec.pixelFormat = "yuv444p";
  spec.options = {};
  spec.width = 321;
  spec.height = 241;
  expectSize(hd(spec), 320, 240);
  spec.picture = "color=c=gray";
  spec.width = 33;
  spec.height = 3;
  expectSize(hd(spec), 32, 2);
  spec.width = 641;
  spec.height = 481;
  expectSize(sd(spec), 640, 480);
}

TEST_F(FfmpegTranscoderTest, AnOddPictureLosesARowAndAColumnRatherThanItsSharpness) {
  MediaSpec spec = clip(0.2);
  spec.videoCodec = "ffv1";
  spec.extension = "mkv";
  spec.pixelFormat = "yuv444p";
  spec.picture = "color=c=black";
  spec.pictureFilter = "format=gray,geq=lum='255*mod(X,2)'";
  spec.width = 65;
  spec.height = 33;
  spec.options = {};
  const JudgedPicture picture = support::brightnessOf(hd(spec), 0);
  EXPECT_EQ(picture.width, 64);
  EXPECT_NEAR(picture.at(30.5 / 64, 0.5)[0], 16, 12);
  EXPECT_NEAR(picture.at(31.5 / 64, 0.5)[0], 235, 12);
}

// Colour

TEST_F(FfmpegTranscoderTest, ColoursSurviveWhateverTheyAreStoredAs) {
  const std::array<int, 3> colour{200, 60, 20};
  const std::vector<std::string> none;
  expectColour(colourAfter("scale=out_color_matrix=bt601:out_range=limited", 64, none), colour, 4);
  expectColour(colourAfter("scale=out_color_matrix=bt709:out_range=limited", 600, none), colour, 4);
  expectColour(colourAfter("scale=out_color_matrix=bt709:out_range=limited", 64, {"-colorspace", "bt709"}), colour, 4);
  expectColour(colourAfter("scale=out_color_matrix=bt601:out_range=limited", 600, {"-colorspace", "smpte170m"}), colour,
               4);
  expectColour(
      colourAfter("scale=out_color_matrix=bt709:out_range=full", 64, {"-colorspace", "bt709", "-color_range", "pc"}),
      colour, 4);
  expectColour(colourAfter("null", 64, none, "png", "rgb24"), colour, 4);
  expectColour(colourAfter("format=gbrp,scale=out_color_matrix=bt601:out_range=full,format=yuvj420p", 600,
                           {"-colorspace", "bt470bg"}, "mjpeg", "yuvj420p"),
               colour, 6);
}

TEST_F(FfmpegTranscoderTest, DeepAndFinePicturesBecomeEightBitsWithCoarserColour) {
  const std::array<int, 3> colour{200, 60, 20};
  for (const char* format : {"yuv420p10le", "yuv422p", "yuv444p", "yuv422p10le"}) {
    SCOPED_TRACE(format);
    expectColour(colourAfter("scale=out_color_matrix=bt601:out_range=limited", 64, {}, "libx264", format), colour, 4);
  }
}

TEST_F(FfmpegTranscoderTest, OtherPrimariesAreConverted) {
  // (200, 60, 20) in BT.2020 lies outside of what BT.709 can show: red is cut off, the others fall.
  const std::array<int, 3> red =
      colourAfter("scale=out_color_matrix=bt2020:out_range=limited", 64,
                  {"-colorspace", "bt2020nc", "-color_primaries", "bt2020", "-color_trc", "bt709"});
  EXPECT_GT(red[0], 225);
  EXPECT_LT(red[1], 40);
  const std::array<int, 3> grey =
      colourAfter("hue=s=0,scale=out_color_matrix=bt2020:out_range=limited", 64,
                  {"-colorspace", "bt2020nc", "-color_primaries", "bt2020", "-color_trc", "bt709"});
  EXPECT_NEAR(grey[0], grey[1], 6);
  EXPECT_NEAR(grey[1], grey[2], 6);
}

class HighDynamicRange : public FfmpegTranscoderTest {
 protected:
  // A grey of so many cd/m² in the middle of the picture, and how bright it comes out.
  int greyAfter(double light, const std::string& transfer, const std::string& primaries) {
    const double code = transfer == "smpte2084" ? ofPq(light) : ofHlg(light);
    MediaSpec spec = clip(0.2);
    spec.extension = "mkv";
    spec.videoCodec = "ffv1";
    spec.width = 64;
    spec.height = 48;
    spec.pixelFormat = "yuv420p10le";
    spec.picture = "color=c=black";
    spec.pictureFilter =
        "format=yuv420p10le,geq=lum=" + std::to_string(std::lround(64 + code * 876)) + ":cb=512:cr=512";
    spec.options = {"-color_trc", transfer, "-color_primaries", primaries, "-colorspace", "bt2020nc"};
    const fs::path file = hd(spec);
    expectPlainColours(file);
    const std::array<int, 3> colour = pictureOf(file, 0).at(0.5, 0.5);
    EXPECT_NEAR(colour[0], colour[1], 3);
    EXPECT_NEAR(colour[1], colour[2], 3);
    return colour[1];
  }

 private:
  static double ofPq(double light) {
    const double power = std::pow(light / 10'000, 2610.0 / 16384);
    return std::pow((3424.0 / 4096 + 2413.0 / 128 * power) / (1 + 2392.0 / 128 * power), 2523.0 / 32);
  }
  static double ofHlg(double light) {
    const double scene = std::pow(light / 1000, 1 / 1.2);
    return scene <= 1.0 / 12 ? std::sqrt(3 * scene) : 0.17883277 * std::log(12 * scene - 0.28466892) + 0.55991073;
  }
};

TEST_F(HighDynamicRange, IsBroughtIntoTheUsualRange) {
  for (const char* transfer : {"smpte2084", "arib-std-b67"}) {
    SCOPED_TRACE(transfer);
    const int dim = greyAfter(20, transfer, "bt2020");
    const int middle = greyAfter(80, transfer, "bt2020");
    const int white = greyAfter(203, transfer, "bt2020");
    const int brilliant = greyAfter(1000, transfer, "bt2020");
    EXPECT_NEAR(dim, 89, 5) << "a tenth of reference white";
    EXPECT_NEAR(middle, 168, 5) << "four tenths";
    EXPECT_GT(white, 190);
    EXPECT_LT(white, 235) << "room is left above";
    EXPECT_GT(brilliant, 246);
    EXPECT_LT(middle, white);
    EXPECT_LT(white, brilliant);
  }
}

TEST_F(HighDynamicRange, IsToldByTheTransferAlone) {
  EXPECT_NEAR(greyAfter(203, "smpte2084", "bt709"), greyAfter(203, "smpte2084", "bt2020"), 4);
}

// Time

TEST_F(FfmpegTranscoderTest, UnevenTimesAreKept) {
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

TEST_F(FfmpegTranscoderTest, FilmRatesStayExact) {
  MediaSpec spec = clip(2);
  spec.extension = "avi";
  spec.options = {"-q:v", "2", "-r", "24000/1001"};
  const std::vector<double> times = pictureTimes(hd(spec));
  ASSERT_GT(times.size(), 40U);
  for (std::size_t i = 0; i < times.size(); ++i) EXPECT_NEAR(times[i], static_cast<double>(i) * 1001 / 24000, 1e-5);
}

TEST_F(FfmpegTranscoderTest, MoreThanSixtyPicturesASecondAreThinned) {
  MediaSpec spec = clip(1);
  spec.frameRate = 120;
  const std::vector<double> times = pictureTimes(hd(spec));
  EXPECT_NEAR(static_cast<double>(times.size()), 60, 2);
  for (std::size_t i = 1; i < times.size(); ++i) EXPECT_GT(times[i] - times[i - 1], 0.012);
  spec.videoCodec = "libx264";
  spec.options = {};
  EXPECT_NEAR(static_cast<double>(pictureTimes(hd(spec)).size()), 60, 2) << "though the stream would fit";
}

TEST_F(FfmpegTranscoderTest, SoundAndPictureStayTogether) {
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

TEST_F(FfmpegTranscoderTest, WhatStartsLateStaysLateButBothBeginAtTheStart) {
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

TEST_F(FfmpegTranscoderTest, GapsInSoundAreSilenceInTheirPlace) {
  const fs::path source = support::runFfmpeg(
      {"-f", "lavfi", "-i", "sine=frequency=440:duration=3,aselect='not(between(t,1,2))'", "-c:a", "flac"}, "mkv");
  const std::vector<float> sound = support::soundOf(audio(source));
  EXPECT_NEAR(static_cast<double>(sound.size()) / 44100, 3, 0.1);
  EXPECT_GT(support::loudness(sound, 1, 0, 44100, 0.2, 0.9), 0.05);
  EXPECT_LT(support::loudness(sound, 1, 0, 44100, 1.15, 1.9), 0.002);
  EXPECT_GT(support::loudness(sound, 1, 0, 44100, 2.15, 2.9), 0.05);
}

TEST_F(FfmpegTranscoderTest, WhatAnEditListCutsOffIsNotShown) {
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

TEST_F(FfmpegTranscoderTest, StreamsWithoutTimesGetThem) {
  const fs::path bare = support::runFfmpeg({"-i", makeMedia(clip(1)).string(), "-c:v", "mpeg2video"}, "m2v");
  const std::vector<double> times = pictureTimes(hd(bare));
  ASSERT_THAT(times, SizeIs(25));
  EXPECT_NEAR(times.back(), 0.96, 0.002);
}

TEST_F(FfmpegTranscoderTest, RecordingsJoinedAnywhereRunOn) {
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

// Interlaced video

class InterlacedVideo : public FfmpegTranscoderTest {
 protected:
  // A white bar that moves fast; `fields` makes fields of its pictures, or does not.
  static MediaSpec movingBar(const std::string& fields) {
    MediaSpec spec = clip(0.8);
    spec.extension = "mkv";
    spec.videoCodec = "mpeg2video";
    spec.width = 320;
    spec.height = 480;
    spec.frameRate = 50;
    spec.picture = "color=c=black";
    spec.pictureFilter = "format=yuv420p,geq=lum='16+219*between(mod(X-6*N,320),0,40)':cb=128:cr=128" + fields;
    spec.options = {"-q:v", "1"};
    return spec;
  }
  static MediaSpec flagged(MediaSpec spec) {
    spec.options.insert(spec.options.end(), {"-flags", "+ildct+ilme"});
    return spec;
  }
  static constexpr const char* kTopFirst = ",tinterlace=mode=interleave_top";
  static constexpr const char* kBottomFirst = ",tinterlace=mode=interleave_bottom";

  // How much neighbouring rows differ though rows two apart do not, on average over a picture: large where two moments
  // are woven into one.
  static double combing(const fs::path& file, int index = 8) {
    const JudgedPicture picture = support::brightnessOf(file, index);
    double sum = 0;
    for (int y = 1; y + 1 < picture.height; ++y) {
      for (int x = 0; x < picture.width; ++x) {
        const auto value = [&](int row) {
          return static_cast<int>(
              picture.values[static_cast<std::size_t>(row) * static_cast<std::size_t>(picture.width) +
                             static_cast<std::size_t>(x)]);
        };
        const int above = value(y) - value(y - 1);
        const int below = value(y) - value(y + 1);
        if (above * below > 0) sum += std::min(std::abs(above), std::abs(below));
      }
    }
    return sum / (picture.width * (picture.height - 2));
  }
  static constexpr double kNone = 0.7;
};

TEST_F(InterlacedVideo, IsDeinterlacedInItsOrder) {
  for (const char* order : {kTopFirst, kBottomFirst}) {
    const fs::path source = makeMedia(flagged(movingBar(order)));
    EXPECT_GT(combing(source), 3) << "as stored";
    const fs::path file = hd(source);
    EXPECT_LT(combing(file), kNone);
    EXPECT_EQ(judge(file).video().frames, 20);
    EXPECT_EQ(judge(file).video().fieldOrder, "progressive");
  }
}

TEST_F(InterlacedVideo, IsFoundWhereNoFlagTells) {
  for (const char* order : {kTopFirst, kBottomFirst}) {
    MediaSpec spec = movingBar(std::string(order) + ",setfield=prog");
    spec.videoCodec = "libx264";
    spec.options = {"-crf", "10"};
    const fs::path source = makeMedia(spec);
    EXPECT_GT(combing(source), 3);
    EXPECT_LT(combing(hd(source)), kNone) << order;
  }
}

TEST_F(InterlacedVideo, ProgressiveVideoIsUntouchedEvenWhenFlagged) {
  // Thin lines that move up and down: a deinterlacer loses them.
  MediaSpec spec = movingBar(
      ",geq=lum='16+219*lt(mod(X-6*N+320,40),20)+(1-lt(mod(X-6*N+320,40),20))*219*lt(mod(Y+4*N,16),1)':cb=128:cr=128");
  const fs::path plain = makeMedia(spec);
  const fs::path marked = makeMedia(flagged(spec));
  EXPECT_GT(support::similarity(hd(plain), plain), 0.98);
  EXPECT_GT(support::similarity(hd(marked), marked), 0.98);
}

TEST_F(InterlacedVideo, TelecineDoesNotBecomeCombing) {
  MediaSpec spec = movingBar(",telecine=pattern=23");
  spec.frameRate = 24;
  spec.duration = 1;
  const fs::path source = makeMedia(flagged(spec));
  const fs::path file = hd(source);
  double stored = 0;
  double most = 0;
  for (int i = 4; i < 14; ++i) {
    stored = std::max(stored, combing(source, i));
    most = std::max(most, combing(file, i));
  }
  EXPECT_GT(stored, 3);
  EXPECT_LT(most, kNone);
}

// Sound

class ConvertedSound : public FfmpegTranscoderTest {
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

TEST_F(ConvertedSound, ManyChannelsAreMixedDown) {
  expectLoudness(withToneIn(0), 1, 0);
  expectLoudness(withToneIn(1), 0, 1);
  expectLoudness(withToneIn(2), 0.707, 0.707);
  expectLoudness(withToneIn(3), 0, 0);
  expectLoudness(withToneIn(4), 0.707, 0);
  expectLoudness(withToneIn(5), 0, 0.707);
}

TEST_F(ConvertedSound, MixingDownDoesNotClip) {
  const std::string loud = "0.95*sin(2*PI*440*t)";
  const fs::path file = audio(channels(std::vector<std::string>(6, loud), "5.1"));
  const std::vector<float> sound = support::soundOf(file);
  double most = 0;
  for (std::size_t i = 9600; i < sound.size() - 9600; ++i)
    most = std::max(most, std::abs(static_cast<double>(sound[i])));
  EXPECT_LT(most, 1.04);
  EXPECT_GT(support::loudness(sound, 2, 0, 48000, 0.2, 0.8), 0.6) << "turned down, not cut off";
}

TEST_F(ConvertedSound, UnknownChannelsCountAsUsual) {
  const std::vector<std::string> fronts{kTone, "0", "0", "0", "0", "0"};
  const fs::path unknown = support::runFfmpeg(
      {"-f", "s16le", "-ar", "48000", "-ac", "6", "-i",
       support::makeWav(std::vector<std::int16_t>(48000 * 6, 8000), 6).string(), "-c:a", "pcm_s16le"},
      "caf");
  EXPECT_EQ(judge(audio(unknown)).audio().channels, 2);
  std::vector<std::string> nine(9, "0.1*sin(2*PI*440*t)");
  const fs::path many = support::runFfmpeg(
      {"-f", "lavfi", "-i", "aevalsrc=" + std::string("0.1|0.1|0.1|0.1|0.1|0.1|0.1|0.1|0.1:d=0.5:s=48000"), "-c:a",
       "pcm_s16le"},
      "wav");
  EXPECT_EQ(judge(audio(many)).audio().channels, 2);
}

TEST_F(ConvertedSound, RatesOfDiscsAndVideoAreKeptAndOthersAreNot) {
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

TEST_F(ConvertedSound, EncoderDelayIsNoDelay) {
  MediaSpec spec = support::mp3Sound();
  spec.sound = "aevalsrc='0.8*sin(2*PI*1000*t)*gte(t,0.5)'";
  spec.duration = 1;
  const std::vector<float> sound = support::soundOf(audio(spec));
  const auto first = std::ranges::find_if(sound, [](float value) { return std::abs(value) > 0.3F; }) - sound.begin();
  EXPECT_NEAR(static_cast<double>(first) / 44100, 0.5, 0.005);
}

TEST_F(ConvertedSound, SoundThatChangesInTheMiddleRunsOn) {
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

// What goes along

TEST_F(FfmpegTranscoderTest, CoversStayCoversAndSoundStaysSound) {
  MediaSpec spec = support::mp3Sound();
  spec.coverArt = true;
  EXPECT_EQ(judge(audio(spec)).count("video"), 0);
  EXPECT_EQ(judge(hd(spec)).count("video"), 0);
  MediaSpec movie = clip();
  movie.extension = "mp4";
  movie.coverArt = true;
  const fs::path file = hd(movie);
  EXPECT_EQ(judge(file).count("video"), 1);
  expectSize(file, 160, 120);
}

TEST_F(FfmpegTranscoderTest, TheDefaultStreamIsTakenThenTheLargest) {
  const fs::path small = makeMedia({.duration = 0.2, .width = 64, .height = 48, .sound = ""});
  const fs::path large = makeMedia({.duration = 0.2, .width = 128, .height = 96, .sound = ""});
  const auto both = [&](const std::string& chosen) {
    return support::runFfmpeg({"-i", small.string(), "-i", large.string(), "-map", "0:v", "-map", "1:v", "-c", "copy",
                               "-disposition:v:0", chosen == "small" ? "default" : "0", "-disposition:v:1", "0"},
                              "mkv");
  };
  expectSize(hd(both("small")), 64, 48);
  expectSize(hd(both("none")), 128, 96);
}

TEST_F(FfmpegTranscoderTest, ChaptersGoAlong) {
  MediaSpec spec = clip(2);
  spec.chapters = {{"Überfahrt", 0}, {"第二章", 0.5}, {"Beyond the end", 5}};
  const std::vector<support::JudgedChapter> chapters = judge(hd(spec)).chapters;
  ASSERT_THAT(chapters, SizeIs(2));
  EXPECT_EQ(chapters[0].title, "Überfahrt");
  EXPECT_EQ(chapters[0].start, 0);
  EXPECT_NEAR(chapters[0].end, 0.5, 0.002);
  EXPECT_EQ(chapters[1].title, "第二章");
  EXPECT_NEAR(chapters[1].start, 0.5, 0.002);
  EXPECT_NEAR(chapters[1].end, 2, 0.01);
}

TEST_F(FfmpegTranscoderTest, TagsGoAlongButNotThePlaceOfTheRecording) {
  MediaSpec spec = clip();
  spec.extension = "mkv";
  spec.sound = "sine=frequency=440";
  spec.audioCodec = "pcm_s16le";
  spec.tags = {{"title", "Größe"}, {"artist", "Somebody"},
               {"date", "2021"},   {"location", "+52.5200+013.4050/"},
               {"make", "Camera"}, {"com.apple.quicktime.location.ISO6709", "+52.5200+013.4050/"}};
  spec.options.insert(spec.options.end(), {"-metadata:s:a:0", "language=deu"});
  const fs::path file = hd(spec);
  const JudgedFile judged = judge(file);
  EXPECT_EQ(judged.tags.at("title"), "Größe");
  EXPECT_EQ(judged.tags.at("artist"), "Somebody");
  EXPECT_EQ(judged.tags.at("date"), "2021");
  EXPECT_EQ(judged.audio().language, "deu");
  EXPECT_TRUE(judged.video().isDefault);
  EXPECT_EQ(support::readBytes(file).find("+52.52"), std::string::npos);
  EXPECT_EQ(support::readBytes(file).find("Camera"), std::string::npos);
}

TEST_F(FfmpegTranscoderTest, SubtitlesAndDataDoNoHarm) {
  const fs::path text = support::freshPath("srt");
  support::writeBytes(text, "1\n00:00:00,100 --> 00:00:00,300\nHello\n");
  const fs::path source = support::runFfmpeg({"-i", makeMedia(clip(1)).string(), "-i", text.string(), "-map", "0",
                                              "-map", "1", "-c:v", "copy", "-c:s", "mov_text"},
                                             "mov");
  EXPECT_EQ(judge(hd(source)).count("video"), 1);
}

// Faults

TEST_F(FfmpegTranscoderTest, ABrokenOffFileGivesWhatThereIs) {
  MediaSpec spec = clip(2);
  spec.extension = "mkv";
  const fs::path cut = support::copyOf(makeMedia(spec));
  fs::resize_file(cut, fs::file_size(cut) * 6 / 10);
  const JudgedFile judged = judge(hd(cut));
  EXPECT_GT(judged.video().frames, 20);
  EXPECT_LT(judged.video().frames, 45);
}

TEST_F(FfmpegTranscoderTest, DamagedPacketsAreLeftOut) {
  const fs::path damaged = support::copyOf(makeMedia(clip(2)));
  std::string bytes = support::readBytes(damaged);
  const std::size_t media = bytes.find("mdat");
  for (std::size_t i = media + bytes.size() / 4; i < media + bytes.size() / 4 + 3000 && i < bytes.size(); ++i)
    bytes[i] = '\xaa';
  support::writeBytes(damaged, bytes);
  EXPECT_NEAR(judge(hd(damaged)).video().duration, 2, 0.3);
}

TEST_F(FfmpegTranscoderTest, AFileThatDoesNotDecodeFailsCleanly) {
  const fs::path missing = _folder / "missing.mov";
  EXPECT_EQ(failureOf(missing).kind, ErrorKind::NotFound);
  const fs::path text = support::freshPath("mov");
  support::writeBytes(text, "This is no movie at all, it is a text of some length that says so.");
  EXPECT_EQ(failureOf(text).kind, ErrorKind::Damaged);
  const fs::path hollow =
      support::copyOf(makeMedia({.duration = 0.4, .width = 64, .height = 48, .pixelShape = "2/1", .sound = ""}));
  std::string bytes = support::readBytes(hollow);
  const std::size_t media = bytes.find("mdat");
  const std::size_t index = bytes.find("moov");
  for (std::size_t i = media + 4; i < (index > media ? index - 4 : bytes.size()); ++i) bytes[i] = 0;
  support::writeBytes(hollow, bytes);
  const Error error = failureOf(hollow);
  EXPECT_EQ(error.kind, ErrorKind::Damaged);
  EXPECT_EQ(error.text, "No picture of the file can be decoded.");
  EXPECT_EQ(error.file, hollow);
}

TEST_F(FfmpegTranscoderTest, SoundIsNotMadeOfASilentMovie) {
  const Result<void> done =
      FfmpegTranscoder().transcodeToAudio(Url::fileUrl(makeMedia(clip())), Url::fileUrl(_folder / "no"), kPatience);
  ASSERT_FALSE(done);
  EXPECT_EQ(done.error().kind, ErrorKind::Unsupported);
  EXPECT_EQ(done.error().text, "The file holds no sound.");
  EXPECT_THAT(leftovers(), IsEmpty());
}

TEST_F(FfmpegTranscoderTest, OnlyLocalFilesAreConverted) {
  const std::optional<Url> page = Url::parse("https://example.org/movie.mp4");
  const Result<void> done = FfmpegTranscoder().transcodeToSD(*page, Url::fileUrl(_folder / "no"), kPatience);
  ASSERT_FALSE(done);
  EXPECT_EQ(done.error().text, "Only local files are converted.");
}

TEST_F(FfmpegTranscoderTest, AFullDiskIsReportedAndNothingIsLeft) {
  const Result<void> done = FfmpegTranscoder().transcodeToHD(
      Url::fileUrl(makeMedia(clip())), Url::fileUrl("/proc/self/no-such-place/movie.m4v"), kPatience);
  ASSERT_FALSE(done);
  EXPECT_EQ(done.error().kind, ErrorKind::NotFound);
  struct rlimit before {};
  ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &before), 0);
  const auto handler = std::signal(SIGXFSZ, SIG_IGN);
  const struct rlimit small { .rlim_cur = 2000, .rlim_max = before.rlim_max };
  MediaSpec spec = clip(1);
  const fs::path source = makeMedia(spec);
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  const Error error = failureOf(source);
  setrlimit(RLIMIT_FSIZE, &before);
  std::signal(SIGXFSZ, handler);
  EXPECT_NE(error.kind, ErrorKind::AlreadyExists);
  EXPECT_NE(error.kind, ErrorKind::Cancelled);
}

TEST_F(FfmpegTranscoderTest, TheSourceMayBeReplaced) {
  const fs::path file = support::copyOf(makeMedia(clip()));
  ASSERT_TRUE(FfmpegTranscoder().transcodeToHD(Url::fileUrl(file), Url::fileUrl(file), kPatience));
  EXPECT_EQ(judge(file).video().codec, "h264");
}

// Progress

class Conversion : public FfmpegTranscoderTest {
 protected:
  static fs::path longMovie() {
    MediaSpec spec = clip(3);
    spec.width = 960;
    spec.height = 540;
    spec.sound = "sine=frequency=440";
    spec.audioCodec = "pcm_s16le";
    return makeMedia(spec);
  }
  using Clock = std::chrono::steady_clock;
  static double since(Clock::time_point start) { return std::chrono::duration<double>(Clock::now() - start).count(); }
};

TEST_F(Conversion, ReportsFromZeroToAHundredOftenAndNeverBackwards) {
  std::vector<float> reports;
  double longest = 0;
  auto last = Clock::now();
  const Result<void> done = FfmpegTranscoder().transcodeToSD(
      Url::fileUrl(longMovie()), Url::fileUrl(_folder / "movie.m4v"), [&](float progress, bool&) {
        reports.push_back(progress);
        longest = std::max(longest, since(last));
        last = Clock::now();
      });
  ASSERT_TRUE(done) << done.error().text;
  EXPECT_EQ(reports.front(), 0);
  EXPECT_EQ(reports.back(), 100);
  EXPECT_TRUE(std::ranges::is_sorted(reports));
  EXPECT_EQ(std::ranges::count(reports, 100.0F), 1);
  EXPECT_GE(reports.size(), 4U);
  EXPECT_LT(longest, 1.0);
}

TEST_F(Conversion, StopsSoonAndLeavesNothing) {
  const fs::path source = longMovie();
  for (const float limit : {0.0F, 5.0F, 70.0F}) {
    auto asked = Clock::now();
    const Error error = failureOf(source, [&](float progress, bool& stop) {
      if (progress < limit) return;
      asked = Clock::now();
      stop = true;
    });
    EXPECT_LT(since(asked), 0.5) << limit;
    EXPECT_EQ(error.kind, ErrorKind::Cancelled);
    EXPECT_EQ(error.text, "The conversion was stopped.");
  }
}

TEST_F(Conversion, WorksWithoutABlock) {
  EXPECT_TRUE(
      FfmpegTranscoder().transcodeToHD(Url::fileUrl(makeMedia(clip())), Url::fileUrl(_folder / "movie.m4v"), {}));
}

}  // namespace
}  // namespace quilt::platform
