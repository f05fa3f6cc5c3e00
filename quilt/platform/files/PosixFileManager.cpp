// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/files/PosixFileManager.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <thread>
#include <utility>

#include "quilt/platform/files/Folders.h"
#include "quilt/platform/files/PosixError.h"
#include "quilt/platform/files/TemporaryItem.h"

namespace quilt::platform {

namespace {

namespace fs = std::filesystem;

Result<void> resultOf(int error, const fs::path& file) {
  if (error != 0) return posixError(error, file);
  return {};
}

int statusOf(const fs::path& path, struct stat& status) {
  if (path.native().find('\0') != std::string::npos) return ENOENT;
  return ::stat(path.c_str(), &status) == 0 ? 0 : errno;
}

FileKind kindOf(mode_t mode) {
  if (S_ISREG(mode)) return FileKind::File;
  return S_ISDIR(mode) ? FileKind::Folder : FileKind::Other;
}

std::int64_t nanoseconds(const timespec& time) { return time.tv_sec * std::int64_t{1'000'000'000} + time.tv_nsec; }

int writeAll(SystemCalls& system, int file, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t written = system.write(file, bytes.data(), bytes.size());
    if (written <= 0) return written == 0 ? EIO : errno;
    bytes.remove_prefix(static_cast<std::size_t>(written));
  }
  return 0;
}

// Makes one folder and syncs its parent.
int makeFolder(SystemCalls& system, const fs::path& path) {
  if (system.makeFolderAt(AT_FDCWD, path.c_str(), S_IRWXU | S_IRWXG | S_IRWXO) != 0) return errno;
  Place place;
  const int error = openPlace(system, path, place);
  // A parent that may be written but not read cannot be synced.
  if (error != 0) return error == EACCES ? 0 : error;
  return syncFolder(system, place.folder.number());
}

FileIdentity identityOf(const struct stat& status) {
  return {status.st_dev, status.st_ino, static_cast<std::uint64_t>(status.st_size), nanoseconds(status.st_ctim)};
}

// Of what is there now, links followed. Opening it asks a network file system's server, where a mere look may be
// answered from what was known half a minute ago.
FileIdentity identityAt(SystemCalls& system, const Place& place) {
  struct stat status {};
  const Descriptor file(system.openAt(place.folder.number(), place.name.c_str(), O_RDONLY | O_NONBLOCK, 0));
  const bool isKnown = file ? ::fstat(file.number(), &status) == 0
                            : ::fstatat(place.folder.number(), place.name.c_str(), &status, 0) == 0;
  // What is no file is no state of one: it stands in the way, and writing says so.
  return isKnown && S_ISREG(status.st_mode) ? identityOf(status) : FileIdentity{};
}

// Whoever holds it is about to write one file. One that hangs, or a folder that cannot be locked, keeps nobody.
void lockForAMoment(SystemCalls& system, int folder) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(2);
  while (system.setWholeLock(folder, LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK &&
         std::chrono::steady_clock::now() < end)
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

int writeAtPlace(SystemCalls& system, const Place& place, std::string_view bytes) {
  const int folder = place.folder.number();
  struct stat old {};
  const bool replaces = ::fstatat(folder, place.name.c_str(), &old, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(old.st_mode);
  constexpr mode_t everyone = S_IRUSR | S_IWUSR | S_IRGRP | S_IWGRP | S_IROTH | S_IWOTH;
  constexpr mode_t permissions = S_IRWXU | S_IRWXG | S_IRWXO;

  TemporaryItem temporary(system, folder, place.name);
  Descriptor file;
  const int created = temporary.create([&](const std::string& name) {
    file = Descriptor(
        system.openAt(folder, name.c_str(), O_WRONLY | O_CREAT | O_EXCL, replaces ? S_IRUSR | S_IWUSR : everyone));
    return file ? 0 : errno;
  });
  if (created != 0) return created;
  if (const int error = writeAll(system, file.number(), bytes)) return error;
  if (replaces && system.changeMode(file.number(), old.st_mode & permissions) != 0) return errno;
  if (system.sync(file.number()) != 0) return errno;
  if (system.close(file.release()) != 0) return errno;
  if (const int error = temporary.replace()) return error;
  return syncFolder(system, folder);
}

}  // namespace

PosixFileManager::PosixFileManager(std::shared_ptr<SystemCalls> system) : _system(std::move(system)) {}

FileKind PosixFileManager::kindOfItemAtPath(const fs::path& path) const {
  struct stat status {};
  return statusOf(path, status) == 0 ? kindOf(status.st_mode) : FileKind::Missing;
}

bool PosixFileManager::isConfined(const fs::path& path, const fs::path& root) const {
  const std::optional<std::string> part = partBelow(path, root);
  if (!part) return false;
  const Descriptor folder(_system->openAt(AT_FDCWD, root.c_str(), O_PATH | O_DIRECTORY, 0));
  if (!folder) return errno == ENOENT;
  Descriptor item;
  const int error = openBelow(*_system, folder.number(), *part, O_PATH, item);
  return error == 0 || error == ENOENT || error == ENOTDIR;
}

Result<FileAttributes> PosixFileManager::attributesOfItemAtPath(const fs::path& path) const {
  struct stat status {};
  if (const int error = statusOf(path, status)) return posixError(error, path);
  FileAttributes attributes;
  attributes.kind = kindOf(status.st_mode);
  attributes.size = static_cast<std::uint64_t>(status.st_size);
  attributes.modified =
      Date(std::chrono::duration_cast<Date::duration>(std::chrono::nanoseconds(nanoseconds(status.st_mtim))));
  attributes.identity = identityOf(status);
  return attributes;
}

Result<void> PosixFileManager::createDirectoryAtPath(const fs::path& path) {
  if (path.native().find('\0') != std::string::npos) return posixError(ENOENT, path);
  std::vector<fs::path> pending{path};
  std::vector<fs::path> made;
  while (!pending.empty()) {
    const fs::path folder = pending.back();
    const int error = makeFolder(*_system, folder);
    if (error == 0) made.push_back(folder);
    if (error == 0 || (error == EEXIST && kindOfItemAtPath(folder) == FileKind::Folder)) {
      pending.pop_back();
    } else if (error == ENOENT && folder.has_parent_path() && folder.parent_path() != folder) {
      pending.push_back(folder.parent_path());
    } else {
      for (auto last = made.rbegin(); last != made.rend(); ++last)
        _system->unlinkAt(AT_FDCWD, last->c_str(), AT_REMOVEDIR);
      return posixError(error, folder);
    }
  }
  return {};
}

Result<std::vector<std::string>> PosixFileManager::contentsOfDirectoryAtPath(const fs::path& path) const {
  if (path.native().find('\0') != std::string::npos) return posixError(ENOENT, path);
  const Descriptor folder(_system->openAt(AT_FDCWD, path.c_str(), O_RDONLY | O_DIRECTORY, 0));
  if (!folder) return posixError(errno, path);
  std::vector<std::string> names;
  if (const int error = listFolder(folder.number(), names)) return posixError(error, path);
  return names;
}

Result<void> PosixFileManager::removeItem(const fs::path& path, const fs::path& within) {
  const std::optional<std::string> part = partBelow(path, within);
  if (!part) return posixError(EXDEV, path);
  const Descriptor root(_system->openAt(AT_FDCWD, within.c_str(), O_PATH | O_DIRECTORY, 0));
  if (!root) return posixError(errno, path);
  const fs::path below = *part;
  Descriptor folder;
  if (const int error = openBelow(*_system, root.number(), below.parent_path(), O_PATH | O_DIRECTORY, folder))
    return posixError(error, path);
  bool changed = false;
  return resultOf(removeTree(*_system, folder.number(), below.filename(), changed), path);
}

Result<std::string> PosixFileManager::readFile(const fs::path& path, std::uint64_t maximum) const {
  if (path.native().find('\0') != std::string::npos) return posixError(ENOENT, path);
  // Not blocking: a pipe in the file's place must not be waited for.
  const Descriptor file(_system->openAt(AT_FDCWD, path.c_str(), O_RDONLY | O_NONBLOCK, 0));
  struct stat status {};
  if (!file || ::fstat(file.number(), &status) != 0) return posixError(errno, path);
  if (!S_ISREG(status.st_mode)) return posixError(S_ISDIR(status.st_mode) ? EISDIR : ENODEV, path);
  const Error tooLong{ErrorKind::Damaged, "The file is longer than " + std::to_string(maximum) + " bytes", path};
  const auto expected = static_cast<std::uint64_t>(status.st_size);
  if (expected > maximum) return tooLong;

  // One byte more than expected, so that the end shows without another round.
  std::string bytes(static_cast<std::size_t>(expected) + 1, '\0');
  std::size_t size = 0;
  for (;;) {
    const ssize_t count = _system->read(file.number(), bytes.data() + size, bytes.size() - size);
    if (count < 0) return posixError(errno, path);
    if (count == 0) break;
    size += static_cast<std::size_t>(count);
    if (size > maximum) return tooLong;
    if (size == bytes.size()) bytes.resize(size + size / 2 + 4096);
  }
  bytes.resize(size);
  return bytes;
}

Result<std::string> PosixFileManager::readStart(const fs::path& path, std::size_t length) const {
  if (path.native().find('\0') != std::string::npos) return posixError(ENOENT, path);
  const Descriptor file(_system->openAt(AT_FDCWD, path.c_str(), O_RDONLY | O_NONBLOCK, 0));
  if (!file) return posixError(errno, path);
  std::string bytes(length, '\0');
  std::size_t size = 0;
  while (size < length) {
    const ssize_t count = _system->read(file.number(), bytes.data() + size, length - size);
    if (count < 0) return posixError(errno, path);
    if (count == 0) break;
    size += static_cast<std::size_t>(count);
  }
  bytes.resize(size);
  return bytes;
}

Result<void> PosixFileManager::writeAtomically(const fs::path& path, std::string_view bytes) {
  Place place;
  if (const int error = openPlace(*_system, path, place)) return posixError(error, path);
  return resultOf(writeAtPlace(*_system, place, bytes), path);
}

Result<FileIdentity> PosixFileManager::replaceAtomically(const fs::path& path, std::string_view bytes,
                                                         const FileIdentity& replaced) {
  Place place;
  if (const int error = openPlace(*_system, path, place)) return posixError(error, path);
  lockForAMoment(*_system, place.folder.number());  // given up with the descriptor
  if (identityAt(*_system, place) != replaced) return changedMeanwhile(path);
  if (const int error = writeAtPlace(*_system, place, bytes)) return posixError(error, path);
  return identityAt(*_system, place);
}

}  // namespace quilt::platform
