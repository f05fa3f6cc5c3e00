// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SourceTimeline.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr double kLeap = 10;                  // seconds; less may be a pause
constexpr double kLeapBack = 1;               // seconds; packets of a stream are in order
constexpr double kLongestPicture = 5 * 3600;  // seconds; the format cannot count many more of the finest ticks

}  // namespace

SourceTimeline::SourceTimeline(double origin, bool leaps, double end)
    : _shift(-origin), _shiftBefore(-origin), _leaps(leaps), _end(end) {}

bool SourceTimeline::isLeap(double time, double expected) const {
  if (_leaps) return time > expected + kLeap || time < expected - kLeapBack;
  const double latest = _end > 0 ? _end + kLeap : kMaximumDuration;
  return time > latest || time < expected - latest;
}

double SourceTimeline::shiftFor(int stream, double time) {
  const auto found = _streams.find(stream);
  if (found == _streams.end()) return _shift;
  const double expected = found->second;
  // Streams do not leap at the same packet: some from before may follow.
  const auto distance = [&](double shift) { return std::abs(time + shift - expected); };
  const double nearer = distance(_shiftBefore) < distance(_shift) ? _shiftBefore : _shift;
  if (!isLeap(time + nearer, expected)) return nearer;
  // What follows continues where the stream that reaches farthest ended.
  double end = expected;
  for (const auto& [index, other] : _streams) {
    if (std::abs(other - expected) < kLeap) end = std::max(end, other);
  }
  _shiftBefore = std::exchange(_shift, end - time);
  return _shift;
}

void SourceTimeline::place(AVPacket& packet, AVRational base) {
  const std::int64_t stamp = packet.dts != AV_NOPTS_VALUE ? packet.dts : packet.pts;
  double shift = _shift;
  if (stamp != AV_NOPTS_VALUE) {
    const double time = seconds(stamp, base);
    shift = shiftFor(packet.stream_index, time);
    _streams[packet.stream_index] = time + shift + std::clamp(seconds(packet.duration, base), 0.0, kLeap);
  }
  const auto ticks = std::llround(shift * base.den / base.num);
  if (packet.pts != AV_NOPTS_VALUE) packet.pts += ticks;
  if (packet.dts != AV_NOPTS_VALUE) packet.dts += ticks;
}

FrameClock::FrameClock(AVRational base, AVRational usualRate, Start start) : _start(start) {
  const double second = static_cast<double>(base.den) / base.num;
  constexpr double usual = 25;  // pictures a second
  const double rate = usualRate.num > 0 && usualRate.den > 0 ? std::clamp(av_q2d(usualRate), 1.0, 60.0) : usual;
  _usual = std::max<std::int64_t>(1, std::llround(second / rate));
  _shortest = second / kMostFramesPerSecond;
}

std::int64_t FrameClock::place(std::int64_t time) {
  if (!_hasBegun) {
    _hasBegun = true;
    const std::int64_t late = time == AV_NOPTS_VALUE ? 0 : std::max<std::int64_t>(time, 0);
    if (_start == Start::Moved) _shift = -late;
    _last = late + _shift;
    _due = static_cast<double>(_last) + _shortest;
    return 0;
  }
  if (time != AV_NOPTS_VALUE) time += _shift;
  if (time == AV_NOPTS_VALUE) {
    time = _last + _usual;
  } else if (time <= _last) {
    // Soon after the one before, so that those which follow can have their own times again.
    constexpr std::int64_t mostLate = 10;  // pictures; more means that there are too many of them
    if (_last - time > mostLate * _usual) return AV_NOPTS_VALUE;
    time = _last + std::max<std::int64_t>(1, _usual / 2);
  }
  if (static_cast<double>(time - _last) > kLongestPicture * kMostFramesPerSecond * _shortest) {
    _shift += _last + _usual - time;
    time = _last + _usual;
  }
  // Times may be rounded to thousandths of a second: a little early is in time, but lets nobody else come earlier.
  const double slack = _shortest / 4;
  if (static_cast<double>(time) + slack < _due) return AV_NOPTS_VALUE;
  _due = std::max(_due, static_cast<double>(time)) + _shortest;
  _last = time;
  return time;
}

}  // namespace quilt::platform::ffmpeg
