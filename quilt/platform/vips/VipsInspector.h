// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform {

/// Inspects image files from their headers: displayed size, MIME type, and what the camera or an editor noted in EXIF
/// as title, description and artist. Any thread.
class VipsInspector final : public MediaInspector {
 public:
  [[nodiscard]] Result<MediaFacts> inspect(const std::filesystem::path& path) const override;
};

}  // namespace quilt::platform
