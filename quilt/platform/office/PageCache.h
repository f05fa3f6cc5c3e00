// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

#include "quilt/platform/base/Result.h"

namespace quilt::platform::office {

/// The PDF files that office documents were converted to, in a folder that only the user may read. A document is known
/// by its bytes and the extension that tells its kind, so that its copies in packages need no conversion of their own.
/// Processes may share the folder.
class PageCache {
 public:
  static constexpr std::uint64_t kUsualMaximum = std::uint64_t{512} << 20;

  /// `maximum` is what all files together may take, in bytes; the least recently used ones go first.
  explicit PageCache(std::filesystem::path folder, std::uint64_t maximum = kUsualMaximum);

  /// "quilt/pages" in $XDG_CACHE_HOME, else in ~/.cache; empty when neither is set.
  static std::filesystem::path usualFolder();

  /// Where the document's PDF is or would be. Reads the document.
  [[nodiscard]] Result<std::filesystem::path> pathFor(const std::filesystem::path& document,
                                                      const std::string& extension) const;

  /// Whether the PDF is there; it then counts as just used.
  bool use(const std::filesystem::path& path) const;

  /// Makes an empty folder to convert in, on the same file system. Removes what killed processes left in theirs.
  Result<std::filesystem::path> makeWorkFolder() const;

  /// Moves a finished PDF to its place, then makes room, for which the new file itself is never taken.
  Result<void> put(const std::filesystem::path& finished, const std::filesystem::path& path) const;

 private:
  void makeRoom(const std::filesystem::path& except) const;

  std::filesystem::path _folder;
  std::uint64_t _maximum;
};

}  // namespace quilt::platform::office
