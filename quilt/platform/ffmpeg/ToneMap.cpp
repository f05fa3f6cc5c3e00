// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/ToneMap.h"

extern "C" {
#include <libavutil/mastering_display_metadata.h>
}

#include <algorithm>
#include <cmath>

#include "quilt/platform/ffmpeg/Streams.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr double kUsualPeak = 1000;  // cd/m², when the stream does not say

// Light in cd/m² of a PQ code value 0…1 (SMPTE ST 2084).
double lightOfPq(double code) {
  constexpr double m1 = 2610.0 / 16384;
  constexpr double m2 = 2523.0 / 4096 * 128;
  constexpr double c1 = 3424.0 / 4096;
  constexpr double c2 = 2413.0 / 4096 * 32;
  constexpr double c3 = 2392.0 / 4096 * 32;
  const double power = std::pow(code, 1 / m2);
  return 10'000 * std::pow(std::max(power - c1, 0.0) / (c2 - c3 * power), 1 / m1);
}

// Scene light 0…1 of an HLG code value 0…1 (ARIB STD-B67).
double lightOfHlg(double code) {
  constexpr double a = 0.17883277;
  constexpr double b = 0.28466892;
  constexpr double c = 0.55991073;
  return code <= 0.5 ? code * code / 3 : (std::exp((code - c) / a) + b) / 12;
}

double lightOfSrgb(double code) { return code <= 0.04045 ? code / 12.92 : std::pow((code + 0.055) / 1.055, 2.4); }

double srgbOfLight(double light) {
  return light <= 0.0031308 ? light * 12.92 : 1.055 * std::pow(light, 1 / 2.4) - 0.055;
}

}  // namespace

double ToneMap::peakOf(const AVFrame& frame) {
  if (frame.color_trc == AVCOL_TRC_ARIB_STD_B67) return kUsualPeak;
  const AVFrameSideData* data = av_frame_get_side_data(&frame, AV_FRAME_DATA_CONTENT_LIGHT_LEVEL);
  if (data == nullptr) return kUsualPeak;
  const auto* level = reinterpret_cast<const AVContentLightMetadata*>(data->data);
  return level->MaxCLL == 0 ? kUsualPeak : std::clamp<double>(level->MaxCLL, kReferenceWhite * 1.01, 10'000);
}

bool ToneMap::isNeeded(const AVFrame& frame) {
  return isHighDynamicRange(frame.color_trc) || frame.color_primaries == AVCOL_PRI_BT2020;
}

ToneMap::ToneMap(const AVFrame& frame)
    : _isHybridLogGamma(frame.color_trc == AVCOL_TRC_ARIB_STD_B67),
      _isHighRange(isHighDynamicRange(frame.color_trc)),
      _isWideGamut(frame.color_primaries == AVCOL_PRI_BT2020 || frame.color_primaries == AVCOL_PRI_UNSPECIFIED),
      _peak(static_cast<float>(peakOf(frame) / kReferenceWhite)) {
  for (std::size_t i = 0; i < kSteps; ++i) {
    const double code = static_cast<double>(i) / (kSteps - 1);
    double light = 0;
    if (_isHybridLogGamma) {
      light = lightOfHlg(code);
    } else if (_isHighRange) {
      light = lightOfPq(code) / kReferenceWhite;
    } else {
      light = lightOfSrgb(code);
    }
    _linear[i] = static_cast<float>(light);
    constexpr double systemGamma = 1.2;  // of a display of 1000 cd/m²
    _systemGain[i] = static_cast<float>(std::pow(std::max(code, 1e-4), systemGamma - 1) * _peak);
    _encoded[i] = static_cast<std::uint8_t>(std::lround(srgbOfLight(code) * 255));
  }
}

void ToneMap::apply(const std::uint16_t* source, std::uint8_t* destination, std::size_t count) const {
  constexpr float last = kSteps - 1;
  constexpr float knee = 0.5F;
  const float range = (_peak - knee) / (1 - knee);
  for (std::size_t i = 0; i < count; ++i, source += 4, destination += 4) {
    float red = _linear[source[0] >> 4U];
    float green = _linear[source[1] >> 4U];
    float blue = _linear[source[2] >> 4U];
    if (_isHybridLogGamma) {
      const float luminance = 0.2627F * red + 0.6780F * green + 0.0593F * blue;
      const float gain = _systemGain[static_cast<std::size_t>(std::clamp(luminance, 0.0F, 1.0F) * last)];
      red *= gain;
      green *= gain;
      blue *= gain;
    }
    if (_isWideGamut) {  // BT.2020 to BT.709 primaries
      const float r = 1.6605F * red - 0.5876F * green - 0.0728F * blue;
      const float g = -0.1246F * red + 1.1329F * green - 0.0083F * blue;
      const float b = -0.0182F * red - 0.1006F * green + 1.1187F * blue;
      red = r;
      green = g;
      blue = b;
    }
    if (_isHighRange) {
      const float brightest = std::max({red, green, blue});
      if (brightest > knee) {
        const float over = std::min((brightest - knee) / (1 - knee), range);
        const float rolled = knee + (1 - knee) * over * (1 + over / (range * range)) / (1 + over);
        const float scale = rolled / brightest;
        red *= scale;
        green *= scale;
        blue *= scale;
      }
    }
    const auto encode = [&](float light) {
      // Never negative, so that the cheap rounding, for every pixel, is right.
      // NOLINTNEXTLINE(bugprone-incorrect-roundings)
      return _encoded[static_cast<std::size_t>(std::clamp(light, 0.0F, 1.0F) * last + 0.5F)];
    };
    destination[0] = encode(red);
    destination[1] = encode(green);
    destination[2] = encode(blue);
    destination[3] = 255;
  }
}

}  // namespace quilt::platform::ffmpeg
