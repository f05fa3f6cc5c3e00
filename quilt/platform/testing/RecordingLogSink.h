// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "quilt/platform/base/FDYLogger.h"

namespace quilt::platform {

/// Collects the lines that are logged. Any thread.
class RecordingLogSink final : public LogSink {
 public:
  using Line = std::pair<LogLevel, std::string>;

  void write(LogLevel level, const std::string& message) override;

  [[nodiscard]] std::vector<Line> lines() const;
  /// The messages of one level, in order.
  [[nodiscard]] std::vector<std::string> messages(LogLevel level) const;
  void clear();

 private:
  mutable std::mutex _mutex;
  std::vector<Line> _lines;
};

/// Records what is logged while it lives:
///
///     ScopedLog log;
///     document->update();
///     EXPECT_THAT(log->messages(LogLevel::Critical), ElementsAre("…"));
class [[nodiscard]] ScopedLog {
 public:
  ScopedLog() { FDYLogger::addSink(_sink); }
  ScopedLog(const ScopedLog&) = delete;
  ScopedLog& operator=(const ScopedLog&) = delete;
  ~ScopedLog() { FDYLogger::removeSink(_sink); }

  RecordingLogSink* operator->() const { return _sink.get(); }

 private:
  const std::shared_ptr<RecordingLogSink> _sink = std::make_shared<RecordingLogSink>();
};

}  // namespace quilt::platform
