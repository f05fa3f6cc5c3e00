// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <mutex>
#include <vector>

#include "quilt/platform/files/SystemCalls.h"

namespace quilt::platform {

/// System calls that fail, fall short or kill the process where a test says so. Any thread.
class FaultySystemCalls : public SystemCalls {
 public:
  enum class Call {
    Open,
    OpenBeneath,
    Close,
    Read,
    Write,
    CopyFileRange,
    CloneFile,
    Truncate,
    Sync,
    Lock,       ///< the first way to lock
    WholeLock,  ///< the other one
    ChangeMode,
    SetTimes,
    SetExtendedAttribute,
    MakeFolder,
    MakeLink,
    Rename,
    RenameIfFree,  ///< a rename that must not replace
    Unlink,
  };
  enum class Repeat { Once, ForEver };

  static constexpr int kExitStatusWhenKilled = 77;

  /// The n-th call from now on, counted from 1, fails with the error number; ForEver, also every later one.
  void failNth(std::size_t n, int error, Repeat repeat);
  /// Every call of the kind fails from now on.
  void failEvery(Call call, int error);
  /// The process ends, without any clean-up, in place of the n-th call from now on.
  void dieAtNth(std::size_t n);
  /// No read, write or copy transfers more than this many bytes.
  void transferAtMost(std::size_t count);

  /// The calls so far, those that failed included.
  [[nodiscard]] std::vector<Call> calls() const;

  int openAt(int folder, const char* name, int flags, mode_t mode) override;
  int openBeneath(int folder, const char* path, int flags) override;
  int close(int file) override;
  ssize_t read(int file, void* bytes, std::size_t count) override;
  ssize_t write(int file, const void* bytes, std::size_t count) override;
  ssize_t copyFileRange(int from, int to, std::size_t count) override;
  int cloneFile(int from, int to) override;
  int truncate(int file, off_t size) override;
  int sync(int file) override;
  int setLock(int file, short kind) override;
  int setWholeLock(int file, int operation) override;
  int changeMode(int file, mode_t mode) override;
  int setTimes(int file, const timespec times[2]) override;
  int setExtendedAttribute(int file, const char* name, const void* value, std::size_t size) override;
  int makeFolderAt(int folder, const char* name, mode_t mode) override;
  int makeLinkAt(const char* target, int folder, const char* name) override;
  int renameAt(int fromFolder, const char* from, int toFolder, const char* to, unsigned flags) override;
  int unlinkAt(int folder, const char* name, int flags) override;

 private:
  bool admit(Call call);
  std::size_t shortened(std::size_t count) const;

  mutable std::mutex _mutex;
  std::vector<Call> _calls;
  std::map<Call, int> _failing;
  std::size_t _failAt = 0;
  int _failure = 0;
  Repeat _repeat = Repeat::Once;
  std::size_t _dieAt = 0;
  std::size_t _transferAtMost = 0;
};

}  // namespace quilt::platform
