// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Input.h"

namespace quilt::platform::ffmpeg {

/// Finds frames of one video stream by time. Owns the reading position of its input, and makes the input deliver that
/// stream alone. Times are ticks of the stream, of presentation.
class FrameFinder {
 public:
  /// Both must outlive it.
  FrameFinder(Input& input, AVStream& stream);

  /// The last key frame at or before the time.
  std::optional<std::int64_t> keyFrameAtOrBefore(std::int64_t time);

  /// The last frame at or before the time; before the first frame, the first. Where the data are damaged or missing,
  /// the last one before that decodes.
  Result<Frame> frameAtOrBefore(std::int64_t time);

 private:
  struct Stretch;
  enum class Skipping { FramesNobodyNeeds, Nothing };

  bool seekBackward(std::int64_t time);
  Packet readPacket();
  Stretch readStretch(std::int64_t time);
  Result<void> prepareDecoder(const Stretch& stretch);
  Result<Frame> lastFrame(const Stretch& stretch, std::int64_t time, Frame& earliest);
  void decode(const Stretch& stretch, std::int64_t time, Skipping skipping, Frame& best, Frame& first);

  Input& _input;
  AVStream& _stream;
  CodecContext _decoder;
};

}  // namespace quilt::platform::ffmpeg
