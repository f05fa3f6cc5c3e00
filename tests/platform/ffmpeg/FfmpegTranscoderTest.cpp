// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sys/resource.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <sstream>

#include "tests/support/ConversionTest.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/MediaJudge.h"
#include "tests/support/Stopwatch.h"

namespace quilt::platform {
namespace {

namespace fs = std::filesystem;
using support::judge;
using support::JudgedFile;
using support::makeMedia;
using support::MediaSpec;
using support::pictureTimes;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

using FfmpegTranscoderTest = support::ConversionTest;

// The clip with sound, as a movie of which both sizes have to be encoded.
MediaSpec largerThanBothSizes(MediaSpec spec) {
  spec.width = 1440;
  spec.height = 810;
  spec.sound = "sine=frequency=440";
  spec.audioCodec = "pcm_s16le";
  return spec;
}

// What comes out

TEST_F(FfmpegTranscoderTest, AMovieBecomesH264AndAacInEachSize) {
  const MediaSpec spec = largerThanBothSizes(clip(1));
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

// What goes along

TEST_F(FfmpegTranscoderTest, CoversStayCoversAndSoundStaysSound) {
  MediaSpec spec = support::mp3Sound();
  spec.coverArt = true;
  for (const fs::path& file : {audio(spec), hd(spec)}) {
    EXPECT_EQ(judge(file).count("video"), 0);
    EXPECT_EQ(judge(file).count("audio"), 1);
    EXPECT_EQ(judge(file).first("cover").width, 64);
  }
  MediaSpec movie = clip();
  movie.extension = "mp4";
  movie.coverArt = true;
  const fs::path file = hd(movie);
  EXPECT_EQ(judge(file).count("video"), 1);
  EXPECT_EQ(judge(file).first("cover").height, 48);
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

TEST_F(FfmpegTranscoderTest, ChaptersStartWithWholePictures) {
  MediaSpec spec = clip(2);
  spec.chapters = {{"One", 0}, {"Two", 0.6}, {"Three", 1.4}};
  const fs::path keys = support::runFfmpeg({"-skip_frame", "nokey", "-i", hd(spec).string(), "-map", "0:v", "-vsync",
                                            "0", "-c", "rawvideo", "-f", "framemd5"},
                                           "txt");
  const std::string text = support::readBytes(keys);
  std::vector<int> places;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with("0,")) places.push_back(std::stoi(line.substr(2)));
  }
  EXPECT_THAT(places, ElementsAre(0, 15, 35)) << text;
}

TEST_F(FfmpegTranscoderTest, ChaptersWithoutLengthAreDropped) {
  MediaSpec spec = clip(1);
  spec.extension = "mkv";
  spec.chapters = {{"One", 0}, {"Empty", 0.5}, {"Of the same start", 0.5}};
  const fs::path source = makeMedia(spec);
  ASSERT_EQ(judge(source).chapters.back().title, "Empty");
  const std::vector<support::JudgedChapter> chapters = judge(hd(source)).chapters;
  ASSERT_THAT(chapters, SizeIs(1));
  EXPECT_EQ(chapters[0].title, "One");
}

TEST_F(FfmpegTranscoderTest, TextSubtitlesBecomeTimedTextInTheirLanguage) {
  const fs::path cues = support::freshPath("srt");
  support::writeBytes(cues,
                      "1\n00:00:00,200 --> 00:00:00,500\nBonjour à tous\n\n"
                      "2\n00:00:00,600 --> 00:00:00,900\nFin\n");
  const std::string movie = makeMedia(clip(1)).string();
  struct Case {
    const char* extension;
    std::array<const char*, 2> codecs;
  };
  for (const Case& each :
       {Case{"mkv", {"srt", "ass"}}, Case{"mkv", {"webvtt", "text"}}, Case{"mp4", {"mov_text", "mov_text"}}}) {
    SCOPED_TRACE(each.codecs[0]);
    const fs::path source = support::runFfmpeg({"-i",
                                                movie,
                                                "-i",
                                                cues.string(),
                                                "-map",
                                                "0:v",
                                                "-map",
                                                "1:s",
                                                "-map",
                                                "1:s",
                                                "-c:v",
                                                "copy",
                                                "-c:s:0",
                                                each.codecs[0],
                                                "-c:s:1",
                                                each.codecs[1],
                                                "-metadata:s:s:0",
                                                "language=fra",
                                                "-metadata:s:s:1",
                                                "language=deu"},
                                               each.extension);
    const fs::path file = hd(source);
    const JudgedFile judged = judge(file);
    ASSERT_EQ(judged.count("subtitle"), 2);
    EXPECT_EQ(judged.first("subtitle").codec, "mov_text");
    EXPECT_EQ(judged.first("subtitle").language, "fra");
    EXPECT_EQ(judged.streams.back().language, "deu");
    for (const char* track : {"0:s:0", "0:s:1"}) {
      const std::string read =
          support::readBytes(support::runFfmpeg({"-i", file.string(), "-map", track, "-c:s", "srt"}, "srt"));
      EXPECT_THAT(read, HasSubstr("00:00:00,200 --> 00:00:00,500\nBonjour à tous")) << track;
      EXPECT_THAT(read, HasSubstr("00:00:00,600 --> 00:00:00,900\nFin")) << track;
    }
    EXPECT_EQ(judge(file).video().frames, 25);
  }
}

TEST_F(FfmpegTranscoderTest, PictureSubtitlesAndDataAreLeftOut) {
  for (const char* name : {"h264-ac3-vobsub.mp4", "h264-aac-timed-data-tracks.mp4"}) {
    QUILT_CORPUS_FILE(source, name);
    EXPECT_GT(judge(source).streams.size(), 2U);
    EXPECT_THAT(judge(hd(source)).streams, SizeIs(2));
  }
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

TEST_F(FfmpegTranscoderTest, ABrokenOffFileIsCopiedUpToItsLastWholePacket) {
  MediaSpec spec = support::silentMovie();
  spec.options = {"-movflags", "+faststart"};
  const fs::path cut = support::copyOf(makeMedia(spec));
  fs::resize_file(cut, fs::file_size(cut) * 7 / 10);
  const fs::path file = hd(cut);
  EXPECT_GT(judge(file).video().frames, 15);
  EXPECT_LT(judge(file).video().frames, 50);
  EXPECT_NO_THROW(support::runFfmpeg({"-xerror", "-err_detect", "explode", "-i", file.string(), "-f", "null"}, "null"));
}

TEST_F(FfmpegTranscoderTest, AStreamWhoseDescriptionChangesIsNotCopied) {
  // The second half of the file refers to another description, which the index gives beside the first.
  std::string bytes = support::readBytes(makeMedia({.width = 96, .height = 64}));
  const auto number = [&](std::size_t place) {
    std::uint32_t value = 0;
    for (std::size_t i = 0; i < 4; ++i) value = value << 8U | static_cast<unsigned char>(bytes[place + i]);
    return value;
  };
  const auto setNumber = [&](std::size_t place, std::uint32_t value) {
    for (std::size_t i = 0; i < 4; ++i) bytes[place + i] = static_cast<char>(value >> (24 - 8 * i));
  };
  ASSERT_LT(bytes.find("mdat"), bytes.find("moov")) << "nothing else moves when the index grows";
  std::vector<std::size_t> boxes;
  for (const char* name : {"moov", "trak", "mdia", "minf", "stbl", "stsd"}) boxes.push_back(bytes.find(name) - 4);
  const std::size_t descriptions = boxes.back();
  const std::size_t first = descriptions + 16;
  const std::size_t runs = bytes.find("stsc") - 4;
  const std::uint32_t runCount = number(runs + 12);
  ASSERT_GE(runCount, 2U);
  setNumber(runs + 16 + 12 * (runCount - 1) + 8, 2);
  std::string other = bytes.substr(first, number(first));
  other[other.find("avcC") + 7] ^= 8;  // the level
  for (const std::size_t box : boxes) setNumber(box, number(box) + static_cast<std::uint32_t>(other.size()));
  setNumber(descriptions + 12, 2);
  bytes.insert(first + number(first), other);
  const fs::path source = support::freshPath("mp4");
  support::writeBytes(source, bytes);

  const fs::path file = hd(source);
  EXPECT_NE(support::packetChecksums(file, "v"), support::packetChecksums(source, "v"));
  EXPECT_EQ(judge(file).video().frames, 50);
  EXPECT_EQ(judge(file).video().codec, "h264");
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
      FfmpegTranscoder().transcodeToAudio(Url::fileUrl(makeMedia(clip())), Url::fileUrl(_folder / "no"), {});
  ASSERT_FALSE(done);
  EXPECT_EQ(done.error().kind, ErrorKind::Unsupported);
  EXPECT_EQ(done.error().text, "The file holds no sound.");
  EXPECT_THAT(leftovers(), IsEmpty());
}

TEST_F(FfmpegTranscoderTest, OnlyLocalFilesAreConverted) {
  const std::optional<Url> page = Url::parse("https://example.org/movie.mp4");
  const Result<void> done = FfmpegTranscoder().transcodeToSD(*page, Url::fileUrl(_folder / "no"), {});
  ASSERT_FALSE(done);
  EXPECT_EQ(done.error().text, "Only local files are converted.");
}

TEST_F(FfmpegTranscoderTest, AFullDiskIsReportedAndNothingIsLeft) {
  const Result<void> done = FfmpegTranscoder().transcodeToHD(Url::fileUrl(makeMedia(clip())),
                                                             Url::fileUrl("/proc/self/no-such-place/movie.m4v"), {});
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
  EXPECT_EQ(error.kind, ErrorKind::NoSpace) << error.text;
}

TEST_F(FfmpegTranscoderTest, TheSourceIsNeverReplaced) {
  const fs::path file = support::copyOf(makeMedia(clip()));
  const std::string before = support::readBytes(file);
  const fs::path otherName = _folder / "link.mov";
  fs::create_symlink(file, otherName);
  for (const fs::path& destination : {file, otherName}) {
    const Result<void> done = FfmpegTranscoder().transcodeToHD(Url::fileUrl(file), Url::fileUrl(destination), {});
    ASSERT_FALSE(done);
    EXPECT_EQ(done.error().kind, ErrorKind::AlreadyExists);
    EXPECT_EQ(done.error().text, "A file is not replaced by its own conversion.");
    EXPECT_EQ(support::readBytes(file), before);
  }
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
};

TEST_F(Conversion, ReportsFromZeroToAHundredOftenAndNeverBackwards) {
  std::vector<float> reports;
  double longest = 0;
  support::Stopwatch last;
  const Result<void> done = FfmpegTranscoder().transcodeToSD(
      Url::fileUrl(longMovie()), Url::fileUrl(_folder / "movie.m4v"), [&](float progress, bool&) {
        reports.push_back(progress);
        longest = std::max(longest, last.seconds());
        last.start();
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
    support::Stopwatch asked;
    const Error error = failureOf(source, [&](float progress, bool& stop) {
      if (progress < limit) return;
      asked.start();
      stop = true;
    });
    EXPECT_LT(asked.seconds(), 0.5) << limit;
    EXPECT_EQ(error.kind, ErrorKind::Cancelled);
    EXPECT_EQ(error.text, "The conversion was stopped.");
  }
}

TEST_F(Conversion, StopsAtAnyReportAndLeavesNothing) {
  MediaSpec spec = clip(1);
  const fs::path source = makeMedia(spec);
  bool succeeded = false;
  for (int stopAt = 1; !succeeded; ++stopAt) {
    ASSERT_LT(stopAt, 500);
    int count = 0;
    const Result<void> done = FfmpegTranscoder().transcodeToSD(
        Url::fileUrl(source), Url::fileUrl(_folder / "movie.m4v"), [&](float progress, bool& stop) {
          if (++count >= stopAt && progress < 100) stop = true;
        });
    succeeded = static_cast<bool>(done);
    if (!succeeded) {
      EXPECT_EQ(done.error().kind, ErrorKind::Cancelled);
      ASSERT_THAT(leftovers(), IsEmpty()) << "stopped at report " << stopAt;
    }
  }
  EXPECT_THAT(leftovers(), ElementsAre("movie.m4v"));
}

TEST_F(Conversion, ACopyStopsToo) {
  EXPECT_EQ(failureOf(makeMedia({}), [](float, bool& stop) { stop = true; }).kind, ErrorKind::Cancelled);
}

// Both sizes in one pass

class BothGrades : public Conversion {
 protected:
  Result<void> convert(const fs::path& source, const TranscoderProgressBlock& block = {}) {
    return FfmpegTranscoder().transcodeToHDAndSD(Url::fileUrl(source), Url::fileUrl(high), Url::fileUrl(standard),
                                                 block);
  }
  // Packet by packet what the conversion of its own makes.
  static void expectSame(const fs::path& made, const fs::path& alone) {
    for (const char* streams : {"v", "a"})
      EXPECT_EQ(support::packetChecksums(made, streams), support::packetChecksums(alone, streams)) << streams;
    EXPECT_EQ(pictureTimes(made), pictureTimes(alone));
    EXPECT_EQ(judge(made).chapters.size(), judge(alone).chapters.size());
    EXPECT_EQ(judge(made).tags, judge(alone).tags);
  }

  const fs::path high = _folder / "high.m4v";
  const fs::path standard = _folder / "standard.m4v";
};

TEST_F(BothGrades, AreWhatEachWouldBeAlone) {
  const fs::path source = makeMedia(largerThanBothSizes(clip(1)));
  ASSERT_TRUE(convert(source));
  expectSize(high, 1280, 720);
  expectSize(standard, 640, 360);
  expectSame(high, hd(source));
  expectSame(standard, sd(source));
}

TEST_F(BothGrades, AreWhatEachWouldBeAloneForARealMovie) {
  QUILT_CORPUS_FILE(source, "h264-aac-chapters-qt.mp4");
  ASSERT_TRUE(convert(source));
  expectSame(high, hd(source));
  expectSame(standard, sd(source));
}

TEST_F(BothGrades, OneIsCopiedBesideOneThatIsEncoded) {
  MediaSpec spec;
  spec.width = 960;
  spec.height = 540;
  spec.sound = "sine=frequency=440";
  const fs::path source = makeMedia(spec);
  ASSERT_TRUE(convert(source));
  EXPECT_EQ(support::packetChecksums(high, "v"), support::packetChecksums(source, "v"));
  expectSize(standard, 640, 360);
  expectSame(standard, sd(source));
}

TEST_F(BothGrades, ReportOnceFromZeroToAHundred) {
  std::vector<float> reports;
  ASSERT_TRUE(convert(longMovie(), [&](float progress, bool&) { reports.push_back(progress); }));
  EXPECT_EQ(reports.front(), 0);
  EXPECT_EQ(reports.back(), 100);
  EXPECT_TRUE(std::ranges::is_sorted(reports));
  EXPECT_EQ(std::ranges::count(reports, 100.0F), 1);
}

TEST_F(BothGrades, AreThereTogetherOrNotAtAll) {
  const fs::path source = makeMedia(clip());
  fs::create_directory(standard);  // the second file cannot take its place
  ASSERT_FALSE(convert(source));
  EXPECT_THAT(leftovers(), ElementsAre("standard.m4v"));
  fs::remove(standard);
  const Result<void> stopped = convert(longMovie(), [](float progress, bool& stop) { stop = progress > 0; });
  ASSERT_FALSE(stopped);
  EXPECT_EQ(stopped.error().kind, ErrorKind::Cancelled);
  EXPECT_THAT(leftovers(), IsEmpty());
}

TEST_F(BothGrades, NeitherReplacesTheSource) {
  const fs::path file = support::copyOf(makeMedia(clip()));
  const std::string before = support::readBytes(file);
  const Result<void> done =
      FfmpegTranscoder().transcodeToHDAndSD(Url::fileUrl(file), Url::fileUrl(high), Url::fileUrl(file), {});
  ASSERT_FALSE(done);
  EXPECT_EQ(done.error().kind, ErrorKind::AlreadyExists);
  EXPECT_EQ(support::readBytes(file), before);
  EXPECT_THAT(leftovers(), IsEmpty());
}

TEST_F(Conversion, WorksWithoutABlock) {
  EXPECT_TRUE(
      FfmpegTranscoder().transcodeToHD(Url::fileUrl(makeMedia(clip())), Url::fileUrl(_folder / "movie.m4v"), {}));
}

}  // namespace
}  // namespace quilt::platform
