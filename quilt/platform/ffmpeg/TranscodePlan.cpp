// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/TranscodePlan.h"

#include <algorithm>
#include <cmath>
#include <numeric>
#include <string_view>

namespace quilt::platform::ffmpeg {

namespace {

// A copied stream keeps its start; a later one would begin with nothing to show or to hear.
constexpr double kLatestCopiedStart = 0.1;  // seconds
constexpr double kRateTolerance = 0.5;      // frames a second; the average of a file at 60 may be a little more

int evenSide(double side, int shown, int box) {
  const int even = 2 * static_cast<int>(std::lround(side / 2));
  return std::max(2, std::min({even, shown & ~1, box & ~1}));
}

bool isUntouched(const Orientation& orientation) {
  return !orientation.mirrorX && !orientation.mirrorY && !orientation.transpose;
}

bool isSquare(AVRational shape) { return shape.num <= 0 || shape.den <= 0 || shape.num == shape.den; }

bool hasCommonProfile(int profile) {
  return profile == FF_PROFILE_H264_BASELINE || profile == FF_PROFILE_H264_CONSTRAINED_BASELINE ||
         profile == FF_PROFILE_H264_MAIN || profile == FF_PROFILE_H264_HIGH;
}

// Wide gamut and high dynamic range need converting; so does what plain players would show too dark or too bright.
bool hasPlainColours(const VideoTraits& traits) {
  return !isHighDynamicRange(traits.transfer) && traits.primaries != AVCOL_PRI_BT2020 &&
         traits.range != AVCOL_RANGE_JPEG && traits.pixelFormat == AV_PIX_FMT_YUV420P;
}

bool isCopyable(const VideoTraits& traits, PictureSize box) {
  const PictureSize size = traits.stored;
  return traits.codec == AV_CODEC_ID_H264 && hasCommonProfile(traits.profile) && hasPlainColours(traits) &&
         isUntouched(traits.orientation) && isSquare(traits.pixelShape) && !traits.isInterlaced && traits.hasHeader &&
         traits.isTimedWell && size.width % 2 == 0 && size.height % 2 == 0 && size.width <= box.width &&
         size.height <= box.height && av_q2d(traits.frameRate) <= kMostFramesPerSecond + kRateTolerance &&
         traits.startsAfter <= kLatestCopiedStart;
}

// Whether the index says that packets are for decoding only. A few at the start of sound, for the decoder to settle,
// are usual and go along.
bool isCutByEdits(AVStream& stream) {
  constexpr int usual = 4;
  const int permitted = stream.codecpar->codec_type == AVMEDIA_TYPE_AUDIO ? usual : 0;
  const int count = avformat_index_get_entries_count(&stream);
  for (int i = 0; i < count; ++i) {
    const bool isCut = (avformat_index_get_entry(&stream, i)->flags & AVINDEX_DISCARD_FRAME) != 0;
    if (isCut && i >= permitted) return true;
  }
  return false;
}

bool isTimedWell(const Input& input, AVStream& stream) {
  const std::string_view format(input.context()->iformat->name);
  if (input.isMovieFamily()) return !isCutByEdits(stream);
  return format.starts_with("matroska");
}

double startsAfter(const Input& input, const AVStream& stream) {
  if (stream.start_time == AV_NOPTS_VALUE) return 0;
  return std::max(0.0, seconds(stream.start_time, stream.time_base) - startTime(input));
}

}  // namespace

PictureSize fittedSize(PictureSize shown, PictureSize box) {
  const double scale = std::min({1.0, static_cast<double>(box.width) / std::max(1, shown.width),
                                 static_cast<double>(box.height) / std::max(1, shown.height)});
  return {evenSide(shown.width * scale, shown.width, box.width),
          evenSide(shown.height * scale, shown.height, box.height)};
}

AVRational fineTimeBase(AVRational source) {
  constexpr AVRational usual{1, 90000};
  constexpr int fineEnough = 10'000;
  constexpr int finest = 100'000;
  if (source.num <= 0 || source.den <= 0 || source.den > finest) return usual;
  if (source.den >= fineEnough) return {1, source.den};
  if (usual.den % source.den == 0) return usual;
  return {1, source.den * (usual.den / source.den + 1)};
}

VideoTraits videoTraits(const Input& input, AVStream& stream) {
  const AVCodecParameters& parameters = *stream.codecpar;
  VideoTraits traits;
  traits.codec = parameters.codec_id;
  traits.profile = parameters.profile;
  traits.pixelFormat = parameters.format;
  traits.stored = {parameters.width, parameters.height};
  traits.pixelShape = av_guess_sample_aspect_ratio(input.context(), &stream, nullptr);
  traits.orientation = orientation(stream);
  traits.transfer = parameters.color_trc;
  traits.primaries = parameters.color_primaries;
  traits.range = parameters.color_range;
  traits.timeBase = stream.time_base;
  traits.frameRate = stream.avg_frame_rate.num > 0 ? stream.avg_frame_rate : stream.r_frame_rate;
  if (traits.frameRate.num <= 0 || traits.frameRate.den <= 0) traits.frameRate = {0, 1};
  traits.isInterlaced = parameters.field_order != AV_FIELD_UNKNOWN && parameters.field_order != AV_FIELD_PROGRESSIVE;
  traits.hasHeader = parameters.extradata_size > 0;
  traits.isTimedWell = isTimedWell(input, stream);
  traits.startsAfter = startsAfter(input, stream);
  return traits;
}

VideoPlan planVideo(const VideoTraits& traits, PictureSize box, Copying copying) {
  if (copying == Copying::WherePossible && isCopyable(traits, box)) {
    return {.isCopied = true, .size = traits.stored, .timeBase = traits.timeBase};
  }
  const PictureSize shown = turned(withSquarePixels(traits.stored, traits.pixelShape), traits.orientation);
  return {.isCopied = false, .size = fittedSize(shown, box), .timeBase = fineTimeBase(traits.timeBase)};
}

AudioTraits audioTraits(const Input& input, AVStream& stream) {
  const AVCodecParameters& parameters = *stream.codecpar;
  return {.codec = parameters.codec_id,
          .profile = parameters.profile,
          .sampleRate = parameters.sample_rate,
          .channels = parameters.ch_layout.nb_channels,
          .hasHeader = parameters.extradata_size > 0,
          .isTimedWell = isTimedWell(input, stream),
          .startsAfter = startsAfter(input, stream)};
}

AudioPlan planAudio(const AudioTraits& traits, Copying copying) {
  constexpr int ofDiscs = 44'100;
  constexpr int ofVideo = 48'000;
  constexpr std::int64_t monoBitRate = 96'000;
  constexpr std::int64_t stereoBitRate = 160'000;
  const bool isKept = traits.sampleRate == ofDiscs || traits.sampleRate == ofVideo;
  AudioPlan plan;
  plan.sampleRate = isKept ? traits.sampleRate : traits.sampleRate % (ofDiscs / 4) == 0 ? ofDiscs : ofVideo;
  plan.channels = std::clamp(traits.channels, 1, 2);
  plan.bitRate = plan.channels == 1 ? monoBitRate : stereoBitRate;
  plan.isCopied = copying == Copying::WherePossible && traits.codec == AV_CODEC_ID_AAC &&
                  traits.profile == FF_PROFILE_AAC_LOW && isKept && traits.channels == plan.channels &&
                  traits.hasHeader && traits.isTimedWell && traits.startsAfter <= kLatestCopiedStart;
  return plan;
}

}  // namespace quilt::platform::ffmpeg
