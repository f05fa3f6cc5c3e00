// SPDX-License-Identifier: Apache-2.0
// The previews of PDF, EPUB and office documents.
#include <gmock/gmock.h>

#include "quilt/sources/QuiltMediaSource.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using support::critical;
using support::Lines;
using support::makePages;
using support::makePdf;
using support::warning;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pair;
using ::testing::StartsWith;

class DocumentPreviewsTest : public support::PackageFixture {
 protected:
  Path write(const std::string& name, const std::string& bytes) { return support::writeFile(folder() / name, bytes); }
  std::shared_ptr<QuiltMediaSource> sourceOfPages(std::size_t count) {
    return addSource(write("a.pdf", makePages(count)));
  }
  std::shared_ptr<QuiltMediaSource> sourceOfEmpty() {
    return recordedSource(
        write("a.pdf", makePdf({"<< /Type /Catalog /Pages 2 0 R >>", "<< /Type /Pages /Kids [] /Count 0 >>"})));
  }
  /// A source of a file that is refused today, as a record of an earlier version has it.
  std::shared_ptr<QuiltMediaSource> recordedSource(const Path& file) {
    EXPECT_EQ(QuiltMediaSource::initWithPath(file), nullptr);
    const auto derivative = derivativeTagged({"Desktop", "720p", "480p"});
    derivative->setUrl(Url::fileUrl(file));
    derivative->setContentType(Text(platform::types::kPDF));
    const auto source = addEmptySource();
    source->addDerivative(derivative);
    return source;
  }
  static support::Line cannotBeShown(const QuiltMediaSource& source, const std::string& reason) {
    return warning("Pages of document at path \"" + source.previewItemURL()->relativePath().native() +
                   "\" cannot be shown: \"" + reason + "\"");
  }
};

TEST_F(DocumentPreviewsTest, ADocumentHasAPreviewForEachPage) {
  const auto source = sourceOfPages(3);
  takeLines();
  EXPECT_EQ(source->previewCount(), 3u);
  const auto preview = source->previewAtIndex(1);
  ASSERT_NE(preview, nullptr);
  EXPECT_EQ(preview->index(), 1u);
  EXPECT_EQ(preview->timecode(), kNoTimecode);
  EXPECT_EQ(preview->image()->size(), (platform::Size{1280, 640}));
  EXPECT_EQ(preview->width(), 1280);
  EXPECT_EQ(preview->height(), 640);
  EXPECT_EQ(source->previewAtIndex(1), preview);
  EXPECT_EQ(source->previewAtIndex(3), nullptr);
  EXPECT_THAT(source->previews(), ElementsAre(preview));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(DocumentPreviewsTest, TheTitleIsTheFirstLineAndTheContentTheWholeText) {
  const auto source = addSource(write(
      "a.pdf", makePdf(support::drawnPage("/MediaBox [0 0 612 792]", support::textAt(72, 700, "A heading", 30) +
                                                                         support::textAt(72, 600, "First line") +
                                                                         support::textAt(72, 586, "second line")))));
  const auto preview = source->previewAtIndex(0);
  ASSERT_NE(preview, nullptr);
  EXPECT_EQ(preview->title(), "A heading");
  EXPECT_EQ(preview->content(), "A heading\n\nFirst line\nsecond line");
}

TEST_F(DocumentPreviewsTest, APageWithoutTextHasAnEmptyTitleAndContent) {
  const auto source = addSource(write("a.pdf", makePdf(support::onePage("/MediaBox [0 0 612 792]"))));
  const auto preview = source->previewAtIndex(0);
  ASSERT_NE(preview, nullptr);
  EXPECT_EQ(preview->title(), "");
  EXPECT_EQ(preview->content(), "");
}

TEST_F(DocumentPreviewsTest, ABookHasPagesToo) {
  support::makeBook(folder() / "a.epub", {"<h1>Loomings</h1><p>Call me Ishmael.</p>", "<h1>The Carpet-Bag</h1>"});
  const auto source = addSource(folder() / "a.epub");
  EXPECT_EQ(source->previewCount(), 2u);
  const auto first = source->previewAtIndex(0), second = source->previewAtIndex(1);
  ASSERT_TRUE(first && second);
  EXPECT_EQ(first->title(), "Loomings");
  EXPECT_THAT(*first->content(), StartsWith("Loomings\n"));
  EXPECT_EQ(second->title(), "The Carpet-Bag");
  EXPECT_EQ(first->image()->size(), (platform::Size{540, 720}));
}

TEST_F(DocumentPreviewsTest, TheWalkReportsEachPageWithItsShare) {
  const auto source = sourceOfPages(3);
  std::vector<std::pair<std::string, double>> seen;
  EXPECT_TRUE(source->previewWithProgressionBlock([&](const auto& preview, double percentage) {
    seen.emplace_back(preview->title().value_or("none"), percentage);
    return true;
  }));
  EXPECT_THAT(seen, ElementsAre(Pair("Page 1", 33), Pair("Page 2", 66), Pair("Page 3", 100)));
  EXPECT_TRUE(source->isPreviewed());
}

TEST_F(DocumentPreviewsTest, TheWalkStopsAtThePageWhereTheBlockSaysSo) {
  const auto source = sourceOfPages(10);
  takeLines();
  EXPECT_FALSE(source->previewWithProgressionBlock([](const auto&, double percentage) { return percentage < 40; }));
  EXPECT_EQ(source->previews().size(), 4u);
  EXPECT_FALSE(source->isPreviewed());
  EXPECT_EQ(takeProblems(), Lines{critical("Previewing media at URL \"" + source->previewItemURL()->absoluteString() +
                                           "\" has been cancelled")});
}

TEST_F(DocumentPreviewsTest, ADocumentWithoutPagesReportsNoPreviewAtHundredAndOneWarning) {
  const auto source = sourceOfEmpty();
  takeLines();
  std::vector<std::pair<bool, double>> seen;
  EXPECT_TRUE(source->previewWithProgressionBlock([&](const auto& preview, double percentage) {
    seen.emplace_back(preview != nullptr, percentage);
    return true;
  }));
  EXPECT_THAT(seen, ElementsAre(Pair(false, 100)));
  EXPECT_EQ(source->previewCount(), 0u);
  EXPECT_EQ(source->previewAtIndex(0), nullptr);
  EXPECT_EQ(source->posterImage(), nullptr);
  EXPECT_EQ(takeProblems(), Lines{cannotBeShown(*source, "The document has no pages.")});
}

TEST_F(DocumentPreviewsTest, AProtectedDocumentIsWarnedOfOnce) {
  QUILT_CORPUS_FILE(file, "pdf-encrypted-user-password.pdf");
  const auto source = recordedSource(file);
  takeLines();
  EXPECT_EQ(source->previewCount(), 0u);
  EXPECT_TRUE(source->isPreviewed());
  EXPECT_EQ(takeProblems(), Lines{cannotBeShown(*source, "The document is protected by a password.")});
}

TEST_F(DocumentPreviewsTest, PagesAreWrittenByTheirIndexAndSurviveTheDocument) {
  const Path file = write("a.pdf", makePages(2));
  const auto source = addSource(file);
  ASSERT_TRUE(source->previewWithProgressionBlock({}));
  source->flattenPreviews();
  EXPECT_THAT(namesIn(source->previewsFolderPath()), ElementsAre("0.jpg", "1.jpg"));
  std::filesystem::remove(file);
  const auto read = QuiltMediaPreview::initWithDictionary(source->previews()[1]->dictionary(), source);
  EXPECT_EQ(read->title(), "Page 2");
  EXPECT_EQ(read->image()->size(), (platform::Size{1280, 640}));
}

TEST_F(DocumentPreviewsTest, PagesCanStillBeWrittenWhenTheDocumentMoves) {
  const Path file = write("a.pdf", makePages(2));
  const auto source = addSource(file);
  ASSERT_TRUE(source->previewWithProgressionBlock({}));
  std::filesystem::rename(file, folder() / "moved.pdf");
  for (const auto& preview : source->previews()) EXPECT_TRUE(preview->flatten());
}

TEST_F(DocumentPreviewsTest, ThePosterIsTheFirstPage) {
  const auto source =
      addSource(write("a.pdf", makePdf(support::drawnPage("/MediaBox [0 0 100 200]", "1 0 0 rg 0 0 100 200 re f"))));
  const auto poster = source->posterImage();
  ASSERT_NE(poster, nullptr);
  EXPECT_EQ(poster->size(), (platform::Size{240, 480}));
  EXPECT_EQ(support::pixelAt(*poster->bitmap(), 120, 240), support::kRed);
}

}  // namespace
}  // namespace quilt
