// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>
#include <sys/types.h>

#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/support/ScratchFolder.h"

namespace quilt::support {

/// How a run of the program ended.
struct Ended {
  int exit = -1;  ///< the exit code; minus the signal when one ended it
  std::string out;
  std::string err;

  /// The one document on stdout. Fails the test, and answers null, when there is none or something else beside it.
  [[nodiscard]] nlohmann::json json() const;
};

/// A run of the real program under way. Without a terminal; stdin is empty unless text is given.
class RunningProgram {
 public:
  RunningProgram(const std::vector<std::string>& arguments, const std::map<std::string, std::string>& environment,
                 const std::string& input);
  RunningProgram(const RunningProgram&) = delete;
  RunningProgram& operator=(const RunningProgram&) = delete;
  /// Kills it when it still runs.
  ~RunningProgram();

  void signal(int number) const;
  /// Waits for its end; fails the test and kills it after a minute.
  Ended wait();
  [[nodiscard]] bool hasEnded();
  /// What it has printed to stdout so far.
  [[nodiscard]] std::string outputSoFar() const;
  /// What it has printed to stderr so far.
  [[nodiscard]] std::string errorsSoFar() const;

 private:
  pid_t _process = 0;
  int _status = 0;
  bool _ended = false;
  ScratchFolder _folder;  // holds what it reads and prints
};

/// A test of the real program, in a library of its own.
class QuiltProgramTest : public ::testing::Test {
 protected:
  using Arguments = std::vector<std::string>;

  /// Runs the program on the library. No colours, no user settings.
  Ended quilt(const Arguments& arguments, const std::string& input = "") const;
  /// The same with --json, which is parsed.
  nlohmann::json quiltJson(const Arguments& arguments, int expectedExit = 0) const;
  std::unique_ptr<RunningProgram> start(const Arguments& arguments, const std::string& input = "") const;

  [[nodiscard]] std::filesystem::path library() const { return _folder / "library"; }
  [[nodiscard]] const std::filesystem::path& folder() const { return _folder.path(); }

  /// Every file and folder below a folder, with kind, size, content and times.
  using Snapshot = std::map<std::string, std::string>;
  static Snapshot snapshot(const std::filesystem::path& folder);

  static void write(const std::filesystem::path& file, const std::string& bytes);
  static std::string read(const std::filesystem::path& file);

  std::map<std::string, std::string> environment{{"PATH", "/usr/bin:/bin"}, {"HOME", "/nonexistent"}};

 private:
  ScratchFolder _folder;
};

/// Waits until the condition holds; false when it does not within the seconds.
bool waitUntil(const std::function<bool()>& condition, double seconds = 30);

}  // namespace quilt::support
