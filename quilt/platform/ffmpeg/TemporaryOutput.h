// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string_view>

#include "quilt/platform/base/Result.h"

namespace quilt::platform::ffmpeg {

/// A hidden file beside its destination, written and then put in its place whole, or removed by the destructor.
class TemporaryOutput {
 public:
  static Result<TemporaryOutput> create(const std::filesystem::path& destination);

  TemporaryOutput(TemporaryOutput&& other) noexcept;
  TemporaryOutput& operator=(TemporaryOutput&&) = delete;
  ~TemporaryOutput();

  [[nodiscard]] const std::filesystem::path& path() const { return _path; }

  Result<void> append(std::string_view bytes);
  /// Writes bytes at an offset; `append` does not take notice.
  Result<void> writeAt(std::uint64_t offset, std::string_view bytes);
  /// Reads back up to `count` bytes; answers how many, fewer at the end, or -1.
  std::int64_t readAt(std::int64_t offset, void* bytes, std::size_t count) const;

  /// Syncs the file, renames it to the destination, replacing what is there, and syncs the folder.
  Result<void> publish();

 private:
  TemporaryOutput(std::filesystem::path path, std::filesystem::path destination, int descriptor);
  Result<void> write(std::int64_t offset, std::string_view bytes);

  std::filesystem::path _path;  // empty once published
  std::filesystem::path _destination;
  int _descriptor;
  std::int64_t _length = 0;
};

}  // namespace quilt::platform::ffmpeg
