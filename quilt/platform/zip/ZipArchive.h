// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYArchive.h"

namespace quilt::platform {

/// Zip archives through libzip, with 64-bit sizes where they are needed. Every entry has the same date and plain
/// permissions, so that the same content gives the same bytes on any machine. A symbolic link, a device or a socket in
/// the folder is refused as Unsafe, by name, and never followed; so is one that appears while the archive is written.
/// Written to a hidden file beside `toZipFile`, synced, then renamed over it. Any thread; may pack several at once.
class ZipArchive final : public FDYArchive {
 public:
  Result<void> archiveFile(const std::filesystem::path& file, std::string_view underName,
                           const std::filesystem::path& toZipFile,
                           const ProgressionBlock& withProgressionBlock) override;

  /// The version of libzip, for people.
  static const char* version();
};

}  // namespace quilt::platform
