// SPDX-License-Identifier: Apache-2.0
#include <fstream>
#include <string>
#include <system_error>

#include "quilt/platform/mupdf/documents.h"

namespace quilt::platform::mupdf {

namespace {

// How far into a file the signature of a PDF may lie.
constexpr std::size_t kSignatureArea = 1024;

bool isCalledPDF(const std::filesystem::path& path) {
  const std::string extension = path.extension().string();
  return extension == ".pdf" || extension == ".PDF";
}

}  // namespace

Result<DocumentKind> kindOfDocument(const std::filesystem::path& path) {
  std::error_code error;
  const std::filesystem::file_status status = std::filesystem::status(path, error);
  if (!std::filesystem::exists(status)) return Error{ErrorKind::NotFound, "There is no such document.", path};
  const Error unsupported{ErrorKind::Unsupported, "This is no PDF or EPUB document.", path};
  if (!std::filesystem::is_regular_file(status)) return unsupported;
  std::string start(kSignatureArea, '\0');
  std::ifstream stream(path, std::ios::binary);
  if (!stream) return Error{ErrorKind::PermissionDenied, "The document cannot be opened.", path};
  stream.read(start.data(), static_cast<std::streamsize>(start.size()));
  start.resize(static_cast<std::size_t>(stream.gcount()));
  if (start.starts_with("PK\x03\x04")) return DocumentKind::EPUB;
  if (start.find("%PDF-") != std::string::npos || isCalledPDF(path)) return DocumentKind::PDF;
  return unsupported;
}

}  // namespace quilt::platform::mupdf
