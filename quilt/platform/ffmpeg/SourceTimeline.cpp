// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SourceTimeline.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr double kLeap = 10;  // seconds; less may be a pause, or streams that are stored far apart

}  // namespace

SourceTimeline::SourceTimeline(double origin, bool leaps, double end)
    : _shift(-origin), _shiftBefore(-origin), _leaps(leaps), _end(end) {}

bool SourceTimeline::isLeap(double time, double expected) const {
  if (_leaps) return std::abs(time - expected) > kLeap;
  const double latest = _end > 0 ? _end + kLeap : kMaximumDuration;
  return time > latest || time < expected - latest;
}

double SourceTimeline::shiftFor(int stream, double time) {
  const auto found = _streams.find(stream);
  if (found == _streams.end()) return _shift;
  const double expected = found->second;
  if (!isLeap(time + _shift, expected)) return _shift;
  // Streams do not leap at the same packet: some from before may follow.
  if (!isLeap(time + _shiftBefore, expected)) return _shiftBefore;
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

FrameClock::FrameClock(AVRational base, AVRational usualRate) {
  const double second = static_cast<double>(base.den) / base.num;
  constexpr double usual = 25;  // pictures a second
  const double rate = usualRate.num > 0 && usualRate.den > 0 ? std::clamp(av_q2d(usualRate), 1.0, 60.0) : usual;
  _usual = std::max<std::int64_t>(1, std::llround(second / rate));
  _shortest = second / kMostFramesPerSecond;
}

std::int64_t FrameClock::place(std::int64_t time) {
  if (!_hasBegun) {
    _hasBegun = true;
    _due = static_cast<double>(std::max<std::int64_t>(time, 0)) + _shortest;
    _last = time == AV_NOPTS_VALUE ? 0 : std::max<std::int64_t>(time, 0);
    return 0;
  }
  if (time == AV_NOPTS_VALUE || time <= _last) {  // without a time of its own it comes after the one before
    constexpr std::int64_t mostDrift = 10;        // pictures; more means that there are too many of them
    const std::int64_t next = _last + _usual;
    if (time != AV_NOPTS_VALUE && next - time > mostDrift * _usual) return AV_NOPTS_VALUE;
    time = next;
  }
  // Times may be rounded to thousandths of a second: a little early is in time, but lets nobody else come earlier.
  const double slack = _shortest / 4;
  if (static_cast<double>(time) + slack < _due) return AV_NOPTS_VALUE;
  _due = std::max(_due + _shortest, static_cast<double>(time));
  _last = time;
  return time;
}

}  // namespace quilt::platform::ffmpeg
