// SPDX-License-Identifier: Apache-2.0
// A document that is idle saves itself with every change, and its record asks each item for its poster: so posters and
// previews are made of the user's own files at once. These files are then deleted, replaced and moved.
#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using ::testing::IsEmpty;

/// What becomes of the user's file once the document has its copy.
enum class Fate { Deleted, Replaced, Moved };

class IdleDocumentTest : public support::DocumentFixture, public ::testing::WithParamInterface<Fate> {
 protected:
  IdleDocumentTest() {
    document->setTitle("Idle");
    document->addMedia(item);
    item->addSource(QuiltMediaSource::initWithPath(file));
    EXPECT_FALSE(document->isProcessing());
  }

  void meetFate() const {
    switch (GetParam()) {
      case Fate::Deleted:
        ASSERT_TRUE(std::filesystem::remove(file));
        return;
      case Fate::Replaced:
        std::filesystem::rename(pictureFile(30, 90, "other.png"), file);
        return;
      case Fate::Moved:
        std::filesystem::rename(file, folder() / "moved.png");
        return;
    }
  }

  static void expectPoster(QuiltMedia& shown) {
    const auto poster = shown.posterImage();
    ASSERT_NE(poster, nullptr);
    EXPECT_EQ(poster->size(), (platform::Size{640, 480})) << "of the picture that was added";
  }

  const Path file = pictureFile(800, 600);
  const std::shared_ptr<QuiltDocument> document = made();
  const std::shared_ptr<QuiltMedia> item = QuiltMedia::init();
};

TEST_P(IdleDocumentTest, TheReopenedDocumentFinalizesAndExports) {
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  meetFate();
  const auto again = reopened(*document);
  ASSERT_NE(again, nullptr);
  takeLines();
  EXPECT_TRUE(again->finalizeWithProgressionBlock({}));
  expectPoster(*again->mediaAtIndex(0));
  EXPECT_FALSE(again->exportToPath(folder(), true, {}, {}).empty());
  EXPECT_THAT(takeProblems(), IsEmpty());
}

TEST_P(IdleDocumentTest, EditsAfterwardsAreSavedAndThePosterStays) {
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  meetFate();
  takeLines();
  document->setTitle("After");
  item->setTitle("After");
  document->invalidateCaches();
  document->moveMediaAtIndexes({0}, 1);
  EXPECT_THAT(takeProblems(), IsEmpty());
  expectPoster(*item);
  const auto again = reopened(*document);
  ASSERT_NE(again, nullptr);
  EXPECT_EQ(again->title(), "After");
  expectPoster(*again->mediaAtIndex(0));
}

TEST_P(IdleDocumentTest, APosterThatIsDrawnAnewIsDrawnFromThePackage) {
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  meetFate();
  item->invalidatePosterImage();
  expectPoster(*item);
  const auto preview = item->sourcePreviewAtIndex(0);
  ASSERT_NE(preview, nullptr);
  ASSERT_NE(preview->image(), nullptr);
  EXPECT_EQ(preview->image()->size(), (platform::Size{800, 600}));
}

TEST_P(IdleDocumentTest, ASmallerGradeIsMadeFromThePackage) {
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  meetFate();
  takeLines();
  EXPECT_TRUE(document->convertToFormat(kQuiltMediaDerivativeCompatibilityTag480p, {}));
  EXPECT_THAT(takeProblems(), IsEmpty());
  const auto smaller = item->sourceAtIndex(0)->derivativeWithFormat(kQuiltMediaDerivativeCompatibilityTag480p);
  ASSERT_NE(smaller, nullptr);
  const auto image = ImageWrapper::imageWithURL(*smaller->url());
  ASSERT_NE(image, nullptr);
  EXPECT_EQ(image->size(), (platform::Size{640, 480}));
}

std::string fateName(const ::testing::TestParamInfo<Fate>& info) {
  switch (info.param) {
    case Fate::Deleted:
      return "Deleted";
    case Fate::Replaced:
      return "Replaced";
    case Fate::Moved:
      return "Moved";
  }
  return {};
}
INSTANTIATE_TEST_SUITE_P(TheOriginalIs, IdleDocumentTest, ::testing::Values(Fate::Deleted, Fate::Replaced, Fate::Moved),
                         fateName);

}  // namespace
}  // namespace quilt
