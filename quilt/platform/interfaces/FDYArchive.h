// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>

#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// Zip archives.
class FDYArchive {
 public:
  virtual ~FDYArchive() = default;

  /// Packs one folder, under its own name, into a new archive: entries sorted, names in UTF-8, media stored and text
  /// deflated, the same bytes for the same content. Reports 0 to 100 by bytes; ends as Cancelled when the block answers
  /// false. Nothing is left at `toZipFile` unless it succeeds.
  virtual Result<void> archiveFile(const std::filesystem::path& file, const std::filesystem::path& toZipFile,
                                   const ProgressionBlock& withProgressionBlock) = 0;
};

}  // namespace quilt::platform
