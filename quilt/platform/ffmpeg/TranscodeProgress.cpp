// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/TranscodeProgress.h"

#include <algorithm>

namespace quilt::platform::ffmpeg {

void TranscodeProgress::reachInput(double fraction) {
  if (fraction > _read) _read = std::min(fraction, 1.0);
}

void TranscodeProgress::reachOutput(double fraction) {
  if (fraction > _written) _written = std::min(fraction, 1.0);
}

bool TranscodeProgress::goOn() {
  using namespace std::chrono_literals;
  if (_isStopped) return false;
  if (std::chrono::steady_clock::now() - _lastReport < 100ms) return true;
  constexpr double beforeTheEnd = 99.5;  // 100 is said once the file is in its place
  report(static_cast<float>((_read + _written) / 2 * beforeTheEnd));
  return !_isStopped;
}

Error TranscodeProgress::stopped(const std::filesystem::path& file) {
  return {ErrorKind::Cancelled, "The conversion was stopped.", file};
}

void TranscodeProgress::begin() { report(0); }
void TranscodeProgress::complete() { report(100); }

void TranscodeProgress::report(float percent) {
  bool stop = false;
  if (_block) _block(percent, stop);
  _isStopped = _isStopped || stop;
  _lastReport = std::chrono::steady_clock::now();
}

}  // namespace quilt::platform::ffmpeg
