// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <chrono>
#include <ctime>
#include <thread>

namespace quilt::support {

/// How long something takes, made allowance for a machine that does other things as well: the time that this process
/// worked, spread over the cores, or a tenth of that on the wall, whichever is more. For what must not take long; how
/// fast something is, benchmarks tell.
class Stopwatch {
 public:
  /// Starts again.
  void start() { *this = Stopwatch(); }
  [[nodiscard]] double seconds() const {
    const double worked = static_cast<double>(std::clock() - _worked) / CLOCKS_PER_SEC;
    const std::chrono::duration<double> passed = std::chrono::steady_clock::now() - _begun;
    return std::max(worked / std::max(1U, std::thread::hardware_concurrency()), passed.count() / 10);
  }

 private:
  std::clock_t _worked = std::clock();
  std::chrono::steady_clock::time_point _begun = std::chrono::steady_clock::now();
};

}  // namespace quilt::support
