// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

#include "quilt/platform/base/ProgressionBlock.h"

namespace quilt::platform::office {

enum class ChildEnd { Exited, Killed, TimedOut, Cancelled, NotStarted };

struct ChildResult {
  ChildEnd end = ChildEnd::NotStarted;
  int status = 0;  ///< of the exit; an error number when it was not started
};

/// Runs a program that works on files from strangers, without a shell, and waits for it. It has no network where the
/// system lets an ordinary user take that away, no input or output, only the open files that it opens itself, at most
/// 4 GiB of memory and files of at most 1 GiB. It ends with this process. When `timeout` has passed or `goesOn`, which
/// is asked many times a second, answers false, and in any case when the program has ended, it is killed with every
/// process that it started.
ChildResult runChild(const std::filesystem::path& program, const std::vector<std::string>& arguments,
                     const std::vector<std::string>& environment, std::chrono::milliseconds timeout,
                     const ContinueBlock& goesOn = {});

}  // namespace quilt::platform::office
