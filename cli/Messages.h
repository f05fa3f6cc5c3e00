// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdio>
#include <functional>
#include <mutex>
#include <string>

namespace quilt::cli {

/// What people read beside the results, on stderr: errors, warnings, notes, and one status line that stays at the
/// bottom of a terminal. Any thread.
class Messages {
 public:
  /// `isTerminal`: a status line can be drawn over. `color`: errors stand out.
  Messages(std::FILE* stream, bool isTerminal, bool color) : _stream(stream), _isTerminal(isTerminal), _color(color) {}

  void setQuiet(bool quiet) { _quiet = quiet; }

  /// Text that may come from outside is escaped by the caller.
  void error(const std::string& text);
  void warning(const std::string& text);  ///< not when quiet
  void note(const std::string& text);     ///< not when quiet
  /// A line as it stands.
  void line(const std::string& text);

  [[nodiscard]] bool isTerminal() const { return _isTerminal; }
  /// Draws the status line anew, or clears it when the text is empty. On a terminal only.
  void setStatus(const std::string& text);
  /// Runs the block while the status line is out of the way, for a block that prints elsewhere on the terminal.
  void withoutStatus(const std::function<void()>& block);

 private:
  void print(const char* kind, const char* color, const std::string& text);
  void clear();
  void draw();

  std::FILE* _stream;
  bool _isTerminal;
  bool _color;
  bool _quiet = false;
  std::mutex _mutex;
  std::string _status;
};

}  // namespace quilt::cli
