// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/PosixError.h"

#include <cerrno>
#include <system_error>

namespace quilt::platform {

Error posixError(int number, const std::filesystem::path& file) {
  switch (number) {
    case ENOENT:
      return {ErrorKind::NotFound, "There is no such file or folder", file};
    case ENOTDIR:
      return {ErrorKind::NotFound, "A part of the path is not a folder", file};
    case EEXIST:
    case ENOTEMPTY:
      return {ErrorKind::AlreadyExists, "Something with this name is already there", file};
    case EISDIR:
      return {ErrorKind::AlreadyExists, "There is a folder in the place of the file", file};
    case EACCES:
    case EPERM:
      return {ErrorKind::PermissionDenied, "Permission was refused", file};
    case EROFS:
      return {ErrorKind::PermissionDenied, "The disk can only be read", file};
    case ENOSPC:
      return {ErrorKind::NoSpace, "The disk is full", file};
    case EDQUOT:
      return {ErrorKind::NoSpace, "The disk quota is used up", file};
    case EFBIG:
      return {ErrorKind::NoSpace, "The file is larger than the disk allows", file};
    case EMFILE:
    case ENFILE:
      return {ErrorKind::InputOutput, "Too many files are open", file};
    case ENOMEM:
      return {ErrorKind::InputOutput, "There is not enough memory", file};
    case EIO:
      return {ErrorKind::InputOutput, "The disk reported a read or write error", file};
    case EBUSY:
    case ETXTBSY:
    case EWOULDBLOCK:
      return {ErrorKind::Locked, "It is in use by another program", file};
    case ECANCELED:
      return {ErrorKind::Cancelled, "The operation was stopped", file};
    case ELOOP:
      return {ErrorKind::Unsafe, "The path leads through a symbolic link", file};
    case EXDEV:
      return {ErrorKind::Unsafe, "The path leads out of its folder", file};
    case ENAMETOOLONG:
      return {ErrorKind::Unsupported, "The name or the path is too long", file};
    case EINVAL:
      return {ErrorKind::Unsupported, "The item cannot be put there", file};
    case ENODEV:
      return {ErrorKind::Unsupported, "It is neither a file nor a folder", file};
    case ENOSYS:
    case EOPNOTSUPP:
      return {ErrorKind::Unsupported, "The disk does not support this", file};
  }
  return {ErrorKind::InputOutput, "Reading or writing failed: " + std::generic_category().message(number), file};
}

}  // namespace quilt::platform
