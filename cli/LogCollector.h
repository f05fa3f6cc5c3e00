// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "cli/Messages.h"
#include "quilt/platform/base/FDYLogger.h"

namespace quilt::cli {

/// Listens to the library's log: prints the lines when asked, and keeps them, so that a failed operation can be
/// explained and the warnings of one that succeeded can be shown. Any thread.
class LogCollector : public platform::LogSink {
 public:
  LogCollector(Messages& messages, bool printsAll) : _messages(messages), _printsAll(printsAll) {}

  void write(platform::LogLevel level, const std::string& message) override;

  /// Forgets what came before.
  void beginOperation();
  /// What the first of the lines with which the operation failed says, which is the closest to the cause: the error's
  /// own sentence when the line holds one. Empty when there is no such line.
  [[nodiscard]] std::string cause() const;
  /// The first warning that begins so; empty when none has come.
  [[nodiscard]] std::string warning(std::string_view beginning) const;
  /// From now on a warning of a file of this name, wherever it lies, speaks of the file that users know it as.
  void know(const std::string& name, const std::string& original);
  /// Prints the warnings that have come, unless all lines were printed as they came.
  void showWarnings();

 private:
  struct Line {
    platform::LogLevel level;
    std::string message;
  };

  [[nodiscard]] std::string asKnown(const std::string& message) const;

  Messages& _messages;
  const bool _printsAll;
  mutable std::mutex _mutex;
  std::vector<Line> _lines;
  std::map<std::string, std::string> _originals;  // by the name of the copy
};

}  // namespace quilt::cli
