// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SoundFrames.h"

#include <array>
#include <cstdint>

namespace quilt::platform::ffmpeg {

namespace {

// Bytes of a frame with its first, in which the mode is (RFC 4867, sections 5.3 and 4.3); 0 where there is no such
// mode.
constexpr std::array<std::uint8_t, 16> kNarrowband{13, 14, 16, 18, 20, 21, 27, 32, 6, 0, 0, 0, 0, 0, 1, 1};
constexpr std::array<std::uint8_t, 16> kWideband{18, 24, 33, 37, 41, 47, 51, 59, 61, 6, 0, 0, 0, 0, 1, 1};
constexpr AVRational kFrameDuration{1, 50};

// 0 where a packet is one frame.
int frameBytes(AVCodecID codec, std::uint8_t first) {
  const std::size_t mode = first >> 3U & 0xfU;
  if (codec == AV_CODEC_ID_AMR_NB) return kNarrowband[mode];
  if (codec == AV_CODEC_ID_AMR_WB) return kWideband[mode];
  return 0;
}

}  // namespace

SoundFrames::SoundFrames(const AVStream& stream, const AVPacket& packet) : _stream(stream), _packet(packet) {}

const AVPacket* SoundFrames::next() {
  const int left = _packet.size - _offset;
  if (left <= 0 && _count > 0) return nullptr;
  const int bytes = left > 0 ? frameBytes(_stream.codecpar->codec_id, _packet.data[_offset]) : 0;
  if (_count == 0 && (bytes == 0 || bytes >= left)) {
    _offset = _packet.size;
    ++_count;
    return &_packet;
  }
  if (bytes == 0 || bytes > left) return nullptr;  // what follows is no frame
  _piece.reset(av_packet_clone(&_packet));
  if (!_piece) return nullptr;
  _piece->data += _offset;
  _piece->size = bytes;
  const std::int64_t delay = av_rescale_q(_count, kFrameDuration, _stream.time_base);
  if (_piece->pts != AV_NOPTS_VALUE) _piece->pts += delay;
  if (_piece->dts != AV_NOPTS_VALUE) _piece->dts += delay;
  _piece->duration = av_rescale_q(1, kFrameDuration, _stream.time_base);
  _offset += bytes;
  ++_count;
  return _piece.get();
}

}  // namespace quilt::platform::ffmpeg
