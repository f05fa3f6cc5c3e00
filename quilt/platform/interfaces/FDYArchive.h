// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string_view>

#include "quilt/platform/base/Export.h"
#include "quilt/platform/base/ProgressionBlock.h"
#include "quilt/platform/base/Result.h"

namespace quilt::platform {

/// Zip archives.
class QUILT_EXPORT FDYArchive {
 public:
  virtual ~FDYArchive() = default;

  /// Packs one folder into a new archive, where it is called `underName`: entries sorted, names in UTF-8, media stored
  /// and text deflated, the same bytes for the same content. Reports 0 to 100 by bytes; ends as Cancelled when the
  /// block answers false. Nothing is left at `toZipFile` unless it succeeds.
  virtual Result<void> archiveFile(const std::filesystem::path& file, std::string_view underName,
                                   const std::filesystem::path& toZipFile,
                                   const ProgressionBlock& withProgressionBlock) = 0;
};

}  // namespace quilt::platform
