// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <array>
#include <cerrno>

#include "quilt/platform/files/Descriptor.h"
#include "quilt/platform/files/PosixError.h"
#include "quilt/platform/files/PosixFileManager.h"

namespace quilt::platform {

namespace {

// Whether the opened file is still the one at the path.
bool isStillThere(int file, const std::filesystem::path& path) {
  struct stat opened {};
  struct stat named {};
  return ::fstat(file, &opened) == 0 && ::lstat(path.c_str(), &named) == 0 && opened.st_dev == named.st_dev &&
         opened.st_ino == named.st_ino;
}

// The kernel gives the lock up with the descriptor, so also when the process dies.
class PosixFileLock final : public FileLock {
 public:
  PosixFileLock(std::shared_ptr<SystemCalls> system, Descriptor file, std::filesystem::path path, bool wasAbandoned)
      : _system(std::move(system)), _file(std::move(file)), _path(std::move(path)), _wasAbandoned(wasAbandoned) {}
  ~PosixFileLock() override {
    if (isStillThere(_file.number(), _path)) _system->unlinkAt(AT_FDCWD, _path.c_str(), 0);
  }
  [[nodiscard]] bool wasAbandoned() const override { return _wasAbandoned; }

 private:
  const std::shared_ptr<SystemCalls> _system;
  const Descriptor _file;
  const std::filesystem::path _path;
  const bool _wasAbandoned;
};

Error lockedBy(SystemCalls& system, int file, const std::filesystem::path& path) {
  std::array<char, 512> text{};
  const ssize_t size = system.read(file, text.data(), text.size());
  const std::string holder(text.data(), size > 0 ? static_cast<std::size_t>(size) : 0);
  return {ErrorKind::Locked, "It is in use by " + (holder.empty() ? "another program" : holder), path};
}

}  // namespace

Result<std::unique_ptr<FileLock>> PosixFileManager::lockFile(const std::filesystem::path& path,
                                                             std::string_view owner) {
  if (path.native().find('\0') != std::string::npos) return posixError(ENOENT, path);
  for (;;) {
    Descriptor file(
        _system->openAt(AT_FDCWD, path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW, S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH));
    if (!file) return posixError(errno, path);
    if (::flock(file.number(), LOCK_EX | LOCK_NB) != 0) {
      if (errno != EWOULDBLOCK) return posixError(errno, path);
      return lockedBy(*_system, file.number(), path);
    }
    // Its last holder may have deleted it between the two calls; then another process can make and lock a new one.
    if (!isStillThere(file.number(), path)) continue;
    // Who gives the lock up deletes the file, so text in it was left by a holder that did not come to that.
    struct stat left {};
    const bool wasAbandoned = ::fstat(file.number(), &left) == 0 && left.st_size > 0;
    if (_system->truncate(file.number(), 0) != 0) return posixError(errno, path);
    // The text is for people: the lock holds also when the disk is too full for it.
    [[maybe_unused]] const ssize_t written = _system->write(file.number(), owner.data(), owner.size());
    return std::unique_ptr<FileLock>(std::make_unique<PosixFileLock>(_system, std::move(file), path, wasAbandoned));
  }
}

}  // namespace quilt::platform
