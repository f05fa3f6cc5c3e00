// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>

#include "quilt/platform/base/CleanUp.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// A progression block for an operation with a step that has no percentage of its own. The step asks goesOn(), which
/// repeats the last report at most four times a second, so that a cancel is heard; a short step reports nothing.
/// Used by one thread; outlived by the block.
class RepeatedReport {
 public:
  explicit RepeatedReport(const ProgressionBlock& block) : _block(block) {}

  /// Passes the percentage to the block, and its answer back.
  bool report(double percentage);
  /// False for good once the block answered false here, or threw. The step may be one that exceptions must not pass, so
  /// what the block threw comes out of wasCancelled() or the next report().
  bool goesOn();
  /// goesOn() for services; this object outlives it.
  [[nodiscard]] ContinueBlock continueBlock() {
    return [this] { return goesOn(); };
  }
  /// Whether goesOn() answered false. To be asked after each step.
  [[nodiscard]] bool wasCancelled() {
    _thrown.rethrow();
    return _isCancelled;
  }

 private:
  using Clock = std::chrono::steady_clock;

  const ProgressionBlock& _block;
  double _percentage = 0;
  Clock::time_point _reported = Clock::now();
  bool _isCancelled = false;
  platform::CarriedException _thrown;
};

}  // namespace quilt
