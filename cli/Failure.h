// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <exception>
#include <nlohmann/json.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Error.h"

namespace quilt::cli {

using Json = nlohmann::ordered_json;

/// The program's exit codes.
enum class ExitCode {
  Done = 0,
  Failed = 1,
  Usage = 2,
  NotFound = 3,
  Invalid = 4,      ///< invalid or damaged input
  Partial = 5,      ///< some of several failed, the rest was done
  Locked = 6,       ///< another process writes to the library
  InputOutput = 7,  ///< no space, or reading or writing failed
  HungUp = 129,
  Interrupted = 130,
  Terminated = 143,
};

/// The code's name in JSON: "not-found".
const char* nameOf(ExitCode code);

/// Which code an error of the library ends in; a cancelled operation in the code of the signal that stopped it.
ExitCode exitCodeFor(platform::ErrorKind kind);

/// The same, told from a line of the library's log: InputOutput when it speaks of the disk, else Failed.
ExitCode exitCodeForCause(std::string_view cause);

/// Why a command did not do what was asked: thrown inside the program, reported in one place.
struct Failure : std::exception {
  Failure(ExitCode exitCode, std::string text, std::filesystem::path file = {})
      : code(exitCode), message(std::move(text)), path(std::move(file)) {}
  /// `what` says what could not be done ("Cannot read it"); the error's own sentence follows.
  Failure(const std::string& what, const platform::Error& error);

  const char* what() const noexcept override { return message.c_str(); }

  /// {"code", "message", "path", …}.
  [[nodiscard]] Json toJson() const;

  ExitCode code;
  std::string message;          ///< what happened, to which file, what next; escaped for a terminal
  std::filesystem::path path;   ///< empty: none
  std::vector<Failure> causes;  ///< one for each that failed, when several were asked
  Json details;                 ///< more members of the JSON error; null: none
};

/// What several failures amount to: nothing when there are none, the failure itself when one thing was asked, Partial
/// when `done` is not 0, else the code that all share, or Failed.
void throwIfAny(const std::vector<Failure>& failures, std::size_t done, const char* whatFailed);

}  // namespace quilt::cli
