// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Track.h"

#include "quilt/platform/ffmpeg/Failure.h"

namespace quilt::platform::ffmpeg {

template <class... Description>
Result<Track> Track::addTo(const Outputs& outputs, const Description&... description) {
  Track track;
  for (MovieOutput* output : outputs) {
    const Result<AVStream*> stream = output->addStream(description...);
    if (!stream) return stream.error();
    track._places.push_back({output, *stream});
  }
  return track;
}

Result<Track> Track::add(const Outputs& outputs, const AVStream& source, const AVCodecParameters& parameters,
                         AVRational timeBase) {
  return addTo(outputs, source, parameters, timeBase);
}

Result<Track> Track::add(const Outputs& outputs, const AVStream& source, const AVCodecContext& encoder) {
  return addTo(outputs, source, encoder);
}

Result<void> Track::write(AVPacket& packet, AVRational timeBase) {
  for (std::size_t i = 0; i + 1 < _places.size(); ++i) {
    const Packet same(av_packet_clone(&packet));
    if (!same) return failure(AVERROR(ENOMEM), {});
    if (Result<void> written = _places[i].output->write(*same, *_places[i].stream, timeBase); !written) return written;
  }
  return _places.back().output->write(packet, *_places.back().stream, timeBase);
}

}  // namespace quilt::platform::ffmpeg
