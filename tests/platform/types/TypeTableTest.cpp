// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/types/TypeTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using namespace std::string_literals;
using namespace types;

const std::string kPngStart = "\x89PNG\r\n\x1A\n\0\0\0\x0D"s;
const std::string kMovieStart = "\0\0\0\x18"s + "ftypisom" + std::string(20, '\0');
const std::string kZipStart = "PK\x03\x04" + std::string(30, '\0');
const std::string kNoise = "\x01\x02\x03\x04"s;

/// The start of a zip archive whose first file has the name, of which `length` bytes may be the name and the rest be
/// its content.
std::string packed(const std::string& name, std::size_t length = 0) {
  std::string header = "PK\x03\x04" + std::string(26, '\0');
  header[26] = static_cast<char>(length ? length : name.size());
  return header + name;
}

class TypeTableTest : public ::testing::Test {
 protected:
  /// The type of a file with the name and the content.
  std::string typeOf(const std::string& name, std::string_view content) const {
    support::writePlainly(scratch / name, content);
    return table.preferredIdentifier(scratch / name).value_or("none");
  }

  const TypeTable table{};
  const support::ScratchFolder scratch;
  const ScopedService<FileManager> files{&Services::files, std::make_shared<PosixFileManager>()};
};

TEST_F(TypeTableTest, ATypeConformsToItselfAndToEveryAncestor) {
  for (const char* other : {kHTML, kText, "public.content", kItem})
    EXPECT_TRUE(table.conformsTo(kHTML, other)) << other;
  EXPECT_TRUE(table.conformsTo(kM4A, kAudio));
  EXPECT_TRUE(table.conformsTo(kAVI, kMovie));
  EXPECT_TRUE(table.conformsTo(kAVI, kAudiovisual));
  EXPECT_TRUE(table.conformsTo(kEPUBContainer, kEPUB));
  EXPECT_FALSE(table.conformsTo(kText, kHTML));
  EXPECT_FALSE(table.conformsTo(kMP3, kMovie));
  EXPECT_FALSE(table.conformsTo(kPNG, kJPEG));
  EXPECT_FALSE(table.conformsTo(kMPEG4, kMovieContainer));
}

TEST_F(TypeTableTest, AnUnknownTypeConformsToItselfOnly) {
  EXPECT_TRUE(table.conformsTo("com.example.unknown", "com.example.unknown"));
  EXPECT_FALSE(table.conformsTo("com.example.unknown", kItem));
  EXPECT_FALSE(table.conformsTo(kPNG, "com.example.unknown"));
  EXPECT_FALSE(table.conformsTo("", kItem));
}

TEST_F(TypeTableTest, ThePreferredMimeTypeIsTheFirst) {
  EXPECT_EQ("image/jpeg", table.mimeType(kJPEG));
  EXPECT_EQ("video/mp4", table.mimeType(kMPEG4));
  EXPECT_EQ("application/epub+zip", table.mimeType(kEPUBContainer));
  EXPECT_EQ(std::nullopt, table.mimeType(kMovie));
  EXPECT_EQ(std::nullopt, table.mimeType("com.example.unknown"));
}

TEST_F(TypeTableTest, ExtensionAndContentThatAgreeGiveTheExtensionsType) {
  EXPECT_EQ(kPNG, typeOf("a.png", kPngStart));
  EXPECT_EQ(kPNG, typeOf("a.PNG", kPngStart));
  EXPECT_EQ(kMPEG4, typeOf("a.mp4", kMovieStart));
  EXPECT_EQ(kM4V, typeOf("a.m4v", kMovieStart));
  EXPECT_EQ(kText, typeOf("a.txt", "text"));
  EXPECT_EQ(kHTML, typeOf("a.html", "<html>"));
  EXPECT_EQ(kSVG, typeOf("a.svg", "<svg/>"));
}

TEST_F(TypeTableTest, WithinOneFamilyTheExtensionDecides) {
  EXPECT_EQ(kJPEG, typeOf("a.jpg", kPngStart));
  EXPECT_EQ(kM4A, typeOf("a.m4a", kMovieStart));
  EXPECT_EQ(kPowerPointPpt, typeOf("a.ppt", "\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1"));
}

TEST_F(TypeTableTest, ContentOfAnotherFamilyDecides) {
  EXPECT_EQ(kPNG, typeOf("a.mp4", kPngStart));
  EXPECT_EQ(kMPEG4, typeOf("a.txt", kMovieStart));
  EXPECT_EQ(kPDF, typeOf("a.jpg", "%PDF-1.7"));
  EXPECT_EQ("public.zip-archive", typeOf("a.png", kZipStart));
}

TEST_F(TypeTableTest, AZipNamedAsADocumentIsThatDocument) {
  EXPECT_EQ(kWordOpenXML, typeOf("a.docx", kZipStart));
  EXPECT_EQ(kEPUBContainer, typeOf("a.epub", kZipStart));
}

TEST_F(TypeTableTest, AnyOtherZipIsAnArchiveWhateverItsName) {
  const std::string archive = packed("holiday/1.jpg");
  for (const char* name : {"a.docx", "a.pptx", "a.odt", "a.pdf", "a.doc", "a.mp4", "a"})
    EXPECT_EQ("public.zip-archive", typeOf(name, archive)) << name;
  for (const char* first : {"[Content_Types].xml", "_rels/.rels", "docProps/core.xml", "customXml/item1.xml"})
    EXPECT_EQ(kPowerPointOpenXML, typeOf("a.pptx", packed(first))) << first;
  EXPECT_EQ(kTextDocument, typeOf("a.odt", packed("mimetype")));
  EXPECT_EQ(kEPUBContainer, typeOf("a.epub", packed("OPS/chapter.xhtml"))) << "its reader tells";
}

TEST_F(TypeTableTest, PagedDocumentsAreToldByTheirContent) {
  const std::string book = packed("mimetypeapplication/epub+zip", 8);
  EXPECT_EQ(kPDF, typeOf("a.docx", "%PDF-1.7"));
  EXPECT_EQ(kPDF, typeOf("a.epub", "%PDF-1.7"));
  EXPECT_EQ(kEPUBContainer, typeOf("a.pdf", book));
  EXPECT_EQ(kEPUBContainer, typeOf("a.odt", book));
  EXPECT_EQ(kWordOpenXML, typeOf("a.pdf", packed("word/document.xml")));
  EXPECT_EQ(kWordDoc, typeOf("a.pdf", "\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1"));
}

TEST_F(TypeTableTest, OfficeProgramsTellTheirOwnDocumentsApart) {
  EXPECT_EQ(kWordOpenXML, typeOf("a.docx", "\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1")) << "as one with a password is stored";
  EXPECT_EQ(kWordDoc, typeOf("a.doc", packed("word/document.xml")));
  EXPECT_EQ(kWordDoc, typeOf("a.doc", "<html>a page that calls itself a document</html>"));
  EXPECT_EQ(kWordDoc, typeOf("a.doc", "{\\rtf1 words}"));
}

TEST_F(TypeTableTest, SpreadsheetsAreNoTextDocuments) {
  for (const char* name : {"a.xls", "a.xlsx", "a.ods"}) {
    const std::string type =
        typeOf(name, name == std::string("a.xls") ? "\xD0\xCF\x11\xE0\xA1\xB1\x1A\xE1" : kZipStart);
    for (const char* other : kOfficeDocuments) EXPECT_FALSE(table.conformsTo(type, other)) << name;
  }
}

TEST_F(TypeTableTest, PackedDocumentsWithoutAnExtensionAreKnownByTheirParts) {
  EXPECT_EQ(kWordOpenXML, typeOf("a", packed("[Content_Types].xml") + packed("word/document.xml")));
  EXPECT_EQ(kPowerPointOpenXML, typeOf("a", packed("[Content_Types].xml") + packed("ppt/presentation.xml")));
  EXPECT_EQ(kWordOpenXML, typeOf("a.mp4", packed("word/document.xml")));
}

TEST_F(TypeTableTest, ATextNamedAsADocumentThatIsNeverTextIsAText) {
  for (const char* name : {"a.pdf", "a.epub", "a.docx", "a.pptx", "a.odt", "a.odp", "a.ppt"})
    EXPECT_EQ(kText, typeOf(name, "just a text")) << name;
  EXPECT_EQ(kPDF, typeOf("a.pdf", "1 0 obj\n<< >>\nendobj\n")) << "it lost its first line";
  EXPECT_EQ(kPDF, typeOf("a.pdf", "a line before\n%PDF-1.4\n"));
  EXPECT_EQ(kWordDoc, typeOf("a.doc", "just a text")) << "which many programs write so";
}

TEST_F(TypeTableTest, ATextNamedAsAMovieIsAText) {
  EXPECT_EQ(kText, typeOf("a.mp4", "just a text"));
  EXPECT_EQ(kText, typeOf("a.png", "just a text"));
  EXPECT_EQ(kText, typeOf("a.zip", "just a text"));
  EXPECT_EQ(kFlatTextDocument, typeOf("a.fodt", "<?xml version=\"1.0\"?>"));
}

TEST_F(TypeTableTest, ADamagedOrEmptyFileKeepsItsExtensionsType) {
  EXPECT_EQ(kMPEG4, typeOf("a.mp4", kNoise));
  EXPECT_EQ(kPNG, typeOf("a.png", ""));
}

TEST_F(TypeTableTest, WithoutAKnownExtensionTheContentDecides) {
  EXPECT_EQ(kPNG, typeOf("a", kPngStart));
  EXPECT_EQ(kMPEG4, typeOf("a.unknown", kMovieStart));
  EXPECT_EQ(kText, typeOf("README", "text"));
  EXPECT_EQ("none", typeOf("a", kNoise));
  EXPECT_EQ("none", typeOf("a", ""));
}

TEST_F(TypeTableTest, FoldersMissingFilesAndPipes) {
  std::filesystem::create_directory(scratch / "folder.png");
  ASSERT_EQ(0, mkfifo((scratch / "pipe.png").c_str(), 0600));
  EXPECT_EQ(kFolder, table.preferredIdentifier(scratch / "folder.png"));
  EXPECT_EQ(std::nullopt, table.preferredIdentifier(scratch / "pipe.png"));
  EXPECT_EQ(std::nullopt, table.preferredIdentifier(scratch / "missing.png"));
  EXPECT_EQ(std::nullopt, table.preferredIdentifier({}));
}

TEST_F(TypeTableTest, TheFreeFunctionAsksTheInstalledService) {
  const ScopedService<TypeIdentifiers> installed(&Services::types, std::make_shared<TypeTable>());
  support::writePlainly(scratch / "a.png", kPngStart);
  EXPECT_EQ(kPNG, FDYTypePreferredIdentifier(scratch / "a.png"));
}

}  // namespace
}  // namespace quilt::platform
