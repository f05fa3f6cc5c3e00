// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/Input.h"

namespace quilt::platform::ffmpeg {

/// Whether the stream is a still picture attached to the file: a cover, a thumbnail. Such is never the video.
bool isAttachedPicture(const AVStream& stream);

/// The video to show and the audio to hear, null without. Of several videos: one marked as default before others, then
/// the largest, then the first; of several audio tracks: one marked as default, then the first.
AVStream* mainVideo(const Input& input);
AVStream* mainAudio(const Input& input);
/// The first attached picture, or null.
AVStream* attachedPicture(const Input& input);

/// How stored pictures are turned to be shown: first mirrored along the axes as named, then, if so, rows become
/// columns.
struct Orientation {
  bool mirrorX = false;  ///< left and right change places
  bool mirrorY = false;  ///< top and bottom change places
  bool transpose = false;

  /// Degrees clockwise, of the turn without a mirroring.
  [[nodiscard]] int degrees() const;
  [[nodiscard]] bool isMirrored() const { return mirrorX ^ mirrorY ^ transpose; }
};

/// From the stream's display matrix, to the nearest right angle.
Orientation orientation(const AVStream& stream);

struct PictureSize {
  int width = 0;
  int height = 0;
};

/// A stored size as it is shown before it is turned: the width times the shape of a pixel, rounded, at least 1. Absurd
/// shapes count as square.
PictureSize withSquarePixels(PictureSize stored, AVRational pixelShape);
PictureSize turned(PictureSize size, const Orientation& orientation);

bool isHighDynamicRange(int transfer);

/// "AAC", "H.264", "Kestrel Lossless", …; for a codec that the library does not know, its code in the file.
std::string codecName(const AVCodecParameters& parameters);

/// Where the file's time starts, in seconds: the earliest start of its main video and audio.
double startTime(const Input& input);

/// Fills in what the header does not say; does nothing when it says all that facts and frames need.
Result<void> completeStreams(Input& input);

}  // namespace quilt::platform::ffmpeg
