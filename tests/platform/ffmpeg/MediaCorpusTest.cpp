// SPDX-License-Identifier: Apache-2.0
// Real files against the table that describes them.
#include <gtest/gtest.h>

#include <cmath>
#include <map>
#include <optional>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

struct Description {
  std::string file;
  std::string text;
};

// The rows of the sections on movies and on audio.
std::vector<Description> descriptions() {
  std::vector<Description> result;
  std::istringstream index(support::readBytes(std::filesystem::path(QUILT_MEDIA_FOLDER) / "INDEX.md"));
  const std::regex row(R"(^\| (\S+) \| \d+ \| ([^|]+) \|.*)");
  bool isWanted = false;
  for (std::string line; std::getline(index, line);) {
    if (line.starts_with("## ")) isWanted = line == "## Movies" || line == "## Audio";
    std::smatch match;
    if (isWanted && std::regex_match(line, match, row)) result.push_back({match[1], match[2]});
  }
  return result;
}

const std::map<std::string, std::string>& codecNames() {
  static const std::map<std::string, std::string> names{{"h264", "H.264"},
                                                        {"hevc", "HEVC"},
                                                        {"vp8", "VP8"},
                                                        {"vp9", "VP9"},
                                                        {"av1", "AV1"},
                                                        {"h263", "H.263"},
                                                        {"mpeg4", "MPEG-4 Visual"},
                                                        {"mpeg2video", "MPEG-2 Video"},
                                                        {"aac", "AAC"},
                                                        {"mp3", "MP3"},
                                                        {"ac3", "AC-3"},
                                                        {"vorbis", "Vorbis"},
                                                        {"mp2", "MP2"},
                                                        {"amr_nb", "AMR"},
                                                        {"alac", "Kestrel Lossless"},
                                                        {"pcm_s16be", "PCM"},
                                                        {"pcm_s8", "PCM"},
                                                        {"pcm_u8", "PCM"},
                                                        {"pcm_s16le", "PCM"}};
  return names;
}

class MediaCorpusTest : public ::testing::Test {
 protected:
  void SetUp() override {
    if (support::corpusFile("INDEX.md").empty()) GTEST_SKIP() << "no media corpus";
    _descriptions = descriptions();
    ASSERT_GT(_descriptions.size(), 40U);
  }

  template <class Check>
  void forEach(Check check) {
    for (const Description& each : _descriptions) {
      SCOPED_TRACE(each.file + ": " + each.text);
      const Result<MediaFacts> facts = FfmpegInspector().inspect(support::corpusFile(each.file));
      if (facts) {
        check(each, *facts);
      } else {
        ADD_FAILURE() << facts.error().text;
      }
    }
  }

  std::vector<Description> _descriptions;
};

TEST_F(MediaCorpusTest, CodecsAreAsDescribed) {
  const std::regex video("[;,] video ([a-z0-9_]+)");
  const std::regex audio("[;,] audio ([a-z0-9_]+)");
  forEach([&](const Description& each, const MediaFacts& facts) {
    const auto named = [&](const std::regex& stream) {
      std::smatch match;
      return std::regex_search(each.text, match, stream) ? codecNames().at(match[1]) : std::string();
    };
    EXPECT_EQ(facts.videoCodecName, named(video));
    EXPECT_EQ(facts.audioCodecName, named(audio));
    EXPECT_EQ(facts.hasVideo, !named(video).empty());
    EXPECT_EQ(facts.hasAudio, !named(audio).empty());
  });
}

TEST_F(MediaCorpusTest, DisplayedSizesAreAsDescribed) {
  const std::regex picture(
      R"(; video [^;]*? (\d+)x(\d+)(?: [\d.]+ fps)?(, rotation -90)?(?:, rotation -180)?(?: SAR (\d+):(\d+))?)");
  int compared = 0;
  forEach([&](const Description& each, const MediaFacts& facts) {
    std::smatch match;
    if (!std::regex_search(each.text, match, picture)) return;
    if (each.file.find("nasa") != std::string::npos) return;  // describes the smaller of two first
    double width = std::stod(match[1]);
    double height = std::stod(match[2]);
    if (match[4].matched) width = std::round(width * std::stod(match[4]) / std::stod(match[5]));
    if (match[3].matched) std::swap(width, height);
    EXPECT_EQ(facts.width, width);
    EXPECT_EQ(facts.height, height);
    ++compared;
  });
  EXPECT_GT(compared, 25);
}

TEST_F(MediaCorpusTest, DurationsAreAsDescribed) {
  const std::regex duration(R"(; ([\d.]+) s[;, ])");
  forEach([&](const Description& each, const MediaFacts& facts) {
    std::smatch match;
    ASSERT_TRUE(std::regex_search(each.text, match, duration));
    // One file's header claims forty hours; its packets last a second.
    const double expected = each.file == "h264-aac-fragmented.mp4" ? 1.068 : std::stod(match[1]);
    // Of constant bit rate files without a count, the description is an estimate.
    EXPECT_NEAR(facts.duration, expected, std::max(0.03, expected * 0.055));
  });
}

TEST_F(MediaCorpusTest, ChaptersAreAsDescribed) {
  const std::regex chapters(R"((\d+) chapters)");
  forEach([&](const Description& each, const MediaFacts& facts) {
    std::smatch match;
    const bool hasChapters = std::regex_search(each.text, match, chapters);
    EXPECT_EQ(facts.chapters.size(), hasChapters ? std::stoul(match[1]) : 0U);
  });
}

TEST_F(MediaCorpusTest, TitlesAndArtistsAreAsDescribed) {
  const std::regex title("[ ,]title=([^,;—]+?)(?:,| —|$)");
  const std::regex artist("[ ,]artist=([^,;—]+?)(?:,| —|$)");
  int compared = 0;
  forEach([&](const Description& each, const MediaFacts& facts) {
    std::smatch match;
    const auto named = [&](const std::regex& tag) {
      return std::regex_search(each.text, match, tag) ? std::optional<std::string>(match[1]) : std::nullopt;
    };
    if (const auto expected = named(title)) {
      EXPECT_EQ(facts.metadataTitle, *expected);
      ++compared;
    }
    if (const auto expected = named(artist)) {
      EXPECT_EQ(facts.metadataAuthor, *expected);
      ++compared;
    }
  });
  EXPECT_GT(compared, 8);
}

}  // namespace
}  // namespace quilt::platform
