// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>

#include "quilt/platform/glance/OpenDocuments.h"
#include "quilt/platform/interfaces/ImageWrapper.h"

namespace quilt::platform {

/// The picture of a page, drawn each time its pixels are needed, in the size that is then wanted, so that the pages of
/// a long document take no memory. Fails once the document has changed, or was moved and then closed.
class PageImage final : public ImageWrapper {
 public:
  struct Page {
    std::shared_ptr<OpenDocuments> documents;
    std::filesystem::path path;
    FileIdentity identity;
    std::size_t index;
  };

  /// The page in high definition; `points` is its size. A page is drawn as large as fits, however small it is.
  PageImage(Page page, Size points);

  [[nodiscard]] Size size() const override { return _size; }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToSD() const override { return fitted(kStandardDefinition); }
  [[nodiscard]] std::shared_ptr<ImageWrapper> convertToHD() const override { return fitted(kHighDefinition); }
  [[nodiscard]] Result<void> saveAsJPGAtPath(const std::filesystem::path& path) const override;
  [[nodiscard]] Result<void> saveAsPNGAtURL(const Url& url) const override;
  [[nodiscard]] Result<Bitmap> bitmap() const override;

 private:
  [[nodiscard]] std::shared_ptr<ImageWrapper> fitted(Size box) const;
  [[nodiscard]] Result<std::shared_ptr<ImageWrapper>> drawn() const;

  Page _page;
  Size _size;
};

}  // namespace quilt::platform
