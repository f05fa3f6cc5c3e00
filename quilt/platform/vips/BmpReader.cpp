// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/BmpReader.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <cstdlib>
#include <vector>

namespace quilt::platform::vips {

namespace {

constexpr std::size_t kFileHeader = 14;
constexpr std::uint32_t kOldHeader = 12;
constexpr std::uint32_t kHeader = 40;

enum class Packing : std::uint32_t { Plain = 0, RunLength8 = 1, RunLength4 = 2, BitFields = 3, BitFieldsAlpha = 6 };

// Little-endian numbers; zero past the end.
std::uint32_t number(std::string_view bytes, std::size_t at, std::size_t size) {
  std::uint32_t value = 0;
  for (std::size_t i = 0; i < size && at + i < bytes.size(); ++i) {
    value |= static_cast<std::uint32_t>(static_cast<unsigned char>(bytes[at + i])) << (8 * i);
  }
  return value;
}

struct Color {
  std::uint8_t red = 0, green = 0, blue = 0, alpha = 255;
};

// One channel of a pixel that is made of bit fields.
class Field {
 public:
  Field() = default;
  explicit Field(std::uint32_t mask)
      : _shift(mask ? std::countr_zero(mask) : 0), _maximum(mask ? mask >> _shift : 0), _mask(mask) {}

  [[nodiscard]] std::uint8_t value(std::uint32_t pixel, std::uint8_t absent) const {
    if (_maximum == 0) return absent;
    const std::uint64_t part = (pixel & _mask) >> _shift;
    return static_cast<std::uint8_t>((part * 255 + _maximum / 2) / _maximum);
  }

 private:
  int _shift = 0;
  std::uint32_t _maximum = 0;
  std::uint32_t _mask = 0;
};

struct Layout {
  std::size_t width = 0;
  std::size_t height = 0;
  bool isTopDown = false;
  std::uint32_t bits = 0;
  Packing packing = Packing::Plain;
  std::size_t pixels = 0;  // where they start
  std::array<Color, 256> palette;
  Field red, green, blue, alpha;
};

bool isKnown(std::uint32_t packing, std::uint32_t bits) {
  switch (static_cast<Packing>(packing)) {
    case Packing::Plain:
      return bits == 1 || bits == 4 || bits == 8 || bits == 16 || bits == 24 || bits == 32;
    case Packing::RunLength8:
      return bits == 8;
    case Packing::RunLength4:
      return bits == 4;
    case Packing::BitFields:
    case Packing::BitFieldsAlpha:
      return bits == 16 || bits == 32;
  }
  return false;
}

void readFields(std::string_view bytes, std::uint32_t headerSize, Layout& layout) {
  if (layout.packing == Packing::BitFields || layout.packing == Packing::BitFieldsAlpha) {
    // Behind the old header or inside the longer ones: the same place.
    layout.red = Field(number(bytes, kFileHeader + kHeader, 4));
    layout.green = Field(number(bytes, kFileHeader + kHeader + 4, 4));
    layout.blue = Field(number(bytes, kFileHeader + kHeader + 8, 4));
    const bool hasAlpha = layout.packing == Packing::BitFieldsAlpha || headerSize >= kHeader + 16;
    if (hasAlpha) layout.alpha = Field(number(bytes, kFileHeader + kHeader + 12, 4));
  } else if (layout.bits == 16) {
    layout.red = Field(0x7C00);
    layout.green = Field(0x03E0);
    layout.blue = Field(0x001F);
  } else {
    layout.red = Field(0xFF0000);
    layout.green = Field(0x00FF00);
    layout.blue = Field(0x0000FF);
  }
}

void readPalette(std::string_view bytes, std::uint32_t headerSize, Layout& layout) {
  if (layout.bits > 8) return;
  const bool isOld = headerSize == kOldHeader;
  const std::size_t entrySize = isOld ? 3 : 4;
  const std::size_t start = kFileHeader + headerSize;
  const std::uint32_t used = isOld ? 0 : number(bytes, kFileHeader + 32, 4);
  std::size_t count = std::size_t{1} << layout.bits;
  if (used != 0) count = std::min<std::size_t>(count, used);
  for (std::size_t i = 0; i < count; ++i) {
    const std::size_t at = start + i * entrySize;
    layout.palette[i] = {static_cast<std::uint8_t>(number(bytes, at + 2, 1)),
                         static_cast<std::uint8_t>(number(bytes, at + 1, 1)),
                         static_cast<std::uint8_t>(number(bytes, at, 1)), 255};
  }
}

// What every version of the header begins with.
std::optional<Layout> readSize(std::string_view bytes) {
  if (!bytes.starts_with("BM") || bytes.size() < kFileHeader + kOldHeader) return std::nullopt;
  const std::uint32_t headerSize = number(bytes, kFileHeader, 4);
  if (headerSize != kOldHeader && (headerSize < kHeader || headerSize > 1024)) return std::nullopt;

  Layout layout;
  if (headerSize == kOldHeader) {
    layout.width = number(bytes, kFileHeader + 4, 2);
    layout.height = number(bytes, kFileHeader + 6, 2);
  } else {
    const auto width = static_cast<std::int32_t>(number(bytes, kFileHeader + 4, 4));
    const auto height = static_cast<std::int32_t>(number(bytes, kFileHeader + 8, 4));
    if (width <= 0) return std::nullopt;
    layout.width = static_cast<std::size_t>(width);
    layout.height = static_cast<std::size_t>(std::abs(static_cast<std::int64_t>(height)));
    layout.isTopDown = height < 0;
  }
  if (layout.width == 0 || layout.height == 0) return std::nullopt;
  return layout;
}

std::optional<Layout> readLayout(std::string_view bytes) {
  std::optional<Layout> layout = readSize(bytes);
  if (!layout) return std::nullopt;
  const std::uint32_t headerSize = number(bytes, kFileHeader, 4);
  const bool isOld = headerSize == kOldHeader;
  layout->bits = number(bytes, kFileHeader + (isOld ? 10 : 14), 2);
  const std::uint32_t packing = isOld ? 0 : number(bytes, kFileHeader + 16, 4);
  if (!isKnown(packing, layout->bits)) return std::nullopt;
  layout->packing = static_cast<Packing>(packing);
  layout->pixels = number(bytes, 10, 4);
  readFields(bytes, headerSize, *layout);
  readPalette(bytes, headerSize, *layout);
  return layout;
}

void put(Bitmap& bitmap, const Layout& layout, std::size_t x, std::size_t rowInFile, Color color) {
  if (x >= layout.width || rowInFile >= layout.height) return;
  const std::size_t row = layout.isTopDown ? rowInFile : layout.height - 1 - rowInFile;
  std::uint8_t* pixel = &bitmap.pixels[(row * layout.width + x) * 4];
  pixel[0] = color.red;
  pixel[1] = color.green;
  pixel[2] = color.blue;
  pixel[3] = color.alpha;
}

Color colorAt(const Layout& layout, std::string_view row, std::size_t x) {
  if (layout.bits <= 8) {
    const std::size_t bit = x * layout.bits;
    const std::uint32_t byte = number(row, bit / 8, 1);
    const std::uint32_t mask = (1U << layout.bits) - 1;
    return layout.palette[(byte >> (8 - layout.bits - bit % 8)) & mask];
  }
  const std::uint32_t pixel = number(row, x * layout.bits / 8, layout.bits / 8);
  return {layout.red.value(pixel, 0), layout.green.value(pixel, 0), layout.blue.value(pixel, 0),
          layout.alpha.value(pixel, 255)};
}

void readRows(std::string_view bytes, const Layout& layout, Bitmap& bitmap) {
  const std::size_t rowBytes = (layout.width * layout.bits + 31) / 32 * 4;
  const std::size_t usedBytes = (layout.width * layout.bits + 7) / 8;
  for (std::size_t y = 0; y < layout.height; ++y) {
    const std::size_t start = layout.pixels + y * rowBytes;
    if (start >= bytes.size() || bytes.size() - start < usedBytes) return;
    const std::string_view row = bytes.substr(start, usedBytes);
    for (std::size_t x = 0; x < layout.width; ++x) put(bitmap, layout, x, y, colorAt(layout, row, x));
  }
}

void readRuns(std::string_view bytes, const Layout& layout, Bitmap& bitmap) {
  const bool isHalf = layout.packing == Packing::RunLength4;
  std::size_t at = layout.pixels;
  std::size_t x = 0;
  std::size_t y = 0;
  const auto putIndex = [&](std::uint32_t byte, std::size_t i) {
    const std::uint32_t index = !isHalf ? byte : i % 2 == 0 ? byte >> 4 : byte & 15;
    put(bitmap, layout, x++, y, layout.palette[index]);
  };
  while (at + 1 < bytes.size() && y < layout.height) {
    const std::uint32_t count = number(bytes, at, 1);
    const std::uint32_t value = number(bytes, at + 1, 1);
    at += 2;
    if (count > 0) {
      for (std::uint32_t i = 0; i < count; ++i) putIndex(value, i);
    } else if (value == 0) {  // end of the row
      x = 0;
      ++y;
    } else if (value == 1) {  // end of the picture
      return;
    } else if (value == 2) {  // a step without pixels
      x += number(bytes, at, 1);
      y += number(bytes, at + 1, 1);
      at += 2;
    } else {  // pixels one by one, padded to two bytes
      for (std::uint32_t i = 0; i < value; ++i) putIndex(number(bytes, at + (isHalf ? i / 2 : i), 1), i);
      const std::size_t length = isHalf ? (value + 1) / 2 : value;
      at += (length + 1) / 2 * 2;
    }
  }
}

}  // namespace

std::optional<BmpHeader> readBmpHeader(std::string_view bytes) {
  const std::optional<Layout> layout = readSize(bytes);
  if (!layout) return std::nullopt;
  return BmpHeader{layout->width, layout->height};
}

std::optional<Bitmap> readBmp(std::string_view bytes) {
  const std::optional<Layout> layout = readLayout(bytes);
  if (!layout) return std::nullopt;
  Bitmap bitmap{layout->width, layout->height, std::vector<std::uint8_t>(layout->width * layout->height * 4)};
  if (layout->packing == Packing::RunLength8 || layout->packing == Packing::RunLength4) {
    readRuns(bytes, *layout, bitmap);
  } else {
    readRows(bytes, *layout, bitmap);
  }
  return bitmap;
}

}  // namespace quilt::platform::vips
