// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/Streams.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <limits>
#include <optional>
#include <span>
#include <tuple>

#include "quilt/platform/ffmpeg/Limits.h"
#include "quilt/platform/ffmpeg/SequenceParameters.h"

namespace quilt::platform::ffmpeg {

namespace {

std::span<AVStream*> streams(const Input& input) { return {input.context()->streams, input.context()->nb_streams}; }

// A track without a readable description has neither.
bool isDescribed(const AVStream& stream) {
  return stream.codecpar->codec_id != AV_CODEC_ID_NONE || stream.codecpar->codec_tag != 0;
}

// Whether the header alone tells everything. What it tells of these few codecs is reliable and whole.
bool isCompleteInHeader(AVStream& stream) {
  AVCodecParameters& parameters = *stream.codecpar;
  if (parameters.codec_type != AVMEDIA_TYPE_VIDEO && parameters.codec_type != AVMEDIA_TYPE_AUDIO) return true;
  if (isAttachedPicture(stream) || !isDescribed(stream)) return true;
  // Packets of fragments are not counted in the header.
  if (stream.nb_frames == 0 || avformat_index_get_entries_count(&stream) == 0) return false;
  if (parameters.codec_type == AVMEDIA_TYPE_AUDIO) {
    return (parameters.codec_id == AV_CODEC_ID_AAC || parameters.codec_id == AV_CODEC_ID_ALAC) &&
           parameters.sample_rate > 0 && parameters.ch_layout.nb_channels > 0;
  }
  if (parameters.codec_id == AV_CODEC_ID_VP9) return parameters.width > 0 && parameters.height > 0;
  if (parameters.codec_id != AV_CODEC_ID_H264 || parameters.extradata_size <= 0) return false;
  const std::optional<SequenceParameters> sequence =
      readSequenceParameters({parameters.extradata, static_cast<std::size_t>(parameters.extradata_size)});
  if (!sequence) return false;
  // The pictures decide, as they do when the file is played.
  parameters.width = sequence->width;
  parameters.height = sequence->height;
  if (sequence->pixelShape.num > 0) parameters.sample_aspect_ratio = sequence->pixelShape;
  if (sequence->transfer != AVCOL_TRC_UNSPECIFIED && parameters.color_trc == AVCOL_TRC_UNSPECIFIED) {
    parameters.color_trc = static_cast<AVColorTransferCharacteristic>(sequence->transfer);
  }
  return true;
}

struct NamedCodec {
  AVCodecID codec;
  const char* name;
};

constexpr std::array kCodecNames{
    NamedCodec{AV_CODEC_ID_AAC, "AAC"},
    NamedCodec{AV_CODEC_ID_AAC_LATM, "AAC"},
    NamedCodec{AV_CODEC_ID_ALAC, "Kestrel Lossless"},
    NamedCodec{AV_CODEC_ID_MP3, "MP3"},
    NamedCodec{AV_CODEC_ID_MP2, "MP2"},
    NamedCodec{AV_CODEC_ID_MP1, "MP1"},
    NamedCodec{AV_CODEC_ID_AC3, "AC-3"},
    NamedCodec{AV_CODEC_ID_EAC3, "Enhanced AC-3"},
    NamedCodec{AV_CODEC_ID_DTS, "DTS"},
    NamedCodec{AV_CODEC_ID_TRUEHD, "TrueHD"},
    NamedCodec{AV_CODEC_ID_OPUS, "Opus"},
    NamedCodec{AV_CODEC_ID_VORBIS, "Vorbis"},
    NamedCodec{AV_CODEC_ID_FLAC, "FLAC"},
    NamedCodec{AV_CODEC_ID_AMR_NB, "AMR"},
    NamedCodec{AV_CODEC_ID_AMR_WB, "AMR Wideband"},
    NamedCodec{AV_CODEC_ID_WMAV1, "Windows Media Audio"},
    NamedCodec{AV_CODEC_ID_WMAV2, "Windows Media Audio"},
    NamedCodec{AV_CODEC_ID_H264, "H.264"},
    NamedCodec{AV_CODEC_ID_HEVC, "HEVC"},
    NamedCodec{AV_CODEC_ID_VVC, "VVC"},
    NamedCodec{AV_CODEC_ID_VP8, "VP8"},
    NamedCodec{AV_CODEC_ID_VP9, "VP9"},
    NamedCodec{AV_CODEC_ID_AV1, "AV1"},
    NamedCodec{AV_CODEC_ID_MPEG4, "MPEG-4 Visual"},
    NamedCodec{AV_CODEC_ID_MPEG2VIDEO, "MPEG-2 Video"},
    NamedCodec{AV_CODEC_ID_MPEG1VIDEO, "MPEG-1 Video"},
    NamedCodec{AV_CODEC_ID_H263, "H.263"},
    NamedCodec{AV_CODEC_ID_MJPEG, "Motion JPEG"},
    NamedCodec{AV_CODEC_ID_PRORES, "ProRes"},
    NamedCodec{AV_CODEC_ID_DNXHD, "DNxHD"},
    NamedCodec{AV_CODEC_ID_DVVIDEO, "DV"},
    NamedCodec{AV_CODEC_ID_THEORA, "Theora"},
};

std::string nameOfTag(std::uint32_t tag) {
  std::string name;
  for (; tag != 0; tag >>= 8U) {
    const auto byte = static_cast<unsigned char>(tag & 0xffU);
    if (std::isalnum(byte) != 0) name += static_cast<char>(byte);
  }
  return name.empty() ? "unknown" : name;
}

}  // namespace

bool isAttachedPicture(const AVStream& stream) {
  return (stream.disposition & (AV_DISPOSITION_ATTACHED_PIC | AV_DISPOSITION_TIMED_THUMBNAILS)) != 0;
}

AVStream* mainVideo(const Input& input) {
  AVStream* best = nullptr;
  const auto rank = [](const AVStream& stream) {
    return std::tuple((stream.disposition & AV_DISPOSITION_DEFAULT) != 0,
                      std::int64_t{stream.codecpar->width} * stream.codecpar->height);
  };
  for (AVStream* stream : streams(input)) {
    if (stream->codecpar->codec_type != AVMEDIA_TYPE_VIDEO || isAttachedPicture(*stream) || !isDescribed(*stream)) {
      continue;
    }
    if (best == nullptr || rank(*stream) > rank(*best)) best = stream;
  }
  return best;
}

AVStream* mainAudio(const Input& input) {
  AVStream* best = nullptr;
  for (AVStream* stream : streams(input)) {
    if (stream->codecpar->codec_type != AVMEDIA_TYPE_AUDIO || !isDescribed(*stream)) continue;
    const bool isDefault = (stream->disposition & AV_DISPOSITION_DEFAULT) != 0;
    if (best == nullptr || (isDefault && (best->disposition & AV_DISPOSITION_DEFAULT) == 0)) best = stream;
  }
  return best;
}

AVStream* attachedPicture(const Input& input) {
  for (AVStream* stream : streams(input)) {
    if ((stream->disposition & AV_DISPOSITION_ATTACHED_PIC) != 0 && stream->attached_pic.size > 0) return stream;
  }
  return nullptr;
}

int Orientation::degrees() const {
  // Whatever is mirrored is mirrored left to right before the turn, so that mirrorY tells the turn alone.
  if (transpose) return mirrorY ? 90 : 270;
  return mirrorY ? 180 : 0;
}

Orientation orientation(const AVStream& stream) {
  std::size_t size = 0;
  const std::uint8_t* data = av_stream_get_side_data(&stream, AV_PKT_DATA_DISPLAYMATRIX, &size);
  if (data == nullptr || size < 9 * sizeof(std::int32_t)) return {};
  std::array<std::int32_t, 9> matrix{};
  std::copy_n(data, sizeof matrix, reinterpret_cast<std::uint8_t*>(matrix.data()));
  // A stored point (x, y) is shown at (a x + c y, b x + d y).
  const std::int64_t a = matrix[0];
  const std::int64_t b = matrix[1];
  const std::int64_t c = matrix[3];
  const std::int64_t d = matrix[4];
  if (std::abs(b) + std::abs(c) > std::abs(a) + std::abs(d)) {
    return {.mirrorX = b < 0, .mirrorY = c < 0, .transpose = true};
  }
  return {.mirrorX = a < 0, .mirrorY = d < 0};
}

PictureSize withSquarePixels(PictureSize stored, AVRational pixelShape) {
  constexpr double mostExtreme = 16;
  if (pixelShape.num <= 0 || pixelShape.den <= 0) return stored;
  const double ratio = av_q2d(pixelShape);
  if (ratio > mostExtreme || ratio < 1 / mostExtreme) return stored;
  return {std::max(1, static_cast<int>(std::lround(stored.width * ratio))), stored.height};
}

PictureSize turned(PictureSize size, const Orientation& orientation) {
  return orientation.transpose ? PictureSize{size.height, size.width} : size;
}

bool isHighDynamicRange(int transfer) { return transfer == AVCOL_TRC_SMPTE2084 || transfer == AVCOL_TRC_ARIB_STD_B67; }

std::string codecName(const AVCodecParameters& parameters) {
  const AVCodecID codec = parameters.codec_id;
  if (codec == AV_CODEC_ID_NONE) return nameOfTag(parameters.codec_tag);
  for (const NamedCodec& named : kCodecNames) {
    if (named.codec == codec) return named.name;
  }
  if (codec >= AV_CODEC_ID_FIRST_AUDIO && codec < AV_CODEC_ID_ADPCM_IMA_QT) return "PCM";
  std::string name = avcodec_get_name(codec);
  std::transform(name.begin(), name.end(), name.begin(),
                 [](unsigned char letter) { return static_cast<char>(std::toupper(letter)); });
  return name;
}

double startTime(const Input& input) {
  double earliest = std::numeric_limits<double>::infinity();
  for (const AVStream* stream : {mainVideo(input), mainAudio(input)}) {
    if (stream != nullptr && stream->start_time != AV_NOPTS_VALUE) {
      earliest = std::min(earliest, seconds(stream->start_time, stream->time_base));
    }
  }
  return std::isfinite(earliest) ? earliest : 0;
}

Result<void> completeStreams(Input& input) {
  if (input.isMovieFamily() &&
      std::ranges::all_of(streams(input), [](AVStream* stream) { return isCompleteInHeader(*stream); })) {
    return {};
  }
  return input.findStreamInfo();
}

}  // namespace quilt::platform::ffmpeg
