// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <cerrno>

#include "cli/Failure.h"
#include "quilt/platform/files/PosixError.h"

namespace quilt::cli {
namespace {

// The library logs the text of an error inside a longer line; the program tells trouble with the disk by that text.
TEST(FailureSentencesTest, AnErrorOfTheDiskIsToldInALogLine) {
  for (const int number : {ENOSPC, EDQUOT, EFBIG, EIO, EACCES, EPERM, EROFS}) {
    const std::string line = "Failed to create it at path \"/x\": \"" + platform::posixError(number, "/x").text + "\"";
    EXPECT_EQ(ExitCode::InputOutput, exitCodeForCause(line)) << line;
  }
  for (const int number : {ENOENT, EEXIST, ELOOP}) {
    const std::string line = "Failed to create it: \"" + platform::posixError(number, "/x").text + "\"";
    EXPECT_EQ(ExitCode::Failed, exitCodeForCause(line)) << line;
  }
}

}  // namespace
}  // namespace quilt::cli
