// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string>
#include <utility>
#include <vector>

namespace quilt::support {

/// A PDF of the given objects, numbered from 1; the first is the catalogue. `trailer` is added to the trailer's
/// entries.
std::string makePdf(const std::vector<std::string>& objects, const std::string& trailer = "");

/// Three objects: a catalogue, the page tree, and one page with these entries ("/MediaBox [0 0 100 200]").
std::vector<std::string> onePage(const std::string& pageEntries);

/// A zip archive with the named contents, in order.
void makeZip(const std::filesystem::path& file, const std::vector<std::pair<std::string, std::string>>& entries);

/// An EPUB with the metadata elements in its package file.
void makeEpub(const std::filesystem::path& file, const std::string& metadata, const std::string& version = "3.0");

}  // namespace quilt::support
