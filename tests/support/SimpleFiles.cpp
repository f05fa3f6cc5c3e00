// SPDX-License-Identifier: Apache-2.0
#include "tests/support/SimpleFiles.h"

#include <fstream>
#include <iterator>

namespace quilt::support {

using platform::Error;
using platform::ErrorKind;
using platform::FileKind;
using platform::Result;

namespace {

Error refused(const std::filesystem::path& path) { return {ErrorKind::Unsupported, "Not part of this test.", path}; }

}  // namespace

FileKind SimpleFiles::kindOfItemAtPath(const std::filesystem::path& path) const {
  std::error_code error;
  const auto status = std::filesystem::status(path, error);
  if (!std::filesystem::exists(status)) return FileKind::Missing;
  if (std::filesystem::is_directory(status)) return FileKind::Folder;
  return std::filesystem::is_regular_file(status) ? FileKind::File : FileKind::Other;
}

bool SimpleFiles::isConfined(const std::filesystem::path&, const std::filesystem::path&) const { return false; }

Result<platform::FileAttributes> SimpleFiles::attributesOfItemAtPath(const std::filesystem::path& path) const {
  return refused(path);
}

Result<void> SimpleFiles::createDirectoryAtPath(const std::filesystem::path& path) { return refused(path); }

Result<std::vector<std::string>> SimpleFiles::contentsOfDirectoryAtPath(const std::filesystem::path& path) const {
  return refused(path);
}

Result<void> SimpleFiles::copyItem(const std::filesystem::path& source, const std::filesystem::path&) {
  return refused(source);
}

Result<void> SimpleFiles::moveItem(const std::filesystem::path& source, const std::filesystem::path&) {
  return refused(source);
}

Result<void> SimpleFiles::removeItem(const std::filesystem::path& path, const std::filesystem::path&) {
  return refused(path);
}

int SimpleFiles::copyfile(const std::filesystem::path&, const std::filesystem::path&, platform::CopyCallback, void*) {
  return -1;
}

int SimpleFiles::syncItem(const std::filesystem::path&) { return 0; }

Result<std::size_t> SimpleFiles::removeTemporariesIn(const std::filesystem::path& folder) { return refused(folder); }

Result<std::string> SimpleFiles::readFile(const std::filesystem::path& path, std::uint64_t maximum) const {
  std::ifstream stream(path, std::ios::binary);
  if (!stream) return Error{ErrorKind::NotFound, "There is no such file.", path};
  std::string bytes{std::istreambuf_iterator<char>(stream), {}};
  if (bytes.size() > maximum) return Error{ErrorKind::Damaged, "The file is too long.", path};
  return bytes;
}

Result<std::string> SimpleFiles::readStart(const std::filesystem::path& path, std::size_t length) const {
  auto bytes = readFile(path, std::uint64_t{1} << 32U);
  if (bytes) bytes->resize(std::min(bytes->size(), length));
  return bytes;
}

Result<void> SimpleFiles::writeAtomically(const std::filesystem::path& path, std::string_view bytes) {
  ++writes;
  if (failWrites) return *failWrites;
  std::ofstream stream(path, std::ios::binary | std::ios::trunc);
  stream.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  if (!stream) return Error{ErrorKind::InputOutput, "The file cannot be written.", path};
  return {};
}

Result<std::unique_ptr<platform::FileLock>> SimpleFiles::lockFile(const std::filesystem::path& path, std::string_view) {
  return refused(path);
}

Result<std::unique_ptr<platform::FileLock>> SimpleFiles::shareLockFile(const std::filesystem::path& path,
                                                                       const std::function<void()>&) {
  return refused(path);
}

}  // namespace quilt::support
