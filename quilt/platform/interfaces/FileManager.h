// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "quilt/platform/base/Date.h"
#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// What is at a path: nothing, a plain file, a folder, or something else (a device, a socket).
enum class FileKind { Missing, File, Folder, Other };

/// What tells one state of a file from another without reading it.
struct FileIdentity {
  /// @{
  /// Of the file system and the item in it; bytes.
  std::uint64_t device = 0;
  std::uint64_t inode = 0;
  std::uint64_t size = 0;
  /// @}
  std::int64_t changed = 0;  ///< change time in nanoseconds since 1970
  /// Equal when nothing tells them apart: the content is the same.
  bool operator==(const FileIdentity&) const = default;
};

/// What the file system says of an item, symbolic links followed.
struct FileAttributes {
  FileKind kind = FileKind::Missing;  ///< what it is
  std::uint64_t size = 0;             ///< bytes
  Date modified;                      ///< when the content last changed
  FileIdentity identity;              ///< of this state of it
};

/// Where a copy is.
enum class CopyStage { Start, Progress, Finish, Error };
/// Whether a copy goes on.
enum class CopyAnswer { Continue, Quit };

/// What a copy callback may ask about the copy under way.
struct CopyState {
  std::int64_t copiedBytes = 0;  ///< of the file under way
};

/// Called while a file is copied: once with Start, with Progress after each stretch of data (never for an empty file),
/// once with Finish; with Error when reading or writing failed. `what` is 0. Quit stops the copy.
using CopyCallback = CopyAnswer (*)(int what, CopyStage stage, const CopyState& state,
                                    const std::filesystem::path& source, const std::filesystem::path& destination,
                                    void* context);

/// A hold on a lock file, given up by the destructor or the end of the process. The last to give it up deletes the
/// file.
class QUILT_EXPORT FileLock {
 public:
  virtual ~FileLock() = default;

  /// Whether its last holder ended without giving it up, so that half-made items may lie about.
  [[nodiscard]] virtual bool wasAbandoned() const = 0;
};

/// The file system. Paths are absolute. Every operation may be called on any thread; none leaves a partial result
/// under a final name. Errors carry the file and a sentence for people.
class QUILT_EXPORT FileManager {
 public:
  virtual ~FileManager() = default;

  /// What is at the path, symbolic links followed; Missing also when a component cannot be searched.
  [[nodiscard]] virtual FileKind kindOfItemAtPath(const std::filesystem::path& path) const = 0;
  /// Whether something is there, of whatever kind.
  [[nodiscard]] bool fileExistsAtPath(const std::filesystem::path& path) const {
    return kindOfItemAtPath(path) != FileKind::Missing;
  }

  /// Whether `path` lies below the folder `root` and reaches its item without any symbolic link on the way or at the
  /// end. True also when nothing is there yet, as long as what is there is no link.
  [[nodiscard]] virtual bool isConfined(const std::filesystem::path& path, const std::filesystem::path& root) const = 0;

  /// NotFound when nothing is there.
  [[nodiscard]] virtual Result<FileAttributes> attributesOfItemAtPath(const std::filesystem::path& path) const = 0;

  /// Makes a folder with its missing parents. A folder that is there already is no error.
  virtual Result<void> createDirectoryAtPath(const std::filesystem::path& path) = 0;

  /// The names in a folder, one level, in the file system's order, without "." and "..".
  [[nodiscard]] virtual Result<std::vector<std::string>> contentsOfDirectoryAtPath(
      const std::filesystem::path& path) const = 0;

  /// Copies a file or a folder with its content, symbolic links as links. Fails when something is at `destination`;
  /// removes what it wrote when it fails.
  virtual Result<void> copyItem(const std::filesystem::path& source, const std::filesystem::path& destination) = 0;

  /// Renames, or copies and deletes across file systems. Fails when something is at `destination`.
  virtual Result<void> moveItem(const std::filesystem::path& source, const std::filesystem::path& destination) = 0;

  /// Deletes a file or a folder with its content, links not followed. Refuses, as Unsafe, an item that does not lie
  /// below the folder `within` or that is reached through a link.
  virtual Result<void> removeItem(const std::filesystem::path& path, const std::filesystem::path& within) = 0;

  /// Copies one file, or a folder with its content, keeping permissions, times and extended attributes: shares the
  /// blocks where the file system can, else copies inside the kernel, else through a large buffer. Replaces a file at
  /// `destination`. Answers 0, or the negative errno when it failed (ECANCELED after Quit); what it wrote is then
  /// removed.
  virtual int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination,
                       CopyCallback callback, void* context) = 0;

  /// Waits until a file, or a folder with its content, and its name are on the disk: a copy that a record is about to
  /// name must outlive a power cut. Answers 0 or the negative errno, as copyfile does.
  virtual int syncItem(const std::filesystem::path& path) = 0;

  /// Deletes what killed processes left half made anywhere below a folder: items with hidden temporary names
  /// (base/TemporaryNames.h), links not followed. The caller keeps other writers away. Answers how many it deleted.
  virtual Result<std::size_t> removeTemporariesIn(const std::filesystem::path& folder) = 0;

  /// The whole file. Fails as Damaged when it is longer than `maximum` bytes.
  [[nodiscard]] virtual Result<std::string> readFile(const std::filesystem::path& path,
                                                     std::uint64_t maximum) const = 0;

  /// The first bytes of a file, at most `length`; fewer when it is shorter.
  [[nodiscard]] virtual Result<std::string> readStart(const std::filesystem::path& path, std::size_t length) const = 0;

  /// Replaces the file whole: writes a hidden temporary file beside it, syncs, renames, syncs the folder. Whatever
  /// happens, the path holds the old or the new content; the temporary file is removed on failure. Keeps the
  /// permissions of the file that it replaces.
  virtual Result<void> writeAtomically(const std::filesystem::path& path, std::string_view bytes) = 0;

  /// The state of a plain file; FileIdentity{} where there is none.
  [[nodiscard]] FileIdentity stateOfFileAtPath(const std::filesystem::path& path) const;
  /// writeAtomically, if the file at the path is still in the state `replaced` (stateOfFileAtPath's): Changed, and
  /// nothing is written, when it is another. Answers the new state. Of several at once, in one process or several, each
  /// sees what the one before it wrote, as far as the implementation can keep them apart; this one only looks before it
  /// writes.
  virtual Result<FileIdentity> replaceAtomically(const std::filesystem::path& path, std::string_view bytes,
                                                 const FileIdentity& replaced);

  /// What people know this process by: "process 12 on host". For the text in a lock.
  [[nodiscard]] virtual std::string thisProcess() const { return "another process"; }

  /// @{
  /// Takes a lock without waiting, making its file when it is missing: for this holder alone, with `owner` in the file
  /// for others to read, or shared with others. Locks by any way to the same file exclude each other, in one process
  /// as between several, and on network file systems that lock, between machines. Locked, with the text of a sole
  /// holder in the message and without the others, while it cannot be had; Unsupported when the file system does not
  /// lock; Unsafe, and nothing is touched, when there is a link, a file of two names or anything else that is no lock
  /// file in its place.
  ///
  /// Whom a shared lock finds alone with what a killed holder left runs `afterKilled` first, if given, with nobody
  /// else holding the lock.
  virtual Result<std::unique_ptr<FileLock>> lockFile(const std::filesystem::path& path, std::string_view owner) = 0;
  virtual Result<std::unique_ptr<FileLock>> shareLockFile(const std::filesystem::path& path,
                                                          const std::function<void()>& afterKilled) = 0;
  /// @}
};

/// The error of replaceAtomically, and of what is made of it, when somebody was faster.
QUILT_EXPORT Error changedMeanwhile(const std::filesystem::path& path);

}  // namespace quilt::platform
