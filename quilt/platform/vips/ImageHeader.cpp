// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/ImageHeader.h"

#include <algorithm>
#include <string_view>

namespace quilt::platform::vips {

namespace {

int integer(::VipsImage* image, const char* name) {
  int value = 0;
  if (vips_image_get_typeof(image, name) == 0 || vips_image_get_int(image, name, &value) != 0) return 0;
  return value;
}

// EXIF fields come as "the text (the text, ASCII, 9 components, 9 bytes)".
std::optional<std::string> exifText(::VipsImage* image, const char* name) {
  const char* field = nullptr;
  if (vips_image_get_typeof(image, name) == 0 || vips_image_get_string(image, name, &field) != 0) return std::nullopt;
  std::string text(field);
  const std::size_t length = text.rfind(" components, ");
  if (length != std::string::npos) {
    // The part in brackets repeats the text, so that the text itself ends in the middle.
    const std::size_t kind = text.rfind(", ", text.rfind(", ", length) - 1);
    if (kind != std::string::npos && kind >= 2) text.erase((kind - 2) / 2);
  }
  const std::size_t end = text.find_last_not_of(' ');
  text.erase(end == std::string::npos ? 0 : end + 1);
  if (text.empty() || !g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr)) return std::nullopt;
  return text;
}

bool contains(std::string_view text, std::string_view part) { return text.find(part) != std::string_view::npos; }

bool hasForeignProfile(::VipsImage* image) {
  if (vips_image_get_typeof(image, VIPS_META_ICC_NAME) == 0) return false;
  const void* data = nullptr;
  std::size_t length = 0;
  if (vips_image_get_blob(image, VIPS_META_ICC_NAME, &data, &length) != 0) return true;
  const std::string_view profile(static_cast<const char*>(data), length);
  using namespace std::string_view_literals;
  return !contains(profile, "sRGB"sv) && !contains(profile, "s\0R\0G\0B"sv);
}

// What the decoder of such a picture keeps in memory at once.
bool isHeldWhole(::VipsImage* image, ImageFormat format) {
  switch (format) {
    case ImageFormat::JPEG:
      return integer(image, "jpeg-multiscan") != 0;
    case ImageFormat::PNG:
      return integer(image, "interlaced") != 0;
    case ImageFormat::TIFF:
      return false;
    case ImageFormat::GIF:
    case ImageFormat::WebP:
    case ImageFormat::JPEG2000:
    case ImageFormat::HEIF:
    case ImageFormat::BMP:
    case ImageFormat::ICNS:
      return true;
  }
  return true;
}

// JPEG 2000: how many halvings; libvips offers each smaller resolution as a page.
int halvings(double reduction, int resolutions) {
  int count = 0;
  while (count + 1 < resolutions && count < 5 && reduction >= 2) {
    ++count;
    reduction /= 2;
  }
  return count;
}

int openJPEG2000(::VipsSource* source, ::VipsImage** out, double reduction) {
  if (vips_jp2kload_source(source, out, "access", VIPS_ACCESS_SEQUENTIAL, nullptr) != 0) return -1;
  const int page = halvings(reduction, integer(*out, VIPS_META_N_PAGES));
  if (page == 0) return 0;
  ::VipsImage* smaller = nullptr;
  if (vips_jp2kload_source(source, &smaller, "page", page, "access", VIPS_ACCESS_SEQUENTIAL, nullptr) != 0) {
    forgetFailures();
    return 0;
  }
  g_object_unref(*out);
  *out = smaller;
  return 0;
}

}  // namespace

Image openPixels(::VipsSource* source, ImageFormat format, double reduction) {
  ::VipsImage* out = nullptr;
  const int shrink = reduction >= 8 ? 8 : reduction >= 4 ? 4 : reduction >= 2 ? 2 : 1;
  int failed = -1;
  switch (format) {
    case ImageFormat::JPEG:
      failed = vips_jpegload_source(source, &out, "shrink", shrink, "access", VIPS_ACCESS_SEQUENTIAL, nullptr);
      break;
    case ImageFormat::PNG:
      failed = vips_pngload_source(source, &out, "access", VIPS_ACCESS_SEQUENTIAL, nullptr);
      break;
    case ImageFormat::TIFF:
      failed = vips_tiffload_source(source, &out, "access", VIPS_ACCESS_SEQUENTIAL, nullptr);
      break;
    case ImageFormat::GIF:
      failed = vips_gifload_source(source, &out, "access", VIPS_ACCESS_SEQUENTIAL, nullptr);
      break;
    case ImageFormat::WebP:
      failed = vips_webpload_source(source, &out, "access", VIPS_ACCESS_SEQUENTIAL, nullptr);
      break;
    case ImageFormat::JPEG2000:
      failed = openJPEG2000(source, &out, reduction);
      break;
    case ImageFormat::HEIF:
      failed = vips_heifload_source(source, &out, "access", VIPS_ACCESS_SEQUENTIAL, nullptr);
      break;
    case ImageFormat::BMP:
    case ImageFormat::ICNS:
      break;
  }
  return Image(failed ? nullptr : out);
}

Result<void> checkSize(Size size, double maximumPixels, const std::filesystem::path& file) {
  if (size.width < 1 || size.height < 1) return Error{ErrorKind::Damaged, "The image is empty.", file};
  if (size.width > kMaximumSide || size.height > kMaximumSide || size.width * size.height > maximumPixels) {
    return Error{ErrorKind::Damaged, "The image is larger than any that is read.", file};
  }
  return {};
}

Result<ImageHeader> readHeader(const ImageBytes& bytes, ImageFormat format) {
  const Source source = bytes.open();
  const Image image = source ? openPixels(source.get(), format, 1) : nullptr;
  if (!image) return failure(ErrorKind::Damaged, "The image is damaged", bytes.file());

  ImageHeader header;
  header.format = format;
  header.size = {static_cast<double>(vips_image_get_width(image.get())),
                 static_cast<double>(vips_image_get_height(image.get()))};
  header.isTurned = vips_image_get_orientation(image.get()) > 1;
  if (vips_image_get_orientation_swap(image.get())) std::swap(header.size.width, header.size.height);
  const double maximum = isHeldWhole(image.get(), format) ? kMaximumHeldPixels : kMaximumStreamedPixels;
  if (Result<void> size = checkSize(header.size, maximum, bytes.file()); !size) return size.error();

  const VipsInterpretation interpretation = vips_image_get_interpretation(image.get());
  header.colour = vips_enum_nick(VIPS_TYPE_INTERPRETATION, interpretation);
  header.isPlainRGB = (interpretation == VIPS_INTERPRETATION_sRGB || interpretation == VIPS_INTERPRETATION_B_W) &&
                      vips_image_get_format(image.get()) == VIPS_FORMAT_UCHAR && !hasForeignProfile(image.get());
  header.title = exifText(image.get(), "exif-ifd0-XPTitle");
  header.information = exifText(image.get(), "exif-ifd0-ImageDescription");
  header.author = exifText(image.get(), "exif-ifd0-Artist");
  forgetFailures();
  return header;
}

}  // namespace quilt::platform::vips
