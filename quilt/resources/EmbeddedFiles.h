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

/// The compiled-in artwork and strings, sorted by path.
std::span<const EmbeddedFile> embeddedFiles();

/// The compiled-in scripts for pages and clients, sorted by path. A library of their own: who serves them needs no
/// artwork.
std::span<const EmbeddedFile> embeddedScripts();

}  // namespace quilt::resources
