// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <filesystem>
#include <list>
#include <memory>
#include <mutex>
#include <optional>

#include "quilt/platform/interfaces/DocumentToolkit.h"
#include "quilt/platform/interfaces/FileManager.h"

namespace quilt::platform {

/// Keeps the documents open that were used last, so that a walk over pages opens its document once, and remembers of
/// many more how many pages they have and why they cannot be used. A file is known again by device, inode, size and
/// change time. The first failure on a file is logged as a warning. Any thread.
class OpenDocuments {
 public:
  static constexpr std::size_t kKeptOpen = 4;
  static constexpr std::size_t kRemembered = 4096;

  struct Found {
    FileIdentity identity;
    std::shared_ptr<PagedDocument> document;
  };

  /// Opens what is at the path. Being cancelled by `goesOn` is no failure of the file's.
  Result<Found> open(const std::filesystem::path& path, const ContinueBlock& goesOn = {});
  /// The document that was open under this identity. One that was moved away is found as long as it is kept open; a
  /// changed one is NotFound.
  Result<std::shared_ptr<PagedDocument>> reopen(const std::filesystem::path& path, const FileIdentity& identity);

  Result<std::size_t> pageCount(const std::filesystem::path& path);

  /// Logs that the document, or a page of it, is of no use, unless that was logged of this file before.
  void warn(const std::filesystem::path& path, const FileIdentity& identity, const Error& error);

 private:
  struct Entry {
    FileIdentity identity;
    std::shared_ptr<PagedDocument> document;  // null when it was closed
    std::optional<std::size_t> count;
    std::optional<Error> failure;  // one that will not pass
    bool isWarned = false;
  };

  Entry& entry(const FileIdentity& identity);
  void closeOthers();

  std::mutex _mutex;
  std::list<Entry> _entries;  // the last used first
};

}  // namespace quilt::platform
