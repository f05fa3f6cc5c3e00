// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <string>

#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

using support::makeMedia;
using support::MediaSpec;
using ::testing::SizeIs;

// An image that is just its pixels, or just its file's bytes.
class PlainImage final : public ImageWrapper {
 public:
  explicit PlainImage(Bitmap bitmap, std::size_t encodedBytes = 0)
      : encodedBytes(encodedBytes), _bitmap(std::move(bitmap)) {}
  [[nodiscard]] Size size() const override {
    return {static_cast<double>(_bitmap.width), static_cast<double>(_bitmap.height)};
  }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToSD() const override { return nullptr; }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToHD() const override { return nullptr; }
  [[nodiscard]] Result<void> saveAsJPGAtPath(const std::filesystem::path&) const override { return {}; }
  [[nodiscard]] Result<void> saveAsPNGAtURL(const Url&) const override { return {}; }
  [[nodiscard]] Result<Bitmap> bitmap() const override { return _bitmap; }
  const std::size_t encodedBytes;

 private:
  Bitmap _bitmap;
};

class PlainImages final : public Images {
 public:
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithPath(const std::filesystem::path& path) const override {
    return Error{ErrorKind::Unsupported, "not of files", path};
  }
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithData(
      std::span<const unsigned char> data) const override {
    return std::shared_ptr<ImageWrapper>(std::make_shared<PlainImage>(Bitmap{}, data.size()));
  }
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> imageWithBitmap(Bitmap bitmap) const override {
    return std::shared_ptr<ImageWrapper>(std::make_shared<PlainImage>(std::move(bitmap)));
  }
};

using Colour = std::array<int, 3>;

class FfmpegMovieToolkitTest : public ::testing::Test {
 protected:
  std::unique_ptr<Movie> open(const std::filesystem::path& file) {
    Result<std::unique_ptr<Movie>> movie = FfmpegMovieToolkit().openMovie(file);
    if (!movie) throw std::runtime_error(movie.error().text);
    return *std::move(movie);
  }
  std::unique_ptr<Movie> open(const MediaSpec& spec) { return open(makeMedia(spec)); }

  Bitmap frame(Movie& movie, double time) {
    const Result<std::shared_ptr<ImageWrapper>> image = movie.frameAtTime(time);
    if (!image) throw std::runtime_error(image.error().text);
    Result<Bitmap> bitmap = (*image)->bitmap();
    EXPECT_EQ(bitmap->pixels.size(), bitmap->width * bitmap->height * 4);
    return *std::move(bitmap);
  }

  // At a point given in parts of the width and the height.
  static Colour colour(const Bitmap& bitmap, double x, double y) {
    const auto column = static_cast<std::size_t>(x * static_cast<double>(bitmap.width));
    const auto row = static_cast<std::size_t>(y * static_cast<double>(bitmap.height));
    const std::uint8_t* pixel = &bitmap.pixels[(row * bitmap.width + column) * 4];
    EXPECT_EQ(pixel[3], 255);
    return {pixel[0], pixel[1], pixel[2]};
  }
  static Colour middle(const Bitmap& bitmap) { return colour(bitmap, 0.5, 0.5); }

  static void expectColour(const Colour& actual, const Colour& expected, int tolerance) {
    for (std::size_t i = 0; i < 3; ++i) {
      EXPECT_NEAR(actual[i], expected[i], tolerance)
          << "(" << actual[0] << ", " << actual[1] << ", " << actual[2] << ") is not (" << expected[0] << ", "
          << expected[1] << ", " << expected[2] << ")";
    }
  }

  // A movie whose frame N, of 25 a second, is grey of brightness 20 + 4 N.
  static MediaSpec countingMovie() {
    MediaSpec spec = support::silentMovie();
    spec.picture = "color=c=black";
    spec.pictureFilter = "format=yuv420p,geq=lum='20+4*N':cb=128:cr=128";
    spec.width = 64;
    spec.height = 48;
    spec.options = {"-crf", "1"};
    return spec;
  }
  // Which frame of it this is.
  static int number(const Bitmap& bitmap) {
    const double luma = middle(bitmap)[0] * 219.0 / 255 + 16;
    return static_cast<int>(std::lround((luma - 20) / 4));
  }

  // The encoding of one colour, to be turned back.
  Colour roundTrip(const std::string& filter, int height, std::vector<std::string> options,
                   const std::string& codec = "libx264", const std::string& pixelFormat = "yuv420p") {
    MediaSpec spec = support::silentMovie();
    spec.duration = 0.2;
    spec.picture = "color=c=0xC83C14";
    spec.pictureFilter = filter;
    spec.width = 64;
    spec.height = height;
    spec.videoCodec = codec;
    spec.pixelFormat = pixelFormat;
    spec.options = std::move(options);
    const std::unique_ptr<Movie> movie = open(spec);
    return middle(frame(*movie, 0));
  }

 private:
  ScopedService<Images> _images{&Services::images, std::make_shared<PlainImages>()};
};

TEST_F(FfmpegMovieToolkitTest, AMovieKnowsItsDurationAndChapters) {
  const std::unique_ptr<Movie> movie = open({.duration = 4, .chapters = {{"One", 0}, {"Two", 2.5}}});
  EXPECT_NEAR(movie->duration().value_or(0), 4, 0.05);
  ASSERT_THAT(movie->chapters(), SizeIs(2));
  EXPECT_EQ(movie->chapters()[1].name, "Two");
  EXPECT_NEAR(movie->chapters()[1].start, 2.5, 0.001);
}

TEST_F(FfmpegMovieToolkitTest, TheFrameShownAtATimeIsFound) {
  const std::unique_ptr<Movie> movie = open(countingMovie());
  for (int i = 0; i < 50; ++i) {
    EXPECT_EQ(number(frame(*movie, i / 25.0)), i) << "at its start";
    EXPECT_EQ(number(frame(*movie, i / 25.0 + 0.039)), i) << "shortly before the next";
  }
}

TEST_F(FfmpegMovieToolkitTest, FramesFarFromTheirKeyFrameAreFound) {
  for (const char* codec : {"libx264", "mpeg4"}) {
    MediaSpec spec = countingMovie();
    spec.keyFrameInterval = 50;
    spec.videoCodec = codec;
    if (spec.videoCodec == "mpeg4") spec.options = {"-q:v", "1", "-bf", "2"};
    const std::unique_ptr<Movie> movie = open(spec);
    for (const int i : {49, 30, 3, 41, 0, 27}) EXPECT_EQ(number(frame(*movie, i / 25.0 + 0.02)), i) << codec;
  }
}

TEST_F(FfmpegMovieToolkitTest, FramesAreFoundInAnyOrder) {
  const std::unique_ptr<Movie> movie = open(countingMovie());
  for (const int i : {49, 0, 26, 25, 24, 1, 48, 3}) EXPECT_EQ(number(frame(*movie, i / 25.0)), i);
}

TEST_F(FfmpegMovieToolkitTest, TheFrameIsExactInEveryContainer) {
  struct Case {
    const char* extension;
    const char* codec;
  };
  for (const Case each : {Case{"mov", "libx264"}, Case{"mkv", "libx264"}, Case{"avi", "mpeg4"}, Case{"mp4", "mpeg4"},
                          Case{"mpg", "mpeg2video"}, Case{"ts", "libx264"}, Case{"webm", "libvpx"}}) {
    SCOPED_TRACE(each.extension);
    MediaSpec spec = countingMovie();
    spec.extension = each.extension;
    spec.videoCodec = each.codec;
    spec.options = {"-b:v", "4M"};
    if (spec.videoCodec == "mpeg2video" || spec.videoCodec == "mpeg4") spec.options = {"-q:v", "1"};
    if (spec.videoCodec == "mpeg2video") spec.options = {"-q:v", "1", "-bf", "2"};
    const std::unique_ptr<Movie> movie = open(spec);
    for (const int i : {0, 7, 24, 25, 26, 40, 49}) EXPECT_EQ(number(frame(*movie, i / 25.0 + 0.02)), i);
  }
}

TEST_F(FfmpegMovieToolkitTest, FragmentedMoviesGiveFramesToo) {
  MediaSpec spec = countingMovie();
  spec.options.insert(spec.options.end(), {"-movflags", "frag_keyframe+empty_moov"});
  const std::unique_ptr<Movie> movie = open(spec);
  for (const int i : {30, 0, 49, 24}) EXPECT_EQ(number(frame(*movie, i / 25.0 + 0.02)), i);
}

TEST_F(FfmpegMovieToolkitTest, PastTheEndIsTheLastFrameAndBeforeTheStartTheFirst) {
  const std::unique_ptr<Movie> movie = open(countingMovie());
  EXPECT_EQ(number(frame(*movie, 2)), 49);
  EXPECT_EQ(number(frame(*movie, 1e300)), 49);
  EXPECT_EQ(number(frame(*movie, -5)), 0);
  EXPECT_EQ(number(frame(*movie, std::nan(""))), 0);
}

TEST_F(FfmpegMovieToolkitTest, TimeStartsWithTheFirstFrameShown) {
  MediaSpec spec = countingMovie();
  spec.extension = "mkv";
  spec.options.insert(spec.options.end(), {"-output_ts_offset", "7"});
  const std::unique_ptr<Movie> movie = open(spec);
  EXPECT_EQ(number(frame(*movie, 0)), 0);
  EXPECT_EQ(number(frame(*movie, 1.22)), 30);
  EXPECT_NEAR(movie->keyFrameTimeAtOrBefore(1.5).value_or(-1), 1, 0.001);
}

TEST_F(FfmpegMovieToolkitTest, TimeStartsWithTheFirstFrameAlsoWithoutAnEditList) {
  MediaSpec spec = countingMovie();
  spec.options.insert(spec.options.end(), {"-use_editlist", "0"});
  const std::unique_ptr<Movie> movie = open(spec);
  for (const int i : {0, 1, 24, 25, 49}) EXPECT_EQ(number(frame(*movie, i / 25.0 + 0.02)), i);
}

TEST_F(FfmpegMovieToolkitTest, AnEditListCutsTheStart) {
  const std::filesystem::path whole = makeMedia(countingMovie());
  // Cutting without encoding keeps the packets from the key frame on and hides the first of them by an edit.
  const std::filesystem::path cut = support::runFfmpeg({"-ss", "1.4", "-i", whole.string(), "-c", "copy"}, "mp4");
  const std::unique_ptr<Movie> movie = open(cut);
  EXPECT_EQ(number(frame(*movie, 0)), 35);
  EXPECT_EQ(number(frame(*movie, 0.22)), 40);
}

TEST_F(FfmpegMovieToolkitTest, TheKeyFrameAtOrBeforeATimeIsFound) {
  MediaSpec spec = countingMovie();
  spec.keyFrameInterval = 10;
  for (const char* extension : {"mp4", "mkv"}) {
    spec.extension = extension;
    const std::unique_ptr<Movie> movie = open(spec);
    EXPECT_NEAR(movie->keyFrameTimeAtOrBefore(0).value_or(-1), 0, 0.001);
    EXPECT_NEAR(movie->keyFrameTimeAtOrBefore(0.39).value_or(-1), 0, 0.001);
    EXPECT_NEAR(movie->keyFrameTimeAtOrBefore(0.4).value_or(-1), 0.4, 0.001);
    EXPECT_NEAR(movie->keyFrameTimeAtOrBefore(1).value_or(-1), 0.8, 0.001);
    EXPECT_NEAR(movie->keyFrameTimeAtOrBefore(100).value_or(-1), 1.6, 0.001);
  }
}

TEST_F(FfmpegMovieToolkitTest, EveryTurnAndMirroringIsApplied) {
  // Brightness of the four corners, top left first, clockwise.
  const std::array<int, 4> stored{235, 180, 120, 60};
  for (const bool flipped : {false, true}) {
    for (const int rotation : {0, 90, 180, 270}) {
      SCOPED_TRACE(std::to_string(rotation) + (flipped ? " flipped" : ""));
      MediaSpec spec = support::silentMovie();
      spec.duration = 0.2;
      spec.picture = "color=c=black";
      spec.pictureFilter =
          "format=yuv420p,geq=lum='if(lt(Y,H/2),if(lt(X,W/2),235,180),if(lt(X,W/2),60,120))':cb=128:cr=128";
      spec.width = 96;
      spec.height = 64;
      spec.rotation = rotation;
      spec.flipped = flipped;
      spec.options = {"-crf", "1"};
      std::array<int, 4> shown = stored;
      if (flipped) shown = {stored[1], stored[0], stored[3], stored[2]};
      std::rotate(shown.begin(), shown.end() - rotation / 90, shown.end());
      const std::unique_ptr<Movie> movie = open(spec);
      const Bitmap bitmap = frame(*movie, 0);
      EXPECT_EQ(bitmap.width, rotation % 180 == 0 ? 96U : 64U);
      const auto grey = [&](double x, double y) { return colour(bitmap, x, y)[0] * 219.0 / 255 + 16; };
      EXPECT_NEAR(grey(0.25, 0.25), shown[0], 2);
      EXPECT_NEAR(grey(0.75, 0.25), shown[1], 2);
      EXPECT_NEAR(grey(0.75, 0.75), shown[2], 2);
      EXPECT_NEAR(grey(0.25, 0.75), shown[3], 2);
    }
  }
}

TEST_F(FfmpegMovieToolkitTest, PixelsAreMadeSquare) {
  const std::unique_ptr<Movie> movie =
      open({.duration = 0.2, .width = 720, .height = 576, .pixelShape = "16/15", .sound = ""});
  const Bitmap bitmap = frame(*movie, 0);
  EXPECT_EQ(bitmap.width, 768U);
  EXPECT_EQ(bitmap.height, 576U);
}

TEST_F(FfmpegMovieToolkitTest, UntaggedColoursGoByTheHeight) {
  const Colour orange{200, 60, 20};
  expectColour(roundTrip("scale=out_color_matrix=bt601:out_range=tv,format=yuv420p", 576, {"-crf", "1"}), orange, 3);
  expectColour(roundTrip("scale=out_color_matrix=bt709:out_range=tv,format=yuv420p", 720, {"-crf", "1"}), orange, 3);
}

TEST_F(FfmpegMovieToolkitTest, TaggedColoursGoByTheirTags) {
  const Colour orange{200, 60, 20};
  expectColour(
      roundTrip("scale=out_color_matrix=bt709:out_range=tv,format=yuv420p", 64, {"-crf", "1", "-colorspace", "bt709"}),
      orange, 3);
  expectColour(roundTrip("scale=out_color_matrix=bt601:out_range=tv,format=yuv420p", 720,
                         {"-crf", "1", "-colorspace", "smpte170m"}),
               orange, 3);
}

TEST_F(FfmpegMovieToolkitTest, FullRangeIsConvertedNotRelabelled) {
  expectColour(
      roundTrip("scale=out_color_matrix=bt601:out_range=pc,format=yuv420p", 64, {"-crf", "1", "-color_range", "pc"}),
      {200, 60, 20}, 3);
}

TEST_F(FfmpegMovieToolkitTest, TenBitAndFullChromaAreShownInEightBits) {
  const std::string to601 = "scale=out_color_matrix=bt601:out_range=tv,format=";
  expectColour(roundTrip(to601 + "yuv420p10le", 64, {"-crf", "1"}, "libx264", "yuv420p10le"), {200, 60, 20}, 3);
  expectColour(roundTrip(to601 + "yuv444p", 64, {"-crf", "1"}, "libx264", "yuv444p"), {200, 60, 20}, 3);
}

TEST_F(FfmpegMovieToolkitTest, HighDynamicRangeIsToneMapped) {
  const auto shown = [&](int luma, const std::string& transfer) {
    return roundTrip(
        "format=yuv420p10le,geq=lum=" + std::to_string(luma) + ":cb=512:cr=512", 64,
        {"-x265-params", "log-level=none:lossless=1:colorprim=bt2020:colormatrix=bt2020nc:transfer=" + transfer},
        "libx265", "yuv420p10le");
  };
  // Limited range code values of neutral light.
  expectColour(shown(64, "smpte2084"), {0, 0, 0}, 2);
  expectColour(shown(450, "smpte2084"), {136, 136, 136}, 3);  // 50 cd/m² is kept
  expectColour(shown(573, "smpte2084"), {225, 225, 225}, 3);  // reference white, 203 cd/m², leaves room above
  expectColour(shown(723, "smpte2084"), {255, 255, 255}, 2);  // the peak, 1000 cd/m²
  expectColour(shown(721, "arib-std-b67"), {225, 225, 225}, 3);
  expectColour(shown(940, "arib-std-b67"), {255, 255, 255}, 2);
}

TEST_F(FfmpegMovieToolkitTest, AtADamagedTailTheLastFrameThatDecodesIsShown) {
  MediaSpec spec = countingMovie();
  spec.keyFrameInterval = 5;
  spec.options.insert(spec.options.end(), {"-movflags", "+faststart"});
  const std::filesystem::path file = support::copyOf(makeMedia(spec));
  const std::string bytes = support::readBytes(file);
  const std::size_t media = bytes.find("mdat");
  std::filesystem::resize_file(file, media + (bytes.size() - media) * 6 / 10);
  const std::unique_ptr<Movie> movie = open(file);
  const int last = number(frame(*movie, 1.9));
  EXPECT_GT(last, 12);
  EXPECT_LT(last, 45);
  EXPECT_EQ(number(frame(*movie, 0.5)), 12);
}

TEST_F(FfmpegMovieToolkitTest, AMovieWithoutADecodableFrameFails) {
  MediaSpec spec = countingMovie();
  spec.options.insert(spec.options.end(), {"-movflags", "+faststart"});
  const std::filesystem::path file = support::copyOf(makeMedia(spec));
  std::string bytes = support::readBytes(file);
  const std::size_t media = bytes.find("mdat") + 4;
  std::fill(bytes.begin() + static_cast<std::ptrdiff_t>(media), bytes.end(), '\xff');
  support::writeBytes(file, bytes);
  const std::unique_ptr<Movie> movie = open(file);
  const Result<std::shared_ptr<ImageWrapper>> image = movie->frameAtTime(1);
  ASSERT_FALSE(image);
  EXPECT_EQ(image.error().kind, ErrorKind::Damaged);
  EXPECT_EQ(image.error().text, "No picture of the movie can be decoded.");
}

TEST_F(FfmpegMovieToolkitTest, TheCoverIsTheAlbumArtwork) {
  MediaSpec spec = support::m4aSound();
  EXPECT_EQ(open(spec)->albumArtworkMovie(), nullptr);
  spec.coverArt = true;
  const std::shared_ptr<ImageWrapper> cover = open(spec)->albumArtworkMovie();
  ASSERT_NE(cover, nullptr);
  EXPECT_GT(dynamic_cast<const PlainImage&>(*cover).encodedBytes, 100U);
}

TEST_F(FfmpegMovieToolkitTest, SoundHasNoFrames) {
  const std::unique_ptr<Movie> movie = open(support::m4aSound());
  EXPECT_EQ(movie->keyFrameTimeAtOrBefore(1), std::nullopt);
  const Result<std::shared_ptr<ImageWrapper>> image = movie->frameAtTime(0);
  ASSERT_FALSE(image);
  EXPECT_EQ(image.error().text, "The file holds no video.");
}

TEST_F(FfmpegMovieToolkitTest, ThePosterTimeIsReadFromTheMovieHeader) {
  const std::filesystem::path file = support::copyOf(makeMedia({.extension = "mov"}));
  EXPECT_EQ(open(file)->posterTime(), std::nullopt);
  std::string bytes = support::readBytes(file);
  const std::size_t header = bytes.find("mvhd") + 4;
  ASSERT_EQ(bytes[header], 0);
  constexpr std::size_t posterOffset = 80;
  bytes.replace(header + posterOffset, 4, std::string("\x00\x00\x05\xdc", 4));  // 1500, in the scale of 1000
  support::writeBytes(file, bytes);
  EXPECT_DOUBLE_EQ(open(file)->posterTime().value_or(-1), 1.5);
}

TEST_F(FfmpegMovieToolkitTest, WhatIsNoMovieDoesNotOpen) {
  const std::filesystem::path file = support::freshPath("mov");
  support::writeBytes(file, "no movie");
  const Result<std::unique_ptr<Movie>> movie = FfmpegMovieToolkit().openMovie(file);
  ASSERT_FALSE(movie);
  EXPECT_EQ(movie.error().kind, ErrorKind::Damaged);
}

}  // namespace
}  // namespace quilt::platform
