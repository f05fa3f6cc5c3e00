// SPDX-License-Identifier: Apache-2.0
#include "tests/support/ImageFixtures.h"

#include <vips/vips.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <stdexcept>

#include "quilt/platform/vips/Vips.h"

namespace quilt::support {

using platform::Bitmap;
using platform::vips::Image;

namespace {

Image checked(int failed, ::VipsImage*& out) {
  if (failed) throw std::runtime_error(vips_error_buffer());
  return Image(out);
}

Image inColour(const Image& image, const std::string& colour) {
  ::VipsImage* out = nullptr;
  if (colour == "cmyk") return checked(vips_icc_export(image.get(), &out, "output_profile", "cmyk", nullptr), out);
  const int space = vips_enum_from_nick("test", VIPS_TYPE_INTERPRETATION, colour.c_str());
  return checked(vips_colourspace(image.get(), &out, static_cast<VipsInterpretation>(space), nullptr), out);
}

}  // namespace

Bitmap paint(std::size_t width, std::size_t height, const std::function<Rgba(std::size_t, std::size_t)>& color) {
  Bitmap bitmap{width, height, {}};
  bitmap.pixels.reserve(width * height * 4);
  for (std::size_t y = 0; y < height; ++y) {
    for (std::size_t x = 0; x < width; ++x) {
      const Rgba pixel = color(x, y);
      bitmap.pixels.insert(bitmap.pixels.end(), pixel.begin(), pixel.end());
    }
  }
  return bitmap;
}

Bitmap quadrants(std::size_t width, std::size_t height) {
  return paint(width, height, [=](std::size_t x, std::size_t y) {
    const bool right = x >= width / 2;
    return y < height / 2 ? (right ? kGreen : kRed) : (right ? kWhite : kBlue);
  });
}

Rgba pixelAt(const Bitmap& bitmap, std::size_t x, std::size_t y) {
  const std::uint8_t* pixel = &bitmap.pixels.at((y * bitmap.width + x) * 4);
  return {pixel[0], pixel[1], pixel[2], pixel[3]};
}

int distance(const Rgba& a, const Rgba& b) {
  int largest = 0;
  for (std::size_t i = 0; i < 4; ++i) largest = std::max(largest, std::abs(a[i] - b[i]));
  return largest;
}

std::string encode(const Bitmap& bitmap, const Encoding& encoding) {
  platform::vips::start();
  ::VipsImage* out = nullptr;
  Image image(vips_image_new_from_memory_copy(bitmap.pixels.data(), bitmap.pixels.size(),
                                              static_cast<int>(bitmap.width), static_cast<int>(bitmap.height), 4,
                                              VIPS_FORMAT_UCHAR));
  image = checked(vips_copy(image.get(), &out, "interpretation", VIPS_INTERPRETATION_sRGB, nullptr), out);
  bool opaque = true;
  for (std::size_t i = 3; i < bitmap.pixels.size(); i += 4) opaque = opaque && bitmap.pixels[i] == 255;
  if (opaque) image = checked(vips_extract_band(image.get(), &out, 0, "n", 3, nullptr), out);
  if (encoding.colour == "cmyk") {
    image = checked(vips_icc_import(image.get(), &out, "input_profile", "srgb", nullptr), out);
  }
  if (encoding.colour != "srgb") image = inColour(image, encoding.colour);
  if (!encoding.profile.empty()) {
    image =
        checked(vips_icc_transform(image.get(), &out, encoding.profile.c_str(), "input_profile", "srgb", nullptr), out);
  } else {
    image = checked(vips_copy(image.get(), &out, nullptr), out);
    vips_image_remove(image.get(), VIPS_META_ICC_NAME);
  }
  if (encoding.orientation != 1) vips_image_set_int(image.get(), VIPS_META_ORIENTATION, encoding.orientation);
  for (const auto& [name, value] : encoding.exif) {
    vips_image_set_string(image.get(), ("exif-ifd0-" + name).c_str(), value.c_str());
  }
  void* bytes = nullptr;
  std::size_t length = 0;
  if (vips_image_write_to_buffer(image.get(), encoding.suffix.c_str(), &bytes, &length, nullptr) != 0) {
    throw std::runtime_error(vips_error_buffer());
  }
  std::string result(static_cast<const char*>(bytes), length);
  g_free(bytes);
  return result;
}

std::filesystem::path writeFile(const std::filesystem::path& file, const std::string& bytes) {
  std::ofstream(file, std::ios::binary) << bytes;
  return file;
}

std::string bytesOf(const std::filesystem::path& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

std::filesystem::path corpusImage(const std::string& name) {
  const std::filesystem::path file = std::filesystem::path(QUILT_MEDIA_FOLDER) / name;
  return std::filesystem::exists(file) ? file : std::filesystem::path();
}

std::size_t openDescriptors() {
  const std::filesystem::directory_iterator all("/proc/self/fd");
  return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

}  // namespace quilt::support
