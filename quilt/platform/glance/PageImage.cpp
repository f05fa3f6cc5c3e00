// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/glance/PageImage.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform {

namespace {

Size wholePixels(Size page, Size box) {
  const Size fitted = FDYFitSizeToSize(page, box);
  return {std::max(1.0, std::round(fitted.width)), std::max(1.0, std::round(fitted.height))};
}

}  // namespace

PageImage::PageImage(Page page, Size points) : _page(std::move(page)), _size(wholePixels(points, kHighDefinition)) {}

std::shared_ptr<ImageWrapper> PageImage::fitted(Size box) const {
  auto image = std::make_shared<PageImage>(*this);
  if (_size.width > box.width || _size.height > box.height) image->_size = wholePixels(_size, box);
  return image;
}

Result<Bitmap> PageImage::bitmap() const {
  const Result<std::shared_ptr<PagedDocument>> document = _page.documents->reopen(_page.path, _page.identity);
  if (!document) return document.error();
  return (*document)->drawPage(_page.index, _size);
}

Result<std::shared_ptr<ImageWrapper>> PageImage::drawn() const {
  Result<Bitmap> pixels = bitmap();
  if (!pixels) return pixels.error();
  return services().images->imageWithBitmap(*std::move(pixels));
}

Result<void> PageImage::saveAsJPGAtPath(const std::filesystem::path& path) const {
  const Result<std::shared_ptr<ImageWrapper>> image = drawn();
  return image ? (*image)->saveAsJPGAtPath(path) : image.error();
}

Result<void> PageImage::saveAsPNGAtURL(const Url& url) const {
  const Result<std::shared_ptr<ImageWrapper>> image = drawn();
  return image ? (*image)->saveAsPNGAtURL(url) : image.error();
}

}  // namespace quilt::platform
