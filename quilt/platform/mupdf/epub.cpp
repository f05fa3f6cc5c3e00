// SPDX-License-Identifier: Apache-2.0
#include <mupdf/fitz.h>

#include "quilt/platform/mupdf/MupdfContext.h"
#include "quilt/platform/mupdf/documents.h"

namespace quilt::platform::mupdf {

namespace {

constexpr std::size_t kMaximumXML = 8 << 20;  // bytes of a container or package file, unpacked
constexpr const char* kDamagedBook = "The book is damaged";

/// The packed files of a book.
class Book {
 public:
  explicit Book(const std::filesystem::path& path) : _path(path) {}

  Result<void> open() {
    return _context.run(kDamagedBook, _path, [&](fz_context* c) {
      _stream.object = fz_open_file(c, _path.c_str());
      _archive.object = fz_open_zip_archive_with_stream(c, _stream.object);
    });
  }

  bool has(const char* name) {
    bool found = false;
    const Result<void> asked = _context.run(
        kDamagedBook, _path, [&](fz_context* c) { found = fz_has_archive_entry(c, _archive.object, name) != 0; });
    return asked && found;
  }

  /// Reads an XML file of the book into `xml`. The sizes that the archive claims are not believed.
  Result<void> read(const std::string& name, MupdfContext::Owner<fz_xml>& xml) {
    MupdfContext::Owner<fz_stream> entry(_context, fz_drop_stream);
    MupdfContext::Owner<fz_buffer> buffer(_context, fz_drop_buffer);
    return _context.run(kDamagedBook, _path, [&](fz_context* c) {
      entry.object = fz_open_archive_entry(c, _archive.object, name.c_str());
      buffer.object = fz_new_buffer(c, 1 << 16);
      unsigned char part[4096];
      while (const std::size_t count = fz_read(c, entry.object, part, sizeof part)) {
        fz_append_data(c, buffer.object, part, count);
        if (fz_buffer_storage(c, buffer.object, nullptr) > kMaximumXML) {
          fz_throw(c, FZ_ERROR_GENERIC, "a file in it is too large");
        }
      }
      xml.object = fz_parse_xml(c, buffer.object, 0);
    });
  }

  MupdfContext& context() { return _context; }

 private:
  const std::filesystem::path& _path;
  MupdfContext _context;
  MupdfContext::Owner<fz_stream> _stream{_context, fz_drop_stream};
  MupdfContext::Owner<fz_archive> _archive{_context, fz_drop_archive};
};

// All texts of <dc:creator> and the like.
std::optional<std::string> texts(fz_xml* metadata, const char* element) {
  std::string all;
  for (fz_xml* item = fz_xml_find_down(metadata, element); item; item = fz_xml_find_next(item, element)) {
    const char* text = fz_xml_down(item) ? fz_xml_text(fz_xml_down(item)) : nullptr;
    const std::optional<std::string> plain = collapsed(text ? text : "");
    if (plain) all += (all.empty() ? "" : ", ") + *plain;
  }
  return trimmed(all);
}

}  // namespace

Result<MediaFacts> inspectEPUB(const std::filesystem::path& path) {
  Book book(path);
  if (Result<void> opened = book.open(); !opened) return opened.error();
  if (!book.has("META-INF/container.xml")) {
    return Error{ErrorKind::Unsupported, "This is no PDF or EPUB document.", path};
  }
  if (book.has("META-INF/rights.xml")) {
    return Error{ErrorKind::Unsupported, "The book is protected against copying.", path};
  }

  MupdfContext::Owner<fz_xml> container(book.context(), fz_drop_xml);
  if (Result<void> read = book.read("META-INF/container.xml", container); !read) return read.error();
  fz_xml* rootFile = fz_xml_find_dfs(fz_xml_root(container.object), "rootfile", nullptr, nullptr);
  const char* packageName = rootFile ? fz_xml_att(rootFile, "full-path") : nullptr;
  if (!packageName) return Error{ErrorKind::Damaged, "The book does not name its content.", path};

  MupdfContext::Owner<fz_xml> package(book.context(), fz_drop_xml);
  if (Result<void> read = book.read(packageName, package); !read) return read.error();
  fz_xml* top = fz_xml_find(fz_xml_root(package.object), "package");
  if (!top) return Error{ErrorKind::Damaged, "The book does not describe its content.", path};

  MediaFacts facts;
  facts.mimeType = "application/epub+zip";
  if (fz_xml* metadata = fz_xml_find_down(top, "metadata")) {
    facts.metadataTitle = texts(metadata, "title");
    facts.metadataAuthor = texts(metadata, "creator");
    facts.metadataInformation = texts(metadata, "description");
    if (std::optional<std::string> language = texts(metadata, "language"))
      facts.details.emplace_back("Language", *language);
  }
  const char* version = fz_xml_att(top, "version");
  facts.details.insert(facts.details.begin(), {"Format", version ? std::string("EPUB ") + version : "EPUB"});
  return facts;
}

}  // namespace quilt::platform::mupdf
