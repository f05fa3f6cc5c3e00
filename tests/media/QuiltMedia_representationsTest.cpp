// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "quilt/media/QuiltMedia.h"
#include "tests/support/PackageFixture.h"

namespace quilt {
namespace {

using platform::Pasteboard;
using platform::PropertyList;
using ::testing::ElementsAre;
using ::testing::EndsWith;

class QuiltMediaRepresentationsTest : public support::PackageFixture {
 protected:
  /// The item as a montage of two pictures.
  void makeMontage() {
    addSource(pictureFile(64, 48));
    addSource(pictureFile(48, 64));
    item()->setContentCategory(kQuiltMediaContentCategoryMontage);
  }
};

TEST_F(QuiltMediaRepresentationsTest, OneDragTypeEndsWithTheNamesOfFrameworkAndClass) {
  EXPECT_THAT(QuiltMedia::dragTypeIdentifier(), EndsWith(".QuiltFramework.QuiltMedia"));
  EXPECT_THAT(QuiltMedia::readableTypesForPasteboard(Pasteboard()), ElementsAre(QuiltMedia::dragTypeIdentifier()));
  EXPECT_THAT(item()->writableTypesForPasteboard(Pasteboard()), ElementsAre(QuiltMedia::dragTypeIdentifier()));
  EXPECT_EQ(item()->writingOptionsForType("any", Pasteboard()), 0u);
  EXPECT_EQ(QuiltMedia::readingOptionsForType("any", Pasteboard()), 1u);
}

TEST_F(QuiltMediaRepresentationsTest, ACopiedItemIsReadBackAsItsUuid) {
  Pasteboard pasteboard;
  pasteboard.writeObject(*item());
  const auto lists = pasteboard.propertyListsForType(QuiltMedia::dragTypeIdentifier());
  ASSERT_THAT(lists, ElementsAre(PropertyList(item()->uuid())));
  EXPECT_EQ(item()->pasteboardPropertyListForType("any"), PropertyList(item()->uuid()));
  EXPECT_EQ(QuiltMedia::initWithPasteboardPropertyList(lists[0], QuiltMedia::dragTypeIdentifier()), nullptr);
}

TEST_F(QuiltMediaRepresentationsTest, AnOrdinaryItemIsShownByItsMainFile) {
  const Path file = pictureFile(8, 8);
  addSource(file);
  EXPECT_EQ(item()->imageUID(), item()->uuid());
  EXPECT_EQ(item()->imageRepresentationType(), kImageBrowserPreviewPathRepresentationType);
  EXPECT_EQ(item()->imageRepresentation(), ImageRepresentation(Url::fileUrl(file)));
  EXPECT_EQ(item()->previewItemURL(), Url::fileUrl(file));
}

TEST_F(QuiltMediaRepresentationsTest, AMovieWithoutSourcesHasNothingToShow) {
  item()->setContentCategory(kQuiltMediaContentCategoryMovie);
  EXPECT_EQ(item()->previewItemURL(), std::nullopt);
  EXPECT_EQ(item()->imageRepresentationType(), kImageBrowserPreviewPathRepresentationType);
  EXPECT_EQ(item()->imageRepresentation(), ImageRepresentation());
}

TEST_F(QuiltMediaRepresentationsTest, AMontageIsShownByItsPosterFile) {
  makeMontage();
  EXPECT_EQ(item()->imageRepresentationType(), kImageBrowserPathRepresentationType);
  EXPECT_EQ(item()->imageRepresentation(), ImageRepresentation(item()->posterImagePath()));
  EXPECT_EQ(item()->previewItemURL(), std::nullopt);
}

TEST_F(QuiltMediaRepresentationsTest, AMontageWhosePosterFileWasDeletedIsShownAsABitmapUntilItIsDrawnAgain) {
  makeMontage();
  ASSERT_NE(item()->posterImage(), nullptr);
  ASSERT_TRUE(std::filesystem::remove(item()->posterImagePath()));
  EXPECT_EQ(item()->imageRepresentationType(), kImageBrowserBitmapRepresentationType);
  EXPECT_EQ(item()->imageRepresentation(), ImageRepresentation(item()->posterImage()));
  item()->invalidatePosterImage();
  EXPECT_EQ(item()->imageRepresentationType(), kImageBrowserPathRepresentationType);
}

TEST_F(QuiltMediaRepresentationsTest, ADualSourceItemWithoutAPosterHasNothingToShow) {
  keepDocumentBusy();
  addSource(pictureFile(8, 8));
  item()->setContentCategory(kQuiltMediaContentCategoryDualSource);
  EXPECT_EQ(item()->imageRepresentationType(), kImageBrowserBitmapRepresentationType);
  EXPECT_EQ(item()->imageRepresentation(), ImageRepresentation());
}

TEST_F(QuiltMediaRepresentationsTest, TheVersionRisesWhenThePosterIsDrawnOrInvalidated) {
  keepDocumentBusy();
  makeMontage();
  const std::uint64_t before = item()->imageVersion();
  item()->posterImage();
  const std::uint64_t drawn = item()->imageVersion();
  EXPECT_GT(drawn, before);
  item()->invalidatePosterImage();
  EXPECT_GT(item()->imageVersion(), drawn);
}

TEST_F(QuiltMediaRepresentationsTest, ItsThumbnailIsDrawnAsAnIcon) {
  EXPECT_EQ(QuiltMedia::glanceThumbnailOptions(), (Dictionary{{kGlanceIconModeOption, true}}));
}

}  // namespace
}  // namespace quilt
