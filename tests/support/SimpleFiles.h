// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::support {

/// A file manager for tests of other services: reads and writes real files plainly and refuses what no service but the
/// model asks for. `failWrites` makes every write fail.
class SimpleFiles final : public platform::FileManager {
 public:
  std::optional<platform::Error> failWrites;
  int writes = 0;

  [[nodiscard]] platform::FileKind kindOfItemAtPath(const std::filesystem::path& path) const override;
  [[nodiscard]] bool isConfined(const std::filesystem::path& path, const std::filesystem::path& root) const override;
  [[nodiscard]] platform::Result<platform::FileAttributes> attributesOfItemAtPath(
      const std::filesystem::path& path) const override;
  platform::Result<void> createDirectoryAtPath(const std::filesystem::path& path) override;
  [[nodiscard]] platform::Result<std::vector<std::string>> contentsOfDirectoryAtPath(
      const std::filesystem::path& path) const override;
  platform::Result<void> copyItem(const std::filesystem::path& source,
                                  const std::filesystem::path& destination) override;
  platform::Result<void> moveItem(const std::filesystem::path& source,
                                  const std::filesystem::path& destination) override;
  platform::Result<void> removeItem(const std::filesystem::path& path, const std::filesystem::path& within) override;
  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination,
               platform::CopyCallback callback, void* context) override;
  int syncItem(const std::filesystem::path& path) override;
  platform::Result<std::size_t> removeTemporariesIn(const std::filesystem::path& folder) override;
  [[nodiscard]] platform::Result<std::string> readFile(const std::filesystem::path& path,
                                                       std::uint64_t maximum) const override;
  [[nodiscard]] platform::Result<std::string> readStart(const std::filesystem::path& path,
                                                        std::size_t length) const override;
  platform::Result<void> writeAtomically(const std::filesystem::path& path, std::string_view bytes) override;
  platform::Result<std::unique_ptr<platform::FileLock>> lockFile(const std::filesystem::path& path,
                                                                 std::string_view owner) override;
  platform::Result<std::unique_ptr<platform::FileLock>> shareLockFile(
      const std::filesystem::path& path, const std::function<void()>& afterKilled) override;
};

}  // namespace quilt::support
