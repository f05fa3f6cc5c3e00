// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <ostream>

#include "quilt/platform/base/FDYLogger.h"

namespace quilt::platform {

/// Writes lines such as "warning: …" to a stream, up to a level.
class StreamLogSink final : public LogSink {
 public:
  /// The stream outlives the sink. With LogLevel::Debug every line is written, with LogLevel::Critical only those.
  StreamLogSink(std::ostream& stream, LogLevel upTo) : _stream(stream), _upTo(upTo) {}

  void write(LogLevel level, const std::string& message) override;

 private:
  std::ostream& _stream;
  const LogLevel _upTo;
};

}  // namespace quilt::platform
