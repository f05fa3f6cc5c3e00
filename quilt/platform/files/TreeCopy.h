// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>

#include "quilt/platform/files/SystemCalls.h"

namespace quilt::platform {

/// Copies a file or a folder with its content: data, permissions, extended attributes and times; symbolic links inside
/// as links. Hard links become files of their own. Devices, pipes and sockets are refused.
class TreeCopy {
 public:
  /// Called after each stretch of data with the bytes copied so far; false ends the copy with ECANCELED.
  using Progress = std::function<bool(std::int64_t copiedBytes)>;

  /// With `durable` every file and folder is synced.
  TreeCopy(SystemCalls& system, Progress progress, bool durable)
      : _system(system), _progress(std::move(progress)), _durable(durable) {}

  /// Copies `source`, read through `from`, to the free place `name` in the opened folder `toFolder`. A link at the end
  /// of `source` is copied as a link, or followed. Answers 0 or an error number; leaves a partial item when it fails.
  int run(const std::filesystem::path& source, bool followLink, int toFolder, const std::string& name);

  /// The file that the last failure concerns.
  [[nodiscard]] const std::filesystem::path& failedFile() const { return _failedFile; }
  [[nodiscard]] std::int64_t copiedBytes() const { return _copiedBytes; }

 private:
  int copyItem(int fromFolder, const std::filesystem::path& source, const char* sourceName, bool followLink,
               int toFolder, const std::string& name, int depth);
  int copyItemKind(int fromFolder, const std::filesystem::path& source, const char* sourceName, bool followLink,
                   int toFolder, const std::string& name, int depth);
  int copyLink(int fromFolder, const char* sourceName, int toFolder, const std::string& name);
  int copyFolder(int from, const struct stat& status, const std::filesystem::path& source, int toFolder,
                 const std::string& name, int depth);
  int copyFile(int from, const struct stat& status, int toFolder, const std::string& name);
  int copyData(int from, int to, const struct stat& status);
  int copyInKernel(int from, int to);
  int copyThroughBuffer(int from, int to);
  int copyMetadata(int from, int to, const struct stat& status);
  int advance(std::int64_t bytes);

  SystemCalls& _system;
  const Progress _progress;
  const bool _durable;
  std::int64_t _copiedBytes = 0;
  std::filesystem::path _failedFile;
  std::unique_ptr<char[]> _buffer;
};

}  // namespace quilt::platform
