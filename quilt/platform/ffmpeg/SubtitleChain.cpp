// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cstring>
#include <utility>
#include <vector>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/StreamChain.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr AVRational kThousandths{1, 1000};
constexpr std::int64_t kUsualDuration = 3000;  // thousandths of a second, where a cue does not say

struct Cue {
  AVSubtitle value{};
  Cue() = default;
  Cue(const Cue&) = delete;
  Cue& operator=(const Cue&) = delete;
  ~Cue() { avsubtitle_free(&value); }
};

// Cues that do not decode or come out of order are left out: no movie fails for its subtitles.
class SubtitleChain final : public StreamChain {
 public:
  SubtitleChain(const AVStream& source, CodecContext decoder, CodecContext encoder, Track track)
      : _source(source),
        _decoder(std::move(decoder)),
        _encoder(std::move(encoder)),
        _track(std::move(track)),
        _text(_encoder ? kMaximumTagBytes : 0) {}

  Result<void> take(AVPacket& packet) override {
    const std::int64_t stamp = packet.pts != AV_NOPTS_VALUE ? packet.pts : packet.dts;
    if (stamp == AV_NOPTS_VALUE || (packet.flags & AV_PKT_FLAG_CORRUPT) != 0) return {};
    const std::int64_t start = av_rescale_q(stamp, _source.time_base, kThousandths);
    if (start <= _last) return {};
    const std::int64_t duration = av_rescale_q(packet.duration, _source.time_base, kThousandths);
    if (!_encoder) {
      packet.duration = duration;
    } else if (!convert(packet, start, duration)) {
      return {};
    }
    packet.pts = packet.dts = _last = start;
    packet.flags |= AV_PKT_FLAG_KEY;
    return _track.write(packet, kThousandths);
  }
  Result<void> finish() override { return {}; }
  [[nodiscard]] bool hasDelivered() const override { return true; }

 private:
  // Replaces the packet's content by timed text; false when there is none.
  bool convert(AVPacket& packet, std::int64_t start, std::int64_t duration) {
    Cue cue;
    int hasCue = 0;
    if (avcodec_decode_subtitle2(_decoder.get(), &cue.value, &hasCue, &packet) < 0 || hasCue == 0) return false;
    if (cue.value.num_rects == 0) return false;
    if (duration <= 0) duration = std::int64_t{cue.value.end_display_time} - cue.value.start_display_time;
    if (duration <= 0) duration = kUsualDuration;
    cue.value.pts = av_rescale_q(start, kThousandths, {1, AV_TIME_BASE});
    cue.value.start_display_time = 0;
    cue.value.end_display_time = static_cast<std::uint32_t>(duration);
    const int size = avcodec_encode_subtitle(_encoder.get(), _text.data(), static_cast<int>(_text.size()), &cue.value);
    av_packet_unref(&packet);
    if (size <= 0 || av_new_packet(&packet, size) < 0) return false;
    std::memcpy(packet.data, _text.data(), static_cast<std::size_t>(size));
    packet.duration = duration;
    return true;
  }

  const AVStream& _source;
  CodecContext _decoder;  // null, as is the encoder, where the text is copied
  CodecContext _encoder;
  Track _track;
  std::vector<std::uint8_t> _text;
  std::int64_t _last = -1;
};

Result<CodecContext> openEncoder(const AVCodecContext& decoder, const std::filesystem::path& file) {
  const AVCodec* codec = avcodec_find_encoder(AV_CODEC_ID_MOV_TEXT);
  if (codec == nullptr) return failure(AVERROR_ENCODER_NOT_FOUND, file);
  CodecContext encoder(avcodec_alloc_context3(codec));
  if (!encoder) return failure(AVERROR(ENOMEM), file);
  encoder->time_base = kThousandths;
  if (decoder.subtitle_header != nullptr) {  // the styles that cues refer to
    const auto size = static_cast<std::size_t>(decoder.subtitle_header_size);
    encoder->subtitle_header = static_cast<std::uint8_t*>(av_mallocz(size + 1));
    if (encoder->subtitle_header == nullptr) return failure(AVERROR(ENOMEM), file);
    std::memcpy(encoder->subtitle_header, decoder.subtitle_header, size);
    encoder->subtitle_header_size = decoder.subtitle_header_size;
  }
  if (const int code = avcodec_open2(encoder.get(), codec, nullptr); code < 0) return conversionFailure(code, file);
  return encoder;
}

}  // namespace

bool isTextSubtitle(const AVStream& stream) {
  switch (static_cast<int>(stream.codecpar->codec_id)) {  // an open list: the library adds to it
    case AV_CODEC_ID_MOV_TEXT:
    case AV_CODEC_ID_SUBRIP:
    case AV_CODEC_ID_TEXT:
    case AV_CODEC_ID_ASS:
    case AV_CODEC_ID_SSA:
    case AV_CODEC_ID_WEBVTT:
      return true;
    default:
      return false;
  }
}

Result<std::unique_ptr<StreamChain>> makeSubtitleChain(const Input& input, const AVStream& source,
                                                       const Outputs& outputs) {
  if (source.codecpar->codec_id == AV_CODEC_ID_MOV_TEXT) {
    Result<Track> track = Track::add(outputs, source, *source.codecpar, kThousandths);
    if (!track) return track.error();
    return std::unique_ptr<StreamChain>(
        std::make_unique<SubtitleChain>(source, CodecContext(), CodecContext(), *std::move(track)));
  }
  Result<CodecContext> decoder = openDecoder(source, 1, input.path());
  if (!decoder) return decoder.error();
  Result<CodecContext> encoder = openEncoder(**decoder, input.path());
  if (!encoder) return encoder.error();
  Result<Track> track = Track::add(outputs, source, **encoder);
  if (!track) return track.error();
  return std::unique_ptr<StreamChain>(
      std::make_unique<SubtitleChain>(source, *std::move(decoder), *std::move(encoder), *std::move(track)));
}

}  // namespace quilt::platform::ffmpeg
