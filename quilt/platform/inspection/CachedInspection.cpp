// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/inspection/CachedInspection.h"

#include <chrono>
#include <functional>
#include <utility>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

// A change so shortly before the look may be followed by another with the same change time, as file systems count that
// in ticks of some milliseconds.
bool isSettled(const FileIdentity& identity) {
  constexpr std::chrono::nanoseconds tick = std::chrono::milliseconds(20);
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return now - std::chrono::nanoseconds(identity.changed) > tick;
}

bool isLasting(const Result<MediaFacts>& result) {
  if (result) return true;
  const ErrorKind kind = result.error().kind;
  return kind == ErrorKind::Damaged || kind == ErrorKind::Unsupported;
}

// A remembered error names the file by the path that is asked about now.
Result<MediaFacts> about(const std::filesystem::path& path, const Result<MediaFacts>& result) {
  if (result) return result;
  return Error{result.error().kind, result.error().text, path};
}

}  // namespace

std::size_t CachedInspection::Hash::operator()(const Key& key) const {
  std::size_t hash = std::hash<std::string>()(key.extension);
  for (const std::uint64_t part :
       {key.identity.device, key.identity.inode, key.identity.size, static_cast<std::uint64_t>(key.identity.changed)}) {
    hash = hash * 1099511628211U ^ std::hash<std::uint64_t>()(part);
  }
  return hash;
}

CachedInspection::CachedInspection(std::shared_ptr<const MediaInspector> inspector, std::size_t capacity)
    : _inspector(std::move(inspector)), _capacity(capacity) {}

Result<MediaFacts> CachedInspection::inspect(const std::filesystem::path& path) const {
  const Result<FileAttributes> attributes = services().files->attributesOfItemAtPath(path);
  if (!attributes) return _inspector->inspect(path);  // and let it say why
  const Key key{attributes->identity, path.extension().string()};
  {
    const std::lock_guard lock(_mutex);
    if (const auto found = _index.find(key); found != _index.end()) {
      _entries.splice(_entries.begin(), _entries, found->second);
      return about(path, found->second->result);
    }
  }
  const bool settled = isSettled(key.identity);
  Result<MediaFacts> result = _inspector->inspect(path);
  if (settled && isLasting(result)) remember(key, result);
  return result;
}

void CachedInspection::remember(const Key& key, const Result<MediaFacts>& result) const {
  const std::lock_guard lock(_mutex);
  if (_index.contains(key)) return;  // another thread looked meanwhile
  _entries.push_front({key, result});
  _index.emplace(key, _entries.begin());
  if (_entries.size() > _capacity) {
    _index.erase(_entries.back().key);
    _entries.pop_back();
  }
}

}  // namespace quilt::platform
