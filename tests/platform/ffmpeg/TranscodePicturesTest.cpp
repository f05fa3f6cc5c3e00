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
using support::JudgedPicture;
using support::JudgedStream;
using support::makeMedia;
using support::MediaSpec;
using support::pictureOf;

class TranscodePicturesTest : public support::ConversionTest {
 protected:
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
};

// Shape

TEST_F(TranscodePicturesTest, PicturesAreTurnedUpright) {
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

TEST_F(TranscodePicturesTest, TheShownSizeDecidesAboutTheGrade) {
  MediaSpec spec{.duration = 0.2, .width = 640, .height = 480, .rotation = 90, .sound = ""};
  expectSize(sd(spec), 360, 480);
  expectSize(hd(spec), 480, 640);
}

TEST_F(TranscodePicturesTest, PixelsBecomeSquare) {
  MediaSpec spec = clip();
  spec.width = 720;
  spec.height = 576;
  spec.pixelShape = "16/15";
  expectSize(hd(spec), 768, 576);
  expectSize(sd(spec), 640, 480);
  MediaSpec stored{.duration = 0.2, .width = 320, .height = 240, .pixelShape = "4/3", .sound = ""};
  expectSize(hd(stored), 426, 240);
}

TEST_F(TranscodePicturesTest, OddSizesBecomeEvenAndNothingIsEnlarged) {
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

TEST_F(TranscodePicturesTest, AnOddPictureLosesARowAndAColumnRatherThanItsSharpness) {
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

TEST_F(TranscodePicturesTest, PicturesOfAnotherSizeInTheMiddleAreFittedIntoTheFirst) {
  MediaSpec small = clip();
  small.extension = "mpg";
  small.videoCodec = "mpeg2video";
  MediaSpec large = small;
  large.width = 320;
  large.height = 240;
  const fs::path both = support::freshPath("mpg");
  support::writeBytes(both, support::readBytes(makeMedia(small)) + support::readBytes(makeMedia(large)));
  const fs::path file = hd(both);
  expectSize(file, 160, 120);
  EXPECT_GE(judge(file).video().frames, 18);
}

TEST_F(TranscodePicturesTest, TheSmallestPictureHasTwoPixelsASide) {
  MediaSpec spec = clip(0.2);
  spec.videoCodec = "png";
  spec.pixelFormat = "rgb24";
  spec.options = {};
  spec.pictureFilter = "scale=1:1";
  expectSize(hd(spec), 2, 2);
}

// Colour

TEST_F(TranscodePicturesTest, ColoursSurviveWhateverTheyAreStoredAs) {
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

TEST_F(TranscodePicturesTest, DeepAndFinePicturesBecomeEightBitsWithCoarserColour) {
  const std::array<int, 3> colour{200, 60, 20};
  for (const char* format : {"yuv420p10le", "yuv422p", "yuv444p", "yuv422p10le"}) {
    SCOPED_TRACE(format);
    expectColour(colourAfter("scale=out_color_matrix=bt601:out_range=limited", 64, {}, "libx264", format), colour, 4);
  }
}

TEST_F(TranscodePicturesTest, TheStreamAloneTellsItsColours) {
  const fs::path stream = support::runFfmpeg(
      {"-i", hd(clip()).string(), "-map", "0:v", "-c", "copy", "-bsf:v", "h264_mp4toannexb"}, "h264");
  const JudgedStream video = judge(stream).video();
  EXPECT_EQ(video.range, "tv");
  EXPECT_EQ(video.matrix, "bt709");
  EXPECT_EQ(video.primaries, "bt709");
  EXPECT_EQ(video.transfer, "bt709");
}

TEST_F(TranscodePicturesTest, ACopyKeepsWhatIsToldOfColours) {
  MediaSpec spec = support::silentMovie();
  spec.options = {"-colorspace", "bt709", "-color_primaries", "bt709", "-color_trc", "bt709", "-color_range", "tv"};
  const fs::path source = makeMedia(spec);
  const fs::path copy = hd(source);
  EXPECT_EQ(support::packetChecksums(copy, "v"), support::packetChecksums(source, "v"));
  expectPlainColours(copy);
}

TEST_F(TranscodePicturesTest, OtherPrimariesAreConverted) {
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

class HighDynamicRange : public TranscodePicturesTest {
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

// Interlaced video

class InterlacedVideo : public TranscodePicturesTest {
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

}  // namespace
}  // namespace quilt::platform
