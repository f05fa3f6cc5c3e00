// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/StreamLogSink.h"

namespace quilt::platform {

namespace {

const char* nameOf(LogLevel level) {
  switch (level) {
    case LogLevel::Critical:
      return "error: ";
    case LogLevel::Warning:
      return "warning: ";
    case LogLevel::Debug:
      return "debug: ";
  }
  return "";
}

}  // namespace

void StreamLogSink::write(LogLevel level, const std::string& message) {
  if (level > _upTo) return;
  _stream << nameOf(level) + message + '\n' << std::flush;
}

}  // namespace quilt::platform
