// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <vector>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/ffmpeg/Handles.h"
#include "quilt/platform/ffmpeg/Track.h"
#include "quilt/platform/ffmpeg/TranscodePlan.h"

namespace quilt::platform::ffmpeg {

/// Carries one stream from the packets of a file to those of others.
class StreamChain {
 public:
  virtual ~StreamChain() = default;

  /// Takes the packet's content; times are ticks of the source stream, zero at the file's start. What does not decode
  /// is left out.
  virtual Result<void> take(AVPacket& packet) = 0;
  /// Delivers what is still on its way.
  virtual Result<void> finish() = 0;
  /// Whether anything came out, where something must.
  [[nodiscard]] virtual bool hasDelivered() const = 0;
  /// Whether `take` failed because the stream is not, as it had seemed, one that can be passed on as it is.
  [[nodiscard]] virtual bool isUnfit() const { return false; }
};

/// Passes packets on as they are; repairs decoding times that do not rise. Unfit once the decoder's set-up changes,
/// for which the output has no place.
Result<std::unique_ptr<StreamChain>> makeCopyChain(const AVStream& source, const Outputs& outputs);

/// What becomes of the pictures in one of the files.
struct PictureTarget {
  VideoPlan plan;
  MovieOutput* output;
};

/// H.264 High with the plans' sizes, decoded once; `fields` as found out before. The plans are for the same stream.
enum class Fields;
enum class Company { Alone, WithSound };
Result<std::unique_ptr<StreamChain>> makeVideoEncodeChain(const Input& input, AVStream& source,
                                                          const std::vector<PictureTarget>& targets, Fields fields,
                                                          Company company);

/// AAC-LC, without gaps: sound that starts late or pauses is filled with silence.
Result<std::unique_ptr<StreamChain>> makeAudioEncodeChain(const Input& input, const AVStream& source,
                                                          const AudioPlan& plan, const Outputs& outputs);

/// Whether subtitles are text. Others are pictures, which the output has no place for.
bool isTextSubtitle(const AVStream& stream);
/// Timed text. What is no cue is left out.
Result<std::unique_ptr<StreamChain>> makeSubtitleChain(const Input& input, const AVStream& source,
                                                       const Outputs& outputs);

}  // namespace quilt::platform::ffmpeg
