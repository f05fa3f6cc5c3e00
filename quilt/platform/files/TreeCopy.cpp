// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/TreeCopy.h"

#include <fcntl.h>
#include <linux/limits.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <vector>

#include "quilt/platform/files/Descriptor.h"
#include "quilt/platform/files/Folders.h"

namespace quilt::platform {

namespace {

// Small enough that progress and a stop answer are prompt on a slow disk.
constexpr std::size_t kKernelStretch = std::size_t{8} << 20;
constexpr std::size_t kBufferSize = std::size_t{1} << 20;
constexpr mode_t kPermissions = S_ISVTX | S_IRWXU | S_IRWXG | S_IRWXO;

// Whether `folder` or a folder above it is the one with that identity.
int liesInside(SystemCalls& system, int folder, const struct stat& outer, bool& inside) {
  Descriptor current(system.openAt(folder, ".", O_PATH | O_DIRECTORY, 0));
  struct stat below {};
  inside = false;
  for (;;) {
    struct stat status {};
    if (!current || ::fstat(current.number(), &status) != 0) return errno;
    if (status.st_dev == outer.st_dev && status.st_ino == outer.st_ino) {
      inside = true;
      return 0;
    }
    if (status.st_dev == below.st_dev && status.st_ino == below.st_ino) return 0;  // the root is its own parent
    below = status;
    current = Descriptor(system.openAt(current.number(), "..", O_PATH | O_DIRECTORY, 0));
  }
}

// Attributes are extras: what the destination's file system cannot hold, or this user may not set, is left out.
bool isBeyondTheDestination(int error) {
  return error == EOPNOTSUPP || error == EPERM || error == EACCES || error == ENOSPC || error == E2BIG ||
         error == ERANGE || error == EINVAL;
}

}  // namespace

int TreeCopy::run(const std::filesystem::path& source, bool followLink, int toFolder, const std::string& name) {
  _copiedBytes = 0;
  _failedFile.clear();
  if (source.native().find('\0') != std::string::npos) {
    _failedFile = source;
    return ENOENT;
  }
  return copyItem(AT_FDCWD, source, source.c_str(), followLink, toFolder, name, 0);
}

int TreeCopy::copyItem(int fromFolder, const std::filesystem::path& source, const char* sourceName, bool followLink,
                       int toFolder, const std::string& name, int depth) {
  const int error = copyItemKind(fromFolder, source, sourceName, followLink, toFolder, name, depth);
  if (error != 0 && _failedFile.empty()) _failedFile = source;
  return error;
}

int TreeCopy::copyItemKind(int fromFolder, const std::filesystem::path& source, const char* sourceName, bool followLink,
                           int toFolder, const std::string& name, int depth) {
  struct stat status {};
  if (::fstatat(fromFolder, sourceName, &status, followLink ? 0 : AT_SYMLINK_NOFOLLOW) != 0) return errno;
  if (S_ISLNK(status.st_mode)) return copyLink(fromFolder, sourceName, toFolder, name);
  if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) return ENODEV;
  // Not blocking: should a pipe have taken the file's place since, opening it must not wait for a writer.
  const Descriptor from(
      _system.openAt(fromFolder, sourceName, O_RDONLY | O_NONBLOCK | (followLink ? 0 : O_NOFOLLOW), 0));
  if (!from || ::fstat(from.number(), &status) != 0) return errno;
  if (S_ISREG(status.st_mode)) return copyFile(from.number(), status, toFolder, name);
  if (!S_ISDIR(status.st_mode)) return ENODEV;
  if (depth > kDeepestFolder) return ENAMETOOLONG;
  if (depth == 0) {
    bool inside = false;
    if (const int error = liesInside(_system, toFolder, status, inside)) return error;
    if (inside) return EINVAL;
  }
  return copyFolder(from.number(), status, source, toFolder, name, depth);
}

int TreeCopy::copyLink(int fromFolder, const char* sourceName, int toFolder, const std::string& name) {
  std::array<char, PATH_MAX + 1> target{};
  const ssize_t length = ::readlinkat(fromFolder, sourceName, target.data(), target.size() - 1);
  if (length < 0) return errno;
  return _system.makeLinkAt(target.data(), toFolder, name.c_str()) == 0 ? 0 : errno;
}

int TreeCopy::copyFolder(int from, const struct stat& status, const std::filesystem::path& source, int toFolder,
                         const std::string& name, int depth) {
  if (_system.makeFolderAt(toFolder, name.c_str(), S_IRWXU) != 0) return errno;
  const Descriptor to(_system.openAt(toFolder, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW, 0));
  if (!to) return errno;
  std::vector<std::string> names;
  if (const int error = listFolder(from, names)) return error;
  for (const std::string& child : names)
    if (const int error = copyItem(from, source / child, child.c_str(), false, to.number(), child, depth + 1))
      return error;
  if (const int error = copyMetadata(from, to.number(), status)) return error;
  return _durable ? syncFolder(_system, to.number()) : 0;
}

int TreeCopy::copyFile(int from, const struct stat& status, int toFolder, const std::string& name) {
  Descriptor to(_system.openAt(toFolder, name.c_str(), O_WRONLY | O_CREAT | O_EXCL, S_IRUSR | S_IWUSR));
  if (!to) return errno;
  if (const int error = copyData(from, to.number(), status)) return error;
  if (const int error = copyMetadata(from, to.number(), status)) return error;
  if (_durable && _system.sync(to.number()) != 0) return errno;
  // Some network file systems tell only now that the disk is full.
  return _system.close(to.release()) == 0 ? 0 : errno;
}

int TreeCopy::copyData(int from, int to, const struct stat& status) {
  if (status.st_size > 0 && _system.cloneFile(from, to) == 0) return advance(status.st_size);
  if (const int error = copyInKernel(from, to)) return error;
  // Also when the kernel says that the end is reached: some file systems say so too early.
  return copyThroughBuffer(from, to);
}

// Ends without an error where the kernel cannot go on.
int TreeCopy::copyInKernel(int from, int to) {
  for (;;) {
    const ssize_t copied = _system.copyFileRange(from, to, kKernelStretch);
    if (copied == 0) return 0;
    if (copied < 0) {
      const bool supported =
          errno != EXDEV && errno != EINVAL && errno != ENOSYS && errno != EOPNOTSUPP && errno != EPERM;
      return supported ? errno : 0;
    }
    if (const int error = advance(copied)) return error;
  }
}

int TreeCopy::copyThroughBuffer(int from, int to) {
  if (!_buffer) _buffer = std::make_unique_for_overwrite<char[]>(kBufferSize);
  for (;;) {
    const ssize_t count = _system.read(from, _buffer.get(), kBufferSize);
    if (count == 0) return 0;
    if (count < 0) return errno;
    for (ssize_t written = 0; written < count;) {
      const ssize_t more = _system.write(to, _buffer.get() + written, static_cast<std::size_t>(count - written));
      if (more <= 0) return more == 0 ? EIO : errno;
      written += more;
    }
    if (const int error = advance(count)) return error;
  }
}

int TreeCopy::copyMetadata(int from, int to, const struct stat& status) {
  std::vector<char> names(XATTR_LIST_MAX);
  const ssize_t length = ::flistxattr(from, names.data(), names.size());
  if (length < 0 && !isBeyondTheDestination(errno)) return errno;
  std::vector<char> value;
  for (const char* name = names.data(); name < names.data() + length; name += std::strlen(name) + 1) {
    value.resize(XATTR_SIZE_MAX);
    const ssize_t size = ::fgetxattr(from, name, value.data(), value.size());
    if (size < 0) continue;  // removed since it was listed, or not for this user
    if (_system.setExtendedAttribute(to, name, value.data(), static_cast<std::size_t>(size)) != 0 &&
        !isBeyondTheDestination(errno))
      return errno;
  }
  if (_system.changeMode(to, status.st_mode & kPermissions) != 0) return errno;
  const timespec times[2] = {status.st_atim, status.st_mtim};
  return _system.setTimes(to, times) == 0 ? 0 : errno;
}

int TreeCopy::advance(std::int64_t bytes) {
  _copiedBytes += bytes;
  return _progress && !_progress(_copiedBytes) ? ECANCELED : 0;
}

}  // namespace quilt::platform
