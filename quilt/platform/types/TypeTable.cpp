// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/types/TypeTable.h"

#include <algorithm>
#include <cctype>
#include <unordered_map>

#include "quilt/platform/base/Paths.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/types/Signatures.h"

namespace quilt::platform {

namespace {

const TypeRow* rowNamed(std::string_view identifier) {
  static const auto index = [] {
    std::unordered_map<std::string_view, const TypeRow*> rows;
    for (const TypeRow& row : typeRows()) rows.emplace(row.identifier, &row);
    return rows;
  }();
  const auto found = index.find(identifier);
  return found == index.end() ? nullptr : found->second;
}

const TypeRow* rowWithExtension(const std::filesystem::path& path) {
  static const auto index = [] {
    std::unordered_map<std::string_view, const TypeRow*> rows;
    for (const TypeRow& row : typeRows())
      for (const char* extension : row.extensions) rows.emplace(extension, &row);
    return rows;
  }();
  std::string extension = pathExtension(path);
  std::transform(extension.begin(), extension.end(), extension.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  const auto found = index.find(extension);
  return found == index.end() ? nullptr : found->second;
}

bool rowConformsTo(const TypeRow* row, std::string_view other) {
  if (!row) return false;
  if (row->identifier == other) return true;
  return std::any_of(row->parents.begin(), row->parents.end(),
                     [other](const char* parent) { return rowConformsTo(rowNamed(parent), other); });
}

/// The families whose confusion does harm: what one decoder is handed must be of its family.
const char* familyOf(const TypeRow* row) {
  for (const char* family : {types::kAudiovisual, types::kImage, "org.quilt.document", types::kText, "public.archive"})
    if (rowConformsTo(row, family)) return family;
  return nullptr;
}

}  // namespace

bool TypeTable::conformsTo(std::string_view identifier, std::string_view other) const {
  return identifier == other || rowConformsTo(rowNamed(identifier), other);
}

std::optional<std::string> TypeTable::mimeType(std::string_view identifier) const {
  const TypeRow* row = rowNamed(identifier);
  if (!row || row->mimeTypes.empty()) return std::nullopt;
  return row->mimeTypes.front();
}

std::optional<std::string> TypeTable::preferredIdentifier(const std::filesystem::path& path) const {
  switch (services().files->kindOfItemAtPath(path)) {
    case FileKind::Missing:
    case FileKind::Other:  // a pipe or device could keep a reader waiting
      return std::nullopt;
    case FileKind::Folder:
      return types::kFolder;
    case FileKind::File:
      break;
  }
  const TypeRow* named = rowWithExtension(path);
  const auto start = services().files->readStart(path, kSignatureLength);
  if (!start) return named ? std::optional<std::string>(named->identifier) : std::nullopt;

  const char* content = typeOfContent(*start);
  if (!named) {
    if (content) return content;
    return isPlainText(*start) ? std::optional<std::string>(types::kText) : std::nullopt;
  }
  if (!content) {
    // Damaged files have no signature either, and keep their extension's type; a text is no movie, whatever its name.
    const bool isTextInDisguise = isPlainText(*start) && familyOf(named) != std::string_view(types::kText) &&
                                  !rowConformsTo(named, "org.quilt.document") && !rowConformsTo(named, types::kSVG);
    return isTextInDisguise ? types::kText : named->identifier;
  }
  const TypeRow* shown = rowNamed(content);
  const char* namedFamily = familyOf(named);
  const char* shownFamily = familyOf(shown);
  const bool isContainerOfDocument =
      shownFamily == std::string_view("public.archive") && namedFamily == std::string_view("org.quilt.document");
  const bool sameFamily = namedFamily && shownFamily && std::string_view(namedFamily) == shownFamily;
  return sameFamily || isContainerOfDocument ? named->identifier : content;
}

}  // namespace quilt::platform
