// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string>

namespace quilt::platform {

/// What went wrong, coarse enough to act on. The program's exit codes and the bridge's answers follow from it.
enum class ErrorKind {
  NotFound,          ///< the file or object is not there
  AlreadyExists,     ///< something is in the way
  PermissionDenied,  ///< the system refused access
  NoSpace,           ///< the disk or a quota is full
  InputOutput,       ///< reading or writing failed
  Damaged,           ///< the bytes are not what their format promises, or exceed a limit
  Unsupported,       ///< well-formed, but nothing here handles it
  Cancelled,         ///< the caller asked to stop
  Locked,            ///< another process holds it
  Changed,           ///< another hand was faster: it is no longer as the caller knew it
  Unsafe,            ///< refused because it would reach outside the folder that owns it
};

/// An error as every layer passes it on: worded once, by whoever detected it.
struct Error {
  ErrorKind kind;              ///< what to act on
  std::string text;            ///< one sentence for people, without the file's name
  std::filesystem::path file;  ///< the file concerned; empty when there is none
};

}  // namespace quilt::platform
