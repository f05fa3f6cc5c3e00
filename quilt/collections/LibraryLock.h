// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <vector>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Result.h"
#include "quilt/platform/interfaces/FileManager.h"
#include "quilt/sources/ModelTypes.h"

namespace quilt {

/// How long to wait for a lock that another holds.
struct LockWait {
  std::chrono::milliseconds limit{0};  ///< 0: not at all
  /// Called on the waiting thread with the refusal before each further attempt, some ten times a second; false stops
  /// waiting. Empty: waits up to the limit.
  std::function<bool(const platform::Error& refusal)> block = nullptr;
};

/// Keeps the others out, hosts and programs alike, while it lives: of a whole library, of a collection, or of one
/// document. Nothing in the model takes one; a host takes it around what it changes, and so does every command that
/// writes. Who only reads needs none. Given up by the destructor, and by the system when the process ends in whatever
/// way; what the process was making below it then goes when the next one takes the lock.
///
/// Each of these shuts out itself and what is in it, and lets everything beside it be: two documents of one collection
/// can be locked by two processes, and while one is, neither the whole collection nor the whole library can be had.
///
/// It lies in hidden files beside what it locks, none of which is left after use: ".quilt-lock" in the library and in a
/// collection's folder, ".NAME.quilt-lock" beside a package or a record. They name process and host. Locks
/// work between the threads of one process, between processes, and between machines on a network file system that
/// locks; where there are no locks, taking one fails as Unsupported.
///
/// Taking one: Locked, with the holder in the text ("It is in use by process 12 on host"), when it cannot be had within
/// the wait; Cancelled when the block stopped it; NotFound when the folder that it would lie in is not there (any
/// more); and what the file system says. What was found before the lock was taken may have changed: look again. Any
/// thread; waiting keeps the calling one, so a window waits on a worker.
class QUILT_EXPORT LibraryLock {
 public:
  /// @{
  /// Of all that is in a library: to load it with its clean-up, to move it, to restore it.
  static platform::Result<LibraryLock> ofLibrary(const Path& library, const LockWait& wait = {});
  /// Of the list of collections, for the moment in which one is made.
  static platform::Result<LibraryLock> ofCollections(const Path& library, const LockWait& wait = {});
  /// Of a collection with all its documents: to remove it.
  static platform::Result<LibraryLock> ofWholeCollection(const Path& folder, const LockWait& wait = {});
  /// Of a collection's own record and poster, and of the list of its documents, for the moment in which one comes or
  /// goes. Its documents can be locked meanwhile.
  static platform::Result<LibraryLock> ofCollection(const Path& folder, const LockWait& wait = {});
  /// Of one document, by its package, in a library or anywhere else; also of one that is about to be made.
  static platform::Result<LibraryLock> ofDocument(const Path& package, const LockWait& wait = {});
  /// @}

  /// @{
  /// Takes over what the other held; gives up what this held before.
  LibraryLock(LibraryLock&&) noexcept = default;
  LibraryLock& operator=(LibraryLock&& other) noexcept;
  /// @}
  LibraryLock(const LibraryLock&) = delete;
  LibraryLock& operator=(const LibraryLock&) = delete;
  /// Gives it up.
  ~LibraryLock();

  /// Whether the one who held it last ended without giving it up, and left what this one cleared away.
  [[nodiscard]] bool wasAbandoned() const { return _wasAbandoned; }

 private:
  struct Level;

  LibraryLock() = default;
  static Level sharedLibrary(const Path& library);
  static Level sharedCollection(const Path& collection);
  static platform::Result<std::unique_ptr<platform::FileLock>> attempt(const Level& level);
  static platform::Error refusal(const Level& level, const platform::Error& error);
  static platform::Result<LibraryLock> take(const std::vector<Level>& levels, const LockWait& wait);

  std::vector<std::unique_ptr<platform::FileLock>> _files;  // from the library down
  bool _wasAbandoned = false;
};

}  // namespace quilt
