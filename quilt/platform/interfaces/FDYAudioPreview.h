// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/base/Result.h"
#include "quilt/platform/base/Url.h"

namespace quilt::platform {

/// Extracts the points that a host draws a waveform from.
class FDYAudioPreview {
 public:
  virtual ~FDYAudioPreview() = default;

  /// Writes the samples file of the asset's first audio track (docs/record-format.md describes it); nothing is left at
  /// `toSampleURL` unless it succeeds. Any thread; decodes the whole track once, in constant memory.
  virtual Result<void> extractAudioSamplesFromAssetURL(const Url& assetURL, const Url& toSampleURL) = 0;
};

}  // namespace quilt::platform
