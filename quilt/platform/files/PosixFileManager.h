// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/files/SystemCalls.h"
#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::platform {

/// The file system of a POSIX machine.
///
/// - A link is itself removed, moved and replaced, never what it points to.
/// - copyfile follows a link that is its source. For a folder it reports the bytes of all files together, between one
///   Start and one Finish; nothing may be at the destination. After Error it stops whatever the callback answers. The
///   negative number is that of the operating system's error; Quit gives -ECANCELED.
/// - Synced before they return: writeAtomically, createDirectoryAtPath and moveItem; a move across file systems syncs
///   the copy before it deletes. Copies are not: their source is still there, and syncItem is at hand.
/// - replaceAtomically has its folder to itself from the look to the end, among those that call it; where a folder
///   cannot be locked, it only looks.
/// - A lock file is deleted when its lock is given up.
class PosixFileManager final : public FileManager {
 public:
  explicit PosixFileManager(std::shared_ptr<SystemCalls> system = std::make_shared<SystemCalls>());

  [[nodiscard]] FileKind kindOfItemAtPath(const std::filesystem::path& path) const override;
  [[nodiscard]] bool isConfined(const std::filesystem::path& path, const std::filesystem::path& root) const override;
  [[nodiscard]] Result<FileAttributes> attributesOfItemAtPath(const std::filesystem::path& path) const override;
  Result<void> createDirectoryAtPath(const std::filesystem::path& path) override;
  [[nodiscard]] Result<std::vector<std::string>> contentsOfDirectoryAtPath(
      const std::filesystem::path& path) const override;
  Result<void> copyItem(const std::filesystem::path& source, const std::filesystem::path& destination) override;
  Result<void> moveItem(const std::filesystem::path& source, const std::filesystem::path& destination) override;
  Result<void> removeItem(const std::filesystem::path& path, const std::filesystem::path& within) override;
  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination, CopyCallback callback,
               void* context) override;
  int syncItem(const std::filesystem::path& path) override;
  Result<std::size_t> removeTemporariesIn(const std::filesystem::path& folder) override;
  [[nodiscard]] Result<std::string> readFile(const std::filesystem::path& path, std::uint64_t maximum) const override;
  [[nodiscard]] Result<std::string> readStart(const std::filesystem::path& path, std::size_t length) const override;
  Result<void> writeAtomically(const std::filesystem::path& path, std::string_view bytes) override;
  Result<FileIdentity> replaceAtomically(const std::filesystem::path& path, std::string_view bytes,
                                         const FileIdentity& replaced) override;
  [[nodiscard]] std::string thisProcess() const override;
  Result<std::unique_ptr<FileLock>> lockFile(const std::filesystem::path& path, std::string_view owner) override;
  Result<std::unique_ptr<FileLock>> shareLockFile(const std::filesystem::path& path,
                                                  const std::function<void()>& afterKilled) override;

 private:
  Result<void> moveAcrossDisks(const std::filesystem::path& source, const std::filesystem::path& destination);

  const std::shared_ptr<SystemCalls> _system;
};

}  // namespace quilt::platform
