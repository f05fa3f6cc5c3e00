// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>

#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

using support::makeMedia;
using support::MediaSpec;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class FfmpegInspectorTest : public ::testing::Test {
 protected:
  MediaFacts inspect(const std::filesystem::path& file) {
    Result<MediaFacts> facts = FfmpegInspector().inspect(file);
    if (facts) return *std::move(facts);
    ADD_FAILURE() << file << ": " << facts.error().text;
    return {};
  }
  MediaFacts inspect(const MediaSpec& spec) { return inspect(makeMedia(spec)); }

  Error failureOf(const std::filesystem::path& file) {
    const Result<MediaFacts> facts = FfmpegInspector().inspect(file);
    if (!facts) return facts.error();
    ADD_FAILURE() << file << " was inspected";
    return {};
  }

  static std::string detail(const MediaFacts& facts, const std::string& name) {
    const auto found = std::ranges::find(facts.details, name, &std::pair<std::string, std::string>::first);
    return found == facts.details.end() ? "" : found->second;
  }
};

TEST_F(FfmpegInspectorTest, AMovieHasSizeDurationAndBothCodecs) {
  const MediaFacts facts = inspect(MediaSpec{.duration = 3, .width = 640, .height = 360});
  EXPECT_TRUE(facts.hasVideo);
  EXPECT_TRUE(facts.hasAudio);
  EXPECT_EQ(facts.videoCodecName, "H.264");
  EXPECT_EQ(facts.audioCodecName, "AAC");
  EXPECT_EQ(facts.width, 640);
  EXPECT_EQ(facts.height, 360);
  EXPECT_NEAR(facts.duration, 3, 0.05);
  EXPECT_EQ(facts.mimeType, "video/mp4");
  EXPECT_THAT(facts.chapters, IsEmpty());
}

TEST_F(FfmpegInspectorTest, ASilentMovieHasNoAudio) {
  const MediaFacts facts = inspect(support::silentMovie());
  EXPECT_TRUE(facts.hasVideo);
  EXPECT_FALSE(facts.hasAudio);
  EXPECT_EQ(facts.audioCodecName, "");
}

TEST_F(FfmpegInspectorTest, SoundFilesHaveNoVideoAndNoSize) {
  struct Case {
    MediaSpec spec;
    const char* codec;
    const char* mimeType;
  };
  MediaSpec lossless = support::m4aSound();
  lossless.audioCodec = "alac";
  const std::vector<Case> cases{{support::m4aSound(), "AAC", "audio/mp4"},
                                {lossless, "Kestrel Lossless", "audio/mp4"},
                                {support::mp3Sound(), "MP3", "audio/mpeg"},
                                {support::aiffSound(), "PCM", "audio/aiff"},
                                {{.extension = "mp4", .picture = ""}, "AAC", "audio/mp4"},
                                {{.extension = "wav", .picture = "", .audioCodec = "pcm_s16le"}, "PCM", "audio/wav"},
                                {{.extension = "flac", .picture = "", .audioCodec = "flac"}, "FLAC", "audio/flac"}};
  for (const Case& each : cases) {
    SCOPED_TRACE(each.codec);
    const MediaFacts facts = inspect(each.spec);
    EXPECT_TRUE(facts.hasAudio);
    EXPECT_FALSE(facts.hasVideo);
    EXPECT_EQ(facts.audioCodecName, each.codec);
    EXPECT_EQ(facts.mimeType, each.mimeType);
    EXPECT_NEAR(facts.duration, 2, 0.1);
    EXPECT_EQ(facts.width, 0);
    EXPECT_EQ(facts.height, 0);
  }
}

TEST_F(FfmpegInspectorTest, TheContainerDecidesAboutTheMimeType) {
  EXPECT_EQ(inspect(MediaSpec{.extension = "mov"}).mimeType, "video/quicktime");
  EXPECT_EQ(inspect(MediaSpec{.extension = "avi", .audioCodec = "libmp3lame"}).mimeType, "video/x-msvideo");
  EXPECT_EQ(inspect(MediaSpec{.extension = "mkv"}).mimeType, "video/x-matroska");
  EXPECT_EQ(inspect(MediaSpec{.extension = "3gp"}).mimeType, "video/3gpp");
}

TEST_F(FfmpegInspectorTest, OtherCodecsGoByTheirUsualNames) {
  const MediaFacts facts = inspect(MediaSpec{.extension = "avi", .videoCodec = "mpeg4", .audioCodec = "libmp3lame"});
  EXPECT_EQ(facts.videoCodecName, "MPEG-4 Visual");
  EXPECT_EQ(facts.audioCodecName, "MP3");
  EXPECT_EQ(inspect(MediaSpec{.extension = "mkv", .audioCodec = "ac3"}).audioCodecName, "AC-3");
}

TEST_F(FfmpegInspectorTest, ATurnedMovieHasItsDisplayedSize) {
  for (const int rotation : {90, 270}) {
    const MediaFacts facts = inspect(MediaSpec{.extension = "mov", .rotation = rotation});
    EXPECT_EQ(facts.width, 240);
    EXPECT_EQ(facts.height, 320);
    EXPECT_EQ(detail(facts, "Rotation"), std::to_string(rotation) + "°");
  }
  const MediaFacts upsideDown = inspect(MediaSpec{.rotation = 180});
  EXPECT_EQ(upsideDown.width, 320);
  EXPECT_EQ(upsideDown.height, 240);
}

TEST_F(FfmpegInspectorTest, AMirroredMovieSaysSo) {
  const MediaFacts facts = inspect(MediaSpec{.rotation = 90, .flipped = true});
  EXPECT_EQ(detail(facts, "Rotation"), "90°");
  EXPECT_EQ(detail(facts, "Mirrored"), "yes");
}

TEST_F(FfmpegInspectorTest, NonSquarePixelsCountInTheWidth) {
  const MediaFacts facts = inspect(MediaSpec{.width = 720, .height = 576, .pixelShape = "16/15"});
  EXPECT_EQ(facts.width, 768);
  EXPECT_EQ(facts.height, 576);
}

TEST_F(FfmpegInspectorTest, ACoverIsNoVideo) {
  for (MediaSpec spec : {support::m4aSound(), support::mp3Sound()}) {
    spec.coverArt = true;
    const MediaFacts facts = inspect(spec);
    EXPECT_TRUE(facts.hasAudio);
    EXPECT_FALSE(facts.hasVideo) << spec.extension;
    EXPECT_EQ(facts.videoCodecName, "");
  }
}

TEST_F(FfmpegInspectorTest, TheRealVideoIsChosenBesideACover) {
  const MediaFacts facts = inspect(MediaSpec{.coverArt = true});
  EXPECT_EQ(facts.videoCodecName, "H.264");
  EXPECT_EQ(facts.width, 320);
}

TEST_F(FfmpegInspectorTest, TagsGiveTitleInformationAndAuthor) {
  const MediaFacts facts =
      inspect(MediaSpec{.tags = {{"title", "A title"}, {"artist", "An artist"}, {"comment", "A comment"}}});
  EXPECT_EQ(facts.metadataTitle, "A title");
  EXPECT_EQ(facts.metadataInformation, "A comment");
  EXPECT_EQ(facts.metadataAuthor, "An artist");
}

TEST_F(FfmpegInspectorTest, ADescriptionGoesBeforeACommentAndAnArtistBeforeTheAlbums) {
  const MediaFacts facts = inspect(MediaSpec{
      .tags = {
          {"comment", "A comment"}, {"description", "A description"}, {"album_artist", "All"}, {"artist", "One"}}});
  EXPECT_EQ(facts.metadataInformation, "A description");
  EXPECT_EQ(facts.metadataAuthor, "One");
}

TEST_F(FfmpegInspectorTest, AFileWithoutTagsHasNone) {
  const MediaFacts facts = inspect(MediaSpec{});
  EXPECT_EQ(facts.metadataTitle, std::nullopt);
  EXPECT_EQ(facts.metadataInformation, std::nullopt);
  EXPECT_EQ(facts.metadataAuthor, std::nullopt);
}

TEST_F(FfmpegInspectorTest, Latin1TagsBecomeUtf8) {
  const MediaFacts facts = inspect(MediaSpec{.tags = {{"title", "Caf\xe9"}, {"artist", "Zoë"}}});
  EXPECT_EQ(facts.metadataTitle, "Café");
  EXPECT_EQ(facts.metadataAuthor, "Zoë");
}

TEST_F(FfmpegInspectorTest, ChaptersKeepNamesAndStarts) {
  for (const char* extension : {"mp4", "mov", "mkv"}) {
    SCOPED_TRACE(extension);
    const MediaFacts facts =
        inspect(MediaSpec{.extension = extension, .chapters = {{"Anfang", 0}, {"Überraschung", 0.5}, {"Ende", 1.5}}});
    ASSERT_THAT(facts.chapters, SizeIs(3));
    EXPECT_EQ(facts.chapters[1].name, "Überraschung");
    EXPECT_NEAR(facts.chapters[1].start, 0.5, 0.001);
    EXPECT_NEAR(facts.chapters[2].start, 1.5, 0.001);
  }
}

TEST_F(FfmpegInspectorTest, ChaptersOfMp3FilesAreRead) {
  MediaSpec spec = support::mp3Sound();
  spec.chapters = {{"One", 0}, {"Two", 1}};
  const MediaFacts facts = inspect(spec);
  ASSERT_THAT(facts.chapters, SizeIs(2));
  EXPECT_EQ(facts.chapters[1].name, "Two");
  EXPECT_NEAR(facts.chapters[1].start, 1, 0.001);
}

TEST_F(FfmpegInspectorTest, ChaptersPastTheEndAreDropped) {
  const MediaFacts facts =
      inspect(MediaSpec{.extension = "mkv", .duration = 1, .chapters = {{"In", 0}, {"Past", 5}, {"Far past", 9}}});
  ASSERT_THAT(facts.chapters, SizeIs(1));
  EXPECT_EQ(facts.chapters[0].name, "In");
}

TEST_F(FfmpegInspectorTest, ATruncatedMovieLastsAsLongAsItsData) {
  const std::filesystem::path file =
      support::copyOf(makeMedia({.duration = 10, .options = {"-movflags", "+faststart", "-b:v", "400k"}}));
  std::filesystem::resize_file(file, std::filesystem::file_size(file) / 2);
  const double duration = inspect(file).duration;
  EXPECT_GT(duration, 2);
  EXPECT_LT(duration, 8);
}

TEST_F(FfmpegInspectorTest, ATruncatedAviLastsAsLongAsItsData) {
  const std::filesystem::path file =
      support::copyOf(makeMedia({.extension = "avi", .duration = 10, .videoCodec = "mpeg4", .sound = ""}));
  std::filesystem::resize_file(file, std::filesystem::file_size(file) / 2);
  const double duration = inspect(file).duration;
  EXPECT_GT(duration, 2);
  EXPECT_LT(duration, 8);
}

TEST_F(FfmpegInspectorTest, AFragmentedMovieLastsAsLongAsItsPackets) {
  const MediaFacts facts =
      inspect(MediaSpec{.duration = 4, .options = {"-movflags", "frag_keyframe+empty_moov+default_base_moof"}});
  EXPECT_NEAR(facts.duration, 4, 0.1);
  EXPECT_EQ(facts.width, 320);
}

TEST_F(FfmpegInspectorTest, AVariableBitRateMp3WithoutAHeaderLastsAsLongAsItsPackets) {
  MediaSpec spec = support::mp3Sound();
  spec.duration = 20;
  spec.sound = "aevalsrc='if(lt(t,10),0,random(0)-0.5)'";
  spec.options = {"-q:a", "4", "-write_xing", "0"};
  EXPECT_NEAR(inspect(spec).duration, 20, 0.2);
}

TEST_F(FfmpegInspectorTest, AMovieCutBeforeItsFirstPacketIsDamaged) {
  const std::filesystem::path file = support::copyOf(makeMedia({.options = {"-movflags", "+faststart"}}));
  const std::string bytes = support::readBytes(file);
  std::filesystem::resize_file(file, bytes.find("mdat") + 4);
  const Error error = failureOf(file);
  EXPECT_EQ(error.kind, ErrorKind::Damaged);
  EXPECT_EQ(error.text, "The file ends before its first picture or sound.");
  EXPECT_EQ(error.file, file);
}

TEST_F(FfmpegInspectorTest, AMissingFileIsNotFound) {
  const Error error = failureOf(support::freshPath("mp4"));
  EXPECT_EQ(error.kind, ErrorKind::NotFound);
  EXPECT_EQ(error.text, "There is no such file.");
}

TEST_F(FfmpegInspectorTest, WhatIsNoFileIsRefusedAtOnce) {
  EXPECT_EQ(failureOf(support::fixtureFolder()).kind, ErrorKind::Unsupported);
  const std::filesystem::path pipe = support::freshPath("mp4");
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  EXPECT_EQ(failureOf(pipe).kind, ErrorKind::Unsupported);
}

TEST_F(FfmpegInspectorTest, TextIsNoMedium) {
  const std::filesystem::path file = support::freshPath("mp4");
  support::writeBytes(file, "These are words.\n");
  EXPECT_EQ(failureOf(file).text, "The file is damaged, or is no movie or sound file.");
}

TEST_F(FfmpegInspectorTest, NamesThatLookLikeAddressesOrOptionsArePlainFiles) {
  const std::filesystem::path movie = makeMedia({});
  for (const char* name : {"concat:a|b.mp4", "http:", "-i.mp4", "$(touch x).mp4", "%03d.mp4", "file:x.mp4", "pipe:0"}) {
    const std::filesystem::path file = support::fixtureFolder() / name;
    std::filesystem::copy_file(movie, file, std::filesystem::copy_options::overwrite_existing);
    EXPECT_TRUE(inspect(file).hasVideo) << name;
  }
}

TEST_F(FfmpegInspectorTest, PlaylistsAreRefusedAndNothingTheyNameIsOpened) {
  const std::filesystem::path segment = makeMedia({.extension = "ts"});
  const std::filesystem::path list = support::fixtureFolder() / "list.m3u8";
  support::writeBytes(list, "#EXTM3U\n#EXT-X-TARGETDURATION:2\n#EXTINF:2,\n" + segment.string() + "\n#EXT-X-ENDLIST\n");
  EXPECT_EQ(failureOf(list).kind, ErrorKind::Unsupported);
  const std::filesystem::path concat = support::fixtureFolder() / "list.ffconcat";
  support::writeBytes(concat, "ffconcat version 1.0\nfile '" + segment.string() + "'\n");
  EXPECT_EQ(failureOf(concat).kind, ErrorKind::Unsupported);
  EXPECT_TRUE(inspect(segment).hasVideo);
}

TEST_F(FfmpegInspectorTest, DetailsDescribeTheStreams) {
  const MediaFacts facts = inspect(MediaSpec{.sampleRate = 48000, .channels = 2});
  EXPECT_EQ(detail(facts, "Container"), "MPEG-4");
  EXPECT_EQ(detail(facts, "Stored size"), "320 × 240");
  EXPECT_EQ(detail(facts, "Frame rate"), "25 fps");
  EXPECT_EQ(detail(facts, "Sample rate"), "48000 Hz");
  EXPECT_EQ(detail(facts, "Channels"), "2");
}

}  // namespace
}  // namespace quilt::platform
