// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/vips/Vips.h"

namespace quilt::platform::vips {

/// The kinds of image that are read. No other decoder ever sees a file, whatever libvips was built with.
enum class ImageFormat { JPEG, PNG, TIFF, GIF, WebP, JPEG2000, HEIF, BMP, ICNS };

/// The format's name for people.
const char* nameOf(ImageFormat format);

/// The format that the first bytes of a file (64 are enough) belong to, or none.
std::optional<ImageFormat> formatOf(std::string_view firstBytes);

/// An encoded image where it lies: in a file, or in memory. A value, cheap to copy.
class ImageBytes {
 public:
  static ImageBytes inFile(std::filesystem::path file) { return {std::move(file), nullptr}; }
  static ImageBytes inMemory(std::string data, std::filesystem::path file = {}) {
    return {std::move(file), std::make_shared<const std::string>(std::move(data))};
  }

  /// The file that the bytes come from, for errors; empty for bytes that were never in one.
  [[nodiscard]] const std::filesystem::path& file() const { return _file; }

  /// The first 64 bytes, or fewer. NotFound when there is no file; Unsupported for what is no regular file.
  [[nodiscard]] Result<std::string> firstBytes() const;
  /// All bytes. Damaged when there are more than `maximum`.
  [[nodiscard]] Result<std::string> all(std::uint64_t maximum) const;
  /// For a decoder. The object must outlive what is decoded from it.
  [[nodiscard]] Source open() const;

 private:
  ImageBytes(std::filesystem::path file, std::shared_ptr<const std::string> data)
      : _file(std::move(file)), _data(std::move(data)) {}

  std::filesystem::path _file;
  std::shared_ptr<const std::string> _data;  // null: in the file
};

}  // namespace quilt::platform::vips
