// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <span>
#include <string_view>

namespace quilt::resources {

/// One file of this folder, compiled in.
struct EmbeddedFile {
  std::string_view path;  ///< relative to quilt/resources: "artwork/AudioPreview.png"
  std::span<const unsigned char> bytes;
};

/// Every compiled-in file, sorted by path.
std::span<const EmbeddedFile> embeddedFiles();

}  // namespace quilt::resources
