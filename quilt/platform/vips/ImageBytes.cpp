// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/ImageBytes.h"

#include <array>
#include <fstream>

#include "quilt/platform/interfaces/Services.h"

namespace quilt::platform::vips {

namespace {

constexpr std::size_t kFirstBytes = 64;

bool isHEIF(std::string_view bytes) {
  if (bytes.size() < 12 || bytes.substr(4, 4) != "ftyp") return false;
  constexpr std::array<std::string_view, 8> brands = {"heic", "heix", "heim", "heis", "mif1", "msf1", "avif", "hevc"};
  for (const std::string_view brand : brands) {
    if (bytes.substr(8, 4) == brand) return true;
  }
  return false;
}

}  // namespace

const char* nameOf(ImageFormat format) {
  switch (format) {
    case ImageFormat::JPEG:
      return "JPEG";
    case ImageFormat::PNG:
      return "PNG";
    case ImageFormat::TIFF:
      return "TIFF";
    case ImageFormat::GIF:
      return "GIF";
    case ImageFormat::WebP:
      return "WebP";
    case ImageFormat::JPEG2000:
      return "JPEG 2000";
    case ImageFormat::HEIF:
      return "HEIF";
    case ImageFormat::BMP:
      return "BMP";
    case ImageFormat::ICNS:
      return "ICNS";
  }
  return "";
}

std::optional<ImageFormat> formatOf(std::string_view bytes) {
  using namespace std::string_view_literals;
  if (bytes.starts_with("\xFF\xD8\xFF"sv)) return ImageFormat::JPEG;
  if (bytes.starts_with("\x89PNG\r\n\x1A\n"sv)) return ImageFormat::PNG;
  if (bytes.starts_with("II*\0"sv) || bytes.starts_with("MM\0*"sv)) return ImageFormat::TIFF;
  if (bytes.starts_with("II+\0"sv) || bytes.starts_with("MM\0+"sv)) return ImageFormat::TIFF;  // 64-bit offsets
  if (bytes.starts_with("GIF87a"sv) || bytes.starts_with("GIF89a"sv)) return ImageFormat::GIF;
  if (bytes.starts_with("RIFF"sv) && bytes.size() >= 12 && bytes.substr(8, 4) == "WEBP") return ImageFormat::WebP;
  if (bytes.starts_with("\0\0\0\x0CjP  \r\n\x87\n"sv)) return ImageFormat::JPEG2000;
  if (bytes.starts_with("\xFF\x4F\xFF\x51"sv)) return ImageFormat::JPEG2000;  // a bare code stream
  if (bytes.starts_with("icns"sv)) return ImageFormat::ICNS;
  if (bytes.starts_with("BM"sv) && bytes.size() >= 26) return ImageFormat::BMP;
  if (isHEIF(bytes)) return ImageFormat::HEIF;
  return std::nullopt;
}

Result<std::string> ImageBytes::firstBytes() const {
  if (_data) return _data->substr(0, kFirstBytes);
  std::error_code error;
  const std::filesystem::file_status status = std::filesystem::status(_file, error);
  if (!std::filesystem::exists(status)) return Error{ErrorKind::NotFound, "There is no such image file.", _file};
  if (!std::filesystem::is_regular_file(status)) {
    return Error{ErrorKind::Unsupported, "This is no file that can hold an image.", _file};
  }
  std::string bytes(kFirstBytes, '\0');
  std::ifstream stream(_file, std::ios::binary);
  if (!stream) return Error{ErrorKind::PermissionDenied, "The image file cannot be opened.", _file};
  stream.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  bytes.resize(static_cast<std::size_t>(stream.gcount()));
  return bytes;
}

Result<std::string> ImageBytes::all(std::uint64_t maximum) const {
  if (!_data) return services().files->readFile(_file, maximum);
  if (_data->size() > maximum) return Error{ErrorKind::Damaged, "The image takes up too many bytes.", _file};
  return *_data;
}

Source ImageBytes::open() const {
  // Not by libvips' names for images, in which "photo[1].jpg" would be a file and an option.
  return Source(_data ? vips_source_new_from_memory(_data->data(), _data->size())
                      : vips_source_new_from_file(_file.c_str()));
}

}  // namespace quilt::platform::vips
