// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <optional>
#include <thread>

#include "quilt/platform/files/Descriptor.h"
#include "quilt/platform/files/PosixError.h"
#include "quilt/platform/files/PosixFileManager.h"

namespace quilt::platform {

namespace {

/// How a lock file begins; the holder's text follows. Whoever gives the lock up deletes the file, so a file with this
/// in it that nobody holds was left by a killed holder.
constexpr std::string_view kMark = "quilt lock\n";

/// How long a lock is tried again that somebody has alone without owning up to it. A sole holder is about to say who it
/// is; several that share it say nothing.
constexpr std::chrono::milliseconds kMomentForOne{200};
/// To share it: somebody is the last of several and about to delete the file, or clears away what a killed one left.
constexpr std::chrono::milliseconds kMomentForMany{5000};

bool isConflict(int error) { return error == EAGAIN || error == EWOULDBLOCK || error == EACCES; }

bool isMissingSupport(int error) {
  return error == ENOLCK || error == ENOSYS || error == EOPNOTSUPP || error == EINVAL || error == EBADF;
}

Error noLocks(const std::filesystem::path& path) {
  return {ErrorKind::Unsupported, "The disk does not support locks, so nothing would keep other programs away", path};
}

Error foreign(const std::filesystem::path& path) {
  return {ErrorKind::Unsafe, "Something that is no lock is in the place of the lock", path};
}

/// An opened lock file and its lock. Locks of open file descriptions, which a network file system hands on to its
/// server; where the kernel has none, flock, which it hands on likewise. The kernel gives a lock up with the
/// descriptor, so also when the process dies. Operations answer 0 or an error number.
class LockFile {
 public:
  LockFile(std::shared_ptr<SystemCalls> system, std::filesystem::path path)
      : _system(std::move(system)), _path(std::move(path)) {}
  LockFile(const LockFile&) = delete;
  LockFile& operator=(const LockFile&) = delete;
  ~LockFile() {
    if (_isOurs) release();
  }

  /// Neither waits for a pipe nor follows a link.
  int open() {
    constexpr mode_t everyone = S_IRUSR | S_IWUSR | S_IRGRP | S_IWGRP | S_IROTH | S_IWOTH;
    _file = Descriptor(
        _system->openAt(AT_FDCWD, _path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY, everyone));
    return _file ? 0 : errno;
  }

  int lock(short kind) {
    _isShared = kind == F_RDLCK;
    if (!_usesFlock && _system->setLock(_file.number(), kind) == 0) return 0;
    if (!_usesFlock && errno != EINVAL) return errno;
    _usesFlock = true;
    const int operation = kind == F_WRLCK ? LOCK_EX : kind == F_RDLCK ? LOCK_SH : LOCK_UN;
    return _system->setWholeLock(_file.number(), operation | LOCK_NB) == 0 ? 0 : errno;
  }

  /// Whether the opened file is still the one at the path, and has no other name.
  [[nodiscard]] bool isStillThere() const {
    struct stat opened {};
    struct stat named {};
    return ::fstat(_file.number(), &opened) == 0 && opened.st_nlink > 0 && ::lstat(_path.c_str(), &named) == 0 &&
           opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
  }

  /// Whether it may be a lock file by its kind: writing to anything else would harm it.
  [[nodiscard]] bool isPlain() const {
    struct stat status {};
    return ::fstat(_file.number(), &status) == 0 && S_ISREG(status.st_mode) && status.st_nlink <= 1;
  }

  /// What is in it; none when it is no lock file's.
  [[nodiscard]] std::optional<std::string> content() const {
    std::array<char, 512> text{};
    const ssize_t size = ::pread(_file.number(), text.data(), text.size(), 0);
    std::string content(text.data(), size > 0 ? static_cast<std::size_t>(size) : 0);
    // A full disk may have cut it short.
    if (!std::string_view(content).starts_with(kMark) && !kMark.starts_with(content)) return std::nullopt;
    return content;
  }

  int clear() { return _system->truncate(_file.number(), 0) == 0 ? 0 : errno; }

  /// Once, into an empty file. The text is for people: the lock holds also when the disk is too full for it.
  void write(const std::string& content) {
    [[maybe_unused]] const ssize_t written = _system->write(_file.number(), content.data(), content.size());
  }

  /// From now on the file goes when the last holder gives the lock up.
  void own() { _isOurs = true; }

  /// A file that nobody has written to, made in vain.
  void removeIfUnused() const {
    struct stat status {};
    if (::fstat(_file.number(), &status) == 0 && status.st_size == 0 && isPlain() && isStillThere())
      _system->unlinkAt(AT_FDCWD, _path.c_str(), 0);
  }

 private:
  // Others that share it keep the file: only who gets it alone deletes it. The own share goes first, or two that end at
  // the same time would each keep the other from being alone.
  void release() {
    if (_isShared) {
      (void)lock(F_UNLCK);
      if (lock(F_WRLCK) != 0) return;
    }
    if (isStillThere()) _system->unlinkAt(AT_FDCWD, _path.c_str(), 0);
  }

  const std::shared_ptr<SystemCalls> _system;
  const std::filesystem::path _path;
  Descriptor _file;
  bool _usesFlock = false;
  bool _isShared = false;
  bool _isOurs = false;
};

class PosixFileLock final : public FileLock {
 public:
  PosixFileLock(std::unique_ptr<LockFile> file, bool wasAbandoned)
      : _file(std::move(file)), _wasAbandoned(wasAbandoned) {}
  [[nodiscard]] bool wasAbandoned() const override { return _wasAbandoned; }

 private:
  const std::unique_ptr<LockFile> _file;
  const bool _wasAbandoned;
};

/// A lock file that is locked, and there.
struct Locked {
  std::unique_ptr<LockFile> file;
  std::string content;
};

/// Opens and locks; again, when the last holder deleted the file between the two or is about to say who it is.
Result<Locked> take(const std::shared_ptr<SystemCalls>& system, const std::filesystem::path& path, short kind) {
  if (path.native().find('\0') != std::string::npos) return posixError(ENOENT, path);
  const auto end = std::chrono::steady_clock::now() + (kind == F_RDLCK ? kMomentForMany : kMomentForOne);
  for (;;) {
    auto file = std::make_unique<LockFile>(system, path);
    if (const int error = file->open())
      return error == EISDIR || error == ENXIO ? foreign(path) : posixError(error, path);
    // Asked before anything is locked or written: what lies here may be somebody's.
    if (!file->isPlain() && file->isStillThere()) return foreign(path);
    const int error = file->lock(kind);
    if (isMissingSupport(error)) {
      file->removeIfUnused();
      return noLocks(path);
    }
    if (error != 0 && !isConflict(error)) return posixError(error, path);
    if (error == 0 && !file->isStillThere()) continue;
    const std::optional<std::string> content = file->content();
    if (!content) return foreign(path);
    if (error == 0) return Locked{std::move(file), *content};
    const std::string holder = content->size() > kMark.size() ? content->substr(kMark.size()) : std::string();
    if (!holder.empty() || std::chrono::steady_clock::now() > end)
      return Error{ErrorKind::Locked, "It is in use by " + (holder.empty() ? "another program" : holder), path};
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
}

}  // namespace

std::string PosixFileManager::thisProcess() const {
  std::array<char, 256> host{};
  const bool isKnown = ::gethostname(host.data(), host.size() - 1) == 0 && host[0] != '\0';
  return "process " + std::to_string(::getpid()) + " on " + (isKnown ? host.data() : "an unknown host");
}

Result<std::unique_ptr<FileLock>> PosixFileManager::lockFile(const std::filesystem::path& path,
                                                             std::string_view owner) {
  Result<Locked> taken = take(_system, path, F_WRLCK);
  if (!taken) return taken.error();
  const bool wasAbandoned = !taken->content.empty();
  if (const int error = taken->file->clear()) return posixError(error, path);
  taken->file->write(std::string(kMark) + std::string(owner));
  taken->file->own();
  return std::unique_ptr<FileLock>(std::make_unique<PosixFileLock>(std::move(taken->file), wasAbandoned));
}

Result<std::unique_ptr<FileLock>> PosixFileManager::shareLockFile(const std::filesystem::path& path,
                                                                  const std::function<void()>& afterKilled) {
  for (;;) {
    Result<Locked> taken = take(_system, path, F_RDLCK);
    if (!taken) return taken.error();
    LockFile& file = *taken->file;
    // Others that share it have left the mark, or somebody who was killed has: who gets it alone knows.
    const bool wasAbandoned = !taken->content.empty() && file.lock(F_WRLCK) == 0;
    if (wasAbandoned) {
      if (afterKilled) afterKilled();
      if (const int error = file.clear()) return posixError(error, path);
    }
    // Where changing the kind of a lock gives it up first, somebody may have been faster.
    const int error = file.lock(F_RDLCK);
    if (isConflict(error) || (error == 0 && !file.isStillThere())) continue;
    if (error != 0) return posixError(error, path);
    if (taken->content.empty() || wasAbandoned) file.write(std::string(kMark));
    file.own();
    return std::unique_ptr<FileLock>(std::make_unique<PosixFileLock>(std::move(taken->file), wasAbandoned));
  }
}

}  // namespace quilt::platform
