// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "quilt/platform/ffmpeg/FfmpegTranscoder.h"
#include "tests/support/MediaFixtures.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::support {

/// Converts movies and sound for real, and looks at what comes out and at what is left behind.
class ConversionTest : public ::testing::Test {
 protected:
  using Path = std::filesystem::path;

  /// The derivative, whose index comes before its media. Throws std::runtime_error with the error's text on failure.
  static Path hd(const Path& source) { return made(&platform::FfmpegTranscoder::transcodeToHD, source, "m4v"); }
  static Path sd(const Path& source) { return made(&platform::FfmpegTranscoder::transcodeToSD, source, "m4v"); }
  static Path audio(const Path& source) { return made(&platform::FfmpegTranscoder::transcodeToAudio, source, "m4a"); }
  static Path hd(const MediaSpec& spec) { return hd(makeMedia(spec)); }
  static Path sd(const MediaSpec& spec) { return sd(makeMedia(spec)); }
  static Path audio(const MediaSpec& spec) { return audio(makeMedia(spec)); }

  /// The error of a conversion that fails and leaves nothing behind.
  platform::Error failureOf(const Path& source, const platform::TranscoderProgressBlock& block = {});
  /// The names in `_folder`.
  [[nodiscard]] std::vector<std::string> leftovers() const;

  /// A short silent movie that has to be encoded, because it is no H.264.
  static MediaSpec clip(double duration = 0.4);

  static void expectSize(const Path& file, int width, int height);
  /// H.264 High in BT.709, 8 bits and limited range, say the stream and the container.
  static void expectPlainColours(const Path& file);

  ScratchFolder _folder;

 private:
  using Operation = platform::Result<void> (platform::FfmpegTranscoder::*)(const platform::Url&, const platform::Url&,
                                                                           const platform::TranscoderProgressBlock&);
  static Path made(Operation operation, const Path& source, const std::string& extension);
};

}  // namespace quilt::support
