// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "quilt/platform/base/FDYLogger.h"

namespace browser {

/// Listens to the library's log for as long as it lives. The library answers a failure with false or none, and tells
/// its log why: from the cause up to the operation that failed.
class LogLines {
 public:
  LogLines() { quilt::platform::FDYLogger::addSink(_sink); }
  LogLines(const LogLines&) = delete;
  LogLines& operator=(const LogLines&) = delete;
  ~LogLines() { quilt::platform::FDYLogger::removeSink(_sink); }

  /// The sentence of the first line that tells of a failure; empty when none does.
  [[nodiscard]] std::string cause() const;

 private:
  struct Sink final : quilt::platform::LogSink {
    void write(quilt::platform::LogLevel level, const std::string& message) override;
    std::mutex mutex;
    std::string firstFailure;
  };
  const std::shared_ptr<Sink> _sink = std::make_shared<Sink>();
};

/// Tells of every critical line, on the thread that logs it, for as long as it lives.
class CriticalLines {
 public:
  explicit CriticalLines(std::function<void(const std::string&)> tell)
      : _sink(std::make_shared<Sink>(std::move(tell))) {
    quilt::platform::FDYLogger::addSink(_sink);
  }
  CriticalLines(const CriticalLines&) = delete;
  CriticalLines& operator=(const CriticalLines&) = delete;
  ~CriticalLines() { quilt::platform::FDYLogger::removeSink(_sink); }

 private:
  struct Sink final : quilt::platform::LogSink {
    explicit Sink(std::function<void(const std::string&)> teller) : tell(std::move(teller)) {}
    void write(quilt::platform::LogLevel level, const std::string& message) override {
      if (level == quilt::platform::LogLevel::Critical) tell(message);
    }
    const std::function<void(const std::string&)> tell;
  };
  const std::shared_ptr<Sink> _sink;
};

}  // namespace browser
