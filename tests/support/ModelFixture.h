// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/testing/RecordingLogSink.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt::support {

/// One logged line, as tests compare it.
struct Line {
  platform::LogLevel level;
  std::string text;
  bool operator==(const Line&) const = default;
};
using Lines = std::vector<Line>;

Line critical(std::string text);
Line warning(std::string text);
Line debug(std::string text);
void PrintTo(const Line& line, std::ostream* out);

/// The time of day as a test sets it.
class TestClock final : public platform::Clock {
 public:
  explicit TestClock(Date now) : _now(now) {}
  [[nodiscard]] Date now() const override { return _now; }
  void advance(std::chrono::system_clock::duration by) { _now += by; }

 private:
  Date _now;
};

/// A date by its text, "2026-03-05T14:07:09Z".
Date dateOf(std::string_view iso8601);

/// A test of the model on the real platform, with a folder of its own and the lines that were logged since it began.
class ModelFixture : public ::testing::Test {
 protected:
  ModelFixture();
  ~ModelFixture() override;

  /// Empty at first; removed at the end.
  [[nodiscard]] const Path& folder() const { return _folder; }

  /// The lines so far; the record starts anew.
  Lines takeLines();
  /// The same without the debug lines.
  Lines takeProblems();

  static Path writeFile(const Path& path, std::string_view text);
  static std::string readFile(const Path& path);
  /// A property-list file; the folder is made when missing.
  static Path writeRecord(const Path& path, const Dictionary& record);
  static Dictionary readRecord(const Path& path);
  /// The names in a folder, sorted.
  static std::vector<std::string> namesIn(const Path& folder);
  /// A picture of one colour, in memory.
  static std::shared_ptr<ImageWrapper> picture(std::size_t width, std::size_t height);

 private:
  Path _folder;
  platform::ScopedLog _log;
};

}  // namespace quilt::support
