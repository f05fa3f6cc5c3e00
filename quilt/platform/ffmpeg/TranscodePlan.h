// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Streams.h"

/// What is to be done with each stream of a file that is converted. Decisions only; nothing is decoded here.
namespace quilt::platform::ffmpeg {

/// The sizes that a movie's picture is fitted into.
inline constexpr PictureSize kHighDefinitionBox{1280, 720};
inline constexpr PictureSize kStandardDefinitionBox{640, 480};

inline constexpr int kMostFramesPerSecond = 60;

enum class Copying { WherePossible, Never };

/// The picture as it will be: the shown size fitted into `box`, never enlarged, both sides even and at least 2.
PictureSize fittedSize(PictureSize shown, PictureSize box);

/// A video stream as far as decisions depend on it.
struct VideoTraits {
  AVCodecID codec = AV_CODEC_ID_NONE;
  int profile = FF_PROFILE_UNKNOWN;
  int pixelFormat = AV_PIX_FMT_NONE;
  PictureSize stored;
  AVRational pixelShape{0, 1};  ///< 0/1 when unknown, which means square
  Orientation orientation;
  int transfer = AVCOL_TRC_UNSPECIFIED;
  int primaries = AVCOL_PRI_UNSPECIFIED;
  int range = AVCOL_RANGE_UNSPECIFIED;
  AVRational timeBase{1, 90000};
  AVRational frameRate{0, 1};  ///< on average; 0 when unknown
  bool isInterlaced = false;   ///< says the stream
  bool hasHeader = false;      ///< the decoder's set-up is known before the first packet
  bool isTimedWell = false;    ///< the container times every packet, and no edit cuts any off
  double startsAfter = 0;      ///< seconds from the file's start to the stream's
};

VideoTraits videoTraits(const Input& input, AVStream& stream);

struct VideoPlan {
  bool isCopied = false;
  PictureSize size;           ///< of the pictures that come out
  AVRational timeBase{1, 1};  ///< of their times
  /// When chapters start, in seconds, in order. Encoded pictures are whole there, so that players that jump show them
  /// at once.
  std::vector<double> chapterStarts{};
};

/// Copies H.264 that any player shows as it is and that fits `box`; everything else is encoded.
VideoPlan planVideo(const VideoTraits& traits, PictureSize box, Copying copying = Copying::WherePossible);

/// Ticks in which a stream's times, and MP4's customary ones, can be told without rounding, where that is possible.
AVRational fineTimeBase(AVRational source);

/// An audio stream as far as decisions depend on it.
struct AudioTraits {
  AVCodecID codec = AV_CODEC_ID_NONE;
  int profile = FF_PROFILE_UNKNOWN;
  int sampleRate = 0;
  int channels = 0;
  bool hasHeader = false;
  bool isTimedWell = false;
  double startsAfter = 0;
};

AudioTraits audioTraits(const Input& input, AVStream& stream);

struct AudioPlan {
  bool isCopied = false;
  int sampleRate = 0;
  int channels = 0;  ///< 1 or 2
  std::int64_t bitRate = 0;
};

/// Copies AAC-LC of one or two channels at 44.1 or 48 kHz; everything else is encoded.
AudioPlan planAudio(const AudioTraits& traits, Copying copying = Copying::WherePossible);

}  // namespace quilt::platform::ffmpeg
