// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform {

/// Looks at the frame of an office document: the directory of a packed one, the tables of a compound one. What fails
/// here LibreOffice cannot open either, and it is told in no time. Of the document itself only the MIME type is told.
class OfficeInspector final : public MediaInspector {
 public:
  /// Damaged when the file is empty or was cut off, Unsupported when it is of another kind.
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override;
};

}  // namespace quilt::platform
