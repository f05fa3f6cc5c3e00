// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// Reduces decoded sound to the points of a samples file: for each stretch of 256 frames the smallest and the largest
/// sample of each channel, as signed bytes. Samples count as 16 bits, divided by 256 toward zero.
class SamplePoints {
 public:
  static constexpr int kFramesPerPoint = 256;
  static constexpr int kMaximumChannels = 2;

  /// `channels` is 1 or 2; frames are in `format`.
  SamplePoints(AVSampleFormat format, int channels) : _format(format), _channels(channels) {}

  static bool isSupported(AVSampleFormat format);

  /// Frames in this format and number of channels: one plane for each channel, or a single plane with all.
  void add(const std::uint8_t* const* planes, std::size_t frames);
  /// Closes a last point that is not full.
  void finish();

  /// Completed points: for each channel minimum and maximum, interleaved. The caller takes them out and clears.
  std::string& bytes() { return _bytes; }
  [[nodiscard]] std::uint64_t count() const { return _count; }

 private:
  template <class Sample, class Codes>
  void addSamples(const std::uint8_t* const* planes, std::size_t frames, Codes codes);
  void closePoint();

  AVSampleFormat _format;
  int _channels;
  int _filled = 0;  // frames in the current point
  std::array<std::int16_t, kMaximumChannels> _least{};
  std::array<std::int16_t, kMaximumChannels> _greatest{};
  std::string _bytes;
  std::uint64_t _count = 0;
};

}  // namespace quilt::platform::ffmpeg
