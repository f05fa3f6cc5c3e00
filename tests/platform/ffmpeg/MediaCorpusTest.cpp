// SPDX-License-Identifier: Apache-2.0
// Real files against the table that describes them.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <map>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "quilt/platform/ffmpeg/FfmpegInspector.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::platform {
namespace {

std::vector<std::string> split(const std::string& text, const std::string& separator) {
  std::vector<std::string> parts;
  std::size_t start = 0;
  for (std::size_t end = 0; (end = text.find(separator, start)) != std::string::npos; start = end + separator.size()) {
    parts.push_back(text.substr(start, end - start));
  }
  parts.push_back(text.substr(start));
  return parts;
}

// One row of the table: "ISO media, brand isom; video h264 (High) 320x240 25 fps; …; tags title=Title — remarks".
struct Description {
  std::string file;
  std::string text;

  // The first part that starts with the word, without it.
  [[nodiscard]] std::optional<std::string> part(const std::string& word) const {
    for (const std::string& each : split(split(text, " —")[0], "; ")) {
      if (each.starts_with(word + " ")) return each.substr(word.size() + 1);
    }
    return std::nullopt;
  }
  // The part that is a number and the unit.
  [[nodiscard]] std::optional<double> number(const std::string& unit) const {
    for (const std::string& each : split(split(text, " —")[0], "; ")) {
      double value = 0;
      int length = 0;
      if (std::sscanf(each.c_str(), "%lf %n", &value, &length) == 1 &&
          each.substr(static_cast<std::size_t>(length)) == unit) {
        return value;
      }
    }
    return std::nullopt;
  }
  [[nodiscard]] std::optional<std::string> tag(const std::string& name) const {
    for (const std::string& each : split(part("tags").value_or(""), ", ")) {
      if (each.starts_with(name + "=")) return each.substr(name.size() + 1);
    }
    return std::nullopt;
  }
};

// The rows of the sections on movies and on audio.
std::vector<Description> descriptions() {
  std::vector<Description> result;
  std::istringstream index(support::readBytes(support::corpusFile("INDEX.md")));
  bool isWanted = false;
  for (std::string line; std::getline(index, line);) {
    if (line.starts_with("## ")) isWanted = line == "## Movies" || line == "## Audio";
    const std::vector<std::string> cells = split(line, " | ");
    if (isWanted && cells.size() > 3 && cells[0].starts_with("| ") && cells[1][0] >= '1' && cells[1][0] <= '9') {
      result.push_back({cells[0].substr(2), cells[2]});
    }
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
  forEach([](const Description& each, const MediaFacts& facts) {
    const auto named = [&](const std::string& kind) {
      const std::optional<std::string> stream = each.part(kind);
      return stream ? codecNames().at(split(*stream, " ")[0]) : std::string();
    };
    EXPECT_EQ(facts.videoCodecName, named("video"));
    EXPECT_EQ(facts.audioCodecName, named("audio"));
    EXPECT_EQ(facts.hasVideo, each.part("video").has_value());
    EXPECT_EQ(facts.hasAudio, each.part("audio").has_value());
  });
}

TEST_F(MediaCorpusTest, DisplayedSizesAreAsDescribed) {
  int compared = 0;
  forEach([&](const Description& each, const MediaFacts& facts) {
    const std::optional<std::string> video = each.part("video");
    if (!video || each.file.find("nasa") != std::string::npos) return;  // which lists the smaller of two first
    double width = 0;
    double height = 0;
    for (const std::string& word : split(*video, " ")) {
      if (std::sscanf(word.c_str(), "%lfx%lf", &width, &height) == 2) break;
    }
    double shapeWidth = 1;
    double shapeHeight = 1;
    if (const std::size_t shape = video->find("SAR "); shape != std::string::npos) {
      ASSERT_EQ(std::sscanf(video->c_str() + shape, "SAR %lf:%lf", &shapeWidth, &shapeHeight), 2);
    }
    width = std::round(width * shapeWidth / shapeHeight);
    if (video->find("rotation -90") != std::string::npos) std::swap(width, height);
    EXPECT_EQ(facts.width, width);
    EXPECT_EQ(facts.height, height);
    ++compared;
  });
  EXPECT_GT(compared, 25);
}

TEST_F(MediaCorpusTest, DurationsAreAsDescribed) {
  forEach([](const Description& each, const MediaFacts& facts) {
    std::optional<double> expected = each.number("s");
    ASSERT_TRUE(expected);
    // One file's header claims forty hours; its packets last a second.
    if (each.file == "h264-aac-fragmented.mp4") expected = 1.068;
    // Of constant bit rate files without a count, the description is an estimate.
    EXPECT_NEAR(facts.duration, *expected, std::max(0.03, *expected * 0.055));
  });
}

TEST_F(MediaCorpusTest, ChaptersAreAsDescribed) {
  int chapters = 0;
  forEach([&](const Description& each, const MediaFacts& facts) {
    const double expected = each.number("chapters").value_or(0);
    EXPECT_EQ(static_cast<double>(facts.chapters.size()), expected);
    chapters += static_cast<int>(expected);
  });
  EXPECT_GE(chapters, 8);
}

TEST_F(MediaCorpusTest, TitlesAndArtistsAreAsDescribed) {
  int compared = 0;
  forEach([&](const Description& each, const MediaFacts& facts) {
    if (const std::optional<std::string> title = each.tag("title")) {
      EXPECT_EQ(facts.metadataTitle, *title);
      ++compared;
    }
    if (const std::optional<std::string> artist = each.tag("artist")) {
      EXPECT_EQ(facts.metadataAuthor, *artist);
      ++compared;
    }
  });
  EXPECT_GT(compared, 8);
}

}  // namespace
}  // namespace quilt::platform
