// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// Whether a name from a record may become one component of a path: not empty, not "." or "..", no "/" and no NUL, at
/// most 255 bytes.
QUILT_EXPORT bool isPlainComponent(std::string_view name);

/// `path` expressed relative to the folder `base`, by their components alone: "/a/b/c" to "/a" gives "b/c"; a path
/// outside climbs with "..". An empty `base` or `path` gives `path` unchanged.
QUILT_EXPORT std::filesystem::path pathRelativeTo(const std::filesystem::path& path, const std::filesystem::path& base);

/// pathRelativeTo() as text, for paths that are at hand as text: a path keeps each component as a text of its own.
QUILT_EXPORT std::string textRelativeTo(const std::string& path, const std::string& base);

/// Expands a leading "~" (the user's home folder), removes "." and ".." components and doubled or trailing separators,
/// all by the text alone.
QUILT_EXPORT std::filesystem::path standardizedPath(const std::filesystem::path& path);

/// The extension without its dot; empty when there is none.
QUILT_EXPORT std::string pathExtension(const std::filesystem::path& path);

/// `base` with "." and the extension appended; `base` alone when the extension is empty.
QUILT_EXPORT std::string withExtension(std::string_view base, std::string_view extension);

}  // namespace quilt::platform
