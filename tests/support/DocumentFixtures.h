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

/// A stream object: what is between "stream" and "endstream", with its length and further entries.
std::string streamObject(const std::string& content, const std::string& entries = "");

/// The same with marks drawn on it, in operators of a content stream; /F1 is Helvetica. The stream is object 4.
std::vector<std::string> drawnPage(const std::string& pageEntries, const std::string& content);

/// The operators that write a line from a point, counted from the lower left.
std::string textAt(int x, int y, const std::string& text, int size = 12);

/// The bytes of a PDF of pages of 200 × 100 points that say "Page 1", "Page 2", …
std::string makePages(std::size_t count);

/// A zip archive with the named contents, in order.
void makeZip(const std::filesystem::path& file, const std::vector<std::pair<std::string, std::string>>& entries);

/// An EPUB with the metadata elements in its package file.
void makeEpub(const std::filesystem::path& file, const std::string& metadata, const std::string& version = "3.0");

/// A readable EPUB: one file for each chapter, with what stands in its <body>.
void makeBook(const std::filesystem::path& file, const std::vector<std::string>& chapters);

}  // namespace quilt::support
