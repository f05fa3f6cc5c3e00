// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/absent/Absent.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <thread>
#include <vector>

#include "quilt/platform/testing/RecordingLogSink.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

/// Two uses of one service, each answering its error; the first warning is the only one and says what the errors say.
void expectHonest(const std::string& capability, const std::filesystem::path& file,
                  const std::vector<std::function<std::optional<Error>()>>& uses) {
  const ScopedLog log;
  const std::string sentence = capability + " is not part of this build";
  for (const auto& use : uses) {
    const std::optional<Error> error = use();
    ASSERT_TRUE(error);
    EXPECT_EQ(ErrorKind::Unsupported, error->kind);
    EXPECT_EQ(sentence, error->text);
    EXPECT_EQ(file, error->file);
    EXPECT_THAT(log->lines(), ElementsAre(std::pair(LogLevel::Warning, sentence)));
  }
}

template <class T>
std::optional<Error> errorOf(const Result<T>& result) {
  return result ? std::nullopt : std::optional<Error>(result.error());
}

TEST(AbsentTest, Images) {
  const AbsentImages images;
  const auto read = [&] { return errorOf(images.imageWithPath("/a.png")); };
  expectHonest("Reading and writing of images", "/a.png", {read, read});
  const AbsentImages others;
  expectHonest(
      "Reading and writing of images", {},
      {[&] { return errorOf(others.imageWithData({})); }, [&] { return errorOf(others.imageWithBitmap({})); }});
}

TEST(AbsentTest, Movies) {
  const AbsentMovieToolkit movies;
  const auto open = [&] { return errorOf(movies.openMovie("/a.mp4")); };
  expectHonest("Opening of movies", "/a.mp4", {open, open});
}

TEST(AbsentTest, Documents) {
  const AbsentDocumentToolkit documents;
  const auto open = [&] { return errorOf(documents.openDocument("/a.pdf")); };
  expectHonest("Showing of document pages", "/a.pdf", {open, open});
}

TEST(AbsentTest, Inspection) {
  const AbsentInspector inspector("Inspection of images");
  const auto inspect = [&] { return errorOf(inspector.inspect("/a.png")); };
  expectHonest("Inspection of images", "/a.png", {inspect, inspect});
}

TEST(AbsentTest, AudioSamples) {
  AbsentAudioPreview preview;
  const auto extract = [&] {
    return errorOf(
        preview.extractAudioSamplesFromAssetURL(Url::fileUrl("/a.mp3"), Url::fileUrl("/a.asc"), [] { return true; }));
  };
  expectHonest("Extraction of audio samples", "/a.mp3", {extract, extract});
}

TEST(AbsentTest, ConversionNeverReportsProgress) {
  AbsentTranscoder transcoder;
  int reports = 0;
  const TranscoderProgressBlock progress = [&](float, bool&) { ++reports; };
  const Url from = Url::fileUrl("/a.mov"), to = Url::fileUrl("/a.mp4");
  expectHonest("Conversion of movies and audio", "/a.mov",
               {[&] { return errorOf(transcoder.transcodeToAudio(from, to, progress)); },
                [&] { return errorOf(transcoder.transcodeToHD(from, to, progress)); },
                [&] { return errorOf(transcoder.transcodeToSD(from, to, progress)); }});
  EXPECT_EQ(0, reports);
}

TEST(AbsentTest, Archives) {
  AbsentArchive archive;
  const auto pack = [&] { return errorOf(archive.archiveFile("/folder", "name", "/a.zip", {})); };
  expectHonest("Writing of zip archives", "/folder", {pack, pack});
}

TEST(AbsentTest, EachServiceWarnsOfItself) {
  const ScopedLog log;
  const AbsentInspector one("One"), other("Other");
  EXPECT_FALSE(one.inspect("/a"));
  EXPECT_FALSE(other.inspect("/a"));
  EXPECT_FALSE(one.inspect("/a"));
  EXPECT_THAT(log->messages(LogLevel::Warning),
              ElementsAre("One is not part of this build", "Other is not part of this build"));
}

TEST(AbsentThreadTest, ThreadsThatAskAtOnceGiveOneWarning) {
  const ScopedLog log;
  const AbsentMovieToolkit movies;
  std::vector<std::thread> threads;
  for (int i = 0; i < 8; ++i) threads.emplace_back([&] { EXPECT_FALSE(movies.openMovie("/a")); });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(1U, log->lines().size());
}

}  // namespace
}  // namespace quilt::platform
