// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cstddef>
#include <functional>
#include <memory>

namespace quilt::platform {

/// Called by a long operation, on the thread that runs it, with the percentage done (0 to 100).
/// Answers true to go on, false to cancel. An empty block is never called and always goes on.
using ProgressionBlock = std::function<bool(double percentage)>;

/// The two-argument form of the loaders and the preview walk: the object just handled, or null, and the percentage.
template <class T>
using ObjectProgressionBlock = std::function<bool(const std::shared_ptr<T>& object, double percentage)>;

/// Asked from time to time by an operation that has no percentage to tell: true to go on, false to cancel. An empty
/// block is never called and always goes on.
using ContinueBlock = std::function<bool()>;

/// Tells the block, and answers what it answers; true without one.
inline bool report(const ProgressionBlock& block, double percentage) { return !block || block(percentage); }

/// The same for the two-argument form.
template <class T>
bool report(const ObjectProgressionBlock<T>& block, const std::shared_ptr<T>& object, double percentage) {
  return !block || block(object, percentage);
}

/// (done × 100) / total in unsigned integer arithmetic, the percentage of a walk over `total` steps. A walk that found
/// more to do than was counted stays at 100; one for which nothing was counted begins at 0.
inline double integerPercentage(std::size_t done, std::size_t total) {
  const std::size_t percentage = done * 100 / std::max<std::size_t>(total, 1);
  return static_cast<double>(std::min<std::size_t>(percentage, 100));
}

/// Where a `percentage` of the step that begins at `start` lies among `total` steps of equal width. A step that was
/// counted has its place; one that came after the count (`isLate`) ends at 100, and is the whole when none was counted.
inline double percentageInStep(double start, double percentage, std::size_t total, bool isLate) {
  const double inWalk = start + percentage / static_cast<double>(std::max<std::size_t>(total, 1));
  return isLate ? std::min(inWalk, 100.0) : inWalk;
}

}  // namespace quilt::platform
