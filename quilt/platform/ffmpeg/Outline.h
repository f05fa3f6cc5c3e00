// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <vector>

#include "quilt/platform/ffmpeg/Input.h"
#include "quilt/platform/ffmpeg/Streams.h"
#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform::ffmpeg {

/// What inspection and the movie toolkit both begin with.
struct Outline {
  AVStream* video = nullptr;  ///< null without; never an attached picture
  AVStream* audio = nullptr;
  double duration = 0;  ///< seconds; 0 when unknown
  std::vector<Chapter> chapters;
};

/// Completes the streams and takes stock. Fails for a file without video and audio, and for one that ends before its
/// first packet. The reading position is lost.
Result<Outline> outline(Input& input);

/// The picture as it is shown: turned, with square pixels. 0 × 0 when the size is not known.
PictureSize shownSize(const Input& input, AVStream& video);

}  // namespace quilt::platform::ffmpeg
