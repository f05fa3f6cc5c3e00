// SPDX-License-Identifier: Apache-2.0
// What every DocumentToolkit and every PagedDocument promises; MupdfDocumentsTest looks at the pages.
#include <cmath>

#include "quilt/platform/absent/Absent.h"
#include "quilt/platform/mupdf/MupdfDocuments.h"
#include "tests/support/Candidate.h"
#include "tests/support/DocumentFixtures.h"
#include "tests/support/ImageFixtures.h"

namespace quilt::platform {
namespace {

using support::expectTellingError;

using DocumentCandidate = support::Candidate<DocumentToolkit>;
const DocumentCandidate kMupdf{"Mupdf", [] { return std::make_shared<MupdfDocuments>(); }};
const DocumentCandidate kNoMupdf{"Absent", [] { return std::make_shared<AbsentDocumentToolkit>(); }};

/// Holds of a build with pages and of one without.
using DocumentToolkitFailureContract = support::ContractTest<DocumentToolkit>;
INSTANTIATE_TEST_SUITE_P(Implementations, DocumentToolkitFailureContract, ::testing::Values(kMupdf, kNoMupdf),
                         support::candidateName);

TEST_P(DocumentToolkitFailureContract, WhatIsNoDocumentIsRefusedWithItsFile) {
  for (const Path& file : {writeFile(folder() / "words.pdf", "words"), writeFile(folder() / "empty.pdf", ""),
                           writeFile(folder() / "words.epub", "words"), folder() / "missing.pdf", folder()})
    expectTellingError(service->openDocument(file), file);
}

/// Holds of every implementation that opens documents.
class PagedDocumentContract : public support::ContractTest<DocumentToolkit> {
 protected:
  Path pages(std::size_t count) { return support::writeFile(folder() / "a.pdf", support::makePages(count)); }
  std::shared_ptr<PagedDocument> open(const Path& file) const {
    auto document = service->openDocument(file);
    EXPECT_TRUE(document);
    return document ? *std::move(document) : nullptr;
  }
};
using PagedDocumentContractThreadTest = PagedDocumentContract;
INSTANTIATE_TEST_SUITE_P(Implementations, PagedDocumentContract, ::testing::Values(kMupdf), support::candidateName);
INSTANTIATE_TEST_SUITE_P(Implementations, PagedDocumentContractThreadTest, ::testing::Values(kMupdf),
                         support::candidateName);

TEST_P(PagedDocumentContract, APageHasASizeAPictureAndText) {
  const auto document = open(pages(2));
  EXPECT_EQ(2U, *document->pageCount());
  EXPECT_EQ((Size{200, 100}), *document->sizeOfPage(1));
  EXPECT_EQ("Page 2", *document->textOfPage(1));
  const Result<Bitmap> picture = document->drawPage(1, {60, 30});
  ASSERT_TRUE(picture);
  EXPECT_EQ(60U, picture->width);
  EXPECT_EQ(30U, picture->height);
  ASSERT_EQ(60U * 30 * 4, picture->pixels.size());
  for (std::size_t i = 3; i < picture->pixels.size(); i += 4) ASSERT_EQ(255, picture->pixels[i]) << "opaque";
}

TEST_P(PagedDocumentContract, PastTheLastPageNothingIsFound) {
  const Path file = pages(2);
  const auto document = open(file);
  expectTellingError(document->sizeOfPage(2), file);
  expectTellingError(document->drawPage(2, {10, 10}), file);
  expectTellingError(document->textOfPage(2), file);
  EXPECT_EQ(ErrorKind::NotFound, document->sizeOfPage(2).error().kind);
}

TEST_P(PagedDocumentContract, NoPictureIsDrawnInAnImpossibleSize) {
  const auto document = open(pages(1));
  for (const Size size : {Size{0, 10}, Size{10, -1}, Size{1e9, 1}, Size{std::nan(""), 1}}) {
    EXPECT_FALSE(document->drawPage(0, size)) << size.width;
  }
  EXPECT_TRUE(document->drawPage(0, {1, 1}));
}

TEST_P(PagedDocumentContract, AnOpenDocumentOutlivesItsName) {
  const Path file = pages(2);
  const auto document = open(file);
  std::filesystem::remove(file);
  EXPECT_EQ("Page 2", *document->textOfPage(1));
}

TEST_P(PagedDocumentContract, AClosedDocumentLeavesNoDescriptor) {
  const Path file = pages(2);
  open(file);
  const std::size_t before = support::openDescriptors();
  EXPECT_TRUE(open(file)->drawPage(0, {10, 10}));
  EXPECT_EQ(before, support::openDescriptors());
}

TEST_P(PagedDocumentContractThreadTest, ThreadsMayShareADocument) {
  const auto document = open(pages(8));
  const Result<Bitmap> expected = document->drawPage(3, {200, 100});
  support::onThreads([&] {
    for (std::size_t i = 0; i < 8; ++i) {
      EXPECT_EQ("Page " + std::to_string(i + 1), *document->textOfPage(i));
      EXPECT_EQ(expected->pixels, document->drawPage(3, {200, 100})->pixels);
    }
  });
}

TEST_P(PagedDocumentContractThreadTest, EveryThreadMayOpenADocumentOfItsOwn) {
  const Path file = pages(4);
  support::onThreads([&] {
    const auto document = service->openDocument(file);
    ASSERT_TRUE(document);
    EXPECT_EQ(4U, *(*document)->pageCount());
    EXPECT_TRUE((*document)->drawPage(3, {100, 50}));
  });
}

}  // namespace
}  // namespace quilt::platform
