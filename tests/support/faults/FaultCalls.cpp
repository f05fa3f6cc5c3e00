// SPDX-License-Identifier: Apache-2.0
// Preloaded into the program by tests: counts the calls by which it changes the disk below given folders, and at the
// n-th kills it or has the call fail. Variables:
//   QUILT_FAULT_ROOTS  the folders, parted by colons
//   QUILT_FAULT_AT     n, counted from 1
//   QUILT_FAULT_ERROR  the error number of the call that fails; without it the process is killed in the call's place
//   QUILT_FAULT_EVER   when set, every later call fails too
//   QUILT_FAULT_COUNT  a file into which the number of calls is written at the end
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

std::atomic<long> counted{0};

long numberFrom(const char* variable) {
  const char* text = std::getenv(variable);
  return text ? std::atol(text) : 0;
}

bool liesBelow(const char* path, const char* roots) {
  for (const char* root = roots; *root;) {
    const char* end = std::strchr(root, ':');
    const std::size_t length = end ? static_cast<std::size_t>(end - root) : std::strlen(root);
    if (length > 0 && std::strncmp(path, root, length) == 0) return true;
    root += length + (end ? 1 : 0);
  }
  return false;
}

bool concernsDescriptor(int file) {
  const char* roots = std::getenv("QUILT_FAULT_ROOTS");
  if (!roots || file < 0) return false;
  char link[64];
  std::snprintf(link, sizeof link, "/proc/self/fd/%d", file);
  char path[PATH_MAX + 1];
  const ssize_t length = readlink(link, path, PATH_MAX);
  if (length <= 0) return false;
  path[length] = '\0';
  return liesBelow(path, roots);
}

bool concerns(int folder, const char* name) {
  const char* roots = std::getenv("QUILT_FAULT_ROOTS");
  if (!roots || !name) return false;
  return name[0] == '/' ? liesBelow(name, roots) : folder != AT_FDCWD && concernsDescriptor(folder);
}

// Whether the call is to be made; errno is set when not.
bool admit() {
  static const long at = numberFrom("QUILT_FAULT_AT");
  static const long error = numberFrom("QUILT_FAULT_ERROR");
  static const bool forEver = std::getenv("QUILT_FAULT_EVER") != nullptr;
  const long n = ++counted;
  if (at == 0 || n < at || (n > at && !forEver)) return true;
  if (error == 0) {
    syscall(SYS_kill, getpid(), SIGKILL);
    pause();
  }
  errno = static_cast<int>(error);
  return false;
}

template <class Function>
Function* next(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

[[gnu::destructor]] void tellCount() {
  const char* file = std::getenv("QUILT_FAULT_COUNT");
  if (!file) return;
  char text[32];
  const int length = std::snprintf(text, sizeof text, "%ld\n", counted.load());
  const long opened = syscall(SYS_openat, AT_FDCWD, file, O_WRONLY | O_CREAT | O_TRUNC, 0600);
  syscall(SYS_write, opened, text, length);
  syscall(SYS_close, opened);
}

}  // namespace

#define PASS_ON(name, ...)                              \
  static const auto real = next<decltype(name)>(#name); \
  return real(__VA_ARGS__)

#define FAULTY(type, name, parameters, isConcerned, ...) \
  type name parameters {                                 \
    if ((isConcerned) && !admit()) return -1;            \
    PASS_ON(name, __VA_ARGS__);                          \
  }

extern "C" {

FAULTY(ssize_t, write, (int file, const void* bytes, size_t count), concernsDescriptor(file), file, bytes, count)
FAULTY(ssize_t, pwrite, (int file, const void* bytes, size_t count, off_t at), concernsDescriptor(file), file, bytes,
       count, at)
FAULTY(ssize_t, pwrite64, (int file, const void* bytes, size_t count, off64_t at), concernsDescriptor(file), file,
       bytes, count, at)
FAULTY(ssize_t, writev, (int file, const iovec* parts, int count), concernsDescriptor(file), file, parts, count)
FAULTY(ssize_t, copy_file_range, (int from, off64_t* fromAt, int to, off64_t* toAt, size_t count, unsigned flags),
       concernsDescriptor(to), from, fromAt, to, toAt, count, flags)
FAULTY(int, ftruncate, (int file, off_t size) noexcept, concernsDescriptor(file), file, size)
FAULTY(int, ftruncate64, (int file, off64_t size) noexcept, concernsDescriptor(file), file, size)
FAULTY(int, fsync, (int file), concernsDescriptor(file), file)
FAULTY(int, fdatasync, (int file), concernsDescriptor(file), file)
FAULTY(int, rename, (const char* from, const char* to) noexcept, concerns(AT_FDCWD, to), from, to)
FAULTY(int, renameat, (int fromFolder, const char* from, int toFolder, const char* to) noexcept, concerns(toFolder, to),
       fromFolder, from, toFolder, to)
FAULTY(int, renameat2, (int fromFolder, const char* from, int toFolder, const char* to, unsigned flags) noexcept,
       concerns(toFolder, to), fromFolder, from, toFolder, to, flags)
FAULTY(int, link, (const char* from, const char* to) noexcept, concerns(AT_FDCWD, to), from, to)
FAULTY(int, linkat, (int fromFolder, const char* from, int toFolder, const char* to, int flags) noexcept,
       concerns(toFolder, to), fromFolder, from, toFolder, to, flags)
FAULTY(int, symlinkat, (const char* from, int folder, const char* to) noexcept, concerns(folder, to), from, folder, to)
FAULTY(int, unlink, (const char* path) noexcept, concerns(AT_FDCWD, path), path)
FAULTY(int, unlinkat, (int folder, const char* path, int flags) noexcept, concerns(folder, path), folder, path, flags)
FAULTY(int, remove, (const char* path) noexcept, concerns(AT_FDCWD, path), path)
FAULTY(int, rmdir, (const char* path) noexcept, concerns(AT_FDCWD, path), path)
FAULTY(int, mkdir, (const char* path, mode_t mode) noexcept, concerns(AT_FDCWD, path), path, mode)
FAULTY(int, mkdirat, (int folder, const char* path, mode_t mode) noexcept, concerns(folder, path), folder, path, mode)
FAULTY(int, fchmod, (int file, mode_t mode) noexcept, concernsDescriptor(file), file, mode)

int openat(int folder, const char* path, int flags, ...) {
  mode_t mode = 0;
  if (flags & O_CREAT) {
    va_list rest;
    va_start(rest, flags);
    mode = va_arg(rest, mode_t);
    va_end(rest);
    if (concerns(folder, path) && !admit()) return -1;
  }
  PASS_ON(openat, folder, path, flags, mode);
}

int open(const char* path, int flags, ...) {
  mode_t mode = 0;
  if (flags & O_CREAT) {
    va_list rest;
    va_start(rest, flags);
    mode = va_arg(rest, mode_t);
    va_end(rest);
    if (concerns(AT_FDCWD, path) && !admit()) return -1;
  }
  PASS_ON(open, path, flags, mode);
}

}  // extern "C"
