// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>
#include <optional>
#include <utility>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/FilterChain.h"
#include "quilt/platform/ffmpeg/SoundFilters.h"
#include "quilt/platform/ffmpeg/SoundFrames.h"
#include "quilt/platform/ffmpeg/StreamChain.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr double kLongestSilence = 3600;  // seconds that are filled in, in all; more counts as damage

void layOut(AVChannelLayout& layout, int channels) {
  av_channel_layout_uninit(&layout);
  av_channel_layout_default(&layout, channels);
}

Result<CodecContext> openEncoder(const AudioPlan& plan, const std::filesystem::path& file) {
  const AVCodec* codec = avcodec_find_encoder_by_name("aac");
  if (codec == nullptr) return failure(AVERROR_ENCODER_NOT_FOUND, file);
  CodecContext encoder(avcodec_alloc_context3(codec));
  if (!encoder) return failure(AVERROR(ENOMEM), file);
  encoder->sample_fmt = AV_SAMPLE_FMT_FLTP;
  encoder->sample_rate = plan.sampleRate;
  encoder->time_base = {1, plan.sampleRate};
  encoder->bit_rate = plan.bitRate;
  encoder->profile = FF_PROFILE_AAC_LOW;
  encoder->flags |= AV_CODEC_FLAG_GLOBAL_HEADER;
  layOut(encoder->ch_layout, plan.channels);
  if (const int code = avcodec_open2(encoder.get(), codec, nullptr); code < 0) return conversionFailure(code, file);
  return encoder;
}

// Two rows of filters: the first turns whatever is decoded into one kind of sound, and is made anew where the stream
// changes; the second, which stays, closes gaps and cuts the encoder's pieces.
class AudioEncodeChain final : public StreamChain {
 public:
  AudioEncodeChain(const Input& input, const AVStream& source, const AudioPlan& plan, CodecContext decoder,
                   CodecContext encoder, Track track)
      : _file(input.path()),
        _source(source),
        _plan(plan),
        _decoder(std::move(decoder)),
        _encoder(std::move(encoder)),
        _track(std::move(track)) {}

  Result<void> take(AVPacket& packet) override {
    SoundFrames frames(_source, packet);
    while (const AVPacket* frame = frames.next()) {
      avcodec_send_packet(_decoder.get(), frame);  // a damaged one is a moment of silence
      if (Result<void> received = receiveSound(); !received) return received;
    }
    return {};
  }

  Result<void> finish() override {
    avcodec_send_packet(_decoder.get(), nullptr);
    if (Result<void> received = receiveSound(); !received) return received;
    if (Result<void> closed = closeConversion(); !closed) return closed;
    if (_evening) {
      _evening->push(nullptr);
      if (Result<void> pulled = pullEvened(); !pulled) return pulled;
    }
    return encode(nullptr);
  }

  [[nodiscard]] bool hasDelivered() const override { return _hasDelivered; }

 private:
  Result<void> receiveSound() {
    while (avcodec_receive_frame(_decoder.get(), _decoded.get()) >= 0) {
      Result<void> converted = convert(*_decoded);
      av_frame_unref(_decoded.get());
      if (!converted) return converted;
    }
    return {};
  }

  Result<void> convert(AVFrame& sound) {
    if (sound.nb_samples <= 0 || sound.sample_rate <= 0 || sound.ch_layout.nb_channels <= 0) return {};
    if (sound.ch_layout.order == AV_CHANNEL_ORDER_UNSPEC) layOut(sound.ch_layout, sound.ch_layout.nb_channels);
    place(sound);
    if (_conversion && !_conversion->fits(sound)) {
      if (Result<void> closed = closeConversion(); !closed) return closed;
    }
    if (!_conversion) {
      const std::string row = soundFilters(sound, _plan.sampleRate, _plan.channels);
      Result<FilterChain> made = FilterChain::create(sound, _encoder->time_base, row, _file);
      if (!made) return made.error();
      _conversion.emplace(*std::move(made));
    }
    if (const int code = _conversion->push(&sound); code < 0) return conversionFailure(code, _file);
    return pullConverted();
  }

  // Gives the sound its time in samples that come out. What has none continues; what leaves more of a gap than can be
  // filled does so too.
  void place(AVFrame& sound) {
    const std::int64_t given = sound.best_effort_timestamp != AV_NOPTS_VALUE ? sound.best_effort_timestamp : sound.pts;
    std::int64_t time = _end;
    if (given != AV_NOPTS_VALUE) {
      time = av_rescale_q(given, _source.time_base, _encoder->time_base) + _shift;
      const std::int64_t gap = time - _end;
      const auto most = static_cast<std::int64_t>(kLongestSilence * _plan.sampleRate);
      if (gap > most - _filled || gap < -most) {
        _shift -= gap;
        time = _end;
      } else if (gap > 0) {
        _filled += gap;
      }
    }
    sound.pts = time;
    _end = std::max(_end, time + av_rescale(sound.nb_samples, _plan.sampleRate, sound.sample_rate));
  }

  Result<void> closeConversion() {
    if (!_conversion) return {};
    _conversion->push(nullptr);
    Result<void> pulled = pullConverted();
    _conversion.reset();
    return pulled;
  }

  Result<void> pullConverted() {
    while (_conversion->pull(*_filtered) >= 0) {
      _filtered->pts = av_rescale_q(_filtered->pts, _conversion->timeBase(), _encoder->time_base);
      Result<void> evened = fillGap(_filtered->pts);
      if (evened) evened = even(*_filtered);
      av_frame_unref(_filtered.get());
      if (!evened) return evened;
    }
    return {};
  }

  // Long gaps are filled here, piece by piece: the filter would hold all of the silence at once.
  Result<void> fillGap(std::int64_t until) {
    const std::int64_t piece = _plan.sampleRate / 4;
    const Frame silence(av_frame_alloc());
    while (until - _evenedUntil > 2 * piece) {
      silence->format = _encoder->sample_fmt;
      silence->sample_rate = _plan.sampleRate;
      silence->nb_samples = static_cast<int>(piece);
      layOut(silence->ch_layout, _plan.channels);
      if (const int code = av_frame_get_buffer(silence.get(), 0); code < 0) return conversionFailure(code, _file);
      av_samples_set_silence(silence->extended_data, 0, silence->nb_samples, _plan.channels, _encoder->sample_fmt);
      silence->pts = _evenedUntil;
      if (Result<void> evened = even(*silence); !evened) return evened;
      av_frame_unref(silence.get());
    }
    return {};
  }

  Result<void> even(AVFrame& sound) {
    _evenedUntil = sound.pts + sound.nb_samples;
    if (!_evening) {
      Result<FilterChain> made =
          FilterChain::create(sound, _encoder->time_base, "aresample=async=1:min_hard_comp=0.02:first_pts=0", _file);
      if (!made) return made.error();
      _evening.emplace(*std::move(made));
      _evening->setFrameSize(_encoder->frame_size);
    }
    if (const int code = _evening->push(&sound); code < 0) return conversionFailure(code, _file);
    return pullEvened();
  }

  Result<void> pullEvened() {
    while (_evening->pull(*_evened) >= 0) {
      _evened->pts = _next;  // no gaps are left
      _next += _evened->nb_samples;
      Result<void> encoded = encode(_evened.get());
      av_frame_unref(_evened.get());
      if (!encoded) return encoded;
    }
    return {};
  }

  Result<void> encode(const AVFrame* sound) {
    if (const int code = avcodec_send_frame(_encoder.get(), sound); code < 0 && code != AVERROR_EOF) {
      return conversionFailure(code, _file);
    }
    int code = 0;
    while ((code = avcodec_receive_packet(_encoder.get(), _packet.get())) >= 0) {
      _hasDelivered = true;
      if (Result<void> written = _track.write(*_packet, _encoder->time_base); !written) return written;
    }
    return code == AVERROR(EAGAIN) || code == AVERROR_EOF ? Result<void>() : conversionFailure(code, _file);
  }

  std::filesystem::path _file;
  const AVStream& _source;
  AudioPlan _plan;
  CodecContext _decoder;
  CodecContext _encoder;
  Track _track;
  std::optional<FilterChain> _conversion;
  std::optional<FilterChain> _evening;
  Frame _decoded{av_frame_alloc()};
  Frame _filtered{av_frame_alloc()};
  Frame _evened{av_frame_alloc()};
  Packet _packet{av_packet_alloc()};
  std::int64_t _shift = 0;   // samples, added to each time
  std::int64_t _end = 0;     // where the latest sound ends
  std::int64_t _filled = 0;  // samples of silence put in
  std::int64_t _evenedUntil = 0;
  std::int64_t _next = 0;  // the time of the encoder's next piece
  bool _hasDelivered = false;
};

}  // namespace

Result<std::unique_ptr<StreamChain>> makeAudioEncodeChain(const Input& input, const AVStream& source,
                                                          const AudioPlan& plan, const Outputs& outputs) {
  const std::filesystem::path& file = input.path();
  Result<CodecContext> decoder = openDecoder(source, 1, file);
  if (!decoder) return decoder.error();
  Result<CodecContext> encoder = openEncoder(plan, file);
  if (!encoder) return encoder.error();
  Result<Track> track = Track::add(outputs, source, **encoder);
  if (!track) return track.error();
  return std::unique_ptr<StreamChain>(std::make_unique<AudioEncodeChain>(input, source, plan, *std::move(decoder),
                                                                         *std::move(encoder), *std::move(track)));
}

}  // namespace quilt::platform::ffmpeg
