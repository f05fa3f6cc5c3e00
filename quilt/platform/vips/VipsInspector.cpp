// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/VipsInspector.h"

#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/vips/PixelSource.h"

namespace quilt::platform {

namespace {

// By what the file holds, not by what it is called.
const char* identifierOf(vips::ImageFormat format) {
  switch (format) {
    case vips::ImageFormat::JPEG:
      return types::kJPEG;
    case vips::ImageFormat::PNG:
      return types::kPNG;
    case vips::ImageFormat::TIFF:
      return types::kTIFF;
    case vips::ImageFormat::GIF:
      return types::kGIF;
    case vips::ImageFormat::WebP:
      return "org.webmproject.webp";
    case vips::ImageFormat::JPEG2000:
      return types::kJPEG2000;
    case vips::ImageFormat::HEIF:
      return types::kHEIC;
    case vips::ImageFormat::BMP:
      return types::kBMP;
    case vips::ImageFormat::ICNS:
      return types::kICNS;
  }
  return types::kImage;
}

}  // namespace

Result<MediaFacts> VipsInspector::inspect(const std::filesystem::path& path) const {
  const Result<std::shared_ptr<const vips::PixelSource>> source =
      vips::PixelSource::ofImage(vips::ImageBytes::inFile(path));
  if (!source) return source.error();
  const vips::ImageHeader& header = *(*source)->header();
  MediaFacts facts;
  facts.width = header.size.width;
  facts.height = header.size.height;
  facts.mimeType = services().types->mimeType(identifierOf(header.format));
  facts.metadataTitle = header.title;
  facts.metadataInformation = header.information;
  facts.metadataAuthor = header.author;
  facts.details = {{"Format", vips::nameOf(header.format)}, {"Colour", header.colour}};
  if (header.isTurned) facts.details.emplace_back("Orientation", "turned by the camera's note");
  return facts;
}

}  // namespace quilt::platform
