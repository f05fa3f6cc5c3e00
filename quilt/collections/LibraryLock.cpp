// SPDX-License-Identifier: Apache-2.0
#include "quilt/collections/LibraryLock.h"

#include <algorithm>
#include <cstdint>
#include <string>
#include <thread>

#include "quilt/platform/interfaces/Services.h"

namespace quilt {

using platform::Error;
using platform::ErrorKind;
using platform::FileLock;
using platform::Result;
using platform::services;

/// One lock file on the way down from the library.
struct LibraryLock::Level {
  Path file;
  Path folder;                   ///< below it lies what a killed holder may have left; empty: nothing to look for
  const char* shared = nullptr;  ///< what it is called by those who only share it; null: to be had alone
};

namespace {

constexpr const char* kLockName = ".quilt-lock";
constexpr const char* kCollectionsFolder = "Collections";
constexpr const char* kLockedRecord = "collection.plist";
constexpr std::size_t kLongestName = 255;

std::string thisProcess() { return services().files->thisProcess(); }

/// The same text for the same name in every program, wherever and whenever it was built.
std::string digest(const std::string& name) {
  std::uint64_t hash = 0xcbf29ce484222325;
  for (const unsigned char byte : name) hash = (hash ^ byte) * 0x100000001b3;
  std::string text;
  for (; text.size() < 16; hash >>= 4U) text += "0123456789abcdef"[hash & 15U];
  return text;
}

/// ".NAME.quilt-lock" beside an item; a name too long for that is told by its digest.
Path lockBeside(const Path& item) {
  const std::string name = item.filename().native();
  std::string lock = "." + name + kLockName;
  if (lock.size() > kLongestName) lock = "." + digest(name) + kLockName;
  return item.parent_path() / lock;
}

/// However it was typed, and through whatever links: who means the same must meet at the same lock.
Path resolved(const Path& path) {
  std::error_code error;
  Path whole = std::filesystem::weakly_canonical(path, error);
  if (error) whole = path.lexically_normal();
  return whole.has_filename() ? whole : whole.parent_path();
}

/// The library that a collection's folder lies in; empty when it lies elsewhere.
Path libraryOf(const Path& collection) {
  const Path list = collection.parent_path();
  return list.filename() == kCollectionsFolder ? list.parent_path() : Path();
}

/// The lock files in a folder: of single documents and records, and, when asked, of the whole folder.
std::vector<Path> lockFilesIn(const Path& folder, bool andOfTheWhole) {
  std::vector<Path> found;
  if (const auto names = services().files->contentsOfDirectoryAtPath(folder))
    for (const std::string& name : *names)
      if (name.starts_with('.') && name.ends_with(kLockName) && (andOfTheWhole || name != kLockName))
        found.push_back(folder / name);
  return found;
}

/// Those below a collection or library, but for its own.
std::vector<Path> lockFilesBelow(const Path& folder, bool andOfCollections) {
  std::vector<Path> found = lockFilesIn(folder, false);
  const Path list = folder / kCollectionsFolder;
  if (const auto names = services().files->contentsOfDirectoryAtPath(list))
    for (const std::string& name : *names) {
      const std::vector<Path> more = lockFilesIn(list / name, andOfCollections);
      found.insert(found.end(), more.begin(), more.end());
    }
  return found;
}

/// Deletes what a killed holder left, while nobody else is there. What cannot be deleted now can be next time.
void clear(const Path& folder) {
  if (services().files->kindOfItemAtPath(folder) != platform::FileKind::Folder) return;
  (void)services().files->removeTemporariesIn(folder);
  // Who gives a lock up deletes its file.
  for (const Path& file : lockFilesBelow(folder, true)) (void)services().files->lockFile(file, thisProcess());
}

std::string withSubject(const std::string& subject, const std::string& text) {
  constexpr std::string_view kIt = "It ";
  return text.starts_with(kIt) ? subject + " " + text.substr(kIt.size()) : text;
}

/// Those who share a lock do not say who they are; one of the locks for which they share it does.
Error withHolderBelow(const Path& folder, const Error& refusal) {
  for (const Path& file : lockFilesBelow(folder, false))
    if (const auto held = services().files->lockFile(file, thisProcess());
        !held && held.error().kind == ErrorKind::Locked)
      return {ErrorKind::Locked, withSubject("A part of it", held.error().text), file};
  return refusal;
}

}  // namespace

LibraryLock::~LibraryLock() {
  while (!_files.empty()) _files.pop_back();
}

LibraryLock& LibraryLock::operator=(LibraryLock&& other) noexcept {
  while (!_files.empty()) _files.pop_back();
  _files = std::move(other._files);
  _wasAbandoned = other._wasAbandoned;
  return *this;
}

Result<LibraryLock> LibraryLock::ofLibrary(const Path& library, const LockWait& wait) {
  const Path folder = resolved(library);
  return take({{folder / kLockName, folder}}, wait);
}

Result<LibraryLock> LibraryLock::ofCollections(const Path& library, const LockWait& wait) {
  const Path folder = resolved(library);
  return take({sharedLibrary(folder), {lockBeside(folder / kCollectionsFolder), {}}}, wait);
}

Result<LibraryLock> LibraryLock::ofWholeCollection(const Path& folder, const LockWait& wait) {
  const Path collection = resolved(folder);
  std::vector<Level> levels;
  if (const Path library = libraryOf(collection); !library.empty()) levels.push_back(sharedLibrary(library));
  levels.push_back({collection / kLockName, collection});
  return take(levels, wait);
}

Result<LibraryLock> LibraryLock::ofCollection(const Path& folder, const LockWait& wait) {
  const Path collection = resolved(folder);
  std::vector<Level> levels;
  if (const Path library = libraryOf(collection); !library.empty()) levels.push_back(sharedLibrary(library));
  levels.push_back(sharedCollection(collection));
  levels.push_back({lockBeside(collection / kLockedRecord), {}});
  return take(levels, wait);
}

Result<LibraryLock> LibraryLock::ofDocument(const Path& package, const LockWait& wait) {
  const Path document = resolved(package);
  const Path collection = document.parent_path();
  std::vector<Level> levels;
  if (const Path library = libraryOf(collection); !library.empty()) {
    levels.push_back(sharedLibrary(library));
    levels.push_back(sharedCollection(collection));
  }
  levels.push_back({lockBeside(document), document});
  return take(levels, wait);
}

LibraryLock::Level LibraryLock::sharedLibrary(const Path& library) {
  return {library / kLockName, library, "Its library"};
}

LibraryLock::Level LibraryLock::sharedCollection(const Path& collection) {
  return {collection / kLockName, collection, "Its collection"};
}

Result<std::unique_ptr<FileLock>> LibraryLock::attempt(const Level& level) {
  platform::FileManager& files = *services().files;
  if (level.shared) return files.shareLockFile(level.file, [&level] { clear(level.folder); });
  auto held = files.lockFile(level.file, thisProcess());
  if (held && (*held)->wasAbandoned()) clear(level.folder);
  return held;
}

Error LibraryLock::refusal(const Level& level, const Error& error) {
  if (error.kind != ErrorKind::Locked) return error;
  if (level.shared) return {error.kind, withSubject(level.shared, error.text), error.file};
  return level.file.filename() == kLockName ? withHolderBelow(level.folder, error) : error;
}

Result<LibraryLock> LibraryLock::take(const std::vector<Level>& levels, const LockWait& wait) {
  constexpr std::chrono::milliseconds kLongestStep{100};
  const auto end = std::chrono::steady_clock::now() + wait.limit;
  std::chrono::milliseconds step{5};
  LibraryLock lock;
  while (lock._files.size() < levels.size()) {
    const Level& level = levels[lock._files.size()];
    Result<std::unique_ptr<FileLock>> held = attempt(level);
    if (held) {
      lock._wasAbandoned |= (*held)->wasAbandoned();
      lock._files.push_back(*std::move(held));
      continue;
    }
    const auto left = end - std::chrono::steady_clock::now();
    if (held.error().kind != ErrorKind::Locked || left <= std::chrono::nanoseconds(0))
      return refusal(level, held.error());
    if (wait.block && !wait.block(refusal(level, held.error())))
      return Error{ErrorKind::Cancelled, "Waiting for it was stopped", held.error().file};
    std::this_thread::sleep_for(std::min<std::chrono::nanoseconds>(step, left));
    step = std::min(step * 2, kLongestStep);
  }
  return lock;
}

}  // namespace quilt
