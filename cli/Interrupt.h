// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cli/Failure.h"

namespace quilt::cli {

/// Ctrl-C and its kin (SIGINT, SIGTERM, SIGHUP). The first asks the command to stop, which long operations hear in
/// their progression blocks; the second ends the process at once. Any thread may ask.
class Interrupt {
 public:
  Interrupt() = delete;

  /// From now on the signals ask. SIGHUP is left alone when it was ignored at the start.
  static void listen();

  static bool isRequested();
  /// The code of the signal that came; Interrupted when none did.
  static ExitCode exitCode();
  /// What a stopped command reports.
  static Failure failure(const std::string& whatIsLeft);
};

}  // namespace quilt::cli
