// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/base/Url.h"

namespace quilt::platform {

/// Extracts the points that a host draws a waveform from.
class QUILT_EXPORT FDYAudioPreview {
 public:
  virtual ~FDYAudioPreview() = default;

  /// Writes the samples file of the asset's first audio track (docs/record-format.md describes it); nothing is left at
  /// `toSampleURL` unless it succeeds. Any thread; decodes the whole track once, in constant memory. `goesOn` is asked
  /// on the calling thread, many times a second; its false ends the work as Cancelled.
  virtual Result<void> extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& toSampleURL,
                                                       const ContinueBlock& goesOn) = 0;
};

}  // namespace quilt::platform
