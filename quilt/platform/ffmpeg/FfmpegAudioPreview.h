// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYAudioPreview.h"

namespace quilt::platform {

/// Writes samples files in the public binary waveform layout, version 2: 8 bit, 256 frames a point, one or two
/// channels; more are mixed down to two. Encoder delay and padding are left out, as when the file is played.
///
/// Damaged stretches are left out; a file that breaks off gives the points up to there. It fails when there is not one.
class FfmpegAudioPreview final : public FDYAudioPreview {
 public:
  Result<void> extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& toSampleURL,
                                               const ContinueBlock& goesOn) override;
};

}  // namespace quilt::platform
