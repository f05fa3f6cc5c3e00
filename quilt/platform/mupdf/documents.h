// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <optional>
#include <string>

#include "quilt/platform/base/Result.h"
#include "quilt/platform/interfaces/FDYMedia.h"

namespace quilt::platform::mupdf {

enum class DocumentKind { PDF, EPUB };

/// What a file is by its first bytes, or by its name for a PDF whose start is lost. A packed file counts as EPUB.
Result<DocumentKind> kindOfDocument(const std::filesystem::path& path);

Result<MediaFacts> inspectPDF(const std::filesystem::path& path);
Result<MediaFacts> inspectEPUB(const std::filesystem::path& path);

/// The text without white space around it; none when nothing is left or it is no UTF-8.
std::optional<std::string> trimmed(const std::string& text);

/// The same with every run of white space inside made one space: how a book's metadata is meant to be read.
std::optional<std::string> collapsed(const std::string& text);

}  // namespace quilt::platform::mupdf
