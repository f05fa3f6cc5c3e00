// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "quilt/platform/glance/OpenDocuments.h"
#include "quilt/platform/interfaces/Glance.h"

namespace quilt::platform {

/// The quick-preview service, made of the other installed services. A thumbnail fits 640 × 480: of an image file the
/// image; of a movie its artwork or the frame that stands for it; of sound its artwork or the drawing of sound; of a
/// document its first page; of a web page the drawing of a link. Null for anything else.
///
/// A page is as large as fits 1280 × 720 and is drawn when its pixels are needed. A document that cannot be shown, or
/// has a page that cannot, is logged once as a warning. Any thread.
class GlanceServices final : public Glance {
 public:
  GlanceServices();

  [[nodiscard]] std::shared_ptr<ImageWrapper> thumbnailImageForURL(const Url& url) const override;
  void prepareDocument(const std::filesystem::path& path, const ContinueBlock& goesOn = {}) const override;
  [[nodiscard]] std::size_t documentPagesCount(const std::filesystem::path& path) const override;
  [[nodiscard]] std::optional<DocumentPage> documentPageAtIndex(const std::filesystem::path& path,
                                                                std::size_t index) const override;

 private:
  [[nodiscard]] std::shared_ptr<ImageWrapper> pictureOf(const Url& url) const;
  [[nodiscard]] std::shared_ptr<ImageWrapper> pictureOfPage(const std::filesystem::path& path, std::size_t index) const;

  std::shared_ptr<OpenDocuments> _documents;
};

}  // namespace quilt::platform
