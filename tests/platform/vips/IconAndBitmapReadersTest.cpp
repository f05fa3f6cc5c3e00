// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/vips/BmpReader.h"
#include "quilt/platform/vips/IcnsReader.h"
#include "quilt/platform/vips/VipsImages.h"
#include "tests/support/ImageFixtures.h"

namespace quilt::platform::vips {
namespace {

using namespace quilt::support;

std::string little(std::uint64_t value, std::size_t size) {
  std::string bytes;
  for (std::size_t i = 0; i < size; ++i) bytes += static_cast<char>(value >> (8 * i));
  return bytes;
}

std::string big(std::uint32_t value) {
  std::string bytes = little(value, 4);
  return {bytes.rbegin(), bytes.rend()};
}

/// A bitmap file from its parts.
struct Bmp {
  std::uint32_t width = 2;
  std::int32_t height = 2;
  std::uint32_t bits = 24;
  std::uint32_t packing = 0;
  std::string afterHeader{};  // fields or palette
  std::string pixels{};

  [[nodiscard]] std::string bytes() const {
    const auto start = static_cast<std::uint32_t>(54 + afterHeader.size());
    return "BM" + little(start + static_cast<std::uint32_t>(pixels.size()), 4) + little(0, 4) + little(start, 4) +
           little(40, 4) + little(width, 4) + little(static_cast<std::uint32_t>(height), 4) + little(1, 2) +
           little(bits, 2) + little(packing, 4) + little(0, 4) + little(0, 8) + little(0, 4) + little(0, 4) +
           afterHeader + pixels;
  }
};

using namespace std::string_literals;

// Red, green over blue, white: stored from the bottom, as blue green red.
const std::string kRows24 = "\xFF\0\0\xFF\xFF\xFF\0\0"s + "\0\0\xFF\0\xFF\0\0\0"s;
const std::string kPalette = "\0\0\xFF\0\0\xFF\0\0\xFF\0\0\0\xFF\xFF\xFF\0"s;  // red, green, blue, white

void expectColors(const std::optional<Bitmap>& bitmap) {
  ASSERT_TRUE(bitmap);
  ASSERT_EQ(bitmap->width, 2U);
  ASSERT_EQ(bitmap->height, 2U);
  EXPECT_EQ(pixelAt(*bitmap, 0, 0), kRed);
  EXPECT_EQ(pixelAt(*bitmap, 1, 0), kGreen);
  EXPECT_EQ(pixelAt(*bitmap, 0, 1), kBlue);
  EXPECT_EQ(pixelAt(*bitmap, 1, 1), kWhite);
}

TEST(BmpReaderTest, ReadsEveryDepth) {
  expectColors(readBmp(Bmp{.pixels = kRows24}.bytes()));
  expectColors(readBmp(Bmp{.bits = 32, .pixels = "\xFF\0\0\0\xFF\xFF\xFF\0"s + "\0\0\xFF\0\0\xFF\0\0"s}.bytes()));
  expectColors(readBmp(Bmp{.bits = 16, .pixels = "\x1F\0\xFF\x7F"s + "\0\x7C\xE0\x03"s}.bytes()));
  expectColors(readBmp(Bmp{.bits = 16,
                           .packing = 3,
                           .afterHeader = little(0xF800, 4) + little(0x07E0, 4) + little(0x001F, 4),
                           .pixels = "\x1F\0\xFF\xFF"s + "\0\xF8\xE0\x07"s}
                           .bytes()));
  const std::string full = kPalette + std::string(1024 - kPalette.size(), '\0');
  expectColors(readBmp(Bmp{.bits = 8, .afterHeader = full, .pixels = "\2\3\0\0"s + "\0\1\0\0"s}.bytes()));
  expectColors(
      readBmp(Bmp{.bits = 4, .afterHeader = full.substr(0, 64), .pixels = "\x23\0\0\0"s + "\x01\0\0\0"s}.bytes()));
}

TEST(BmpReaderTest, ReadsOneBitAndTheOldHeader) {
  const std::string blackAndWhite = "\0\0\0\0\xFF\xFF\xFF\0"s;
  const std::optional<Bitmap> bit =
      readBmp(Bmp{.bits = 1, .afterHeader = blackAndWhite, .pixels = "\x40\0\0\0"s + "\x80\0\0\0"s}.bytes());
  ASSERT_TRUE(bit);
  EXPECT_EQ(pixelAt(*bit, 0, 0), kWhite);
  EXPECT_EQ(pixelAt(*bit, 1, 0), (Rgba{0, 0, 0, 255}));
  EXPECT_EQ(pixelAt(*bit, 1, 1), kWhite);

  const std::string old = "BM"s + little(42, 4) + little(0, 4) + little(26, 4) + little(12, 4) + little(2, 2) +
                          little(2, 2) + little(1, 2) + little(24, 2) + kRows24;
  expectColors(readBmp(old));
}

TEST(BmpReaderTest, ReadsRunLengthsAndRowsFromTheTop) {
  const std::string full = kPalette + std::string(1024 - kPalette.size(), '\0');
  expectColors(
      readBmp(Bmp{.bits = 8, .packing = 1, .afterHeader = full, .pixels = "\1\2\1\3\0\0"s + "\1\0\1\1\0\1"s}.bytes()));
  expectColors(
      readBmp(Bmp{.bits = 4, .packing = 2, .afterHeader = full.substr(0, 64), .pixels = "\2\x23\0\0"s + "\2\x01\0\1"s}
                  .bytes()));
  expectColors(readBmp(Bmp{.height = -2, .pixels = kRows24.substr(8) + kRows24.substr(0, 8)}.bytes()));
}

TEST(BmpReaderTest, KeepsTransparencyOnlyWhereTheHeaderSaysSo) {
  const std::string fields = little(0xFF0000, 4) + little(0xFF00, 4) + little(0xFF, 4) + little(0xFF000000, 4);
  const std::string pixels = "\0\0\xFF\x80"s;
  const auto read = [&](std::uint32_t packing, const std::string& after) {
    return readBmp(
        Bmp{.width = 1, .height = 1, .bits = 32, .packing = packing, .afterHeader = after, .pixels = pixels}.bytes());
  };
  EXPECT_EQ(pixelAt(*read(6, fields), 0, 0), (Rgba{255, 0, 0, 128}));
  EXPECT_EQ(pixelAt(*read(0, ""), 0, 0), kRed);
}

TEST(BmpReaderTest, EveryLengthAndEveryFlippedByteIsSurvived) {
  const std::string full = kPalette + std::string(48, '\0');
  for (const std::string& whole :
       {Bmp{.pixels = kRows24}.bytes(),
        Bmp{.bits = 4, .packing = 2, .afterHeader = full, .pixels = "\2\x23\0\0\0\4\x12\x34\0\2\1\1\2\x01\0\1"s}
            .bytes()}) {
    for (std::size_t length = 0; length < whole.size(); ++length) (void)readBmp(whole.substr(0, length));
    for (std::size_t i = 0; i < whole.size(); ++i) {
      for (const int flip : {1, 0x80, 0xFF}) {
        std::string other = whole;
        other[i] = static_cast<char>(other[i] ^ flip);
        const std::optional<BmpHeader> header = readBmpHeader(other);
        if (header && header->width * header->height < 1000000) (void)readBmp(other);
      }
    }
  }
}

std::string icon(const std::vector<std::pair<std::string, std::string>>& elements) {
  std::string content;
  for (const auto& [type, data] : elements) content += type + big(static_cast<std::uint32_t>(data.size() + 8)) + data;
  return "icns" + big(static_cast<std::uint32_t>(content.size() + 8)) + content;
}

TEST(IcnsReaderTest, AnswersTheLargestPictureFirst) {
  const std::string small = encode(quadrants(128, 128), {.suffix = ".png"});
  const std::string large = encode(quadrants(512, 512), {.suffix = ".png"});
  const std::vector<IconPicture> pictures = readIcns(icon({{"ic07", small}, {"TOC ", "x"}, {"ic09", large}}));
  ASSERT_EQ(pictures.size(), 2U);
  EXPECT_EQ(pictures[0].nominalSide, 512U);
  EXPECT_EQ(std::get<std::string>(pictures[0].content), large);
}

TEST(IcnsReaderTest, ReadsRunLengthsWithTheirMask) {
  const std::string runs = "\xFF\xFF\xFB\xFF"s + "\xFF\0\xFB\0"s + "\xFF\x10\xFB\x10"s;  // 130 + 126 of each channel
  const std::vector<IconPicture> pictures = readIcns(icon({{"is32", runs}, {"s8mk", std::string(256, '\x40')}}));
  ASSERT_EQ(pictures.size(), 1U);
  const Bitmap& bitmap = std::get<Bitmap>(pictures[0].content);
  EXPECT_EQ(bitmap.width, 16U);
  EXPECT_EQ(pixelAt(bitmap, 0, 0), (Rgba{255, 0, 16, 64}));
  EXPECT_EQ(pixelAt(bitmap, 15, 15), (Rgba{255, 0, 16, 64}));
}

TEST(IcnsReaderTest, ReadsRunLengthsWithTransparencyAsAChannel) {
  std::string runs = "ARGB";
  for (const char level : {'\x80', '\xFF', '\x00', '\x10'}) {
    runs += "\xFF"s + level + "\xFB" + level;
  }
  const std::vector<IconPicture> pictures = readIcns(icon({{"ic04", runs}}));
  ASSERT_EQ(pictures.size(), 1U);
  EXPECT_EQ(pixelAt(std::get<Bitmap>(pictures[0].content), 7, 7), (Rgba{255, 0, 16, 128}));
}

TEST(IcnsReaderTest, EveryLengthAndEveryFlippedByteIsSurvived) {
  const std::string whole = icon({{"is32", "\xFF\xFF\xFB\xFF\xFF\0\xFB\0\xFF\x10\xFB\x10"s},
                                  {"s8mk", std::string(256, '\x40')},
                                  {"ic04", "ARGB\3"}});
  for (std::size_t length = 0; length < whole.size(); ++length) (void)readIcns(whole.substr(0, length));
  for (std::size_t i = 0; i < whole.size(); ++i) {
    std::string other = whole;
    other[i] = static_cast<char>(~other[i]);
    for (const IconPicture& picture : readIcns(other)) EXPECT_LE(picture.nominalSide, 1024U);
  }
}

}  // namespace
}  // namespace quilt::platform::vips
