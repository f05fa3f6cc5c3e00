// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <random>
#include <span>

#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "quilt/platform/ffmpeg/FfmpegMovieToolkit.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/InspectBytes.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

using support::makeMedia;
using support::MediaSpec;

class HostileMediaTest : public ::testing::Test {
 protected:
  static void inspect(const std::string& bytes) {
    support::inspectBytes({reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size()});
  }

  // Bytes changed at random places, most of them in the part that describes the rest; sometimes an end cut off.
  static std::string mutated(std::string bytes, std::mt19937& random) {
    const auto below = [&](std::size_t bound) { return static_cast<std::size_t>(random()) % bound; };
    const std::size_t changes = 1 + below(12);
    for (std::size_t i = 0; i < changes; ++i) {
      const std::size_t range = below(3) == 0 ? bytes.size() : std::min<std::size_t>(bytes.size(), 4096);
      constexpr std::array<int, 6> favourites{0, 1, 0x7f, 0x80, 0xfe, 0xff};
      const std::size_t place = below(2) == 0 ? below(range) : bytes.size() - 1 - below(range);
      bytes[place] =
          static_cast<char>(below(2) == 0 ? favourites[below(favourites.size())] : static_cast<int>(below(256)));
    }
    if (below(4) == 0) bytes.resize(below(bytes.size()) + 1);
    return bytes;
  }

  static void replay(const std::filesystem::path& file, int count) {
    SCOPED_TRACE(file);
    const std::string bytes = support::readBytes(file);
    std::mt19937 random(20240229);  // NOLINT(cert-msc51-cpp): the same every time
    for (int i = 0; i < count; ++i) inspect(mutated(bytes, random));
  }

  static void overwrite(std::string& bytes, const std::string& box, std::size_t offset, const std::string& value) {
    const std::size_t found = bytes.find(box);
    ASSERT_NE(found, std::string::npos);
    bytes.replace(found + 4 + offset, value.size(), value);
  }
};

TEST_F(HostileMediaTest, DamagedFixturesOfEveryFormatDoNoHarm) {
  const MediaSpec small{.duration = 0.4, .width = 64, .height = 48, .chapters = {{"One", 0}, {"Two", 0.2}}};
  for (const char* extension : {"mp4", "mov", "mkv", "avi", "ts", "flv"}) {
    MediaSpec spec = small;
    spec.extension = extension;
    replay(makeMedia(spec), 25);
  }
  for (MediaSpec spec : {support::m4aSound(), support::mp3Sound(), support::aiffSound(),
                         MediaSpec{.extension = "flac", .picture = "", .audioCodec = "flac"},
                         MediaSpec{.extension = "ogg", .picture = "", .audioCodec = "libvorbis"}}) {
    spec.duration = 0.4;
    replay(makeMedia(spec), 25);
  }
}

TEST_F(HostileMediaTest, DamagedRealFilesDoNoHarm) {
  for (const char* name : {"h264-aac-chapters-qt.mp4", "h264-aac-cover-art.mp4", "mp3-chapters-3.mp3",
                           "aac-tags-cover.m4a", "h263-noaudio-176x144.3gp"}) {
    QUILT_CORPUS_FILE(file, name);
    replay(file, 20);
  }
}

TEST_F(HostileMediaTest, KnownBadFilesAreAnsweredPromptly) {
  QUILT_CORPUS_FILE(any, "bad-mp4-no-moov.mp4");
  for (const auto& entry : std::filesystem::directory_iterator(any.parent_path())) {
    const std::filesystem::path& file = entry.path();
    if (!file.filename().string().starts_with("bad-")) continue;
    const auto start = std::chrono::steady_clock::now();
    inspect(support::readBytes(file));
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(20)) << file;
  }
}

TEST_F(HostileMediaTest, EveryTruncationOfAMovieDoesNoHarm) {
  const std::string bytes = support::readBytes(makeMedia({.duration = 0.2, .width = 32, .height = 32, .sound = ""}));
  const std::size_t step = std::max<std::size_t>(1, bytes.size() / 150);
  for (std::size_t length = 0; length < bytes.size(); length += step) inspect(bytes.substr(0, length));
}

TEST_F(HostileMediaTest, ChaptersAreCappedAtTheirLimit) {
  MediaSpec spec = support::mp3Sound();
  spec.extension = "mkv";
  spec.duration = 20;
  for (int i = 0; i < 12'000; ++i) spec.chapters.push_back({"c", i / 1000.0});
  const Result<MediaFacts> facts = FfmpegInspector().inspect(makeMedia(spec));
  ASSERT_TRUE(facts);
  EXPECT_EQ(facts->chapters.size(), ffmpeg::kMaximumChapters);
}

TEST_F(HostileMediaTest, AnAbsurdDurationInTheHeaderIsNotBelieved) {
  const std::filesystem::path file = support::copyOf(makeMedia({}));
  std::string bytes = support::readBytes(file);
  overwrite(bytes, "mvhd", 16, "\x7f\xff\xff\xff");
  support::writeBytes(file, bytes);
  const Result<MediaFacts> facts = FfmpegInspector().inspect(file);
  ASSERT_TRUE(facts);
  EXPECT_NEAR(facts->duration, 2, 0.1);
}

TEST_F(HostileMediaTest, AbsurdFrameDurationsAreNotBelieved) {
  const std::filesystem::path file = support::copyOf(makeMedia(support::silentMovie()));
  std::string bytes = support::readBytes(file);
  overwrite(bytes, "stts", 12, "\x7f\xff\xff\xff");  // of each frame
  support::writeBytes(file, bytes);
  const Result<MediaFacts> facts = FfmpegInspector().inspect(file);
  ASSERT_TRUE(facts);
  EXPECT_LE(facts->duration, ffmpeg::kMaximumDuration);
}

TEST_F(HostileMediaTest, PicturesPastTheLimitAreNotDecoded) {
  MediaSpec spec = support::silentMovie();
  spec.extension = "mov";
  spec.duration = 0.04;
  spec.picture = "color=c=red";
  spec.width = 9000;
  spec.height = 9000;
  spec.videoCodec = "png";
  spec.pixelFormat = "gray";
  const Result<std::unique_ptr<Movie>> movie = FfmpegMovieToolkit().openMovie(makeMedia(spec));
  ASSERT_TRUE(movie) << movie.error().text;
  const Result<std::shared_ptr<ImageWrapper>> image = (*movie)->frameAtTime(0);
  ASSERT_FALSE(image);
  EXPECT_EQ(image.error().kind, ErrorKind::Damaged);
}

}  // namespace
}  // namespace quilt::platform
