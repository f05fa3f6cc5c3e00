// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/MupdfDocuments.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <fstream>
#include <sstream>

#include "quilt/platform/mupdf/MupdfContext.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/Program.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using namespace quilt::support;
using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::StartsWith;

constexpr const char* kRedLeftHalf = "1 0 0 rg 0 0 50 200 re f";

class MupdfDocumentsTest : public ::testing::Test {
 protected:
  std::shared_ptr<PagedDocument> open(const std::filesystem::path& file) {
    const auto opened = MupdfDocuments().openDocument(file);
    EXPECT_TRUE(opened) << file << ": " << (opened ? "" : opened.error().text);
    return opened ? *opened : nullptr;
  }
  std::shared_ptr<PagedDocument> openPdf(const std::vector<std::string>& objects, const std::string& trailer = "") {
    return open(writeFile(folder / "a.pdf", makePdf(objects, trailer)));
  }
  std::shared_ptr<PagedDocument> openBook(const std::vector<std::string>& chapters) {
    makeBook(folder / "a.epub", chapters);
    return open(folder / "a.epub");
  }
  Error error(const std::filesystem::path& file) {
    const auto opened = MupdfDocuments().openDocument(file);
    EXPECT_FALSE(opened);
    return opened ? Error{} : opened.error();
  }
  static Bitmap draw(PagedDocument& document, std::size_t index, Size pixels) {
    Result<Bitmap> bitmap = document.drawPage(index, pixels);
    EXPECT_TRUE(bitmap) << (bitmap ? "" : bitmap.error().text);
    return bitmap ? *bitmap : Bitmap{};
  }
  static std::string text(PagedDocument& document, std::size_t index = 0) {
    Result<std::string> read = document.textOfPage(index);
    EXPECT_TRUE(read) << (read ? "" : read.error().text);
    return read ? *read : "";
  }
  /// The text of a page of a letter's width with these lines.
  std::string textDrawn(const std::string& content) {
    return text(*openPdf(drawnPage("/MediaBox [0 0 612 792]", content)));
  }

  ScratchFolder folder;
};

// ---- Pictures

TEST_F(MupdfDocumentsTest, APageIsDrawnOnWhite) {
  const auto document = openPdf(drawnPage("/MediaBox [0 0 100 200]", kRedLeftHalf));
  EXPECT_EQ(*document->sizeOfPage(0), (Size{100, 200}));
  const Bitmap page = draw(*document, 0, {50, 100});
  EXPECT_EQ(pixelAt(page, 10, 50), kRed);
  EXPECT_EQ(pixelAt(page, 40, 50), kWhite);
}

TEST_F(MupdfDocumentsTest, ATurnedPageStandsUpright) {
  const auto document = openPdf(drawnPage("/MediaBox [0 0 100 200] /Rotate 90", kRedLeftHalf));
  EXPECT_EQ(*document->sizeOfPage(0), (Size{200, 100}));
  const Bitmap page = draw(*document, 0, {200, 100});
  EXPECT_EQ(pixelAt(page, 100, 10), kRed) << "the left half is on top";
  EXPECT_EQ(pixelAt(page, 100, 90), kWhite);
}

TEST_F(MupdfDocumentsTest, WhatTheCropBoxHidesIsNotShown) {
  const auto document = openPdf(drawnPage("/MediaBox [0 0 100 200] /CropBox [40 0 90 100]", kRedLeftHalf));
  EXPECT_EQ(*document->sizeOfPage(0), (Size{50, 100}));
  const Bitmap page = draw(*document, 0, {50, 100});
  EXPECT_EQ(pixelAt(page, 5, 50), kRed);
  EXPECT_EQ(pixelAt(page, 15, 50), kWhite) << "10 of the 50 red points are left";
}

TEST_F(MupdfDocumentsTest, TransparencyIsMixedWithWhite) {
  std::vector<std::string> objects =
      onePage("/MediaBox [0 0 10 10] /Contents 4 0 R /Resources << /ExtGState << /G << /ca 0.5 >> >> >>");
  objects.push_back(streamObject("/G gs 0 0 1 rg 0 0 10 10 re f"));
  const Bitmap page = draw(*openPdf(objects), 0, {10, 10});
  EXPECT_LE(distance(pixelAt(page, 5, 5), {128, 128, 255, 255}), 2);
}

TEST_F(MupdfDocumentsTest, APageOfTransparentGroupsIsOpaque) {
  const std::string states = "/ExtGState << /A << /ca 0.5 >> /B << /ca 0.4 >> /C << /ca 0.3 >> >>";
  std::vector<std::string> objects =
      onePage("/MediaBox [0 0 100 100] /Contents 4 0 R /Resources << " + states + " /XObject << /X 5 0 R >> >>");
  objects.push_back(streamObject("/A gs /X Do /C gs /X Do"));
  objects.push_back(
      streamObject("0 0 1 rg 10 10 70 70 re f /B gs 1 0 0 rg 0 0 50 50 re f",
                   "/Type /XObject /Subtype /Form /BBox [0 0 100 100] /Group << /S /Transparency >> /Resources << " +
                       states + " >>"));
  const Bitmap page = draw(*openPdf(objects), 0, {100, 100});
  for (std::size_t i = 3; i < page.pixels.size(); i += 4) ASSERT_EQ(page.pixels[i], 255) << "pixel " << i / 4;
  EXPECT_LE(distance(pixelAt(page, 70, 50), {89, 89, 255, 255}), 2) << "0.5 × 0.7 of the white is left";
}

TEST_F(MupdfDocumentsTest, AnnotationsAreDrawn) {
  std::vector<std::string> objects = drawnPage("/MediaBox [0 0 100 100] /Annots [5 0 R]", "");
  objects.push_back("<< /Type /Annot /Subtype /Stamp /Rect [0 0 50 100] /F 4 /AP << /N 6 0 R >> >>");
  objects.push_back(streamObject("0 0 1 rg 0 0 50 100 re f", "/Type /XObject /Subtype /Form /BBox [0 0 50 100]"));
  const Bitmap page = draw(*openPdf(objects), 0, {100, 100});
  EXPECT_EQ(pixelAt(page, 25, 50), kBlue);
  EXPECT_EQ(pixelAt(page, 75, 50), kWhite);
}

TEST_F(MupdfDocumentsTest, ABookIsLaidOutOnPagesOfOneSize) {
  std::string paragraphs;
  for (int i = 0; i < 100; ++i) paragraphs += "<p>Paragraph " + std::to_string(i) + "</p>";
  const auto document = openBook({"<h1>First</h1>" + paragraphs, "<h1>Second</h1>"});
  EXPECT_EQ(*document->sizeOfPage(0), (Size{450, 600}));
  const std::size_t count = *document->pageCount();
  EXPECT_GT(count, 3U);
  EXPECT_THAT(text(*document, 0), StartsWith("First\n"));
  EXPECT_THAT(text(*document, count - 1), StartsWith("Second")) << "a chapter begins a page";
  const Bitmap page = draw(*document, 0, {450, 600});
  EXPECT_EQ(pixelAt(page, 2, 2), kWhite);
  EXPECT_TRUE(std::ranges::any_of(page.pixels, [](auto byte) { return byte < 50; })) << "letters";
}

// ---- Text

TEST_F(MupdfDocumentsTest, TextComesLineByLineAndBlockByBlock) {
  EXPECT_EQ(textDrawn(textAt(72, 700, "One two") + textAt(72, 686, "three.") + textAt(72, 600, "Four.")),
            "One two\nthree.\n\nFour.");
}

TEST_F(MupdfDocumentsTest, ColumnsDrawnOneAfterTheOtherStayWhole) {
  EXPECT_EQ(textDrawn(textAt(72, 700, "Left one") + textAt(72, 686, "left two") + textAt(330, 700, "Right one") +
                      textAt(330, 686, "right two")),
            "Left one\nleft two\n\nRight one\nright two");
}

TEST_F(MupdfDocumentsTest, WhatIsDrawnFromBelowIsReadFromAbove) {
  EXPECT_EQ(textDrawn(textAt(72, 100, "Last") + textAt(72, 400, "Middle") + textAt(72, 700, "First")),
            "First\n\nMiddle\n\nLast");
}

TEST_F(MupdfDocumentsTest, ColumnsUnderATitleThatIsDrawnLast) {
  EXPECT_EQ(textDrawn(textAt(330, 600, "Right one") + textAt(330, 586, "right two") + textAt(72, 600, "Left one") +
                      textAt(72, 586, "left two") + textAt(72, 720, "A title that runs across the page", 30)),
            "A title that runs across the page\n\nLeft one\nleft two\n\nRight one\nright two");
}

TEST_F(MupdfDocumentsTest, APageOfPicturesHasNoText) {
  EXPECT_EQ(textDrawn("1 0 0 rg 0 0 50 50 re f"), "");
  EXPECT_EQ(textDrawn(textAt(72, 5000, "Far off the page")), "");
}

TEST_F(MupdfDocumentsTest, OnlyWhatLiesOnThePageIsRead) {
  const std::string onPage = textAt(72, 700, "Here");
  for (const std::string& beyond :
       {textAt(72, 5000, "Above"), textAt(72, -40, "Below"), textAt(-200, 400, "Left"), textAt(700, 400, "Right")}) {
    EXPECT_EQ(textDrawn(onPage + beyond), "Here");
    EXPECT_EQ(textDrawn(beyond + onPage), "Here");
  }
  // Of a line that leaves the page, the letters on it.
  EXPECT_EQ(textDrawn(textAt(560, 700, "Cut at the edge")), "Cut at the");
}

TEST_F(MupdfDocumentsTest, LongTextIsCutAtAWholeCharacter) {
  std::string content;
  for (int i = 0; i < 9000; ++i)
    content += textAt(0, 9500 - i, "\\247\\247\\247\\247\\247\\247\\247\\247\\247xxxxxxxxxxxxx", 1);
  const auto document = openPdf(drawnPage("/MediaBox [0 0 10000 10000]", content));
  const std::string read = text(*document);
  EXPECT_LE(read.size(), 256U << 10);
  EXPECT_GT(read.size(), 255U << 10);
  EXPECT_NE(static_cast<unsigned char>(read.back()) & 0xC0, 0xC0) << "a first byte without its second";
}

// ---- Pages

TEST_F(MupdfDocumentsTest, PagesAreCountedFromZero) {
  const auto document = open(writeFile(folder / "a.pdf", makePages(3)));
  EXPECT_EQ(*document->pageCount(), 3U);
  EXPECT_EQ(text(*document, 0), "Page 1");
  EXPECT_EQ(text(*document, 2), "Page 3");
  for (const std::size_t index : {std::size_t{3}, static_cast<std::size_t>(-1)}) {
    EXPECT_EQ(document->sizeOfPage(index).error().kind, ErrorKind::NotFound);
    EXPECT_EQ(document->drawPage(index, {1, 1}).error().kind, ErrorKind::NotFound);
    EXPECT_EQ(document->textOfPage(index).error().text, "The document has no such page.");
  }
}

TEST_F(MupdfDocumentsTest, TheFirstPageOfABookNeedsNoOtherChapter) {
  // Laying out the second chapter would take more memory than a document may.
  makeZip(folder / "a.epub",
          {{"mimetype", "application/epub+zip"},
           {"META-INF/container.xml", "<container><rootfiles><rootfile full-path='p.opf'/></rootfiles></container>"},
           {"p.opf",
            "<package version='3.0'><metadata/><manifest><item id='a' href='a.xhtml'/><item id='b' href='b.xhtml'/>"
            "</manifest><spine><itemref idref='a'/><itemref idref='b'/></spine></package>"},
           {"a.xhtml", "<html><body><p>Hello</p></body></html>"},
           {"b.xhtml", "<html><body>" + std::string(mupdf::kMaximumMemory + 1, ' ') + "</body></html>"}});
  const auto document = open(folder / "a.epub");
  EXPECT_EQ(text(*document), "Hello");
  EXPECT_GT(draw(*document, 0, {45, 60}).pixels.size(), 0U);
  EXPECT_EQ(document->pageCount().error().kind, ErrorKind::Damaged);
  EXPECT_EQ(text(*document), "Hello") << "and the document is as it was";
}

// ---- What cannot be shown

TEST_F(MupdfDocumentsTest, WhatIsNoDocumentIsRefusedWithASentence) {
  EXPECT_EQ(error(folder / "missing.pdf").kind, ErrorKind::NotFound);
  EXPECT_EQ(error(writeFile(folder / "a.txt", "words")).kind, ErrorKind::Unsupported);
  EXPECT_EQ(error(writeFile(folder / "empty.pdf", "")).kind, ErrorKind::Damaged);
  const Error damaged = error(writeFile(folder / "a.pdf", "%PDF-1.7 words"));
  EXPECT_THAT(damaged.text, StartsWith("The document is damaged ("));
  EXPECT_EQ(damaged.file, folder / "a.pdf");
}

TEST_F(MupdfDocumentsTest, ADocumentWithoutPagesIsDamaged) {
  EXPECT_EQ(error(writeFile(folder / "a.pdf",
                            makePdf({"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [] /Count 0 >>"})))
                .text,
            "The document has no pages.");
  makeEpub(folder / "a.epub", "");
  EXPECT_EQ(error(folder / "a.epub").kind, ErrorKind::Damaged);
}

TEST_F(MupdfDocumentsTest, AProtectedBookSaysSo) {
  makeZip(folder / "a.epub", {{"META-INF/container.xml", "<container/>"}, {"META-INF/rights.xml", "<rights/>"}});
  EXPECT_EQ(error(folder / "a.epub").text, "The book is protected against copying.");
}

// ---- Hostile documents

TEST_F(MupdfDocumentsTest, AHugePageIsDrawnInTheSizeThatWasAskedFor) {
  const auto document = openPdf(drawnPage("/MediaBox [0 0 1000000 1000000]", "1 0 0 rg 0 0 1000000 1000000 re f"));
  EXPECT_EQ(pixelAt(draw(*document, 0, {720, 720}), 360, 360), kRed);
}

TEST_F(MupdfDocumentsTest, APictureOfAHundredThousandSquareIsStopped) {
  std::vector<std::string> objects =
      onePage("/MediaBox [0 0 100 100] /Contents 4 0 R /Resources << /XObject << /I 5 0 R >> >>");
  objects.push_back(streamObject("100 0 0 100 0 0 cm /I Do"));
  objects.push_back(streamObject("x",
                                 "/Type /XObject /Subtype /Image /Width 100000 /Height 100000 /BitsPerComponent 8 "
                                 "/ColorSpace /DeviceRGB"));
  const auto document = openPdf(objects);
  const Result<Bitmap> page = document->drawPage(0, {720, 720});
  EXPECT_TRUE(page || page.error().kind == ErrorKind::Damaged);
}

TEST_F(MupdfDocumentsTest, FormsThatDrawThemselvesAreStopped) {
  std::vector<std::string> objects =
      onePage("/MediaBox [0 0 100 100] /Contents 4 0 R /Resources << /XObject << /X 5 0 R >> >>");
  objects.push_back(streamObject("/X Do /X Do"));
  objects.push_back(streamObject("1 0 0 rg 0 0 50 50 re f /X Do /X Do",
                                 "/Type /XObject /Subtype /Form /BBox [0 0 100 100] "
                                 "/Resources << /XObject << /X 5 0 R >> >>"));
  const auto document = openPdf(objects);
  EXPECT_EQ(pixelAt(draw(*document, 0, {100, 100}), 25, 75), kRed);
}

TEST_F(MupdfDocumentsTest, AHundredThousandPagesAreRefused) {
  const auto document = openPdf({"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [3 0 R] /Count 100000 >>",
                                 "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 100 200] >>"});
  EXPECT_EQ(document->pageCount().error().text, "The document has more than 20000 pages.");
}

TEST_F(MupdfDocumentsTest, EveryLengthAndEveryChangedByteOfASmallPDFIsSurvived) {
  const std::string pdf = makePdf(drawnPage("/MediaBox [0 0 100 200]", textAt(10, 10, "Hello")));
  int good = 0;
  for (std::size_t i = 0; i < pdf.size(); ++i) {
    std::string other = pdf;
    other[i] = static_cast<char>(other[i] ^ 0x11);
    for (const std::string& bytes : {pdf.substr(0, i), other}) {
      const auto opened = MupdfDocuments().openDocument(writeFile(folder / "a.pdf", bytes));
      if (!opened) continue;
      const bool isCounted = (*opened)->pageCount().hasValue();
      const bool isDrawn = (*opened)->drawPage(0, {10, 20}).hasValue();
      const bool isRead = (*opened)->textOfPage(0).hasValue();
      good += isCounted && isDrawn && isRead;
    }
  }
  EXPECT_GT(good, 0) << "slight damage is repaired";
}

TEST_F(MupdfDocumentsTest, ABookReachesNothingOutsideItself) {
  const std::filesystem::path secret =
      writeFile(folder / "secret.png", encode(paint(50, 50, [](auto, auto) { return kRed; }), {.suffix = ".png"}));
  const auto document =
      openBook({"<p>Hello</p><img src='file://" + secret.native() + "'/><img src='" + secret.native() +
                "'/><img src='../../secret.png'/>"
                "<img src='%2e%2e/%2e%2e/secret.png'/><script>document.write('x')</script>"});
  EXPECT_EQ(text(*document), "Hello\n\n[image][image][image][image]") << "pictures that are not there";
  const Bitmap page = draw(*document, 0, {450, 600});
  for (std::size_t i = 0; i < page.pixels.size(); i += 4) {
    ASSERT_FALSE(page.pixels[i] > 200 && page.pixels[i + 1] < 50) << "a red pixel";
  }
}

// ---- Real files, beside what mutool makes of them

struct Pages {
  const char* name;
  std::size_t count;
  bool isDrawnInOrder = true;  // and mutool's order is therefore ours
};

void PrintTo(const Pages& document, std::ostream* stream) { *stream << document.name; }

class MupdfDocumentsCorpusTest : public ::testing::TestWithParam<Pages> {
 protected:
  /// A picture as mutool writes it: "P6", width, height, 255, RGB.
  static Bitmap readPortablePixmap(const std::filesystem::path& file) {
    const std::string bytes = bytesOf(file);
    std::istringstream header(bytes);
    std::string magic;
    std::size_t width = 0, height = 0, depth = 0;
    header >> magic >> width >> height >> depth;
    EXPECT_EQ(magic, "P6");
    const std::string pixels = bytes.substr(static_cast<std::size_t>(header.tellg()) + 1);
    EXPECT_EQ(pixels.size(), width * height * 3);
    return paint(width, height, [&](std::size_t x, std::size_t y) {
      const auto* rgb = reinterpret_cast<const std::uint8_t*>(pixels.data()) + (y * width + x) * 3;
      return Rgba{rgb[0], rgb[1], rgb[2], 255};
    });
  }
  static double meanDifference(const Bitmap& a, const Bitmap& b) {
    double sum = 0;
    for (std::size_t i = 0; i < a.pixels.size(); ++i) sum += std::abs(a.pixels[i] - b.pixels[i]);
    return sum / static_cast<double>(a.pixels.size());
  }
  // Without white space, and without the sign for a letter that cannot be told.
  static std::string marksOf(std::string text) {
    constexpr std::string_view untold = "\xEF\xBF\xBD";
    for (std::size_t at = 0; (at = text.find(untold, at)) != std::string::npos;) text.erase(at, untold.size());
    std::erase_if(text, [](unsigned char c) { return c <= ' '; });
    return text;
  }

  ScratchFolder folder;
};

TEST_P(MupdfDocumentsCorpusTest, CountPicturesAndTextAgree) {
  const std::filesystem::path file = corpusImage(GetParam().name);
  if (file.empty()) GTEST_SKIP() << "no media corpus";
  const auto opened = MupdfDocuments().openDocument(file);
  ASSERT_TRUE(opened) << opened.error().text;
  if (runProgram({"mutool", "-v"}).status < 0) GTEST_SKIP() << "no mutool";
  const auto document = *opened;
  EXPECT_EQ(*document->pageCount(), GetParam().count);
  for (const std::size_t index : {std::size_t{0}, GetParam().count / 2, GetParam().count - 1}) {
    SCOPED_TRACE(index);
    const std::string number = std::to_string(index + 1);
    const auto mutool = [&](std::vector<std::string> options, const std::string& name) {
      std::vector<std::string> command{"mutool", "draw", "-q", "-o", folder / name};
      command.insert(command.end(), options.begin(), options.end());
      command.insert(command.end(), {file, number});
      const ProgramResult run = runProgram(command);
      EXPECT_EQ(run.status, 0) << run.output;
      return folder / name;
    };
    const Bitmap theirs = readPortablePixmap(mutool({"-w", "640", "-h", "480", "-f"}, "a.ppm"));
    const Result<Bitmap> ours = document->drawPage(index, {640, 480});
    ASSERT_TRUE(ours) << ours.error().text;
    EXPECT_LT(meanDifference(*ours, theirs), 1) << "of 255";
    std::string ourText = marksOf(*document->textOfPage(index));
    std::string theirText = marksOf(bytesOf(mutool({"-F", "text"}, "a.txt")));
    if (!GetParam().isDrawnInOrder) {
      std::ranges::sort(ourText);
      std::ranges::sort(theirText);
    }
    EXPECT_EQ(ourText, theirText);
  }
}

INSTANTIATE_TEST_SUITE_P(Files, MupdfDocumentsCorpusTest,
                         ::testing::Values(Pages{"pdf-policy-193p.pdf", 193}, Pages{"pdf-book-117p.pdf", 117, false},
                                           Pages{"pdf-4-pages.pdf", 4}, Pages{"pdf-in-cc0.pdf", 10, false},
                                           Pages{"pdf-landscape-18p.pdf", 18}, Pages{"pdf-rotated-pages.pdf", 4},
                                           Pages{"pdf-2.0-simple.pdf", 1}, Pages{"pdf-attachment.pdf", 1},
                                           Pages{"pdf-title-author.pdf", 1}));

TEST_F(MupdfDocumentsTest, RealBooksHaveAsManyPagesAsMutoolLaysOut) {
  if (corpusImage("epub2-small.epub").empty()) GTEST_SKIP() << "no media corpus";
  for (const char* name : {"epub3-debian-policy.epub", "epub3-moby-dick.epub", "epub2-leaves-of-grass.epub",
                           "epub2-small.epub", "epub2-minimal.epub"}) {
    SCOPED_TRACE(name);
    const std::filesystem::path file = corpusImage(name);
    const auto document = open(file);
    const std::size_t count = *document->pageCount();
    const ProgramResult pages = runProgram({"mutool", "draw", "-q", "-W", "450", "-H", "600", "-S", "12", "-F", "trace",
                                            "-o", "/dev/null", file, std::to_string(count) + "-N"});
    if (pages.status < 0) GTEST_SKIP() << "no mutool";
    EXPECT_EQ(pages.status, 0) << pages.output;
    EXPECT_TRUE(document->drawPage(count - 1, {45, 60}));
    EXPECT_EQ(document->sizeOfPage(count).error().kind, ErrorKind::NotFound);
  }
}

TEST_F(MupdfDocumentsTest, RealDocumentsThatCannotBeShown) {
  if (corpusImage("pdf-4-pages.pdf").empty()) GTEST_SKIP() << "no media corpus";
  EXPECT_EQ(error(corpusImage("pdf-encrypted-user-password.pdf")).text, "The document is protected by a password.");
  for (const char* name :
       {"bad-pdf-fuzz.pdf", "bad-pdf-no-catalog.pdf", "bad-pdf-no-signature.pdf", "bad-pdf-recursive-pages.pdf"}) {
    SCOPED_TRACE(name);
    const auto opened = MupdfDocuments().openDocument(corpusImage(name));
    if (!opened) {
      EXPECT_EQ(opened.error().kind, ErrorKind::Damaged);
      continue;
    }
    const Result<Bitmap> page = (*opened)->drawPage(0, {100, 100});
    EXPECT_TRUE(page || page.error().kind == ErrorKind::Damaged);
  }
}

}  // namespace
}  // namespace quilt::platform
