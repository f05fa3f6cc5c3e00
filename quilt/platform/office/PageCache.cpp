// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/office/PageCache.h"

#include <algorithm>
#include <array>
#include <bit>
#include <charconv>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <fstream>
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

constexpr std::size_t kPart = 1 << 20;  // a multiple of a word's size

// Tells files apart, not forgeries: who makes two documents that look the same to it has their own pages mixed up.
class Digest {
 public:
  void add(const char* bytes, std::size_t length) {
    _length += length;
    for (std::size_t at = 0; at < length; at += sizeof(std::uint64_t)) {
      std::uint64_t word = 0;
      std::memcpy(&word, bytes + at, std::min(sizeof word, length - at));
      _first = std::rotl((_first ^ word) * 0x9E3779B97F4A7C15U, 29);
      _second = std::rotl((_second + word) * 0xC2B2AE3D27D4EB4FU, 31) ^ _first;
    }
  }
  [[nodiscard]] std::string text() const {
    return hexadecimal(_first) + "-" + hexadecimal(_second) + "-" + hexadecimal(_length);
  }

 private:
  static std::string hexadecimal(std::uint64_t number) {
    std::array<char, 16> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number, 16).ptr;
    return {digits.data(), end};
  }

  std::uint64_t _length = 0;
  std::uint64_t _first = 0;
  std::uint64_t _second = 0;
};

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

Result<fs::path> PageCache::pathFor(const fs::path& document, const std::string& extension) const {
  std::ifstream stream(document, std::ios::binary);
  if (!stream) return Error{ErrorKind::PermissionDenied, "The document cannot be opened.", document};
  Digest digest;
  for (std::vector<char> part(kPart); stream;) {
    stream.read(part.data(), static_cast<std::streamsize>(part.size()));
    digest.add(part.data(), static_cast<std::size_t>(stream.gcount()));
  }
  if (stream.bad()) return Error{ErrorKind::InputOutput, "The document cannot be read.", document};
  return _folder / (digest.text() + "-" + extension + kExtension);
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
