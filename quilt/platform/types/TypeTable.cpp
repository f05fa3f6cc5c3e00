// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/types/TypeTable.h"

#include <algorithm>
#include <cctype>
#include <initializer_list>
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

constexpr const char* kDocumentFamily = "org.quilt.document";
constexpr const char* kArchiveFamily = "public.archive";

/// The families whose confusion does harm: what one decoder is handed must be of its family. One of five pointers.
const char* familyOf(const TypeRow* row) {
  for (const char* family : {types::kAudiovisual, types::kImage, kDocumentFamily, types::kText, kArchiveFamily})
    if (rowConformsTo(row, family)) return family;
  return nullptr;
}

bool isOneOf(const TypeRow* row, std::initializer_list<const char*> identifiers) {
  return std::ranges::any_of(identifiers, [row](const char* one) { return row->identifier == std::string_view(one); });
}

bool isPaged(const TypeRow* row) { return isOneOf(row, {types::kPDF, types::kEPUBContainer}); }

bool isPacked(const TypeRow* row) {
  return isOneOf(row, {types::kWordOpenXML, types::kPowerPointOpenXML, types::kTextDocument, types::kPresentation});
}

/// Whether a file of plain text cannot be what its extension says. Some documents are written as text.
bool isTextInDisguise(const TypeRow* named, std::string_view start) {
  if (rowConformsTo(named, types::kText) || rowConformsTo(named, types::kSVG)) return false;
  if (!rowConformsTo(named, kDocumentFamily)) return true;
  if (isOneOf(named, {types::kPDF})) {  // one that lost its first line has objects still
    return start.find("%PDF-") == std::string_view::npos && start.find(" obj") == std::string_view::npos;
  }
  return isPaged(named) || isPacked(named) || isOneOf(named, {types::kPowerPointPpt});
}

/// Whether a file whose content is of the one type may be taken for the other, which its extension says.
bool mayPassAs(const TypeRow* named, const TypeRow* shown, std::string_view start) {
  const char* namedFamily = familyOf(named);
  const char* shownFamily = familyOf(shown);
  if (!namedFamily || !shownFamily) return false;
  if (namedFamily == kArchiveFamily) return shownFamily == kArchiveFamily;
  if (namedFamily == kDocumentFamily && shownFamily == kArchiveFamily) {
    return isOneOf(named, {types::kEPUBContainer}) || (isPacked(named) && mayBePackedDocument(start));
  }
  // Pages and office documents are opened by different programs.
  if (namedFamily == kDocumentFamily && (isPaged(named) || isPaged(shown))) return named == shown;
  return namedFamily == shownFamily;
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
    return isPlainText(*start) && isTextInDisguise(named, *start) ? types::kText : named->identifier;
  }
  return mayPassAs(named, rowNamed(content), *start) ? named->identifier : content;
}

}  // namespace quilt::platform
