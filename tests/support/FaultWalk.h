// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstddef>
#include <filesystem>
#include <functional>
#include <memory>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/testing/FaultySystemCalls.h"

// Walks through every fault that the system can put in an operation's way.

namespace quilt::support {

using platform::FaultySystemCalls;
using platform::PosixFileManager;

/// Makes the first, the second, … system call of the operation fail, until it makes fewer calls than that. Before each
/// run `prepare` sets the disk up; after it `inspect` gets the number of the failed call and whether the operation
/// succeeded all the same.
inline void failAtEveryCall(int error, FaultySystemCalls::Repeat repeat, const std::function<void()>& prepare,
                            const std::function<bool(PosixFileManager&)>& operation,
                            const std::function<void(std::size_t n, bool succeeded)>& inspect) {
  for (std::size_t n = 1; n < 10000; ++n) {
    SCOPED_TRACE("system call " + std::to_string(n) + " fails with error " + std::to_string(error));
    prepare();
    const auto system = std::make_shared<FaultySystemCalls>();
    PosixFileManager files(system);
    system->failNth(n, error, repeat);
    const bool succeeded = operation(files);
    const bool reached = system->calls().size() >= n;
    inspect(n, succeeded);
    if (!reached) {
      EXPECT_GT(n, 1U);
      EXPECT_TRUE(succeeded);
      return;
    }
  }
  FAIL() << "the operation never ends";
}

/// Kills a process at the first, the second, … system call of the operation, until it lives through it.
inline void dieAtEveryCall(const std::function<void()>& prepare,
                           const std::function<void(PosixFileManager&)>& operation,
                           const std::function<void(std::size_t n)>& inspect) {
  for (std::size_t n = 1; n < 10000; ++n) {
    SCOPED_TRACE("the process dies at system call " + std::to_string(n));
    prepare();
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
      const auto system = std::make_shared<FaultySystemCalls>();
      PosixFileManager files(system);
      system->dieAtNth(n);
      operation(files);
      _exit(0);
    }
    int status = 0;
    ASSERT_EQ(child, waitpid(child, &status, 0));
    ASSERT_TRUE(WIFEXITED(status));
    inspect(n);
    if (WEXITSTATUS(status) == 0) {
      EXPECT_GT(n, 1U);
      return;
    }
    ASSERT_EQ(FaultySystemCalls::kExitStatusWhenKilled, WEXITSTATUS(status));
  }
  FAIL() << "the operation never ends";
}

/// The descriptors that this process has open.
inline std::size_t openDescriptors() {
  const std::filesystem::directory_iterator entries("/proc/self/fd");
  return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

}  // namespace quilt::support
