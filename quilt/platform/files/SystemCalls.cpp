// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/SystemCalls.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <linux/openat2.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace quilt::platform {

namespace {

template <class Call>
auto uninterrupted(const Call& call) {
  auto answer = call();
  while (answer == -1 && errno == EINTR) answer = call();
  return answer;
}

}  // namespace

int SystemCalls::openAt(int folder, const char* name, int flags, mode_t mode) {
  return uninterrupted([&] { return ::openat(folder, name, flags | O_CLOEXEC, mode); });
}

int SystemCalls::openBeneath(int folder, const char* path, int flags) {
  open_how how{};
  how.flags = static_cast<decltype(how.flags)>(flags | O_CLOEXEC);
  how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS;
  return uninterrupted([&] { return static_cast<int>(::syscall(SYS_openat2, folder, path, &how, sizeof how)); });
}

// Never repeated: the descriptor is gone even when a signal interrupts the call.
int SystemCalls::close(int file) {
  const int answer = ::close(file);
  return answer == -1 && errno == EINTR ? 0 : answer;
}

ssize_t SystemCalls::read(int file, void* bytes, std::size_t count) {
  return uninterrupted([&] { return ::read(file, bytes, count); });
}

ssize_t SystemCalls::write(int file, const void* bytes, std::size_t count) {
  return uninterrupted([&] { return ::write(file, bytes, count); });
}

ssize_t SystemCalls::copyFileRange(int from, int to, std::size_t count) {
  return uninterrupted([&] { return ::copy_file_range(from, nullptr, to, nullptr, count, 0); });
}

int SystemCalls::cloneFile(int from, int to) {
  return uninterrupted([&] { return ::ioctl(to, FICLONE, from); });
}

int SystemCalls::truncate(int file, off_t size) {
  return uninterrupted([&] { return ::ftruncate(file, size); });
}

int SystemCalls::sync(int file) {
  return uninterrupted([&] { return ::fsync(file); });
}

int SystemCalls::setLock(int file, short kind) {
  struct flock whole {};  // from 0 on, to wherever the file ends
  whole.l_type = kind;
  whole.l_whence = SEEK_SET;
  return uninterrupted([&] { return ::fcntl(file, F_OFD_SETLK, &whole); });
}

int SystemCalls::setWholeLock(int file, int operation) {
  return uninterrupted([&] { return ::flock(file, operation); });
}

int SystemCalls::changeMode(int file, mode_t mode) {
  return uninterrupted([&] { return ::fchmod(file, mode); });
}

int SystemCalls::setTimes(int file, const timespec times[2]) {
  return uninterrupted([&] { return ::futimens(file, times); });
}

int SystemCalls::setExtendedAttribute(int file, const char* name, const void* value, std::size_t size) {
  return uninterrupted([&] { return ::fsetxattr(file, name, value, size, 0); });
}

int SystemCalls::makeFolderAt(int folder, const char* name, mode_t mode) {
  return uninterrupted([&] { return ::mkdirat(folder, name, mode); });
}

int SystemCalls::makeLinkAt(const char* target, int folder, const char* name) {
  return uninterrupted([&] { return ::symlinkat(target, folder, name); });
}

int SystemCalls::renameAt(int fromFolder, const char* from, int toFolder, const char* to, unsigned flags) {
  return uninterrupted([&] { return ::renameat2(fromFolder, from, toFolder, to, flags); });
}

int SystemCalls::unlinkAt(int folder, const char* name, int flags) {
  return uninterrupted([&] { return ::unlinkat(folder, name, flags); });
}

}  // namespace quilt::platform
