// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/JpegWriter.h"

#include <gtest/gtest.h>

#include "quilt/platform/vips/VipsImages.h"
#include "tests/support/ImageFixtures.h"

namespace quilt::platform::vips {
namespace {

using namespace quilt::support;

constexpr std::pair<std::size_t, std::size_t> kSizes[] = {{1, 1}, {3, 3}, {16, 16}, {33, 17}, {250, 131}};

std::shared_ptr<ImageWrapper> opened(const std::string& jpeg) {
  const auto image = VipsImages().imageWithData({reinterpret_cast<const unsigned char*>(jpeg.data()), jpeg.size()});
  EXPECT_TRUE(image) << (image ? "" : image.error().text);
  return image ? *image : nullptr;
}

// What libvips makes of the same picture at the same quality.
Bitmap byLibvips(const Bitmap& bitmap) { return *opened(encode(bitmap, {.suffix = ".jpg[Q=85]"}))->bitmap(); }

// How many channels the file holds: the tenth byte of its frame header.
int channelsOf(const std::string& jpeg) {
  const std::size_t frame = jpeg.find("\xFF\xC0");
  return frame == std::string::npos ? 0 : jpeg.at(frame + 9);
}

Rgba shade(std::size_t x, std::size_t y) {
  const auto grey = static_cast<std::uint8_t>(x * 5 + y * 3);
  return {grey, grey, grey, 255};
}

TEST(JpegWriterTest, ThePixelsAreThoseThatLibvipsWouldWrite) {
  for (const auto& [width, height] : kSizes) {
    const Bitmap coloured = paint(width, height, [](std::size_t x, std::size_t y) {
      return Rgba{static_cast<std::uint8_t>(x * 7), static_cast<std::uint8_t>(y * 11), 90, 255};
    });
    const std::optional<std::string> jpeg = jpegOf(coloured);
    ASSERT_TRUE(jpeg);
    EXPECT_EQ(channelsOf(*jpeg), 3);
    EXPECT_EQ(opened(*jpeg)->bitmap()->pixels, byLibvips(coloured).pixels) << width << " x " << height;
  }
}

TEST(JpegWriterTest, AGreyPictureNeedsNoColoursToLookTheSame) {
  for (const auto& [width, height] : kSizes) {
    const Bitmap grey = paint(width, height, shade);
    const std::optional<std::string> jpeg = jpegOf(grey);
    ASSERT_TRUE(jpeg);
    EXPECT_EQ(channelsOf(*jpeg), 1);
    EXPECT_EQ(opened(*jpeg)->bitmap()->pixels, byLibvips(grey).pixels) << width << " x " << height;
  }
}

TEST(JpegWriterTest, OnePixelDecidesAboutColourAndTransparency) {
  for (const std::size_t pixel : {0U, 1U, 7U, 8U}) {
    for (const std::size_t channel : {0U, 1U, 2U, 3U}) {
      Bitmap bitmap = paint(3, 3, shade);
      bitmap.pixels[pixel * 4 + channel] -= 1;
      const std::optional<std::string> jpeg = jpegOf(bitmap);
      EXPECT_EQ(jpeg.has_value(), channel != 3) << pixel;
      EXPECT_EQ(jpeg ? channelsOf(*jpeg) : 3, 3) << pixel << ", " << channel;
    }
  }
}

TEST(JpegWriterTest, NoiseIsWrittenWhole) {  // more bytes than are gathered at once
  std::uint32_t state = 1;
  const Bitmap noise = paint(700, 500, [&](std::size_t, std::size_t) {
    state = state * 1664525 + 1013904223;
    return Rgba{static_cast<std::uint8_t>(state >> 24), static_cast<std::uint8_t>(state >> 16), 0, 255};
  });
  const std::optional<std::string> jpeg = jpegOf(noise);
  ASSERT_TRUE(jpeg);
  EXPECT_GT(jpeg->size(), 2U << 16);
  EXPECT_EQ(opened(*jpeg)->bitmap()->pixels, byLibvips(noise).pixels);
}

TEST(JpegWriterTest, ASideThatJPEGCannotSayIsRefused) {
  EXPECT_FALSE(jpegOf(paint(65536, 1, shade)));
  EXPECT_FALSE(jpegOf(paint(1, 65536, shade)));
}

}  // namespace
}  // namespace quilt::platform::vips
