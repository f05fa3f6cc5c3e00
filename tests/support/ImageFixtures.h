// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <string>

#include "quilt/platform/base/Bitmap.h"

namespace quilt::support {

using Rgba = std::array<std::uint8_t, 4>;

inline constexpr Rgba kRed{255, 0, 0, 255};
inline constexpr Rgba kGreen{0, 255, 0, 255};
inline constexpr Rgba kBlue{0, 0, 255, 255};
inline constexpr Rgba kWhite{255, 255, 255, 255};

platform::Bitmap paint(std::size_t width, std::size_t height,
                       const std::function<Rgba(std::size_t x, std::size_t y)>& color);
/// Red, green over blue, white.
platform::Bitmap quadrants(std::size_t width, std::size_t height);

Rgba pixelAt(const platform::Bitmap& bitmap, std::size_t x, std::size_t y);
/// The largest difference between two colours in one channel.
int distance(const Rgba& a, const Rgba& b);

/// How a fixture is stored.
struct Encoding {
  std::string suffix = ".jpg";                ///< with libvips' options: ".png[palette=true]"
  std::string colour = "srgb";                ///< "srgb", "cmyk", "b-w", "rgb16", "grey16"
  int orientation = 1;                        ///< EXIF, 1 to 8
  std::string profile{};                      ///< an ICC profile of libvips ("p3"); empty: none
  std::map<std::string, std::string> exif{};  ///< "ImageDescription": "…"
};

/// The bytes of an image file.
std::string encode(const platform::Bitmap& bitmap, const Encoding& encoding);
/// As a file in `folder` under `name`; answers its path.
std::filesystem::path writeFile(const std::filesystem::path& file, const std::string& bytes);
std::string bytesOf(const std::filesystem::path& file);

/// A file of the media corpus, or empty without the corpus.
std::filesystem::path corpusImage(const std::string& name);

/// How many descriptors this process has open.
std::size_t openDescriptors();

}  // namespace quilt::support
