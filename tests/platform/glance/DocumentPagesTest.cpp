// SPDX-License-Identifier: Apache-2.0
// The pages of documents as GlanceServices hands them out.
#include <gmock/gmock.h>

#include "quilt/platform/glance/GlanceServices.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/ModelFixture.h"

namespace quilt::platform {
namespace {

using support::Lines;
using support::makePdf;
using support::warning;
using ::testing::IsEmpty;

/// Passes documents on and counts how often one is opened.
class CountingToolkit final : public DocumentToolkit {
 public:
  explicit CountingToolkit(std::shared_ptr<DocumentToolkit> target) : _target(std::move(target)) {}
  mutable int opened = 0;

  [[nodiscard]] Result<std::shared_ptr<PagedDocument>> openDocument(const Path& path,
                                                                    const ContinueBlock& goesOn) const override {
    ++opened;
    return _target->openDocument(path, goesOn);
  }

 private:
  const std::shared_ptr<DocumentToolkit> _target;
};

class DocumentPagesTest : public support::ModelFixture {
 protected:
  Path write(const std::string& name, const std::string& bytes) { return support::writeFile(folder() / name, bytes); }
  Path pages(std::size_t count, const std::string& name = "a.pdf") { return write(name, support::makePages(count)); }
  Path empty(const std::string& name = "empty.pdf") {
    return write(name, makePdf({"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [] /Count 0 >>"}));
  }
  static support::Line cannotBeShown(const Path& file, const std::string& reason) {
    return warning("Pages of document at path \"" + file.native() + "\" cannot be shown: \"" + reason + "\"");
  }
  std::shared_ptr<ImageWrapper> image(const Path& file, std::size_t index) {
    const auto page = glance.documentPageAtIndex(file, index);
    EXPECT_TRUE(page);
    return page ? page->image : nullptr;
  }

  const std::shared_ptr<CountingToolkit> toolkit = std::make_shared<CountingToolkit>(services().documents);
  const ScopedService<DocumentToolkit> installed{&Services::documents, toolkit};
  const GlanceServices glance;
};

TEST_F(DocumentPagesTest, ADocumentHasPagesWithTextInHighDefinition) {
  const Path file = pages(3);
  EXPECT_EQ(glance.documentPagesCount(file), 3U);
  const auto page = glance.documentPageAtIndex(file, 2);
  ASSERT_TRUE(page);
  EXPECT_EQ(page->text, "Page 3");
  EXPECT_EQ(page->image->size(), (Size{1280, 640})) << "a small page is drawn large";
  EXPECT_FALSE(glance.documentPageAtIndex(file, 3));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(DocumentPagesTest, AWalkOpensTheDocumentOnce) {
  const Path file = pages(20);
  glance.prepareDocument(file);
  const std::size_t count = glance.documentPagesCount(file);
  for (std::size_t i = 0; i < count; ++i) EXPECT_TRUE(image(file, i)->bitmap());
  EXPECT_EQ(toolkit->opened, 1);
}

TEST_F(DocumentPagesTest, FewDocumentsStayOpenButTheirPagesAreKnown) {
  std::vector<Path> files;
  for (int i = 0; i < 20; ++i) files.push_back(pages(2, std::to_string(i) + ".pdf"));
  const std::size_t before = support::openDescriptors();
  for (int round = 0; round < 2; ++round) {
    for (const Path& file : files) EXPECT_EQ(glance.documentPagesCount(file), 2U);
  }
  EXPECT_EQ(toolkit->opened, 20);
  EXPECT_LE(support::openDescriptors(), before + OpenDocuments::kKeptOpen);
}

TEST_F(DocumentPagesTest, APageIsDrawnInTheSizeThatIsWanted) {
  const Path file = write("a.pdf", makePdf(support::drawnPage("/MediaBox [0 0 100 200]", "1 0 0 rg 0 0 50 200 re f")));
  const auto page = image(file, 0);
  EXPECT_EQ(page->size(), (Size{360, 720}));
  EXPECT_EQ(page->convertToHD()->size(), page->size());
  const auto small = page->convertToSD();
  EXPECT_EQ(small->size(), (Size{240, 480}));
  EXPECT_EQ(small->convertToHD()->size(), small->size()) << "never enlarged again";
  EXPECT_EQ(support::pixelAt(*small->bitmap(), 60, 240), support::kRed);
  ASSERT_TRUE(page->saveAsJPGAtPath(folder() / "a.jpg"));
  EXPECT_EQ(ImageWrapper::imageWithPath(folder() / "a.jpg")->size(), (Size{360, 720}));
  ASSERT_TRUE(small->saveAsPNGAtURL(Url::fileUrl(folder() / "a.png")));
  EXPECT_EQ(support::pixelAt(*ImageWrapper::imageWithPath(folder() / "a.png")->bitmap(), 60, 240), support::kRed);
}

TEST_F(DocumentPagesTest, ALongThinPageIsAtLeastOnePixelWide) {
  const Path file = write("a.pdf", makePdf(support::onePage("/MediaBox [0 0 1 5000]")));
  EXPECT_EQ(image(file, 0)->size(), (Size{1, 720}));
  EXPECT_TRUE(image(file, 0)->convertToSD()->bitmap());
}

TEST_F(DocumentPagesTest, ADocumentThatMovesAwayIsStillDrawn) {
  const Path file = pages(1);
  const auto page = image(file, 0);
  std::filesystem::rename(file, folder() / "moved.pdf");
  EXPECT_TRUE(page->bitmap());
}

TEST_F(DocumentPagesTest, ADocumentThatChangedIsNotTakenForTheOldOne) {
  const Path file = pages(1);
  const auto page = image(file, 0);
  std::filesystem::remove(file);
  pages(2);
  EXPECT_EQ(glance.documentPagesCount(file), 2U);
  EXPECT_EQ(page->bitmap().error().text, "The document was changed after its page was asked for.");
  EXPECT_FALSE(page->saveAsJPGAtPath(folder() / "a.jpg"));
  EXPECT_FALSE(std::filesystem::exists(folder() / "a.jpg"));
}

TEST_F(DocumentPagesTest, EachDocumentThatCannotBeShownIsWarnedOfOnce) {
  const Path none = empty();
  for (int i = 0; i < 3; ++i) {
    glance.prepareDocument(none);
    EXPECT_EQ(glance.documentPagesCount(none), 0U);
    EXPECT_FALSE(glance.documentPageAtIndex(none, 0));
    EXPECT_EQ(glance.thumbnailImageForURL(Url::fileUrl(none)), nullptr);
  }
  EXPECT_EQ(takeProblems(), (Lines{cannotBeShown(none, "The document has no pages.")}));
  EXPECT_EQ(toolkit->opened, 1) << "and not tried again";
  const Path other = empty("other.pdf");
  EXPECT_EQ(glance.documentPagesCount(other), 0U);
  EXPECT_EQ(takeProblems(), (Lines{cannotBeShown(other, "The document has no pages.")}));
}

TEST_F(DocumentPagesTest, TooManyPagesAreNone) {
  const Path file =
      write("a.pdf", makePdf({"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [3 0 R] /Count 100000 >>",
                              "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 100 200] >>"}));
  EXPECT_EQ(glance.documentPagesCount(file), 0U);
  EXPECT_FALSE(glance.documentPageAtIndex(file, 0));
  EXPECT_EQ(takeProblems(), (Lines{cannotBeShown(file, "The document has more than 20000 pages.")}));
}

TEST_F(DocumentPagesTest, WhatIsNoDocumentHasNoPagesWithoutAWord) {
  for (const Path& file :
       {write("words.txt", "words"), write("a.png", support::encode(support::quadrants(4, 4), {.suffix = ".png"})),
        folder() / "missing.pdf", folder()}) {
    EXPECT_EQ(glance.documentPagesCount(file), 0U) << file;
    EXPECT_FALSE(glance.documentPageAtIndex(file, 0)) << file;
  }
  EXPECT_EQ(toolkit->opened, 0);
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_F(DocumentPagesTest, AThumbnailIsTheFirstPage) {
  const Path file = write("a.pdf", makePdf(support::drawnPage("/MediaBox [0 0 100 200]", "1 0 0 rg 0 0 100 200 re f")));
  const auto thumbnail = glance.thumbnailImageForURL(Url::fileUrl(file));
  ASSERT_TRUE(thumbnail);
  EXPECT_EQ(thumbnail->size(), (Size{240, 480}));
  EXPECT_EQ(support::pixelAt(*thumbnail->bitmap(), 100, 100), support::kRed);
}

}  // namespace
}  // namespace quilt::platform
