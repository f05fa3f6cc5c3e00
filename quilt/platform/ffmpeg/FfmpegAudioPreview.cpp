// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FfmpegAudioPreview.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "quilt/platform/ffmpeg/Failure.h"
#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/SamplePoints.h"
#include "quilt/platform/ffmpeg/SoundFrames.h"
#include "quilt/platform/ffmpeg/Streams.h"
#include "quilt/platform/ffmpeg/TemporaryOutput.h"

namespace quilt::platform {

using namespace ffmpeg;

namespace {

constexpr std::size_t kFlushedBytes = std::size_t{64} << 10;

std::string littleEndian(std::uint64_t value) {
  std::string bytes;
  for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>(value >> shift & 0xffU);
  return bytes;
}

std::string header(int sampleRate, std::uint64_t points, int channels) {
  constexpr int version = 2;
  constexpr int eightBits = 1;
  return littleEndian(version) + littleEndian(eightBits) + littleEndian(static_cast<std::uint64_t>(sampleRate)) +
         littleEndian(SamplePoints::kFramesPerPoint) + littleEndian(points) +
         littleEndian(static_cast<std::uint64_t>(channels));
}

// Mixes more than two channels down to two: fronts, the centre and the surrounds at 0.707, scaled so that nothing
// clips; the low-frequency channel is left out. Channels whose places nobody knows count alike.
class Mixer {
 public:
  int open(const AVFrame& frame) {
    AVChannelLayout source{};
    if (const int code = av_channel_layout_copy(&source, &frame.ch_layout); code < 0) return code;
    const int channels = source.nb_channels;
    if (source.order == AV_CHANNEL_ORDER_UNSPEC) av_channel_layout_default(&source, channels);
    AVChannelLayout stereo = AV_CHANNEL_LAYOUT_STEREO;
    SwrContext* context = nullptr;
    int code = swr_alloc_set_opts2(&context, &stereo, AV_SAMPLE_FMT_S16P, frame.sample_rate, &source,
                                   static_cast<AVSampleFormat>(frame.format), frame.sample_rate, 0, nullptr);
    const bool arePlacesKnown = source.order != AV_CHANNEL_ORDER_UNSPEC;
    av_channel_layout_uninit(&source);
    _resampler.reset(context);
    if (code >= 0 && !arePlacesKnown) {
      const std::vector<double> shares(static_cast<std::size_t>(channels) * 2, 1.0 / channels);
      code = swr_set_matrix(context, shares.data(), channels);
    }
    return code < 0 ? code : swr_init(context);
  }

  // Fills both planes; answers how many frames, or an error code.
  int mix(const AVFrame& frame) {
    const auto frames = static_cast<std::size_t>(frame.nb_samples);
    std::array<std::uint8_t*, 2> outputs{};
    for (std::size_t i = 0; i < 2; ++i) {
      if (_channels[i].size() < frames) _channels[i].resize(frames);
      outputs[i] = reinterpret_cast<std::uint8_t*>(_channels[i].data());
      _planes[i] = outputs[i];
    }
    return swr_convert(_resampler.get(), outputs.data(), frame.nb_samples,
                       const_cast<const std::uint8_t**>(frame.extended_data), frame.nb_samples);
  }
  [[nodiscard]] const std::uint8_t* const* planes() const { return _planes.data(); }

 private:
  Resampler _resampler;
  std::array<std::vector<std::int16_t>, 2> _channels;
  std::array<const std::uint8_t*, 2> _planes{};
};

// Turns decoded frames into the file's points. The first frame decides about rate and channels.
class Extraction {
 public:
  Extraction(TemporaryOutput output, std::filesystem::path source)
      : _output(std::move(output)), _source(std::move(source)) {}

  Result<void> add(const AVFrame& frame) {
    if (frame.nb_samples <= 0 || frame.sample_rate <= 0) return {};
    const int channels = frame.ch_layout.nb_channels;
    if (!_points) {
      if (channels <= 0) return {};
      if (Result<void> started = start(frame); !started) return started;
    }
    // A stream that changes what it is in the middle is followed as long as it can be.
    if (channels != _sourceChannels || frame.format != _sourceFormat) return {};
    if (_isMixed) {
      const int frames = _mixer.mix(frame);
      if (frames < 0) return failure(frames, _source);
      _points->add(_mixer.planes(), static_cast<std::size_t>(frames));
    } else {
      _points->add(frame.extended_data, static_cast<std::size_t>(frame.nb_samples));
    }
    if (_points->count() > kMaximumSamplePoints) {
      return Error{ErrorKind::Damaged, "The sound lasts longer than can be shown.", _source};
    }
    return _points->bytes().size() >= kFlushedBytes ? flush() : Result<void>();
  }

  Result<void> finish() {
    if (_points) _points->finish();
    if (!_points || _points->count() == 0) {
      return Error{ErrorKind::Damaged, "No sound of the file can be decoded.", _source};
    }
    if (Result<void> flushed = flush(); !flushed) return flushed;
    const std::string final = header(_sampleRate, _points->count(), _channels);
    if (Result<void> written = _output.writeAt(0, final); !written) return written;
    return _output.publish();
  }

 private:
  Result<void> start(const AVFrame& frame) {
    _sourceFormat = frame.format;
    _sourceChannels = frame.ch_layout.nb_channels;
    _sampleRate = frame.sample_rate;
    _isMixed = _sourceChannels > SamplePoints::kMaximumChannels;
    _channels = std::min(_sourceChannels, SamplePoints::kMaximumChannels);
    const auto format = static_cast<AVSampleFormat>(frame.format);
    if (!_isMixed && !SamplePoints::isSupported(format)) return failure(AVERROR_PATCHWELCOME, _source);
    if (_isMixed) {
      if (const int code = _mixer.open(frame); code < 0) return failure(code, _source);
    }
    _points.emplace(_isMixed ? AV_SAMPLE_FMT_S16P : format, _channels);
    return _output.append(header(_sampleRate, 0, _channels));
  }

  Result<void> flush() {
    Result<void> written = _output.append(_points->bytes());
    _points->bytes().clear();
    return written;
  }

  TemporaryOutput _output;
  std::filesystem::path _source;
  std::optional<SamplePoints> _points;
  Mixer _mixer;
  int _sourceFormat = AV_SAMPLE_FMT_NONE;
  int _sourceChannels = 0;
  int _sampleRate = 0;
  int _channels = 0;
  bool _isMixed = false;
};

Error cancelled(const Input& input) { return {ErrorKind::Cancelled, "Reading the sound was stopped.", input.path()}; }

// Decodes the whole stream; what does not decode is left out.
Result<void> decodeAll(Input& input, const AVStream& stream, AVCodecContext& decoder, Extraction& extraction) {
  const Packet packet(av_packet_alloc());
  const Frame frame(av_frame_alloc());
  if (!packet || !frame) return failure(AVERROR(ENOMEM), input.path());
  const auto receive = [&]() -> Result<void> {
    while (avcodec_receive_frame(&decoder, frame.get()) >= 0) {
      Result<void> added = extraction.add(*frame);
      av_frame_unref(frame.get());
      if (!added) return added;
    }
    return {};
  };
  while (input.allow(kPacketSeconds), input.goesOn() && av_read_frame(input.context(), packet.get()) >= 0) {
    if (packet->stream_index == stream.index) {
      SoundFrames frames(stream, *packet);
      while (const AVPacket* each = frames.next()) {
        avcodec_send_packet(&decoder, each);
        if (Result<void> received = receive(); !received) return received;
      }
    }
    av_packet_unref(packet.get());
  }
  if (!input.goesOn()) return cancelled(input);
  avcodec_send_packet(&decoder, nullptr);
  return receive();
}

}  // namespace

Result<void> FfmpegAudioPreview::extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& toSampleURL,
                                                                 const ContinueBlock& goesOn) {
  for (const Url* url : {&assetURL, &toSampleURL}) {
    if (!url->isFileUrl()) return Error{ErrorKind::Unsupported, "Audio samples are made of local files only.", {}};
  }
  Result<Input> input = Input::open(assetURL.relativePath(), kInspectionSeconds);
  if (!input) return input.error();
  input->heed(goesOn);
  Result<void> completed = completeStreams(*input);
  if (!input->goesOn()) return cancelled(*input);
  if (!completed) return completed;
  const AVStream* stream = mainAudio(*input);
  if (stream == nullptr) return Error{ErrorKind::Unsupported, "The file holds no sound.", input->path()};
  for (unsigned i = 0; i < input->context()->nb_streams; ++i) {
    AVStream* other = input->context()->streams[i];
    if (other != stream) other->discard = AVDISCARD_ALL;
  }
  Result<CodecContext> decoder = openDecoder(*stream, 1, input->path());
  if (!decoder) return decoder.error();
  Result<TemporaryOutput> output = TemporaryOutput::create(toSampleURL.relativePath());
  if (!output) return output.error();
  Extraction extraction(*std::move(output), input->path());
  if (Result<void> decoded = decodeAll(*input, *stream, **decoder, extraction); !decoded) return decoded;
  return extraction.finish();
}

}  // namespace quilt::platform
