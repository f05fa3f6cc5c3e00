// SPDX-License-Identifier: Apache-2.0
#include <algorithm>

#include "quilt/platform/ffmpeg/StreamChain.h"

namespace quilt::platform::ffmpeg {

namespace {

class CopyChain final : public StreamChain {
 public:
  CopyChain(const AVStream& source, MovieOutput& output, const AVStream& stream)
      : _timeBase(source.time_base), _output(output), _stream(stream) {}

  Result<void> take(AVPacket& packet) override {
    if (packet.dts == AV_NOPTS_VALUE) packet.dts = packet.pts;
    if (packet.dts == AV_NOPTS_VALUE)
      packet.dts = _hasDelivered ? _last + std::max<std::int64_t>(1, packet.duration) : 0;
    if (_hasDelivered) packet.dts = std::max(packet.dts, _last + 1);
    packet.pts = packet.pts == AV_NOPTS_VALUE ? packet.dts : std::max(packet.pts, packet.dts);
    _last = packet.dts;
    _hasDelivered = true;
    return _output.write(packet, _stream, _timeBase);
  }
  Result<void> finish() override { return {}; }
  [[nodiscard]] bool hasDelivered() const override { return _hasDelivered; }

 private:
  AVRational _timeBase;
  MovieOutput& _output;
  const AVStream& _stream;
  bool _hasDelivered = false;
  std::int64_t _last = 0;
};

}  // namespace

Result<std::unique_ptr<StreamChain>> makeCopyChain(const AVStream& source, MovieOutput& output) {
  Result<AVStream*> stream = output.addStream(source, *source.codecpar, source.time_base);
  if (!stream) return stream.error();
  return std::unique_ptr<StreamChain>(std::make_unique<CopyChain>(source, output, **stream));
}

}  // namespace quilt::platform::ffmpeg
