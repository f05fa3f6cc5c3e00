// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/VipsImages.h"

#include <string>
#include <utility>

#include "quilt/platform/vips/LazyImage.h"
#include "quilt/platform/vips/PixelSource.h"

namespace quilt::platform {

namespace {

Result<std::shared_ptr<ImageWrapper>> wrap(Result<std::shared_ptr<const vips::PixelSource>> source) {
  if (!source) return source.error();
  return std::shared_ptr<ImageWrapper>(std::make_shared<vips::LazyImage>(*std::move(source)));
}

Capability capability(vips::ImageFormat format, const char* operation) {
  const std::string name = std::string(vips::nameOf(format)) + " images";
  if (operation && vips_type_find("VipsOperation", operation) == 0) {
    return {name, false, "", "Install a libvips that was built with it."};
  }
  return {name, true, "", ""};
}

}  // namespace

Result<std::shared_ptr<ImageWrapper>> VipsImages::imageWithPath(const std::filesystem::path& path) const {
  return wrap(vips::PixelSource::ofImage(vips::ImageBytes::inFile(path)));
}

Result<std::shared_ptr<ImageWrapper>> VipsImages::imageWithData(std::span<const unsigned char> data) const {
  return wrap(vips::PixelSource::ofImage(
      vips::ImageBytes::inMemory(std::string(reinterpret_cast<const char*>(data.data()), data.size()))));
}

Result<std::shared_ptr<ImageWrapper>> VipsImages::imageWithBitmap(Bitmap bitmap) const {
  return wrap(vips::PixelSource::ofBitmap(std::move(bitmap)));
}

std::vector<Capability> VipsImages::capabilities() {
  using vips::ImageFormat;
  vips::start();
  const std::string version =
      std::to_string(vips_version(0)) + "." + std::to_string(vips_version(1)) + "." + std::to_string(vips_version(2));
  return {
      {"Images (libvips)", true, version, ""},
      capability(ImageFormat::JPEG, "jpegload_source"),
      capability(ImageFormat::PNG, "pngload_source"),
      capability(ImageFormat::TIFF, "tiffload_source"),
      capability(ImageFormat::GIF, "gifload_source"),
      capability(ImageFormat::WebP, "webpload_source"),
      capability(ImageFormat::JPEG2000, "jp2kload_source"),
      capability(ImageFormat::HEIF, "heifload_source"),
      capability(ImageFormat::BMP, nullptr),
      capability(ImageFormat::ICNS, nullptr),
  };
}

}  // namespace quilt::platform
