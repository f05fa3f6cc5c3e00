// SPDX-License-Identifier: Apache-2.0
#include "tests/support/DocumentFixtures.h"

#include <zip.h>

#include <cstdio>
#include <stdexcept>

namespace quilt::support {

std::string makePdf(const std::vector<std::string>& objects, const std::string& trailer) {
  std::string pdf = "%PDF-1.7\n";
  std::string table = "0000000000 65535 f \n";
  for (std::size_t i = 0; i < objects.size(); ++i) {
    char line[32];
    std::snprintf(line, sizeof line, "%010zu 00000 n \n", pdf.size());
    table += line;
    pdf += std::to_string(i + 1) + " 0 obj\n" + objects[i] + "\nendobj\n";
  }
  const std::string count = std::to_string(objects.size() + 1);
  const std::string start = std::to_string(pdf.size());
  return pdf + "xref\n0 " + count + "\n" + table + "trailer\n<< /Size " + count + " /Root 1 0 R " + trailer +
         " >>\nstartxref\n" + start + "\n%%EOF\n";
}

std::vector<std::string> onePage(const std::string& pageEntries) {
  return {"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [3 0 R] /Count 1 >>",
          "<< /Type /Page /Parent 2 0 R " + pageEntries + " >>"};
}

std::string streamObject(const std::string& content, const std::string& entries) {
  return "<< /Length " + std::to_string(content.size()) + " " + entries + " >>\nstream\n" + content + "\nendstream";
}

std::vector<std::string> drawnPage(const std::string& pageEntries, const std::string& content) {
  std::vector<std::string> objects = onePage(
      pageEntries +
      " /Contents 4 0 R /Resources << /Font << /F1 << /Type /Font /Subtype /Type1 /BaseFont /Helvetica >> >> >>");
  objects.push_back(streamObject(content));
  return objects;
}

std::string textAt(int x, int y, const std::string& text, int size) {
  return "BT /F1 " + std::to_string(size) + " Tf " + std::to_string(x) + " " + std::to_string(y) + " Td (" + text +
         ") Tj ET\n";
}

std::string makePages(std::size_t count) {
  std::vector<std::string> objects{"<< /Type /Catalog /Pages 2 0 R >>", ""};
  std::string kids;
  for (std::size_t i = 1; i <= count; ++i) {
    const std::size_t page = objects.size() + 1;
    kids += std::to_string(page) + " 0 R ";
    objects.push_back(
        "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 200 100] /Contents " + std::to_string(page + 1) +
        " 0 R /Resources << /Font << /F1 << /Type /Font /Subtype /Type1 /BaseFont /Helvetica >> >> >> >>");
    objects.push_back(streamObject(textAt(20, 50, "Page " + std::to_string(i))));
  }
  objects[1] = "<< /Type /Pages /Count " + std::to_string(count) + " /Kids [" + kids + "] >>";
  return makePdf(objects);
}

void makeZip(const std::filesystem::path& file, const std::vector<std::pair<std::string, std::string>>& entries) {
  zip_t* archive = zip_open(file.c_str(), ZIP_CREATE | ZIP_TRUNCATE, nullptr);
  if (!archive) throw std::runtime_error("no archive");
  for (const auto& [name, content] : entries) {
    zip_source_t* source = zip_source_buffer(archive, content.data(), content.size(), 0);
    if (zip_file_add(archive, name.c_str(), source, ZIP_FL_ENC_UTF_8) < 0) throw std::runtime_error("no entry");
  }
  if (zip_close(archive) != 0) throw std::runtime_error("no archive");
}

namespace {

const std::pair<std::string, std::string> kContainer{
    "META-INF/container.xml",
    "<?xml version='1.0'?><container version='1.0' xmlns='urn:oasis:names:tc:opendocument:xmlns:container'>"
    "<rootfiles><rootfile full-path='OEBPS/content.opf' media-type='application/oebps-package+xml'/>"
    "</rootfiles></container>"};

std::string package(const std::string& version, const std::string& metadata, const std::string& content) {
  return "<?xml version='1.0'?><package xmlns='http://www.idpf.org/2007/opf' version='" + version +
         "'><metadata xmlns:dc='http://purl.org/dc/elements/1.1/'>" + metadata + "</metadata>" + content + "</package>";
}

}  // namespace

void makeEpub(const std::filesystem::path& file, const std::string& metadata, const std::string& version) {
  makeZip(file, {{"mimetype", "application/epub+zip"},
                 kContainer,
                 {"OEBPS/content.opf", package(version, metadata, "<manifest/><spine/>")}});
}

void makeBook(const std::filesystem::path& file, const std::vector<std::string>& chapters) {
  std::string manifest, spine;
  std::vector<std::pair<std::string, std::string>> entries{{"mimetype", "application/epub+zip"}, kContainer};
  for (std::size_t i = 0; i < chapters.size(); ++i) {
    const std::string name = "c" + std::to_string(i);
    manifest += "<item id='" + name + "' href='" + name + ".xhtml' media-type='application/xhtml+xml'/>";
    spine += "<itemref idref='" + name + "'/>";
    entries.emplace_back("OEBPS/" + name + ".xhtml", "<html xmlns='http://www.w3.org/1999/xhtml'><head><title>" + name +
                                                         "</title></head><body>" + chapters[i] + "</body></html>");
  }
  entries.emplace_back(
      "OEBPS/content.opf",
      package("3.0", "<dc:title>Book</dc:title>", "<manifest>" + manifest + "</manifest><spine>" + spine + "</spine>"));
  makeZip(file, entries);
}

}  // namespace quilt::support
