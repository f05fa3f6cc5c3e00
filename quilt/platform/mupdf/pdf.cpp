// SPDX-License-Identifier: Apache-2.0
#include <mupdf/pdf.h>

#include <cmath>

#include "quilt/platform/mupdf/MupdfContext.h"
#include "quilt/platform/mupdf/documents.h"

namespace quilt::platform::mupdf {

namespace {

constexpr int kMaximumText = 64 << 10;
constexpr const char* kDamagedDocument = "The document is damaged";

std::optional<std::string> metadata(MupdfContext& context, pdf_document* document, const char* key) {
  std::string text(kMaximumText, '\0');
  int length = 0;
  const Result<void> read = context.run(kDamagedDocument, {}, [&](fz_context* c) {
    length = pdf_lookup_metadata(c, document, key, text.data(), kMaximumText);
  });
  if (!read || length <= 1) return std::nullopt;
  text.resize(text.find('\0'));
  return trimmed(text);
}

// The text of the first item of, say, <dc:title><rdf:Alt><rdf:li>, in the description that newer files carry.
std::string described(fz_xml* root, const char* element) {
  fz_xml* item = fz_xml_find_dfs(root, element, nullptr, nullptr);
  if (item) item = fz_xml_find_dfs(fz_xml_down(item), "li", nullptr, nullptr);
  const char* text = item && fz_xml_down(item) ? fz_xml_text(fz_xml_down(item)) : nullptr;
  return text ? text : "";
}

void readDescription(MupdfContext& context, pdf_document* document, MediaFacts& facts) {
  MupdfContext::Owner<fz_buffer> buffer(context, fz_drop_buffer);
  MupdfContext::Owner<fz_xml> xml(context, fz_drop_xml);
  const Result<void> read = context.run(kDamagedDocument, {}, [&](fz_context* c) {
    pdf_obj* object = pdf_dict_getp(c, pdf_trailer(c, document), "Root/Metadata");
    if (!pdf_is_stream(c, object)) return;
    buffer.object = pdf_load_stream(c, object);
    xml.object = fz_parse_xml(c, buffer.object, 0);
  });
  if (!read || !xml.object) return;
  fz_xml* root = fz_xml_root(xml.object);
  if (!facts.metadataTitle) facts.metadataTitle = trimmed(described(root, "title"));
  if (!facts.metadataAuthor) facts.metadataAuthor = trimmed(described(root, "creator"));
  if (!facts.metadataInformation) facts.metadataInformation = trimmed(described(root, "description"));
}

}  // namespace

Result<MediaFacts> inspectPDF(const std::filesystem::path& path) {
  MupdfContext context;
  MupdfContext::Owner<fz_stream> stream(context, fz_drop_stream);
  MupdfContext::Owner<pdf_document> document(context, pdf_drop_document);
  bool needsPassword = false;
  Result<void> opened = context.run(kDamagedDocument, path, [&](fz_context* c) {
    stream.object = fz_open_file(c, path.c_str());
    document.object = pdf_open_document_with_stream(c, stream.object);
    needsPassword = pdf_needs_password(c, document.object) != 0;
  });
  if (!opened) return opened.error();
  if (needsPassword) return Error{ErrorKind::Unsupported, "The document is protected by a password.", path};

  int pages = 0;
  fz_rect box = fz_empty_rect;
  Result<void> read = context.run(kDamagedDocument, path, [&](fz_context* c) {
    pages = pdf_count_pages(c, document.object);
    if (pages < 1) fz_throw(c, FZ_ERROR_GENERIC, "it has no pages");
    fz_matrix matrix;
    pdf_page_obj_transform(c, pdf_lookup_page_obj(c, document.object, 0), &box, &matrix);
    box = fz_transform_rect(box, matrix);
  });
  if (!read) return read.error();

  MediaFacts facts;
  facts.mimeType = "application/pdf";
  const double width = std::abs(box.x1 - box.x0);
  const double height = std::abs(box.y1 - box.y0);
  if (std::isfinite(width) && std::isfinite(height)) {
    facts.width = width;
    facts.height = height;
  }
  facts.metadataTitle = metadata(context, document.object, FZ_META_INFO_TITLE);
  facts.metadataAuthor = metadata(context, document.object, FZ_META_INFO_AUTHOR);
  facts.metadataInformation = metadata(context, document.object, FZ_META_INFO_SUBJECT);
  readDescription(context, document.object, facts);
  facts.details = {{"Format", metadata(context, document.object, FZ_META_FORMAT).value_or("PDF")},
                   {"Pages", std::to_string(pages)}};
  return facts;
}

}  // namespace quilt::platform::mupdf
