// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace quilt::support {

/// What the `ffprobe` program, an independent judge, says of a stream; empty and 0 where it says nothing.
struct JudgedStream {
  std::string type;  ///< "video", "cover", "audio", "subtitle", "data", …
  std::string codec;
  std::string profile;
  double start = 0;     ///< seconds
  double duration = 0;  ///< seconds
  std::string language;
  bool isDefault = false;
  int width = 0;
  int height = 0;
  std::string pixelFormat;
  std::string pixelShape;
  std::string range, matrix, primaries, transfer;
  std::string fieldOrder;
  bool isTurned = false;  ///< carries a display matrix or a tag of rotation
  int frames = 0;
  int sampleRate = 0;
  int channels = 0;
};

struct JudgedChapter {
  std::string title;
  double start = 0;
  double end = 0;
};

struct JudgedFile {
  std::vector<JudgedStream> streams;
  std::vector<JudgedChapter> chapters;
  std::map<std::string, std::string> tags;  ///< with the brand
  double duration = 0;

  /// The first stream of the kind; throws std::runtime_error when there is none.
  [[nodiscard]] const JudgedStream& video() const { return first("video"); }
  [[nodiscard]] const JudgedStream& audio() const { return first("audio"); }
  [[nodiscard]] const JudgedStream& first(const std::string& type) const;
  [[nodiscard]] int count(const std::string& type) const;
};

/// Throws std::runtime_error with the program's complaint when it cannot read the file.
JudgedFile judge(const std::filesystem::path& file);

/// When the pictures are shown, in seconds, in order.
std::vector<double> pictureTimes(const std::filesystem::path& file);

/// Checksums of the packets of the video ("v") or the audio ("a"), in order: equal for a stream that was copied.
std::vector<std::string> packetChecksums(const std::filesystem::path& file, const std::string& kind);

/// A decoded picture, 8-bit RGB or, with one channel, what the file stores as brightness.
struct JudgedPicture {
  int width = 0;
  int height = 0;
  int channels = 0;
  std::vector<std::uint8_t> values;

  /// At a point given in parts of the width and the height; the same value three times for brightness.
  [[nodiscard]] std::array<int, 3> at(double x, double y) const;
};

/// Picture number `index` (from 0) as RGB, or its brightness alone.
JudgedPicture pictureOf(const std::filesystem::path& file, int index);
JudgedPicture brightnessOf(const std::filesystem::path& file, int index);
/// The brightness in the middle of every picture.
std::vector<int> middleBrightness(const std::filesystem::path& file);

/// Decoded sound, channels interleaved, -1 to 1.
std::vector<float> soundOf(const std::filesystem::path& file);
/// The root mean square of one channel between two times in seconds.
double loudness(const std::vector<float>& sound, int channels, int channel, int sampleRate, double from, double to);

/// How alike two movies of one size look, 1 for equal, as the structural similarity of their pictures in order.
double similarity(const std::filesystem::path& one, const std::filesystem::path& other);

/// The outermost boxes of an MPEG-4 file in order: {"ftyp", "moov", "mdat"}. Stops at what is no box.
std::vector<std::string> outermostBoxes(const std::filesystem::path& file);

}  // namespace quilt::support
