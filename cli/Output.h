// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdio>
#include <optional>
#include <string>

#include "cli/Failure.h"
#include "cli/Messages.h"

namespace quilt::cli {

/// The results, on stdout: text as it comes, or one JSON document at the end. One thread at a time.
class Output {
 public:
  /// `color`: text may hold styles. `isTerminal`: people read it, and no program.
  Output(std::FILE* stream, bool json, bool isTerminal, bool color, Messages& messages)
      : _stream(stream), _json(json), _isTerminal(isTerminal), _color(color), _messages(messages) {}

  [[nodiscard]] bool isJson() const { return _json; }

  /// The result is a list, also when nothing is added to it.
  void beginList();
  /// One of several results, with the lines that people get.
  void item(Json object, const std::string& lines);
  /// The one result.
  void object(Json object, const std::string& lines);

  /// Prints the result now, for a command that goes on: what follows is told by messages and the exit code alone.
  void publish();

  /// A path as a result: escaped on a terminal, else as it is, so that a program can use it.
  [[nodiscard]] std::string shown(const std::filesystem::path& path) const;
  /// `text` in bold or dim where styles are shown.
  [[nodiscard]] std::string bold(const std::string& text) const { return styled("\x1b[1m", text); }
  [[nodiscard]] std::string dim(const std::string& text) const { return styled("\x1b[2m", text); }

  /// Ends the output and reports the failure, if there is one. The program's exit code: the failure's, or InputOutput
  /// when the results could not be written.
  ExitCode finish(const std::optional<Failure>& failure);

 private:
  [[nodiscard]] std::string styled(const char* style, const std::string& text) const;
  void print(const std::string& text);
  void printDocument(const std::optional<Failure>& failure);

  std::FILE* _stream;
  bool _json;
  bool _isTerminal;
  bool _color;
  Messages& _messages;
  Json _result;
  bool _isPublished = false;
  int _writeError = 0;  // errno of the first write that failed
};

}  // namespace quilt::cli
