// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/testing/FailNthFileManager.h"

namespace quilt::platform {

namespace fs = std::filesystem;

void FailNthFileManager::failNth(std::size_t n, ErrorKind kind, Repeat repeat, Which which) {
  _count = 0;
  _failAt = n;
  _kind = kind;
  _repeat = repeat;
  _which = which;
}

bool FailNthFileManager::admit(Which which) const {
  if (which == Which::All && _which == Which::Changes) return true;
  const std::size_t n = ++_count;
  return _failAt == 0 || n < _failAt || (n > _failAt && _repeat == Repeat::Once);
}

Error FailNthFileManager::error(const fs::path& file) const {
  return {_kind, "The test made this operation fail", file};
}

Result<FileAttributes> FailNthFileManager::attributesOfItemAtPath(const fs::path& path) const {
  if (!admit(Which::All)) return error(path);
  return ForwardingFileManager::attributesOfItemAtPath(path);
}

Result<void> FailNthFileManager::createDirectoryAtPath(const fs::path& path) {
  if (!admit(Which::Changes)) return error(path);
  return ForwardingFileManager::createDirectoryAtPath(path);
}

Result<std::vector<std::string>> FailNthFileManager::contentsOfDirectoryAtPath(const fs::path& path) const {
  if (!admit(Which::All)) return error(path);
  return ForwardingFileManager::contentsOfDirectoryAtPath(path);
}

Result<void> FailNthFileManager::copyItem(const fs::path& source, const fs::path& destination) {
  if (!admit(Which::Changes)) return error(destination);
  return ForwardingFileManager::copyItem(source, destination);
}

Result<void> FailNthFileManager::moveItem(const fs::path& source, const fs::path& destination) {
  if (!admit(Which::Changes)) return error(destination);
  return ForwardingFileManager::moveItem(source, destination);
}

Result<void> FailNthFileManager::removeItem(const fs::path& path, const fs::path& within) {
  if (!admit(Which::Changes)) return error(path);
  return ForwardingFileManager::removeItem(path, within);
}

int FailNthFileManager::copyfile(const fs::path& source, const fs::path& destination, CopyCallback callback,
                                 void* context) {
  if (admit(Which::Changes)) return ForwardingFileManager::copyfile(source, destination, callback, context);
  if (callback) {
    callback(0, CopyStage::Start, {}, source, destination, context);
    callback(0, CopyStage::Error, {}, source, destination, context);
  }
  return -1;
}

int FailNthFileManager::syncItem(const fs::path& path) {
  return admit(Which::Changes) ? ForwardingFileManager::syncItem(path) : -1;
}

Result<std::size_t> FailNthFileManager::removeTemporariesIn(const fs::path& folder) {
  if (!admit(Which::Changes)) return error(folder);
  return ForwardingFileManager::removeTemporariesIn(folder);
}

Result<std::string> FailNthFileManager::readFile(const fs::path& path, std::uint64_t maximum) const {
  if (!admit(Which::All)) return error(path);
  return ForwardingFileManager::readFile(path, maximum);
}

Result<void> FailNthFileManager::writeAtomically(const fs::path& path, std::string_view bytes) {
  if (!admit(Which::Changes)) return error(path);
  return ForwardingFileManager::writeAtomically(path, bytes);
}

Result<std::unique_ptr<FileLock>> FailNthFileManager::lockFile(const fs::path& path, std::string_view owner) {
  if (!admit(Which::Changes)) return error(path);
  return ForwardingFileManager::lockFile(path, owner);
}

Result<std::unique_ptr<FileLock>> FailNthFileManager::shareLockFile(const fs::path& path,
                                                                    const std::function<void()>& afterKilled) {
  if (!admit(Which::Changes)) return error(path);
  return ForwardingFileManager::shareLockFile(path, afterKilled);
}

}  // namespace quilt::platform
