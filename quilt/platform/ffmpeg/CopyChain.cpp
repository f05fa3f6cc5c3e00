// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <limits>
#include <utility>
#include <vector>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/StreamChain.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr std::size_t kMostHeld = 32;  // packets; no codec reorders more

class CopyChain final : public StreamChain {
 public:
  CopyChain(const AVStream& source, Track track)
      : _source(source), _timeBase(source.time_base), _track(std::move(track)) {}

  Result<void> take(AVPacket& packet) override {
    if ((packet.flags & AV_PKT_FLAG_CORRUPT) != 0) return {};  // of a file that breaks off
    if (changesSetUp(packet)) {
      _isUnfit = true;
      return Error{ErrorKind::Unsupported, "The stream changes in the middle of the file.", {}};
    }
    if (packet.dts != AV_NOPTS_VALUE || _hasDelivered) {
      if (Result<void> released = release(packet.dts); !released) return released;
      return pass(packet);
    }
    Packet held(av_packet_clone(&packet));
    if (!held) return failure(AVERROR(ENOMEM), {});
    _held.push_back(std::move(held));
    return _held.size() < kMostHeld ? Result<void>() : release(AV_NOPTS_VALUE);
  }
  Result<void> finish() override { return release(AV_NOPTS_VALUE); }
  [[nodiscard]] bool hasDelivered() const override { return _hasDelivered; }
  [[nodiscard]] bool isUnfit() const override { return _isUnfit; }

 private:
  [[nodiscard]] bool changesSetUp(const AVPacket& packet) const {
    std::size_t size = 0;
    const std::uint8_t* bytes = av_packet_get_side_data(&packet, AV_PKT_DATA_NEW_EXTRADATA, &size);
    const AVCodecParameters& parameters = *_source.codecpar;
    return bytes != nullptr && (size != static_cast<std::size_t>(std::max(0, parameters.extradata_size)) ||
                                !std::equal(bytes, bytes + size, parameters.extradata));
  }

  // The first packets of some files say only when they are shown. They are decoded, one after the other, before the
  // first that says more; or as long before the first is shown as keeps all of them in time.
  Result<void> release(std::int64_t next) {
    const std::vector<Packet> held = std::exchange(_held, {});
    const auto count = static_cast<std::int64_t>(held.size());
    const std::int64_t step = held.empty() ? 0 : stepOf(*held[0]);
    std::int64_t first = next != AV_NOPTS_VALUE ? next - count * step : std::numeric_limits<std::int64_t>::max();
    for (std::int64_t i = 0; i < count; ++i) {
      const AVPacket& packet = *held[static_cast<std::size_t>(i)];
      if (packet.pts != AV_NOPTS_VALUE) first = std::min(first, packet.pts - i * step);
    }
    if (first == std::numeric_limits<std::int64_t>::max()) first = 0;
    for (std::int64_t i = 0; i < count; ++i) {
      AVPacket& packet = *held[static_cast<std::size_t>(i)];
      packet.dts = first + i * step;
      if (Result<void> passed = pass(packet); !passed) return passed;
    }
    return {};
  }

  [[nodiscard]] std::int64_t stepOf(const AVPacket& packet) const {
    if (packet.duration > 0) return packet.duration;
    const AVRational rate = _source.avg_frame_rate;
    return rate.num <= 0 ? 1 : std::max<std::int64_t>(1, av_rescale_q(1, av_inv_q(rate), _timeBase));
  }

  Result<void> pass(AVPacket& packet) {
    if (packet.dts == AV_NOPTS_VALUE) packet.dts = _last + stepOf(packet);
    if (_hasDelivered) packet.dts = std::max(packet.dts, _last + 1);
    packet.pts = packet.pts == AV_NOPTS_VALUE ? packet.dts : std::max(packet.pts, packet.dts);
    _last = packet.dts;
    _hasDelivered = true;
    const AVCodecParameters& parameters = *_source.codecpar;
    if (parameters.codec_type != AVMEDIA_TYPE_AUDIO || parameters.frame_size <= 0) {
      return _track.write(packet, _timeBase);
    }
    // Sound lasts a whole number of samples, whatever the container rounds its times to.
    const AVRational samples{1, parameters.sample_rate};
    packet.dts = packet.pts =
        av_rescale_delta(_timeBase, packet.dts, samples, parameters.frame_size, &_samples, samples);
    packet.duration = parameters.frame_size;
    return _track.write(packet, samples);
  }

  const AVStream& _source;
  AVRational _timeBase;
  Track _track;
  std::vector<Packet> _held;
  bool _hasDelivered = false;
  bool _isUnfit = false;
  std::int64_t _last = 0;
  std::int64_t _samples = AV_NOPTS_VALUE;  // of the library's rounding
};

}  // namespace

Result<std::unique_ptr<StreamChain>> makeCopyChain(const AVStream& source, const Outputs& outputs) {
  const AVCodecParameters& parameters = *source.codecpar;
  const bool isSound = parameters.codec_type == AVMEDIA_TYPE_AUDIO;
  Result<Track> track =
      Track::add(outputs, source, parameters, isSound ? AVRational{1, parameters.sample_rate} : source.time_base);
  if (!track) return track.error();
  return std::unique_ptr<StreamChain>(std::make_unique<CopyChain>(source, *std::move(track)));
}

}  // namespace quilt::platform::ffmpeg
