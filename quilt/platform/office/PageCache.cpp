// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/office/PageCache.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <cstdlib>
#include <system_error>
#include <utility>
#include <vector>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform::office {

namespace {

namespace fs = std::filesystem;

constexpr const char* kExtension = ".pdf";
constexpr const char* kWorkPrefix = ".converting-";
constexpr auto kAbandoned = std::chrono::hours(1);

std::string hexadecimal(std::uint64_t number) {
  std::array<char, 16> digits{};
  const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number, 16).ptr;
  return {digits.data(), end};
}

std::vector<fs::directory_entry> entriesOf(const fs::path& folder) {
  std::vector<fs::directory_entry> entries;
  std::error_code error;
  for (fs::directory_iterator at(folder, error), end; !error && at != end; at.increment(error)) entries.push_back(*at);
  return entries;
}

fs::path environmentPath(const char* name) {
  const char* value = std::getenv(name);
  return value && value[0] == '/' ? fs::path(value) : fs::path();
}

}  // namespace

PageCache::PageCache(fs::path folder, std::uint64_t maximum) : _folder(std::move(folder)), _maximum(maximum) {}

fs::path PageCache::usualFolder() {
  fs::path cache = environmentPath("XDG_CACHE_HOME");
  if (const fs::path home = environmentPath("HOME"); cache.empty() && !home.empty()) cache = home / ".cache";
  return cache.empty() ? fs::path() : cache / "quilt" / "pages";
}

fs::path PageCache::path(const FileIdentity& identity, const std::string& extension) const {
  std::string name;
  for (const std::uint64_t part :
       {identity.device, identity.inode, identity.size, static_cast<std::uint64_t>(identity.changed)}) {
    name += hexadecimal(part) + "-";
  }
  return _folder / (name + extension + kExtension);
}

bool PageCache::use(const fs::path& path) const {
  std::error_code error;
  if (!fs::is_regular_file(fs::symlink_status(path, error))) return false;
  fs::last_write_time(path, fs::file_time_type::clock::now(), error);
  return true;
}

Result<fs::path> PageCache::makeWorkFolder() const {
  if (_folder.empty()) {
    return Error{ErrorKind::NotFound, "There is no folder for temporary files: set XDG_CACHE_HOME or HOME.", {}};
  }
  if (const Result<void> made = services().files->createDirectoryAtPath(_folder); !made) return made.error();
  std::error_code error;
  fs::permissions(_folder, fs::perms::owner_all, error);
  for (const fs::directory_entry& entry : entriesOf(_folder)) {
    if (!entry.path().filename().native().starts_with(kWorkPrefix)) continue;
    const bool isOld = fs::file_time_type::clock::now() - entry.last_write_time(error) > kAbandoned;
    if (!error && isOld) fs::remove_all(entry.path(), error);
  }
  const fs::path work = _folder / (kWorkPrefix + generateUUID());
  if (const Result<void> made = services().files->createDirectoryAtPath(work); !made) return made.error();
  return work;
}

Result<void> PageCache::put(const fs::path& finished, const fs::path& path) const {
  services().files->syncItem(finished);
  std::error_code error;
  fs::rename(finished, path, error);
  if (error) return Error{ErrorKind::InputOutput, "The converted document cannot be kept.", path};
  makeRoom(path);
  return {};
}

void PageCache::makeRoom(const fs::path& except) const {
  struct File {
    fs::file_time_type used;
    std::uint64_t size;
    fs::path path;
  };
  std::vector<File> files;
  std::uint64_t total = 0;
  std::error_code error;
  for (const fs::directory_entry& entry : entriesOf(_folder)) {
    if (entry.path().extension() != kExtension || !entry.is_regular_file(error)) continue;
    const File file{entry.last_write_time(error), entry.file_size(error), entry.path()};
    if (error) continue;  // another process took it away
    total += file.size;
    if (file.path != except) files.push_back(file);
  }
  std::ranges::sort(files, {}, &File::used);
  for (const File& file : files) {
    if (total <= _maximum) return;
    if (fs::remove(file.path, error)) total -= file.size;
  }
}

}  // namespace quilt::platform::office
