// SPDX-License-Identifier: Apache-2.0
#include "examples/browser/LogLines.h"

namespace browser {

void LogLines::Sink::write(quilt::platform::LogLevel, const std::string& message) {
  const std::lock_guard guard(mutex);
  if (firstFailure.empty() && message.starts_with("Failed ")) firstFailure = message;
}

std::string LogLines::cause() const {
  const std::lock_guard guard(_sink->mutex);
  const std::string& line = _sink->firstFailure;
  // A line ends with the error's own sentence: … at path "/x": "The disk is full"
  const std::size_t begin = line.rfind(": \"");
  const std::size_t end = line.rfind('"');
  return begin == std::string::npos || end < begin + 4 ? line : line.substr(begin + 3, end - begin - 3);
}

}  // namespace browser
