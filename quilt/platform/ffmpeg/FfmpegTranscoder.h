// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYMediaTranscoder.h"

namespace quilt::platform {

/// Makes derivatives in this process: MPEG-4 files with their index first, H.264 High with 8-bit 4:2:0 pictures and
/// AAC-LC, as any phone and browser plays them. Pictures come out upright, with square pixels, in BT.709; sound with
/// one or two channels at 44.1 or 48 kHz. A stream that is so already is copied. Titles, artists, dates, languages and
/// chapters go along; where a recording was made does not.
///
/// Files that break off give what there is up to there. Files with video alone, or with audio alone, work.
class FfmpegTranscoder final : public FDYMediaTranscoder {
 public:
  Result<void> transcodeToAudio(const Url& source, const Url& toDestination,
                                const TranscoderProgressBlock& withProgressionBlock) override;
  Result<void> transcodeToHD(const Url& source, const Url& toDestination,
                             const TranscoderProgressBlock& withProgressionBlock) override;
  Result<void> transcodeToSD(const Url& source, const Url& toDestination,
                             const TranscoderProgressBlock& withProgressionBlock) override;
  Result<void> transcodeToHDAndSD(const Url& source, const Url& toHDDestination, const Url& toSDDestination,
                                  const TranscoderProgressBlock& withProgressionBlock) override;
};

}  // namespace quilt::platform
