// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstddef>

#include "quilt/platform/testing/ForwardingFileManager.h"

namespace quilt::platform {

/// Makes the n-th operation fail without being carried out, so that a test can walk through every fault:
///
///     for (std::size_t n = 1; !succeeded; ++n) {
///       files->failNth(n, ErrorKind::NoSpace);
///       succeeded = document->update();
///     }
///
/// What cannot fail, kindOfItemAtPath and isConfined, is neither counted nor changed. Any thread, except for failNth.
class FailNthFileManager final : public ForwardingFileManager {
 public:
  enum class Which {
    Changes,  ///< the operations that change the disk, or lock
    All,      ///< also those that read
  };
  enum class Repeat { Once, ForEver };

  using ForwardingFileManager::ForwardingFileManager;

  /// The n-th operation from now on, counted from 1, fails with the kind; ForEver, also every later one. 0: none does.
  void failNth(std::size_t n, ErrorKind kind, Repeat repeat = Repeat::Once, Which which = Which::Changes);
  /// The operations since failNth, those that failed included.
  [[nodiscard]] std::size_t operations() const { return _count; }

  [[nodiscard]] Result<FileAttributes> attributesOfItemAtPath(const std::filesystem::path& path) const override;
  Result<void> createDirectoryAtPath(const std::filesystem::path& path) override;
  [[nodiscard]] Result<std::vector<std::string>> contentsOfDirectoryAtPath(
      const std::filesystem::path& path) const override;
  Result<void> copyItem(const std::filesystem::path& source, const std::filesystem::path& destination) override;
  Result<void> moveItem(const std::filesystem::path& source, const std::filesystem::path& destination) override;
  Result<void> removeItem(const std::filesystem::path& path, const std::filesystem::path& within) override;
  /// Fails with -1, after the stages Start and Error.
  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination, CopyCallback callback,
               void* context) override;
  /// Fails with -1.
  int syncItem(const std::filesystem::path& path) override;
  Result<std::size_t> removeTemporariesIn(const std::filesystem::path& folder) override;
  [[nodiscard]] Result<std::string> readFile(const std::filesystem::path& path, std::uint64_t maximum) const override;
  Result<void> writeAtomically(const std::filesystem::path& path, std::string_view bytes) override;
  Result<std::unique_ptr<FileLock>> lockFile(const std::filesystem::path& path, std::string_view owner) override;
  Result<std::unique_ptr<FileLock>> shareLockFile(const std::filesystem::path& path,
                                                  const std::function<void()>& afterKilled) override;

 private:
  bool admit(Which which) const;
  [[nodiscard]] Error error(const std::filesystem::path& file) const;

  mutable std::atomic<std::size_t> _count = 0;
  std::size_t _failAt = 0;
  ErrorKind _kind = ErrorKind::InputOutput;
  Repeat _repeat = Repeat::Once;
  Which _which = Which::Changes;
};

}  // namespace quilt::platform
