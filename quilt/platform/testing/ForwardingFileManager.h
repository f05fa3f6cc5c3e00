// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <utility>

#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::platform {

/// Passes every call on to another file manager, so that a test overrides only what it means to change.
class ForwardingFileManager : public FileManager {
 public:
  explicit ForwardingFileManager(std::shared_ptr<FileManager> target) : _target(std::move(target)) {}

  [[nodiscard]] FileKind kindOfItemAtPath(const std::filesystem::path& path) const override {
    return _target->kindOfItemAtPath(path);
  }
  [[nodiscard]] bool isConfined(const std::filesystem::path& path, const std::filesystem::path& root) const override {
    return _target->isConfined(path, root);
  }
  [[nodiscard]] Result<FileAttributes> attributesOfItemAtPath(const std::filesystem::path& path) const override {
    return _target->attributesOfItemAtPath(path);
  }
  Result<void> createDirectoryAtPath(const std::filesystem::path& path) override {
    return _target->createDirectoryAtPath(path);
  }
  [[nodiscard]] Result<std::vector<std::string>> contentsOfDirectoryAtPath(
      const std::filesystem::path& path) const override {
    return _target->contentsOfDirectoryAtPath(path);
  }
  Result<void> copyItem(const std::filesystem::path& source, const std::filesystem::path& destination) override {
    return _target->copyItem(source, destination);
  }
  Result<void> moveItem(const std::filesystem::path& source, const std::filesystem::path& destination) override {
    return _target->moveItem(source, destination);
  }
  Result<void> removeItem(const std::filesystem::path& path, const std::filesystem::path& within) override {
    return _target->removeItem(path, within);
  }
  int copyfile(const std::filesystem::path& source, const std::filesystem::path& destination, CopyCallback callback,
               void* context) override {
    return _target->copyfile(source, destination, callback, context);
  }
  int syncItem(const std::filesystem::path& path) override { return _target->syncItem(path); }
  Result<std::size_t> removeTemporariesIn(const std::filesystem::path& folder) override {
    return _target->removeTemporariesIn(folder);
  }
  [[nodiscard]] Result<std::string> readFile(const std::filesystem::path& path, std::uint64_t maximum) const override {
    return _target->readFile(path, maximum);
  }
  [[nodiscard]] Result<std::string> readStart(const std::filesystem::path& path, std::size_t length) const override {
    return _target->readStart(path, length);
  }
  Result<void> writeAtomically(const std::filesystem::path& path, std::string_view bytes) override {
    return _target->writeAtomically(path, bytes);
  }
  [[nodiscard]] std::string thisProcess() const override { return _target->thisProcess(); }
  Result<std::unique_ptr<FileLock>> lockFile(const std::filesystem::path& path, std::string_view owner) override {
    return _target->lockFile(path, owner);
  }
  Result<std::unique_ptr<FileLock>> shareLockFile(const std::filesystem::path& path,
                                                  const std::function<void()>& afterKilled) override {
    return _target->shareLockFile(path, afterKilled);
  }

 private:
  const std::shared_ptr<FileManager> _target;
};

}  // namespace quilt::platform
