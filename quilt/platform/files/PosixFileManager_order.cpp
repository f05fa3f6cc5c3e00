// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <linux/fs.h>
#include <linux/magic.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/vfs.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <ctime>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/Folders.h"
#include "quilt/platform/files/PosixError.h"
#include "quilt/platform/files/PosixFileManager.h"

namespace quilt::platform {

namespace {

namespace fs = std::filesystem;

class PosixFolderHold final : public FolderHold {
 public:
  explicit PosixFolderHold(Descriptor folder) : _folder(std::move(folder)) { holdFolderOf(_folder.number()); }

 private:
  const Descriptor _folder;
};

// A flock tells nothing of another machine's processes.
bool isShared(int folder) {
  constexpr std::array<unsigned long, 8> kinds{
      NFS_SUPER_MAGIC,  0xFF534D42 /* CIFS */, 0xFE534D42 /* SMB 2 */, SMB_SUPER_MAGIC,
      FUSE_SUPER_MAGIC, AFS_FS_MAGIC,          0x00C36400 /* Ceph */,  V9FS_MAGIC};
  struct statfs system {};
  if (::fstatfs(folder, &system) != 0) return true;
  const auto kind = static_cast<unsigned long>(system.f_type) & 0xFFFFFFFFUL;
  return std::find(kinds.begin(), kinds.end(), kind) != kinds.end();
}

/// One sweep of a folder.
class Sweep {
 public:
  Sweep(SystemCalls& system, SweepDepth depth, const IsRecorded& isRecorded)
      : _system(system), _depth(depth), _isRecorded(isRecorded) {}

  void run(int folder, const fs::path& path, int depth) {
    // Whoever is at work here clears up behind itself, and what the dead left waits.
    if (::flock(folder, LOCK_EX | LOCK_NB) != 0) return;
    std::vector<std::string> names;
    if (listFolder(folder, names) != 0) return;
    std::vector<std::string> others;
    for (std::string& name : names) {
      const HiddenName hidden = hiddenNameFrom(name);
      if (hidden.kind == HiddenKind::None) {
        others.push_back(std::move(name));
      } else if (isOldEnough(folder, name)) {
        clear(folder, path, name, hidden);
      }
    }
    ::flock(folder, LOCK_UN);
    if (_depth == SweepDepth::Level || depth == kDeepestFolder) return;
    for (const std::string& name : others) {
      // Without a look at its kind first, every file would be opened.
      struct stat status {};
      if (::fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISDIR(status.st_mode)) continue;
      const Descriptor child(_system.openAt(folder, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW, 0));
      if (child) run(child.number(), path / name, depth + 1);
    }
  }

  [[nodiscard]] std::size_t cleared() const { return _cleared; }

 private:
  static bool isOldEnough(int folder, const std::string& name) {
    if (!isShared(folder)) return true;
    constexpr std::time_t day = 24 * 60 * 60;
    struct stat status {};
    return ::fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
           status.st_mtim.tv_sec < std::time(nullptr) - day;
  }

  void clear(int folder, const fs::path& path, const std::string& name, const HiddenName& hidden) {
    if (hidden.kind == HiddenKind::Half) return remove(folder, name);
    const std::string of(hidden.of);
    if (!_isRecorded || of.empty()) return;
    const std::optional<bool> isRecorded = _isRecorded(path / of);
    if (!isRecorded) return;
    if (hidden.kind == HiddenKind::Aside) {
      if (*isRecorded && renameIfFree(_system, folder, name, folder, of) == 0) {
        (void)syncFolder(_system, folder);
        ++_cleared;
        return;
      }
      return remove(folder, name);
    }
    // The mark goes last: as long as it is there, what it marks is not taken for finished.
    struct stat status {};
    const bool isThere = ::fstatat(folder, of.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
    if (isThere && !*isRecorded && !isRemoved(folder, of)) return;
    remove(folder, name);
  }

  void remove(int folder, const std::string& name) { _cleared += isRemoved(folder, name) ? 1 : 0; }

  bool isRemoved(int folder, const std::string& name) {
    bool changed = false;
    const int error = removeTree(_system, folder, name, changed);
    return error == 0 || error == ENOENT;
  }

  SystemCalls& _system;
  const SweepDepth _depth;
  const IsRecorded& _isRecorded;
  std::size_t _cleared = 0;
};

}  // namespace

Result<fs::path> PosixFileManager::setAside(const fs::path& path, const fs::path& within, bool forGood) {
  const std::optional<std::string> part = partBelow(path, within);
  if (!part) return posixError(EXDEV, path);
  const Descriptor root(_system->openAt(AT_FDCWD, within.c_str(), O_PATH | O_DIRECTORY, 0));
  if (!root) return posixError(errno, path);
  const fs::path below = *part;
  Descriptor folder;
  if (const int error = openBelow(*_system, root.number(), below.parent_path(), O_RDONLY | O_DIRECTORY, folder))
    return posixError(error, path);
  const std::string name = below.filename();
  const std::string hidden = forGood ? hiddenNameBeside(name) : asideNameBeside(name);
  if (const int error = renameIfFree(*_system, folder.number(), name, folder.number(), hidden))
    return posixError(error, path);
  return path.parent_path() / hidden;
}

Result<fs::path> PosixFileManager::markUnfinished(const fs::path& path) {
  Place place;
  if (const int error = openPlace(*_system, path, place)) return posixError(error, path);
  const std::string name = unfinishedNameBeside(place.name);
  constexpr mode_t everyone = S_IRUSR | S_IWUSR | S_IRGRP | S_IWGRP | S_IROTH | S_IWOTH;
  const Descriptor mark(
      _system->openAt(place.folder.number(), name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW, everyone));
  if (!mark) return posixError(errno, path);
  return path.parent_path() / name;
}

Result<void> PosixFileManager::removeMark(const fs::path& mark) {
  Place place;
  if (const int error = openPlace(*_system, mark, place)) return posixError(error, mark);
  if (_system->unlinkAt(place.folder.number(), place.name.c_str(), 0) != 0) return posixError(errno, mark);
  if (const int error = syncFolder(*_system, place.folder.number())) return posixError(error, mark);
  return {};
}

std::unique_ptr<FolderHold> PosixFileManager::holdFolder(const fs::path& folder) {
  Descriptor opened(_system->openAt(AT_FDCWD, folder.c_str(), O_RDONLY | O_DIRECTORY, 0));
  if (!opened) return nullptr;
  return std::make_unique<PosixFolderHold>(std::move(opened));
}

std::size_t PosixFileManager::sweepFolder(const fs::path& folder, SweepDepth depth, const IsRecorded& isRecorded) {
  const Descriptor opened(_system->openAt(AT_FDCWD, folder.c_str(), O_RDONLY | O_DIRECTORY, 0));
  if (!opened) return 0;
  Sweep sweep(*_system, depth, isRecorded);
  sweep.run(opened.number(), folder, 0);
  return sweep.cleared();
}

}  // namespace quilt::platform
