// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace quilt::support {

/// What Python's own property-list reader sees at the top level of a file: "Key kind value" for each key, in the order
/// in which the file holds them; kind is str, int, float, bool, datetime, bytes, list or dict. One line that begins
/// with "error" when it cannot read the file.
std::vector<std::string> entriesByPython(const std::filesystem::path& file);

/// The same for every level: "Media.0.Sources.0.UUID str value". A list or dictionary has a line of its own, with its
/// count, before those of what it holds.
std::vector<std::string> treeByPython(const std::filesystem::path& file);

/// Writes what Python reads in one file to another, in the binary form. False when it cannot.
bool writeBinaryByPython(const std::filesystem::path& file, const std::filesystem::path& binaryFile);

/// Only the keys, in order.
std::vector<std::string> keysByPython(const std::filesystem::path& file);

}  // namespace quilt::support
