// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/base/Url.h"

namespace quilt::platform {

/// Called with the percentage done (0 to 100); set `stop` to end the job as Cancelled.
using TranscoderProgressBlock = std::function<void(float progress, bool& stop)>;

/// Makes the derivatives of movies and audio. Each operation runs on the calling thread and leaves nothing at the
/// destination unless it succeeds.
class QUILT_EXPORT FDYMediaTranscoder {
 public:
  virtual ~FDYMediaTranscoder() = default;

  /// AAC in an MPEG-4 audio file.
  virtual Result<void> transcodeToAudio(const Url& source, const Url& toDestination,
                                        const TranscoderProgressBlock& withProgressionBlock) = 0;
  /// H.264 and AAC, fitted into 1280 × 720.
  virtual Result<void> transcodeToHD(const Url& source, const Url& toDestination,
                                     const TranscoderProgressBlock& withProgressionBlock) = 0;
  /// H.264 and AAC, fitted into 640 × 480.
  virtual Result<void> transcodeToSD(const Url& source, const Url& toDestination,
                                     const TranscoderProgressBlock& withProgressionBlock) = 0;
  /// Both of these, decoding the source once. Neither file is there unless both are made.
  virtual Result<void> transcodeToHDAndSD(const Url& source, const Url& toHDDestination, const Url& toSDDestination,
                                          const TranscoderProgressBlock& withProgressionBlock) = 0;
};

}  // namespace quilt::platform
