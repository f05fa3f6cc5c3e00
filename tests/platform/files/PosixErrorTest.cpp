// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <cerrno>

#include "quilt/platform/files/PosixError.h"

namespace quilt::platform {
namespace {

struct Expected {
  int number;
  ErrorKind kind;
  const char* text;
};

class PosixErrorTest : public ::testing::TestWithParam<Expected> {};

TEST_P(PosixErrorTest, HasItsKindAndSentence) {
  const Error error = posixError(GetParam().number, "/a/file");
  EXPECT_EQ(GetParam().kind, error.kind);
  EXPECT_EQ(GetParam().text, error.text);
  EXPECT_EQ("/a/file", error.file);
}

INSTANTIATE_TEST_SUITE_P(
    Numbers, PosixErrorTest,
    ::testing::Values(Expected{ENOENT, ErrorKind::NotFound, "There is no such file or folder"},
                      Expected{ENOTDIR, ErrorKind::NotFound, "A part of the path is not a folder"},
                      Expected{EEXIST, ErrorKind::AlreadyExists, "Something with this name is already there"},
                      Expected{ENOTEMPTY, ErrorKind::AlreadyExists, "Something with this name is already there"},
                      Expected{EISDIR, ErrorKind::AlreadyExists, "There is a folder in the place of the file"},
                      Expected{EACCES, ErrorKind::PermissionDenied, "Permission was refused"},
                      Expected{EPERM, ErrorKind::PermissionDenied, "Permission was refused"},
                      Expected{EROFS, ErrorKind::PermissionDenied, "The disk can only be read"},
                      Expected{ENOSPC, ErrorKind::NoSpace, "The disk is full"},
                      Expected{EDQUOT, ErrorKind::NoSpace, "The disk quota is used up"},
                      Expected{EFBIG, ErrorKind::NoSpace, "The file is larger than the disk allows"},
                      Expected{EMFILE, ErrorKind::InputOutput, "Too many files are open"},
                      Expected{ENFILE, ErrorKind::InputOutput, "Too many files are open"},
                      Expected{ENOMEM, ErrorKind::InputOutput, "There is not enough memory"},
                      Expected{EIO, ErrorKind::InputOutput, "The disk reported a read or write error"},
                      Expected{EBUSY, ErrorKind::Locked, "It is in use by another program"},
                      Expected{ETXTBSY, ErrorKind::Locked, "It is in use by another program"},
                      Expected{EWOULDBLOCK, ErrorKind::Locked, "It is in use by another program"},
                      Expected{ECANCELED, ErrorKind::Cancelled, "The operation was stopped"},
                      Expected{ELOOP, ErrorKind::Unsafe, "The path leads through a symbolic link"},
                      Expected{EXDEV, ErrorKind::Unsafe, "The path leads out of its folder"},
                      Expected{ENAMETOOLONG, ErrorKind::Unsupported, "The name or the path is too long"},
                      Expected{EINVAL, ErrorKind::Unsupported, "The item cannot be put there"},
                      Expected{ENODEV, ErrorKind::Unsupported, "It is neither a file nor a folder"},
                      Expected{ENOSYS, ErrorKind::Unsupported, "The disk does not support this"},
                      Expected{EOPNOTSUPP, ErrorKind::Unsupported, "The disk does not support this"}));

TEST(PosixErrorTextTest, OtherNumbersAreWordedByTheSystem) {
  const Error error = posixError(ENOTTY, "");
  EXPECT_EQ(ErrorKind::InputOutput, error.kind);
  EXPECT_EQ("Reading or writing failed: Inappropriate ioctl for device", error.text);
}

}  // namespace
}  // namespace quilt::platform
