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

void makeZip(const std::filesystem::path& file, const std::vector<std::pair<std::string, std::string>>& entries) {
  zip_t* archive = zip_open(file.c_str(), ZIP_CREATE | ZIP_TRUNCATE, nullptr);
  if (!archive) throw std::runtime_error("no archive");
  for (const auto& [name, content] : entries) {
    zip_source_t* source = zip_source_buffer(archive, content.data(), content.size(), 0);
    if (zip_file_add(archive, name.c_str(), source, ZIP_FL_ENC_UTF_8) < 0) throw std::runtime_error("no entry");
  }
  if (zip_close(archive) != 0) throw std::runtime_error("no archive");
}

void makeEpub(const std::filesystem::path& file, const std::string& metadata, const std::string& version) {
  makeZip(file,
          {{"mimetype", "application/epub+zip"},
           {"META-INF/container.xml",
            "<?xml version='1.0'?><container version='1.0' xmlns='urn:oasis:names:tc:opendocument:xmlns:container'>"
            "<rootfiles><rootfile full-path='OEBPS/content.opf' media-type='application/oebps-package+xml'/>"
            "</rootfiles></container>"},
           {"OEBPS/content.opf", "<?xml version='1.0'?><package xmlns='http://www.idpf.org/2007/opf' version='" +
                                     version + "'><metadata xmlns:dc='http://purl.org/dc/elements/1.1/'>" + metadata +
                                     "</metadata><manifest/><spine/></package>"}});
}

}  // namespace quilt::support
