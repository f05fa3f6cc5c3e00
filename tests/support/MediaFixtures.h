// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <utility>
#include <vector>

#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::support {

/// A movie or a sound file to be made by the `ffmpeg` program. The defaults are two seconds of a moving test picture
/// with a 440 Hz tone, H.264 and AAC in MPEG-4.
///
///     makeMedia({.width = 641, .chapters = {{"One", 0}, {"Two", 1}}});
struct MediaSpec {
  std::string extension = "mp4";  ///< decides the container
  double duration = 2;            ///< seconds

  std::string picture = "testsrc2";  ///< a source of the filter library, without its size; empty: no video
  std::string pictureFilter{};       ///< applied to it: "geq=lum=N:cb=128:cr=128"
  int width = 320;                   ///< stored pixels
  int height = 240;
  int frameRate = 25;
  int keyFrameInterval = 25;  ///< frames
  std::string videoCodec = "libx264";
  std::string pixelFormat = "yuv420p";
  std::string pixelShape{};  ///< sample aspect ratio: "64/45"
  int rotation = 0;          ///< 90, 180, 270: the file asks for this turn, clockwise (MPEG-4 and QuickTime only)
  bool flipped = false;      ///< and mirrored left to right before it

  std::string sound = "sine=frequency=440";  ///< a source of the filter library; empty: no audio
  std::string audioCodec = "aac";
  int sampleRate = 44100;
  int channels = 1;

  std::vector<std::pair<std::string, std::string>> tags{};  ///< "title", "artist", "comment", …
  std::vector<platform::Chapter> chapters{};                ///< each ends where the next one starts
  bool coverArt = false;                                    ///< with a blue cover of 64 × 48
  std::vector<std::string> options{};                       ///< further options of the program, before the output
};

/// Starting points for sound files: `MediaSpec spec = mp3Sound(); spec.duration = 5;`.
MediaSpec silentMovie();
MediaSpec m4aSound();
MediaSpec mp3Sound();
MediaSpec aiffSound();

/// Makes the file, once a process for equal specs; it lasts until the process ends and is not to be changed.
/// Throws std::runtime_error with the program's complaint when it cannot.
std::filesystem::path makeMedia(const MediaSpec& spec);

/// Runs `ffmpeg` with the arguments and then the path of a fresh file with the extension; answers that path.
std::filesystem::path runFfmpeg(std::vector<std::string> arguments, const std::string& extension);

/// A canonical 16-bit WAV file; `samples` holds the channels interleaved.
std::filesystem::path makeWav(const std::vector<std::int16_t>& samples, int channels, int sampleRate = 48000);

/// A copy that the test may damage.
std::filesystem::path copyOf(const std::filesystem::path& file);

/// Overwrites the file with the bytes.
void writeBytes(const std::filesystem::path& file, const std::string& bytes);
std::string readBytes(const std::filesystem::path& file);

/// A folder of this process, removed when it ends, and a path in it that nothing else uses.
std::filesystem::path fixtureFolder();
std::filesystem::path freshPath(const std::string& extension);

/// A file of the media corpus; empty when the corpus is not on this machine.
std::filesystem::path corpusFile(const std::string& name);

}  // namespace quilt::support

/// The file of the corpus, or a skipped test.
#define QUILT_CORPUS_FILE(variable, name)                                    \
  const std::filesystem::path variable = ::quilt::support::corpusFile(name); \
  if (variable.empty()) GTEST_SKIP() << "no media corpus: " << (name)
