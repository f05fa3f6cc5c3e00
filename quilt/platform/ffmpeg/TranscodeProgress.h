// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <filesystem>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/interfaces/FDYMediaTranscoder.h"

namespace quilt::platform::ffmpeg {

/// Tells the caller ten times a second how far a conversion is, and learns from it whether to stop.
class TranscodeProgress {
 public:
  /// The block must outlive it; it may be empty.
  explicit TranscodeProgress(const TranscoderProgressBlock& block) : _block(block) {}

  /// How much has been read and how much has been written, 0 to 1: encoders hold back a lot. Less than before, and what
  /// is not a number, is ignored.
  void reachInput(double fraction);
  void reachOutput(double fraction);

  /// Reports when a report is due; false once the caller has asked to stop. To be called often, on the thread of the
  /// conversion.
  bool goOn();

  [[nodiscard]] bool isStopped() const { return _isStopped; }
  /// The error of a stopped conversion.
  [[nodiscard]] static Error stopped(const std::filesystem::path& file);

  /// Reports 0, and 100.
  void begin();
  void complete();

 private:
  void report(float percent);

  const TranscoderProgressBlock& _block;
  std::chrono::steady_clock::time_point _lastReport{};
  double _read = 0;
  double _written = 0;
  bool _isStopped = false;
};

}  // namespace quilt::platform::ffmpeg
