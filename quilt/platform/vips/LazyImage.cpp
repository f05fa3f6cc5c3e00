// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/LazyImage.h"

#include <cstring>
#include <utility>

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/vips/JpegWriter.h"

namespace quilt::platform::vips {

namespace {

// Of 0 to 9. With differences of neighbours (the filter) a photograph takes three quarters of the bytes that level 6
// needs without them, in less time; higher levels gain nothing on photographs.
constexpr int kPNGCompression = 2;

bool isTransparent(const Image& image) { return vips_image_get_bands(image.get()) == 4; }

Image onWhite(const Image& image) {
  ::VipsImage* out = nullptr;
  VipsArrayDouble* white = vips_array_double_newv(3, 255.0, 255.0, 255.0);
  const int failed = vips_flatten(image.get(), &out, "background", white, nullptr);
  vips_area_unref(VIPS_AREA(white));
  return Image(failed ? nullptr : out);
}

Result<void> write(const std::filesystem::path& path, void* bytes, std::size_t length) {
  const std::unique_ptr<void, decltype(&g_free)> owner(bytes, g_free);
  return services().files->writeAtomically(path, {static_cast<const char*>(bytes), length});
}

}  // namespace

LazyImage::LazyImage(std::shared_ptr<const PixelSource> source) : _source(std::move(source)), _size(_source->size()) {}

LazyImage::LazyImage(std::shared_ptr<const PixelSource> source, Size size) : _source(std::move(source)), _size(size) {}

std::shared_ptr<ImageWrapper> LazyImage::fitted(Size box) const {
  // The same pixels and the same file, seen through an object of its own.
  return std::make_shared<LazyImage>(_source, fittedSize(_size, box));
}

Result<void> LazyImage::saveAsJPGAtPath(const std::filesystem::path& path) const {
  if (_size == _source->size()) {
    const Result<std::optional<std::string>> jpeg = _source->plainJPEG();
    if (!jpeg) return jpeg.error();
    if (*jpeg) return services().files->writeAtomically(path, **jpeg);
  }
  Result<Image> image = _source->pixels(_size);
  if (!image) return image.error();
  if (isTransparent(*image)) image = onWhite(*image);
  void* bytes = nullptr;
  std::size_t length = 0;
  if (!*image || vips_jpegsave_buffer(image->get(), &bytes, &length, "Q", kJPEGQuality, "strip", TRUE, nullptr) != 0) {
    return failure(ErrorKind::Damaged, "The image cannot be decoded and written as JPEG", path);
  }
  return write(path, bytes, length);
}

Result<void> LazyImage::saveAsPNGAtURL(const Url& url) const {
  if (!url.isFileUrl()) return Error{ErrorKind::Unsupported, "An image can be saved to a file only.", {}};
  Result<Image> image = _source->pixels(_size);
  if (!image) return image.error();
  void* bytes = nullptr;
  std::size_t length = 0;
  if (vips_pngsave_buffer(image->get(), &bytes, &length, "compression", kPNGCompression, "filter",
                          VIPS_FOREIGN_PNG_FILTER_SUB, "strip", TRUE, nullptr) != 0) {
    return failure(ErrorKind::Damaged, "The image cannot be decoded and written as PNG", url.relativePath());
  }
  return write(url.relativePath(), bytes, length);
}

Result<Bitmap> LazyImage::bitmap() const {
  if (Result<void> size = checkSize(_size, kMaximumHeldPixels, {}); !size) return size.error();
  Result<Image> image = _source->pixels(_size);
  if (!image) return image.error();
  if (!isTransparent(*image)) {
    ::VipsImage* out = nullptr;
    const int failed = vips_bandjoin_const1(image->get(), &out, 255, nullptr);
    image = Image(failed ? nullptr : out);
  }
  std::size_t length = 0;
  const std::unique_ptr<void, decltype(&g_free)> pixels(
      *image ? vips_image_write_to_memory(image->get(), &length) : nullptr, g_free);
  if (!pixels) return failure(ErrorKind::Damaged, "The image cannot be drawn", {});
  const auto* first = static_cast<const std::uint8_t*>(pixels.get());
  return Bitmap{static_cast<std::size_t>(_size.width), static_cast<std::size_t>(_size.height),
                std::vector<std::uint8_t>(first, first + length)};
}

}  // namespace quilt::platform::vips
