// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

namespace quilt::support {

struct ProgramResult {
  int status = -1;     ///< of the exit; -1 when it did not start or was killed
  std::string output;  ///< standard output and error
};

/// Runs a program found on the PATH, without a shell, and waits for it.
ProgramResult runProgram(const std::vector<std::string>& arguments);

}  // namespace quilt::support
