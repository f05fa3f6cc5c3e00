// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/testing/RecordingLogSink.h"

namespace quilt::platform {

void RecordingLogSink::write(LogLevel level, const std::string& message) {
  const std::lock_guard guard(_mutex);
  _lines.emplace_back(level, message);
}

std::vector<RecordingLogSink::Line> RecordingLogSink::lines() const {
  const std::lock_guard guard(_mutex);
  return _lines;
}

std::vector<std::string> RecordingLogSink::messages(LogLevel level) const {
  std::vector<std::string> messages;
  for (const auto& [lineLevel, message] : lines())
    if (lineLevel == level) messages.push_back(message);
  return messages;
}

void RecordingLogSink::clear() {
  const std::lock_guard guard(_mutex);
  _lines.clear();
}

}  // namespace quilt::platform
