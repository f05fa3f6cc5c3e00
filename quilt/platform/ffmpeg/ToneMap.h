// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "quilt/platform/ffmpeg/Handles.h"

namespace quilt::platform::ffmpeg {

/// Lines of the tallest picture whose colours are those of standard definition when nothing is said of them.
inline constexpr int kTallestStandardDefinition = 576;

/// Brings RGB with a wide range of brightness or colour into sRGB. Brightness up to half of reference white (203 cd/m²)
/// is kept, what is above is rolled off so that the peak becomes white; hues are kept. Colours outside are clipped.
class ToneMap {
 public:
  /// Whether a frame with these properties needs it: PQ or HLG, whatever its primaries, or BT.2020 primaries.
  static bool isNeeded(const AVFrame& frame);

  static constexpr double kReferenceWhite = 203;  ///< cd/m², ITU-R BT.2408
  /// The brightest light in the frame, in cd/m²: what the stream says, within reason, or what is usual.
  static double peakOf(const AVFrame& frame);

  explicit ToneMap(const AVFrame& frame);

  /// `count` pixels of 16-bit RGBA, full range, to 8-bit RGBA.
  void apply(const std::uint16_t* source, std::uint8_t* destination, std::size_t count) const;

 private:
  static constexpr std::size_t kSteps = 4096;

  std::array<float, kSteps> _linear{};          // code value → light; 1 is reference white
  std::array<float, kSteps> _systemGain{};      // HLG only: scene luminance → gain
  std::array<std::uint8_t, kSteps> _encoded{};  // light 0…1 → sRGB
  bool _isHybridLogGamma;
  bool _isHighRange;
  bool _isWideGamut;
  float _peak;
};

}  // namespace quilt::platform::ffmpeg
