// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "quilt/platform/interfaces/Glance.h"

namespace quilt::platform {

/// The quick-preview service, made of the other installed services. A thumbnail fits 640 × 480: of an image file the
/// image; of a movie its artwork or the frame that stands for it; of sound its artwork or the drawing of sound; of a
/// web page the drawing of a link. Null for anything else. It renders no pages yet: documents have neither pages nor
/// thumbnails. Any thread.
class GlanceServices final : public Glance {
 public:
  [[nodiscard]] std::shared_ptr<ImageWrapper> thumbnailImageForURL(const Url& url) const override;
  [[nodiscard]] std::size_t documentPagesCount(const std::filesystem::path& path) const override;
  [[nodiscard]] std::optional<DocumentPage> documentPageAtIndex(const std::filesystem::path& path,
                                                                std::size_t index) const override;
};

}  // namespace quilt::platform
