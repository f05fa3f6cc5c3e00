// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <list>
#include <memory>
#include <mutex>
#include <string>
#include <unordered_map>

#include "quilt/platform/interfaces/FDYMedia.h"
#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::platform {

/// Remembers what another inspector found, so that a file is looked into once however often it is asked about. A file
/// is known again by device, inode, size, change time and its name's extension; the least recently used facts make room
/// for new ones. That a file is damaged or unsupported is remembered as well; other failures may pass and are not.
/// Any thread: two threads that ask about one new file at the same time may both look.
class CachedInspection final : public MediaInspector {
 public:
  static constexpr std::size_t kUsualCapacity = 4096;

  /// `inspector` must not be null, nor `capacity` 0.
  explicit CachedInspection(std::shared_ptr<const MediaInspector> inspector, std::size_t capacity = kUsualCapacity);

  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override;

 private:
  struct Key {
    FileIdentity identity;
    std::string extension;
    bool operator==(const Key&) const = default;
  };
  struct Hash {
    std::size_t operator()(const Key& key) const;
  };
  struct Entry {
    Key key;
    Result<MediaFacts> result;
  };

  void remember(const Key& key, const Result<MediaFacts>& result) const;

  std::shared_ptr<const MediaInspector> _inspector;
  std::size_t _capacity;
  mutable std::mutex _mutex;
  mutable std::list<Entry> _entries;  // the most recently used first
  mutable std::unordered_map<Key, std::list<Entry>::iterator, Hash> _index;
};

}  // namespace quilt::platform
