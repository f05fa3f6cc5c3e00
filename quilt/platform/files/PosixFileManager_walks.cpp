// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>

#include "quilt/platform/base/TemporaryNames.h"
#include "quilt/platform/files/Folders.h"
#include "quilt/platform/files/PosixError.h"
#include "quilt/platform/files/PosixFileManager.h"

namespace quilt::platform {

namespace {

// Links and what is neither file nor folder have no content of their own to sync.
int syncTree(SystemCalls& system, int folder, const std::string& name, int depth) {
  struct stat status {};
  if (::fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) return errno;
  if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) return 0;
  if (depth > kDeepestFolder) return ENAMETOOLONG;
  const Descriptor item(system.openAt(folder, name.c_str(), O_RDONLY | O_NONBLOCK | O_NOFOLLOW, 0));
  if (!item) return errno;
  if (S_ISREG(status.st_mode)) return system.sync(item.number()) == 0 ? 0 : errno;
  std::vector<std::string> names;
  if (const int error = listFolder(item.number(), names)) return error;
  for (const std::string& child : names)
    if (const int error = syncTree(system, item.number(), child, depth + 1)) return error;
  return syncFolder(system, item.number());
}

int removeTemporaries(SystemCalls& system, int folder, int depth, std::size_t& removed) {
  std::vector<std::string> names;
  if (const int error = listFolder(folder, names)) return error;
  for (const std::string& name : names) {
    const HiddenKind kind = hiddenNameFrom(name).kind;
    if (kind == HiddenKind::Half) {
      bool changed = false;
      const int error = removeTree(system, folder, name, changed);
      if (error != 0 && error != ENOENT) return error;
      removed += error == 0;
      continue;
    }
    if (kind != HiddenKind::None) continue;
    const Descriptor child(system.openAt(folder, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW, 0));
    if (!child || depth == kDeepestFolder) continue;  // a file, a link, or nothing that this library made
    if (const int error = removeTemporaries(system, child.number(), depth + 1, removed)) return error;
  }
  return 0;
}

}  // namespace

int PosixFileManager::syncItem(const std::filesystem::path& path) {
  Place place;
  if (const int error = openPlace(*_system, path, place)) return -error;
  if (const int error = syncTree(*_system, place.folder.number(), place.name, 0)) return -error;
  return -syncFolder(*_system, place.folder.number());
}

Result<std::size_t> PosixFileManager::removeTemporariesIn(const std::filesystem::path& folder) {
  const Descriptor opened(_system->openAt(AT_FDCWD, folder.c_str(), O_RDONLY | O_DIRECTORY, 0));
  if (!opened) return posixError(errno, folder);
  std::size_t removed = 0;
  if (const int error = removeTemporaries(*_system, opened.number(), 0, removed)) return posixError(error, folder);
  return removed;
}

}  // namespace quilt::platform
