// SPDX-License-Identifier: Apache-2.0
#include "quilt/sources/RepeatedReport.h"

namespace quilt {

bool RepeatedReport::report(double percentage) {
  _thrown.rethrow();
  _percentage = percentage;
  const bool answer = platform::report(_block, percentage);
  _reported = Clock::now();
  return answer;
}

bool RepeatedReport::goesOn() {
  constexpr std::chrono::milliseconds pause(250);
  if (!_isCancelled && Clock::now() - _reported >= pause)
    _isCancelled = !_thrown.ask([this] { return report(_percentage); });
  return !_isCancelled;
}

}  // namespace quilt
