// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/MupdfInspector.h"

#include <mupdf/fitz/version.h>

#include "quilt/platform/mupdf/documents.h"

namespace quilt::platform {

Result<MediaFacts> MupdfInspector::inspect(const std::filesystem::path& path) const {
  const Result<mupdf::DocumentKind> kind = mupdf::kindOfDocument(path);
  if (!kind) return kind.error();
  switch (*kind) {
    case mupdf::DocumentKind::PDF:
      return mupdf::inspectPDF(path);
    case mupdf::DocumentKind::EPUB:
      return mupdf::inspectEPUB(path);
  }
  return Error{ErrorKind::Unsupported, "This is no PDF or EPUB document.", path};
}

const char* MupdfInspector::version() { return FZ_VERSION; }

}  // namespace quilt::platform
