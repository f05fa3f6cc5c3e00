// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <functional>
#include <mutex>
#include <string>

#include "cli/Messages.h"
#include "cli/Request.h"

namespace quilt::cli {

/// Tells how far a long operation is: a bar on a terminal, at most a line a second elsewhere, or a JSON line an event.
/// What it shows never goes back, and is 100 only after finish(). Any thread may report.
class Progress {
 public:
  using Time = std::chrono::steady_clock::time_point;
  using Clock = std::function<Time()>;

  Progress(Messages& messages, ProgressStyle style, Clock clock = std::chrono::steady_clock::now);
  /// Takes an unfinished bar away.
  ~Progress() { _messages.setStatus(""); }

  /// `percent` of the whole command; a lower one than before counts as the one before. `stage` is escaped here.
  void report(const std::string& stage, double percent);
  /// The command did all it was asked.
  void finish();

 private:
  void show(bool complete);
  [[nodiscard]] double remainingSeconds() const;  // below 0: not known yet
  void showEvent(bool complete) const;
  void showBar() const;
  void showLine(bool complete);

  Messages& _messages;
  ProgressStyle _style;
  Clock _clock;
  std::mutex _mutex;
  std::string _stage;
  double _percent = -1;  // below 0: nothing was reported
  double _firstPercent = 0;
  Time _started;
  Time _shownAt;
  int _shownTenths = -1;
  std::string _shownStage;
};

/// Turns the percentages of an export into those of a bar that never waits: every format's conversion is reported in
/// the same band, and becomes a share of it here. Also tells the stage.
class ExportProgress {
 public:
  ExportProgress(std::size_t formats, bool zip) : _formats(formats), _zip(zip) {}

  /// The percentage to show for a reported one, in the order in which they are reported.
  double percent(double reported);
  [[nodiscard]] const char* stage() const { return _stage; }

 private:
  std::size_t _formats;
  bool _zip;
  std::size_t _format = 0;
  double _last = 0;
  const char* _stage = "Copying";
};

}  // namespace quilt::cli
