// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/vips/IcnsReader.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <map>

namespace quilt::platform::vips {

namespace {

struct Kind {
  std::string_view type;
  std::size_t side;
  std::string_view mask;  // the element with the transparency of old kinds; empty for kinds with their own
};

constexpr std::array<Kind, 17> kKinds = {{{"ic10", 1024, ""},
                                          {"ic14", 512, ""},
                                          {"ic09", 512, ""},
                                          {"ic13", 256, ""},
                                          {"ic08", 256, ""},
                                          {"ic07", 128, ""},
                                          {"it32", 128, "t8mk"},
                                          {"ic12", 64, ""},
                                          {"icp6", 64, ""},
                                          {"ih32", 48, "h8mk"},
                                          {"ic11", 32, ""},
                                          {"icp5", 32, ""},
                                          {"ic05", 32, ""},
                                          {"il32", 32, "l8mk"},
                                          {"icp4", 16, ""},
                                          {"is32", 16, "s8mk"},
                                          {"ic04", 16, ""}}};

std::uint32_t bigEndian(std::string_view bytes, std::size_t at) {
  std::uint32_t value = 0;
  for (std::size_t i = 0; i < 4; ++i) value = value << 8 | static_cast<unsigned char>(bytes[at + i]);
  return value;
}

std::map<std::string_view, std::string_view> elementsOf(std::string_view bytes) {
  std::map<std::string_view, std::string_view> elements;
  if (bytes.size() < 8 || !bytes.starts_with("icns")) return elements;
  for (std::size_t at = 8; at + 8 <= bytes.size();) {
    const std::size_t length = bigEndian(bytes, at + 4);
    if (length < 8) break;
    const std::size_t end = std::min(bytes.size(), at + length);
    elements.emplace(bytes.substr(at, 4), bytes.substr(at + 8, end - at - 8));
    at = end;
  }
  return elements;
}

// One byte for each pixel and channel, channel after channel; none when the runs end early.
std::optional<std::string> expandRuns(std::string_view runs, std::size_t length) {
  std::string out;
  out.reserve(length);
  for (std::size_t at = 0; out.size() < length;) {
    if (at >= runs.size()) return std::nullopt;
    const auto code = static_cast<unsigned char>(runs[at++]);
    if (code < 128) {
      const std::size_t count = code + 1U;
      if (runs.size() - at < count) return std::nullopt;
      out += runs.substr(at, count);
      at += count;
    } else {
      if (at >= runs.size()) return std::nullopt;
      out.append(code - 125U, runs[at++]);
    }
  }
  out.resize(length);
  return out;
}

std::optional<Bitmap> readRuns(std::string_view data, std::size_t side, std::string_view mask) {
  if (side == 128 && data.size() >= 4 && bigEndian(data, 0) == 0) data.remove_prefix(4);
  const std::size_t area = side * side;
  std::optional<std::string> expanded;
  if (data.size() == area * 4) {  // not packed: four bytes a pixel, the first unused
    expanded.emplace(area * 3, '\0');
    for (std::size_t i = 0; i < area * 3; ++i) (*expanded)[i] = data[(i % area) * 4 + 1 + i / area];
  } else {
    expanded = expandRuns(data, area * 3);
  }
  if (!expanded) return std::nullopt;
  Bitmap bitmap{side, side, std::vector<std::uint8_t>(area * 4, 255)};
  for (std::size_t i = 0; i < area; ++i) {
    for (std::size_t channel = 0; channel < 3; ++channel) {
      bitmap.pixels[i * 4 + channel] = static_cast<std::uint8_t>((*expanded)[channel * area + i]);
    }
    if (mask.size() == area) bitmap.pixels[i * 4 + 3] = static_cast<std::uint8_t>(mask[i]);
  }
  return bitmap;
}

// The newest small kinds: run lengths with the transparency as the first channel.
std::optional<Bitmap> readRunsWithAlpha(std::string_view data, std::size_t side) {
  const std::size_t area = side * side;
  const std::optional<std::string> expanded = expandRuns(data, area * 4);
  if (!expanded) return std::nullopt;
  Bitmap bitmap{side, side, std::vector<std::uint8_t>(area * 4)};
  for (std::size_t i = 0; i < area; ++i) {
    for (std::size_t channel = 0; channel < 4; ++channel) {
      bitmap.pixels[i * 4 + (channel + 3) % 4] = static_cast<std::uint8_t>((*expanded)[channel * area + i]);
    }
  }
  return bitmap;
}

bool isImageFile(std::string_view data) {
  using namespace std::string_view_literals;
  return data.starts_with("\x89PNG"sv) || data.starts_with("\0\0\0\x0CjP  "sv) ||
         data.starts_with("\xFF\x4F\xFF\x51"sv);
}

}  // namespace

std::vector<IconPicture> readIcns(std::string_view bytes) {
  const std::map<std::string_view, std::string_view> elements = elementsOf(bytes);
  std::vector<IconPicture> pictures;
  for (const Kind& kind : kKinds) {
    const auto element = elements.find(kind.type);
    if (element == elements.end()) continue;
    const std::string_view data = element->second;
    if (isImageFile(data)) {
      pictures.push_back({kind.side, std::string(data)});
    } else if (data.starts_with("ARGB")) {
      if (std::optional<Bitmap> bitmap = readRunsWithAlpha(data.substr(4), kind.side)) {
        pictures.push_back({kind.side, *std::move(bitmap)});
      }
    } else {
      const auto mask = elements.find(kind.mask);
      if (std::optional<Bitmap> bitmap =
              readRuns(data, kind.side, mask == elements.end() ? std::string_view() : mask->second)) {
        pictures.push_back({kind.side, *std::move(bitmap)});
      }
    }
  }
  return pictures;
}

}  // namespace quilt::platform::vips
