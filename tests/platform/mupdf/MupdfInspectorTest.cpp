// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "quilt/platform/mupdf/MupdfInspector.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using namespace quilt::support;
using ::testing::Contains;
using ::testing::HasSubstr;
using ::testing::Pair;

class MupdfInspectorTest : public ::testing::Test {
 protected:
  MediaFacts facts(const std::filesystem::path& file) {
    const Result<MediaFacts> read = MupdfInspector().inspect(file);
    EXPECT_TRUE(read) << (read ? "" : read.error().text);
    return read ? *read : MediaFacts{};
  }
  MediaFacts factsOf(const std::string& pdf) { return facts(writeFile(folder / "a.pdf", pdf)); }
  Error error(const std::filesystem::path& file) {
    const Result<MediaFacts> read = MupdfInspector().inspect(file);
    EXPECT_FALSE(read);
    return read ? Error{} : read.error();
  }

  ScratchFolder folder;
};
/// What starts threads; run with the thread sanitizer too.
using MupdfInspectorThreadTest = MupdfInspectorTest;

TEST_F(MupdfInspectorTest, APDFTellsItsKindItsFirstPageAndItsPages) {
  const MediaFacts read = factsOf(makePdf(onePage("/MediaBox [10 20 622 416]")));
  EXPECT_EQ(read.mimeType, "application/pdf");
  EXPECT_EQ(read.width, 612);
  EXPECT_EQ(read.height, 396);
  EXPECT_EQ(read.duration, 0);
  EXPECT_FALSE(read.hasAudio);
  EXPECT_FALSE(read.hasVideo);
  EXPECT_THAT(read.details, Contains(Pair("Pages", "1")));
  EXPECT_EQ(read.metadataTitle, std::nullopt);
}

TEST_F(MupdfInspectorTest, TheSizeIsTheDisplayedOne) {
  EXPECT_EQ(factsOf(makePdf(onePage("/MediaBox [0 0 100 200] /Rotate 90"))).width, 200);
  EXPECT_EQ(factsOf(makePdf(onePage("/MediaBox [0 0 100 200] /CropBox [10 10 60 110]"))).height, 100);
  EXPECT_EQ(factsOf(makePdf(onePage("/MediaBox [0 0 100 200] /UserUnit 2"))).width, 200);
}

TEST_F(MupdfInspectorTest, TitleAuthorAndSubjectAreRead) {
  std::vector<std::string> objects = onePage("/MediaBox [0 0 100 200]");
  objects.push_back("<< /Title <FEFF00C400720067006500720020> /Author (Ann O.) /Subject (On bridges) >>");
  const MediaFacts read = factsOf(makePdf(objects, "/Info 4 0 R"));
  EXPECT_EQ(read.metadataTitle, "Ärger");
  EXPECT_EQ(read.metadataAuthor, "Ann O.");
  EXPECT_EQ(read.metadataInformation, "On bridges");
}

TEST_F(MupdfInspectorTest, ANewerPDFTellsThemInItsDescription) {
  const std::string xml =
      "<?xpacket begin=''?><x:xmpmeta xmlns:x='adobe:ns:meta/'><rdf:RDF "
      "xmlns:rdf='http://www.w3.org/1999/02/22-rdf-syntax-ns#'><rdf:Description "
      "xmlns:dc='http://purl.org/dc/elements/1.1/'><dc:title><rdf:Alt><rdf:li "
      "xml:lang='x-default'>Bridges</rdf:li></rdf:Alt></dc:title><dc:creator><rdf:Seq><rdf:li>Ann "
      "O.</rdf:li></rdf:Seq></dc:creator></rdf:Description></rdf:RDF></x:xmpmeta>";
  std::vector<std::string> objects = onePage("/MediaBox [0 0 100 200]");
  objects[0] = "<< /Type /Catalog /Pages 2 0 R /Metadata 4 0 R >>";
  objects.push_back("<< /Type /Metadata /Subtype /XML /Length " + std::to_string(xml.size()) + " >>\nstream\n" + xml +
                    "\nendstream");
  const MediaFacts read = factsOf(makePdf(objects));
  EXPECT_EQ(read.metadataTitle, "Bridges");
  EXPECT_EQ(read.metadataAuthor, "Ann O.");
}

TEST_F(MupdfInspectorTest, AnEPUBTellsItsBookAndIsNotLaidOut) {
  makeEpub(folder / "a.epub",
           "<dc:title>Moby-Dick</dc:title><dc:creator>Herman Melville</dc:creator><dc:creator>A. "
           "Editor</dc:creator><dc:description>\n  About a whale. </dc:description><dc:language>en</dc:language>");
  const MediaFacts read = facts(folder / "a.epub");
  EXPECT_EQ(read.mimeType, "application/epub+zip");
  EXPECT_EQ(read.metadataTitle, "Moby-Dick");
  EXPECT_EQ(read.metadataAuthor, "Herman Melville, A. Editor");
  EXPECT_EQ(read.metadataInformation, "About a whale.");
  EXPECT_EQ(read.width, 0);
  EXPECT_EQ(read.height, 0);
  EXPECT_THAT(read.details, Contains(Pair("Format", "EPUB 3.0")));
  EXPECT_THAT(read.details, Contains(Pair("Language", "en")));
}

TEST_F(MupdfInspectorTest, WhatIsNoDocumentIsRefusedWithASentence) {
  EXPECT_EQ(error(folder / "missing.pdf").kind, ErrorKind::NotFound);
  EXPECT_EQ(error(folder.path()).kind, ErrorKind::Unsupported);
  EXPECT_EQ(error("/dev/zero").kind, ErrorKind::Unsupported);
  EXPECT_EQ(error(writeFile(folder / "a.txt", "words")).text, "This is no PDF or EPUB document.");
  const Error damaged = error(writeFile(folder / "a.pdf", "words"));
  EXPECT_EQ(damaged.kind, ErrorKind::Damaged);
  EXPECT_THAT(damaged.text, HasSubstr("The document is damaged ("));
  EXPECT_EQ(damaged.file, folder / "a.pdf");
  makeZip(folder / "a.zip", {{"word/document.xml", "<a/>"}});
  EXPECT_EQ(error(folder / "a.zip").kind, ErrorKind::Unsupported);
}

TEST_F(MupdfInspectorTest, ABookUnderRightsIsUnsupported) {
  makeZip(folder / "a.epub", {{"META-INF/container.xml", "<container/>"}, {"META-INF/rights.xml", "<rights/>"}});
  EXPECT_EQ(error(folder / "a.epub").text, "The book is protected against copying.");
  makeZip(folder / "b.epub", {{"META-INF/container.xml", "<container/>"}});
  EXPECT_EQ(error(folder / "b.epub").text, "The book does not name its content.");
}

TEST_F(MupdfInspectorTest, ABookThatExpandsAThousandfoldIsStopped) {
  makeZip(folder / "a.epub",
          {{"META-INF/container.xml", "<container>" + std::string(100 << 20, ' ') + "</container>"}});
  EXPECT_LT(std::filesystem::file_size(folder / "a.epub"), 1U << 20);
  EXPECT_EQ(error(folder / "a.epub").text, "The book is damaged (a file in it is too large).");
}

TEST_F(MupdfInspectorTest, AMillionNestedElementsAreStopped) {
  std::string deep;
  for (int i = 0; i < 1000000; ++i) deep += "<a>";
  makeZip(folder / "a.epub", {{"META-INF/container.xml", deep}});
  EXPECT_EQ(error(folder / "a.epub").kind, ErrorKind::Damaged);
}

TEST_F(MupdfInspectorTest, ScriptsAreNotRun) {
  std::vector<std::string> objects = onePage("/MediaBox [0 0 100 200]");
  objects[0] = "<< /Type /Catalog /Pages 2 0 R /OpenAction << /S /JavaScript /JS (while\\(true\\){}) >> >>";
  EXPECT_EQ(factsOf(makePdf(objects)).height, 200);
}

TEST_F(MupdfInspectorTest, EveryLengthAndEveryChangedByteOfASmallPDFIsSurvived) {
  std::vector<std::string> objects = onePage("/MediaBox [0 0 100 200]");
  objects.push_back("<< /Title (A) >>");
  const std::string pdf = makePdf(objects, "/Info 4 0 R");
  int good = 0;
  for (std::size_t i = 0; i < pdf.size(); ++i) {
    good += MupdfInspector().inspect(writeFile(folder / "a.pdf", pdf.substr(0, i))).hasValue();
    std::string other = pdf;
    other[i] = static_cast<char>(other[i] ^ 0x11);
    good += MupdfInspector().inspect(writeFile(folder / "b.pdf", other)).hasValue();
  }
  EXPECT_GT(good, 0) << "slight damage is repaired";
}

TEST_F(MupdfInspectorThreadTest, ManyThreadsLookAtOnce) {
  writeFile(folder / "a.pdf", makePdf(onePage("/MediaBox [0 0 100 200]")));
  makeEpub(folder / "a.epub", "<dc:title>T</dc:title>");
  const std::size_t before = openDescriptors();
  std::atomic<int> good{0};
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      for (int k = 0; k < 50; ++k) {
        good += MupdfInspector().inspect(folder / "a.pdf").hasValue();
        good += MupdfInspector().inspect(folder / "a.epub").hasValue();
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(good, 400);
  EXPECT_EQ(openDescriptors(), before);
}

struct KnownDocument {
  const char* name;
  double width, height;
  const char* pages;
  const char* title;
};

TEST_F(MupdfInspectorTest, RealDocuments) {
  if (corpusImage("pdf-4-pages.pdf").empty()) GTEST_SKIP() << "no media corpus";
  const KnownDocument known[] = {{"pdf-policy-193p.pdf", 612, 792, "193", "Debian Policy Manual"},
                                 {"pdf-landscape-18p.pdf", 792, 612, "18", nullptr},
                                 {"pdf-2.0-simple.pdf", 612, 396, "1", nullptr},
                                 {"pdf-title-author.pdf", 612, 792, "1", "The Big Brown Bear"},
                                 {"epub3-moby-dick.epub", 0, 0, nullptr, "Moby-Dick"},
                                 {"epub3-debian-policy.epub", 0, 0, nullptr, "Debian Policy Manual"},
                                 {"epub2-leaves-of-grass.epub", 0, 0, nullptr, "Leaves of Grass"},
                                 {"epub2-small.epub", 0, 0, nullptr, "An ePub for Tika"},
                                 {"epub2-minimal.epub", 0, 0, nullptr, "Your title here"}};
  for (const KnownDocument& document : known) {
    SCOPED_TRACE(document.name);
    const MediaFacts read = facts(corpusImage(document.name));
    EXPECT_EQ(read.width, document.width);
    EXPECT_EQ(read.height, document.height);
    if (document.pages) {
      EXPECT_THAT(read.details, Contains(Pair("Pages", document.pages)));
    }
    if (document.title) {
      EXPECT_EQ(read.metadataTitle, document.title);
    }
  }
  const MediaFacts rotated = facts(corpusImage("pdf-rotated-pages.pdf"));
  EXPECT_NEAR(rotated.width, 841.89, 0.01);
  EXPECT_NEAR(rotated.height, 595.276, 0.01);
  EXPECT_EQ(facts(corpusImage("pdf-in-cc0.pdf")).metadataAuthor, "Attila SZERVÁC");
}

TEST_F(MupdfInspectorTest, RealDocumentsThatCannotBeShown) {
  if (corpusImage("pdf-4-pages.pdf").empty()) GTEST_SKIP() << "no media corpus";
  const Error locked = error(corpusImage("pdf-encrypted-user-password.pdf"));
  EXPECT_EQ(locked.kind, ErrorKind::Unsupported);
  EXPECT_EQ(locked.text, "The document is protected by a password.");
  for (const char* name :
       {"bad-pdf-fuzz.pdf", "bad-pdf-no-catalog.pdf", "bad-pdf-no-signature.pdf", "bad-pdf-recursive-pages.pdf"}) {
    SCOPED_TRACE(name);
    const Result<MediaFacts> read = MupdfInspector().inspect(corpusImage(name));
    EXPECT_TRUE(read || read.error().kind == ErrorKind::Damaged);
  }
}

}  // namespace
}  // namespace quilt::platform
