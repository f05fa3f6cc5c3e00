// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <optional>
#include <thread>
#include <utility>
#include <vector>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/FilterChain.h"
#include "quilt/platform/ffmpeg/PictureFilters.h"
#include "quilt/platform/ffmpeg/SourceTimeline.h"
#include "quilt/platform/ffmpeg/StreamChain.h"

namespace quilt::platform::ffmpeg {

namespace {

constexpr const char* kPreset = "medium";
constexpr const char* kQuality = "22";  // constant rate factor

// As many as there are cores, but not so many that the pictures which each holds fill the memory.
int decoderThreads(const AVCodecParameters& parameters) {
  constexpr std::int64_t mostBytes = 256 << 20;
  const std::int64_t bytes = std::max<std::int64_t>(1, std::int64_t{parameters.width} * parameters.height * 3);
  const auto cores = static_cast<std::int64_t>(std::clamp(std::thread::hardware_concurrency(), 1U, 16U));
  return static_cast<int>(std::clamp<std::int64_t>(mostBytes / bytes, 1, cores));
}

Result<CodecContext> openEncoder(const VideoPlan& plan, AVRational rate, const std::filesystem::path& file) {
  const AVCodec* codec = avcodec_find_encoder_by_name("libx264");
  if (codec == nullptr) return failure(AVERROR_ENCODER_NOT_FOUND, file);
  CodecContext encoder(avcodec_alloc_context3(codec));
  if (!encoder) return failure(AVERROR(ENOMEM), file);
  encoder->width = plan.size.width;
  encoder->height = plan.size.height;
  encoder->pix_fmt = AV_PIX_FMT_YUV420P;
  encoder->time_base = plan.timeBase;
  encoder->framerate = rate;
  encoder->sample_aspect_ratio = {1, 1};
  encoder->color_range = AVCOL_RANGE_MPEG;
  encoder->colorspace = AVCOL_SPC_BT709;
  encoder->color_primaries = AVCOL_PRI_BT709;
  encoder->color_trc = AVCOL_TRC_BT709;
  encoder->chroma_sample_location = AVCHROMA_LOC_LEFT;
  encoder->flags |= AV_CODEC_FLAG_GLOBAL_HEADER;
  encoder->thread_count = 0;  // the encoder knows best
  Options options;
  options.set("preset", kPreset);
  options.set("crf", kQuality);
  options.set("profile", "high");
  if (const int code = avcodec_open2(encoder.get(), codec, options.address()); code < 0)
    return conversionFailure(code, file);
  return encoder;
}

// Makes the pictures of one file out of decoded ones.
class PictureEncoder {
 public:
  PictureEncoder(const Input& input, const AVStream& source, VideoPlan plan, Fields fields, CodecContext encoder,
                 Track track)
      : _file(input.path()),
        _plan(std::move(plan)),
        _orientation(orientation(source)),
        _fields(fields),
        _encoder(std::move(encoder)),
        _track(std::move(track)) {}

  /// A picture to be shown for `duration`, or for `usualDuration` when it is not the last: ticks of the plan's time
  /// base, as is the picture's time. Takes its content.
  Result<void> take(AVFrame& picture, std::int64_t duration, std::int64_t usualDuration) {
    _lastDuration = duration;
    _usualDuration = usualDuration;
    if (_filters && !_filters->fits(picture)) {
      if (Result<void> closed = closeFilters(); !closed) return closed;
    }
    if (!_filters) {
      if (!hasFiltersFor(picture.color_trc, picture.color_primaries)) return failure(AVERROR_FILTER_NOT_FOUND, _file);
      const std::string row = pictureFilters(picture, _plan.size, _orientation, _fields);
      Result<FilterChain> made = FilterChain::create(picture, _plan.timeBase, row, _file);
      if (!made) return made.error();
      _filters.emplace(*std::move(made));
    }
    if (const int code = _filters->push(&picture); code < 0) return conversionFailure(code, _file);
    return pullPictures();
  }

  Result<void> finish() {
    if (Result<void> filtered = closeFilters(); !filtered) return filtered;
    return encode(nullptr);
  }

  [[nodiscard]] bool hasDelivered() const { return _hasDelivered; }

 private:
  Result<void> closeFilters() {
    if (!_filters) return {};
    _filters->push(nullptr);
    Result<void> pulled = pullPictures();
    _filters.reset();
    return pulled;
  }

  Result<void> pullPictures() {
    while (_filters->pull(*_filtered) >= 0) {
      _filtered->pts = av_rescale_q(_filtered->pts, _filters->timeBase(), _encoder->time_base);
      _filtered->pict_type = startsChapter(_filtered->pts) ? AV_PICTURE_TYPE_I : AV_PICTURE_TYPE_NONE;
      _filtered->sample_aspect_ratio = {1, 1};
      _filtered->interlaced_frame = 0;
      // What the picture went through says nothing of it any more.
      while (_filtered->nb_side_data > 0) av_frame_remove_side_data(_filtered.get(), _filtered->side_data[0]->type);
      Result<void> encoded = encode(_filtered.get());
      av_frame_unref(_filtered.get());
      if (!encoded) return encoded;
    }
    return {};
  }

  bool startsChapter(std::int64_t time) {
    const double soon = seconds(time + _usualDuration / 2, _plan.timeBase);
    bool starts = false;
    for (; _nextChapter < _plan.chapterStarts.size() && _plan.chapterStarts[_nextChapter] <= soon; ++_nextChapter) {
      starts = true;
    }
    return starts;
  }

  Result<void> encode(const AVFrame* picture) {
    if (picture != nullptr) {
      if (picture->pts <= _lastTime) return {};
      _lastTime = picture->pts;
    }
    if (const int code = avcodec_send_frame(_encoder.get(), picture); code < 0 && code != AVERROR_EOF) {
      return conversionFailure(code, _file);
    }
    int code = 0;
    while ((code = avcodec_receive_packet(_encoder.get(), _packet.get())) >= 0) {
      // Only the last picture's counts; the others last until the next one.
      if (_packet->pts == _lastTime) _packet->duration = _lastDuration;
      _hasDelivered = true;
      if (Result<void> written = _track.write(*_packet, _encoder->time_base); !written) return written;
    }
    return code == AVERROR(EAGAIN) || code == AVERROR_EOF ? Result<void>() : conversionFailure(code, _file);
  }

  std::filesystem::path _file;
  VideoPlan _plan;
  Orientation _orientation;
  Fields _fields;
  CodecContext _encoder;
  Track _track;
  std::optional<FilterChain> _filters;
  Frame _filtered{av_frame_alloc()};
  Packet _packet{av_packet_alloc()};
  std::int64_t _lastTime = -1;
  std::int64_t _lastDuration = 0;
  std::int64_t _usualDuration = 0;
  std::size_t _nextChapter = 0;
  bool _hasDelivered = false;
};

class VideoEncodeChain final : public StreamChain {
 public:
  VideoEncodeChain(AVStream& source, AVRational timeBase, const FrameClock& clock, CodecContext decoder,
                   std::vector<PictureEncoder> encoders)
      : _source(source),
        _timeBase(timeBase),
        _clock(clock),
        _decoder(std::move(decoder)),
        _encoders(std::move(encoders)) {}

  Result<void> take(AVPacket& packet) override {
    avcodec_send_packet(_decoder.get(), &packet);  // a damaged packet is one picture less
    return receivePictures();
  }

  Result<void> finish() override {
    avcodec_send_packet(_decoder.get(), nullptr);
    if (Result<void> received = receivePictures(); !received) return received;
    for (PictureEncoder& encoder : _encoders) {
      if (Result<void> finished = encoder.finish(); !finished) return finished;
    }
    return {};
  }

  [[nodiscard]] bool hasDelivered() const override {
    return std::ranges::all_of(_encoders, &PictureEncoder::hasDelivered);
  }

 private:
  Result<void> receivePictures() {
    while (avcodec_receive_frame(_decoder.get(), _decoded.get()) >= 0) {
      Result<void> encoded = encode(*_decoded);
      av_frame_unref(_decoded.get());
      if (!encoded) return encoded;
    }
    return {};
  }

  Result<void> encode(AVFrame& picture) {
    const std::int64_t shown =
        picture.best_effort_timestamp != AV_NOPTS_VALUE ? picture.best_effort_timestamp : picture.pts;
    const std::int64_t time =
        _clock.place(shown == AV_NOPTS_VALUE ? shown : av_rescale_q(shown, _source.time_base, _timeBase));
    if (time == AV_NOPTS_VALUE) return {};
    picture.pts = time;
    const std::int64_t duration = picture.pkt_duration > 0
                                      ? av_rescale_q(picture.pkt_duration, _source.time_base, _timeBase)
                                      : _clock.usualDuration();
    for (PictureEncoder& encoder : _encoders) {
      if (&encoder == &_encoders.back()) return encoder.take(picture, duration, _clock.usualDuration());
      const Frame same(av_frame_clone(&picture));
      if (!same) return failure(AVERROR(ENOMEM), {});
      if (Result<void> taken = encoder.take(*same, duration, _clock.usualDuration()); !taken) return taken;
    }
    return {};
  }

  AVStream& _source;
  AVRational _timeBase;
  FrameClock _clock;
  CodecContext _decoder;
  std::vector<PictureEncoder> _encoders;
  Frame _decoded{av_frame_alloc()};
};

}  // namespace

Result<std::unique_ptr<StreamChain>> makeVideoEncodeChain(const Input& input, AVStream& source,
                                                          const std::vector<PictureTarget>& targets, Fields fields,
                                                          Company company) {
  const std::filesystem::path& file = input.path();
  // Better to be told now than at the first picture.
  if (!hasFiltersFor(source.codecpar->color_trc, source.codecpar->color_primaries)) {
    return failure(AVERROR_FILTER_NOT_FOUND, file);
  }
  Result<CodecContext> decoder = openDecoder(source, decoderThreads(*source.codecpar), file);
  if (!decoder) return decoder.error();
  const AVRational rate = videoTraits(input, source).frameRate;
  std::vector<PictureEncoder> encoders;
  for (const auto& [plan, output] : targets) {
    Result<CodecContext> encoder = openEncoder(plan, rate, file);
    if (!encoder) return encoder.error();
    Result<Track> track = Track::add({output}, source, **encoder);
    if (!track) return track.error();
    encoders.emplace_back(input, source, plan, fields, *std::move(encoder), *std::move(track));
  }
  const AVRational timeBase = targets.front().plan.timeBase;
  const FrameClock clock(timeBase, rate,
                         company == Company::Alone ? FrameClock::Start::Moved : FrameClock::Start::Lengthened);
  return std::unique_ptr<StreamChain>(
      std::make_unique<VideoEncodeChain>(source, timeBase, clock, *std::move(decoder), std::move(encoders)));
}

}  // namespace quilt::platform::ffmpeg
