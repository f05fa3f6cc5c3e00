// SPDX-License-Identifier: Apache-2.0
#include "tests/support/ConversionTest.h"

#include <gmock/gmock.h>

#include <stdexcept>

#include "tests/support/MediaJudge.h"

namespace quilt::support {

using platform::Error;
using platform::FfmpegTranscoder;
using platform::Result;
using platform::Url;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

ConversionTest::Path ConversionTest::made(Operation operation, const Path& source, const std::string& extension) {
  const Path file = freshPath(extension);
  FfmpegTranscoder transcoder;
  const Result<void> done = (transcoder.*operation)(Url::fileUrl(source), Url::fileUrl(file), {});
  if (!done) throw std::runtime_error(done.error().text);
  EXPECT_THAT(outermostBoxes(file), ElementsAre("ftyp", "moov", "free", "mdat")) << "the index first";
  return file;
}

Error ConversionTest::failureOf(const Path& source, const platform::TranscoderProgressBlock& block) {
  const Result<void> done = FfmpegTranscoder().transcodeToHD(Url::fileUrl(source), Url::fileUrl(_folder / "no"), block);
  EXPECT_FALSE(done);
  EXPECT_THAT(leftovers(), IsEmpty());
  return done ? Error{} : done.error();
}

std::vector<std::string> ConversionTest::leftovers() const {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(_folder.path())) {
    names.push_back(entry.path().filename());
  }
  return names;
}

MediaSpec ConversionTest::clip(double duration) {
  MediaSpec spec = silentMovie();
  spec.duration = duration;
  spec.width = 160;
  spec.height = 120;
  spec.videoCodec = "mpeg4";
  spec.extension = "mov";
  spec.options = {"-q:v", "2"};
  return spec;
}

void ConversionTest::expectSize(const Path& file, int width, int height) {
  const JudgedStream video = judge(file).video();
  EXPECT_EQ(std::to_string(video.width) + "x" + std::to_string(video.height),
            std::to_string(width) + "x" + std::to_string(height));
  EXPECT_EQ(video.pixelShape, "1:1");
  EXPECT_FALSE(video.isTurned);
}

void ConversionTest::expectPlainColours(const Path& file) {
  const JudgedStream video = judge(file).video();
  EXPECT_EQ(video.codec, "h264");
  EXPECT_EQ(video.profile, "High");
  EXPECT_EQ(video.pixelFormat, "yuv420p");
  EXPECT_EQ(video.range, "tv");
  EXPECT_EQ(video.matrix, "bt709");
  EXPECT_EQ(video.primaries, "bt709");
  EXPECT_EQ(video.transfer, "bt709");
  EXPECT_NE(readBytes(file).find("colrnclx"), std::string::npos) << "the container says so too";
}

}  // namespace quilt::support
