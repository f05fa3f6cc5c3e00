// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SamplePoints.h"

#include <algorithm>
#include <cmath>
#include <cstring>

namespace quilt::platform::ffmpeg {

namespace {

template <class Sample>
struct Range {
  Sample least;
  Sample greatest;
};

// What the processor compares at once.
template <class Sample>
struct Vector {
  static constexpr std::size_t kLanes = 16 / sizeof(Sample);
  typedef Sample Type __attribute__((vector_size(16)));
  Type lanes;

  static Vector load(const Sample* samples) {
    Vector vector;
    std::memcpy(&vector.lanes, samples, sizeof vector.lanes);
    return vector;
  }
};

// The ranges of each channel in `frames` interleaved frames, at least one. Every lane holds samples of one channel, as
// the number of channels divides the number of lanes.
template <class Sample, std::size_t Channels>
std::array<Range<Sample>, Channels> rangesOf(const Sample* samples, std::size_t frames) {
  using Lanes = Vector<Sample>;
  constexpr std::size_t step = 2 * Lanes::kLanes;  // two at a time, as one comparison need not wait for the other
  std::array<Range<Sample>, Channels> result;
  for (std::size_t channel = 0; channel < Channels; ++channel) result[channel] = {samples[channel], samples[channel]};
  const auto note = [&](std::size_t channel, Sample least, Sample greatest) {
    Range<Sample>& range = result[channel];
    range.least = least < range.least ? least : range.least;
    range.greatest = greatest > range.greatest ? greatest : range.greatest;
  };
  const std::size_t count = frames * Channels;
  std::size_t i = 0;
  if (count >= step) {
    Lanes least0 = Lanes::load(samples);
    Lanes least1 = Lanes::load(samples + Lanes::kLanes);
    Lanes greatest0 = least0;
    Lanes greatest1 = least1;
    for (i = step; i + step <= count; i += step) {
      const Lanes next0 = Lanes::load(samples + i);
      const Lanes next1 = Lanes::load(samples + i + Lanes::kLanes);
      least0.lanes = next0.lanes < least0.lanes ? next0.lanes : least0.lanes;
      least1.lanes = next1.lanes < least1.lanes ? next1.lanes : least1.lanes;
      greatest0.lanes = next0.lanes > greatest0.lanes ? next0.lanes : greatest0.lanes;
      greatest1.lanes = next1.lanes > greatest1.lanes ? next1.lanes : greatest1.lanes;
    }
    for (std::size_t lane = 0; lane < Lanes::kLanes; ++lane) {
      note(lane % Channels, least0.lanes[lane], greatest0.lanes[lane]);
      note(lane % Channels, least1.lanes[lane], greatest1.lanes[lane]);
    }
  }
  for (; i < count; ++i) note(i % Channels, samples[i], samples[i]);
  return result;
}

std::int16_t codeOfReal(double sample) {
  if (std::isnan(sample)) return 0;
  return static_cast<std::int16_t>(std::lrint(std::clamp(sample * 32768, -32768.0, 32767.0)));
}

char byteOf(std::int16_t code) { return static_cast<char>(code / 256); }

}  // namespace

bool SamplePoints::isSupported(AVSampleFormat format) {
  switch (static_cast<int>(av_get_packed_sample_fmt(format))) {
    case AV_SAMPLE_FMT_U8:
    case AV_SAMPLE_FMT_S16:
    case AV_SAMPLE_FMT_S32:
    case AV_SAMPLE_FMT_FLT:
    case AV_SAMPLE_FMT_DBL:
      return true;
    default:
      return false;
  }
}

template <class Sample, class Codes>
void SamplePoints::addSamples(const std::uint8_t* const* planes, std::size_t frames, Codes codes) {
  const bool isInterleaved = _channels == 2 && av_sample_fmt_is_planar(_format) == 0;
  const auto note = [&](std::size_t channel, const Range<Sample>& range) {
    const std::int16_t least = codes(range.least);
    const std::int16_t greatest = codes(range.greatest);
    _least[channel] = _filled == 0 ? least : std::min(_least[channel], least);
    _greatest[channel] = _filled == 0 ? greatest : std::max(_greatest[channel], greatest);
  };
  const auto samples = [&](std::size_t plane) { return reinterpret_cast<const Sample*>(planes[plane]); };
  for (std::size_t done = 0; done < frames;) {
    const std::size_t count = std::min(frames - done, static_cast<std::size_t>(kFramesPerPoint - _filled));
    if (isInterleaved) {
      const auto [left, right] = rangesOf<Sample, 2>(samples(0) + done * 2, count);
      note(0, left);
      note(1, right);
    } else {
      for (std::size_t channel = 0; channel < static_cast<std::size_t>(_channels); ++channel) {
        note(channel, rangesOf<Sample, 1>(samples(channel) + done, count)[0]);
      }
    }
    done += count;
    _filled += static_cast<int>(count);
    if (_filled == kFramesPerPoint) closePoint();
  }
}

void SamplePoints::add(const std::uint8_t* const* planes, std::size_t frames) {
  switch (static_cast<int>(av_get_packed_sample_fmt(_format))) {
    case AV_SAMPLE_FMT_U8:
      return addSamples<std::uint8_t>(
          planes, frames, [](std::uint8_t sample) { return static_cast<std::int16_t>((sample - 128) * 256); });
    case AV_SAMPLE_FMT_S16:
      return addSamples<std::int16_t>(planes, frames, [](std::int16_t sample) { return sample; });
    case AV_SAMPLE_FMT_S32:
      return addSamples<std::int32_t>(planes, frames,
                                      [](std::int32_t sample) { return static_cast<std::int16_t>(sample >> 16); });
    case AV_SAMPLE_FMT_FLT:
      return addSamples<float>(planes, frames, [](float sample) { return codeOfReal(sample); });
    case AV_SAMPLE_FMT_DBL:
      return addSamples<double>(planes, frames, [](double sample) { return codeOfReal(sample); });
    default:
      return;  // isSupported says so beforehand
  }
}

void SamplePoints::closePoint() {
  for (std::size_t channel = 0; channel < static_cast<std::size_t>(_channels); ++channel) {
    _bytes += byteOf(_least[channel]);
    _bytes += byteOf(_greatest[channel]);
  }
  ++_count;
  _filled = 0;
}

void SamplePoints::finish() {
  if (_filled > 0) closePoint();
}

}  // namespace quilt::platform::ffmpeg
