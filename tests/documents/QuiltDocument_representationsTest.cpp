// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "quilt/platform/interfaces/Services.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::Pasteboard;
using platform::PropertyList;
using ::testing::ElementsAre;
using ::testing::EndsWith;

using QuiltDocumentRepresentationsTest = support::DocumentFixture;

TEST_F(QuiltDocumentRepresentationsTest, OneDragTypeEndsWithTheNameOfTheClass) {
  EXPECT_THAT(QuiltDocument::dragTypeIdentifier(), EndsWith(".QuiltDocument"));
  EXPECT_THAT(QuiltDocument::readableTypesForPasteboard(Pasteboard()),
              ElementsAre(QuiltDocument::dragTypeIdentifier()));
  EXPECT_THAT(made()->writableTypesForPasteboard(Pasteboard()), ElementsAre(QuiltDocument::dragTypeIdentifier()));
}

TEST_F(QuiltDocumentRepresentationsTest, ItsUuidIsWrittenWithoutOptionsAndReadAsAText) {
  const auto document = made();
  for (const char* type : {"org.quilt.QuiltDocument", "public.text", ""}) {
    EXPECT_EQ(document->pasteboardPropertyListForType(type), PropertyList(document->uuid())) << type;
    EXPECT_EQ(document->writingOptionsForType(type, Pasteboard()), 0u);
    EXPECT_EQ(QuiltDocument::readingOptionsForType(type, Pasteboard()), 1u);
  }
}

TEST_F(QuiltDocumentRepresentationsTest, IsNeverMadeFromAPasteboard) {
  const auto document = made();
  Pasteboard pasteboard;
  pasteboard.writeObject(*document);
  const auto lists = pasteboard.propertyListsForType(QuiltDocument::dragTypeIdentifier());
  ASSERT_THAT(lists, ElementsAre(PropertyList(document->uuid())));
  EXPECT_EQ(QuiltDocument::initWithPasteboardPropertyList(lists[0], QuiltDocument::dragTypeIdentifier()), nullptr);
}

TEST_F(QuiltDocumentRepresentationsTest, WithoutAPosterFileThePlaceholderIsShown) {
  const auto document = made();
  EXPECT_EQ(document->imageUID(), document->uuid());
  EXPECT_EQ(document->imageRepresentationType(), kImageBrowserImageRepresentationType);
  const auto shown = document->imageRepresentation();
  ASSERT_TRUE(std::holds_alternative<std::shared_ptr<ImageWrapper>>(shown));
  EXPECT_EQ(std::get<std::shared_ptr<ImageWrapper>>(shown), document->posterImage());
}

TEST_F(QuiltDocumentRepresentationsTest, ANewPosterRaisesTheVersionAndIsShownByItsFile) {
  const auto document = made();
  const std::uint64_t before = document->imageVersion();
  document->updatePosterImage(picture(40, 30));
  EXPECT_EQ(document->imageVersion(), before + 1);
  EXPECT_EQ(document->imageRepresentationType(), kImageBrowserPathRepresentationType);
  EXPECT_EQ(document->imageRepresentation(), ImageRepresentation(document->path() / "poster.png"));
}

TEST_F(QuiltDocumentRepresentationsTest, ADeletedPosterFileLeavesTheCachedImage) {
  const auto document = made();
  document->updatePosterImage(picture(40, 30));
  ASSERT_TRUE(std::filesystem::remove(document->posterImagePath()));
  ASSERT_NE(document->posterImage(), nullptr);
  EXPECT_EQ(document->imageRepresentationType(), kImageBrowserImageRepresentationType);
  EXPECT_EQ(document->imageRepresentation(), ImageRepresentation(document->posterImage()));
}

TEST_F(QuiltDocumentRepresentationsTest, WithoutATitleItIsShownUnderAnother) {
  const auto document = made();
  document->setIsProcessing(true);  // a save would store the other title
  document->setTitle(std::nullopt);
  EXPECT_EQ(document->imageTitle(), "Untitled Episode");
  EXPECT_EQ(document->title(), std::nullopt);
  document->setTitle("A talk");
  EXPECT_EQ(document->imageTitle(), "A talk");
}

TEST_F(QuiltDocumentRepresentationsTest, TheSubtitleIsTheDayOfCreation) {
  const auto document = made();
  const auto date = support::dateOf("2024-03-05T12:00:00Z");
  document->setCreationDate(date);
  EXPECT_EQ(document->imageSubtitle(), platform::services().dates->shortDescription(date));
  EXPECT_NE(document->imageSubtitle(), "");
}

}  // namespace
}  // namespace quilt
