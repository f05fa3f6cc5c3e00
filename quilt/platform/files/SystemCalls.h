// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <ctime>

namespace quilt::platform {

/// The calls of the operating system through which PosixFileManager reads and changes the disk. Each answers as the
/// call that it is named after does, errno included, and repeats itself when a signal interrupts it. A test overrides
/// some to fail, to stop the process or to record.
class SystemCalls {
 public:
  virtual ~SystemCalls() = default;

  virtual int openAt(int folder, const char* name, int flags, mode_t mode);
  /// openat2 that neither leaves the folder nor passes a symbolic link. Fails with ENOSYS on kernels before 5.6.
  virtual int openBeneath(int folder, const char* path, int flags);
  virtual int close(int file);

  virtual ssize_t read(int file, void* bytes, std::size_t count);
  virtual ssize_t write(int file, const void* bytes, std::size_t count);
  /// Copies from and to the files' own positions.
  virtual ssize_t copyFileRange(int from, int to, std::size_t count);
  /// Makes `to` share the blocks of `from`.
  virtual int cloneFile(int from, int to);
  virtual int truncate(int file, off_t size);
  virtual int sync(int file);

  /// fcntl's F_OFD_SETLK on the whole file: F_RDLCK, F_WRLCK or F_UNLCK. Never waits.
  virtual int setLock(int file, short kind);
  /// flock, of which LOCK_NB is the caller's to say.
  virtual int setWholeLock(int file, int operation);

  virtual int changeMode(int file, mode_t mode);
  virtual int setTimes(int file, const timespec times[2]);
  virtual int setExtendedAttribute(int file, const char* name, const void* value, std::size_t size);

  virtual int makeFolderAt(int folder, const char* name, mode_t mode);
  virtual int makeLinkAt(const char* target, int folder, const char* name);
  virtual int renameAt(int fromFolder, const char* from, int toFolder, const char* to, unsigned flags);
  virtual int unlinkAt(int folder, const char* name, int flags);
};

}  // namespace quilt::platform
