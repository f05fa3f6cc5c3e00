// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>

#include "quilt/platform/files/Folders.h"
#include "quilt/platform/files/PosixError.h"
#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/files/TemporaryItem.h"
#include "quilt/platform/files/TreeCopy.h"

namespace quilt::platform {

namespace {

namespace fs = std::filesystem;

int statusAt(int folder, const std::string& name, struct stat& status) {
  return ::fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 ? 0 : errno;
}

// Opens the place for a new item. Renaming will refuse an occupied one too, but only after the copying.
int openFreePlace(SystemCalls& system, const fs::path& path, Place& place) {
  if (const int error = openPlace(system, path, place)) return error;
  struct stat status {};
  const int error = statusAt(place.folder.number(), place.name, status);
  return error == 0 ? EEXIST : error == ENOENT ? 0 : error;
}

// Copies to a free place; a link as a link.
Result<void> copyToPlace(SystemCalls& system, const fs::path& source, const fs::path& destination, bool durable,
                         Place& place) {
  if (const int error = openFreePlace(system, destination, place)) return posixError(error, destination);
  const int folder = place.folder.number();
  TemporaryItem temporary(system, folder, place.name);
  TreeCopy copy(system, nullptr, durable);
  const int copied = temporary.create([&](const std::string& name) { return copy.run(source, false, folder, name); });
  if (copied != 0) return posixError(copied, copy.failedFile());
  if (const int error = temporary.putIfFree()) return posixError(error, destination);
  return {};
}

}  // namespace

Result<void> PosixFileManager::copyItem(const fs::path& source, const fs::path& destination) {
  Place place;
  return copyToPlace(*_system, source, destination, false, place);
}

Result<void> PosixFileManager::moveItem(const fs::path& source, const fs::path& destination) {
  Place from;
  Place to;
  if (const int error = openPlace(*_system, source, from)) return posixError(error, source);
  if (const int error = openPlace(*_system, destination, to)) return posixError(error, destination);
  const int error = renameIfFree(*_system, from.folder.number(), from.name, to.folder.number(), to.name);
  if (error == EXDEV) return moveAcrossDisks(source, destination);
  if (error != 0) return posixError(error, error == ENOENT ? source : destination);
  // The new name first: at no time are both forgotten.
  int failed = syncFolder(*_system, to.folder.number());
  const fs::path& where = failed != 0 ? destination : source;
  if (failed == 0) failed = syncFolder(*_system, from.folder.number());
  if (failed == 0) return {};
  // Who is told of a failure finds the item where it was.
  (void)renameIfFree(*_system, to.folder.number(), to.name, from.folder.number(), from.name);
  return posixError(failed, where);
}

Result<void> PosixFileManager::moveAcrossDisks(const fs::path& source, const fs::path& destination) {
  Place from;
  if (const int error = openPlace(*_system, source, from)) return posixError(error, source);
  Place to;
  if (Result<void> copied = copyToPlace(*_system, source, destination, true, to); !copied) return copied;
  bool changed = false;
  int error = syncFolder(*_system, to.folder.number());
  if (error == 0) error = removeTree(*_system, from.folder.number(), from.name, changed);
  if (error == 0) return {};
  // While the source is still whole the copy goes; afterwards the copy is the one that must stay.
  bool ignored = false;
  if (!changed) removeTree(*_system, to.folder.number(), to.name, ignored);
  return posixError(error, source);
}

int PosixFileManager::copyfile(const fs::path& source, const fs::path& destination, CopyCallback callback,
                               void* context) {
  CopyState state;
  const auto goesOn = [&](CopyStage stage) {
    return !callback || callback(0, stage, state, source, destination, context) == CopyAnswer::Continue;
  };
  const auto copy = [&]() -> int {
    if (!goesOn(CopyStage::Start)) return ECANCELED;
    const bool isFolder = kindOfItemAtPath(source) == FileKind::Folder;
    Place place;
    if (const int error =
            isFolder ? openFreePlace(*_system, destination, place) : openPlace(*_system, destination, place))
      return error;
    const int folder = place.folder.number();
    struct stat status {};
    if (statusAt(folder, place.name, status) == 0 && S_ISDIR(status.st_mode)) return EISDIR;

    TemporaryItem temporary(*_system, folder, place.name);
    TreeCopy tree(
        *_system,
        [&](std::int64_t copiedBytes) {
          state.copiedBytes = copiedBytes;
          return goesOn(CopyStage::Progress);
        },
        false);
    if (const int error =
            temporary.create([&](const std::string& name) { return tree.run(source, true, folder, name); }))
      return error;
    if (!goesOn(CopyStage::Finish)) return ECANCELED;
    return isFolder ? temporary.putIfFree() : temporary.replace();
  };
  const int error = copy();
  if (error != 0 && error != ECANCELED) goesOn(CopyStage::Error);
  return -error;
}

}  // namespace quilt::platform
