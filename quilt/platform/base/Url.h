// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// The address of a file or of a web page. A value; never empty.
class QUILT_EXPORT Url {
 public:
  /// The URL of a local file: "file://" and the absolute path, percent-encoded byte by byte, so that any name survives.
  /// A relative path is taken from the working folder.
  static Url fileUrl(const std::filesystem::path& path);

  /// Reads an absolute URL. Spaces in what follows the host are encoded, as people and other programs leave them there.
  /// None for text without a scheme, with control characters, with spaces elsewhere, or for a file URL that names
  /// another host or holds an encoded NUL.
  static std::optional<Url> parse(std::string_view text);

  /// Whether it is the URL of a local file.
  [[nodiscard]] bool isFileUrl() const { return _isFile; }
  /// The URL as text, percent-encoded as it was given or made.
  [[nodiscard]] const std::string& absoluteString() const { return _text; }

  /// The path part, percent-decoded: for a file URL the file's path.
  [[nodiscard]] std::filesystem::path relativePath() const;
  /// The same as text, which costs a tenth.
  [[nodiscard]] std::string relativePathText() const;

  /// Equal when their texts are.
  bool operator==(const Url&) const = default;

 private:
  Url(std::string text, bool isFile) : _text(std::move(text)), _isFile(isFile) {}

  std::string _text;
  bool _isFile;
};

}  // namespace quilt::platform
