// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <array>
#include <cstdlib>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using platform::Bitmap;
using platform::services;
using platform::Size;
using Pixel = std::array<std::uint8_t, 3>;

constexpr Pixel kBrickRed{220, 30, 30};
constexpr Pixel kLeafGreen{30, 200, 30};
constexpr Pixel kInkBlue{30, 30, 220};
constexpr Pixel kYellow{230, 220, 20};
constexpr Pixel kPaperWhite{250, 250, 250};
constexpr Pixel kBlack{0, 0, 0};

class QuiltMediaCompositionsTest : public support::DocumentFixture {
 protected:
  QuiltMediaCompositionsTest() : document(made()), item(addItem(*document)) { document->setIsProcessing(true); }

  /// A source whose picture has the left colour in its left half and the right one in the other.
  void addPicture(std::size_t width, std::size_t height, Pixel left, Pixel right) {
    Bitmap bitmap{width, height, {}};
    for (std::size_t y = 0; y < height; ++y)
      for (std::size_t x = 0; x < width; ++x) {
        for (const std::uint8_t part : x < width / 2 ? left : right) bitmap.pixels.push_back(part);
        bitmap.pixels.push_back(255);
      }
    const Path file = folder() / ("picture" + std::to_string(item->sourcesCount()) + ".png");
    ASSERT_TRUE((*services().images->imageWithBitmap(std::move(bitmap)))->saveAsPNGAtURL(platform::Url::fileUrl(file)));
    item->addSource(QuiltMediaSource::initWithPath(file));
  }
  void addPicture(Pixel colour) { addPicture(400, 400, colour, colour); }

  /// The poster's pixel at a point of the drawing, whose side is 512, counted from the lower left.
  Pixel at(double x, double y) {
    const auto image = item->posterImage();
    EXPECT_NE(image, nullptr);
    const auto bitmap = image->bitmap();
    const double scale = static_cast<double>(bitmap->width) / 512;
    const auto column = static_cast<std::size_t>(x * scale);
    const std::size_t row = bitmap->height - 1 - static_cast<std::size_t>(y * scale);
    const std::uint8_t* pixel = bitmap->pixels.data() + (row * bitmap->width + column) * 4;
    return {pixel[0], pixel[1], pixel[2]};
  }
  static void expectNear(Pixel seen, Pixel expected, const char* where, int tolerance = 6) {
    for (std::size_t i = 0; i < 3; ++i) EXPECT_NEAR(seen[i], expected[i], tolerance) << where << ", part " << i;
  }
  void montage() { item->setContentCategory(std::string(kQuiltMediaContentCategoryMontage)); }
  void dualSource() { item->setContentCategory(std::string(kQuiltMediaContentCategoryDualSource)); }

  const std::shared_ptr<QuiltDocument> document;
  const std::shared_ptr<QuiltMedia> item;
};

// The badge and its shadow lie over the middle: points near the corners are clear of both.

TEST_F(QuiltMediaCompositionsTest, AMontageWithoutSourcesIsTheBadgeOnBlack) {
  montage();
  EXPECT_EQ(item->posterImage()->size(), (Size{480, 480})) << "512 × 512 in standard definition";
  for (const double x : {4.0, 256.0, 508.0}) expectNear(at(x, 4), kBlack, "the ground");
  const Pixel middle = at(256, 200);
  EXPECT_GT(middle[0] + middle[1] + middle[2], 30) << "the badge";
  EXPECT_TRUE(std::filesystem::exists(item->posterImagePath()));
}

TEST_F(QuiltMediaCompositionsTest, OnePictureFillsTheMontageWithItsMiddle) {
  addPicture(800, 400, kBrickRed, kInkBlue);
  montage();
  expectNear(at(12, 500), kBrickRed, "upper left");
  expectNear(at(500, 12), kInkBlue, "lower right");
  expectNear(at(240, 504), kBrickRed, "left of the middle", 14);
  expectNear(at(272, 504), kInkBlue, "right of the middle", 14);
}

TEST_F(QuiltMediaCompositionsTest, TwoPicturesStandSideBySide) {
  addPicture(kBrickRed);
  addPicture(kInkBlue);
  montage();
  for (const double y : {12.0, 500.0}) {
    expectNear(at(12, y), kBrickRed, "left");
    expectNear(at(500, y), kInkBlue, "right");
  }
}

TEST_F(QuiltMediaCompositionsTest, OfThreePicturesTheFirstIsAbove) {
  addPicture(kBrickRed);
  addPicture(kLeafGreen);
  addPicture(kInkBlue);
  montage();
  expectNear(at(12, 500), kBrickRed, "upper left");
  expectNear(at(500, 500), kBrickRed, "upper right");
  expectNear(at(12, 12), kLeafGreen, "lower left");
  expectNear(at(500, 12), kInkBlue, "lower right");
}

TEST_F(QuiltMediaCompositionsTest, OfFivePicturesFourAreShownAndTheFirstIsStretchedUnderTheSecond) {
  addPicture(400, 400, kPaperWhite, kBrickRed);
  addPicture(kLeafGreen);
  addPicture(kInkBlue);
  addPicture(kYellow);
  addPicture(kBrickRed);
  montage();
  expectNear(at(12, 500), kPaperWhite, "upper left");
  expectNear(at(240, 500), kPaperWhite, "still the first's left half: it is twice as wide", 14);
  expectNear(at(500, 500), kLeafGreen, "upper right");
  expectNear(at(12, 12), kInkBlue, "lower left");
  expectNear(at(500, 12), kYellow, "lower right");
}

TEST_F(QuiltMediaCompositionsTest, TheMontageHasABlackFrame) {
  addPicture(kPaperWhite);
  montage();
  const Pixel edge = at(256, 511.9);
  EXPECT_LT(edge[0], 60) << "one pixel of the line of two lies inside";
  expectNear(at(256, 506), kPaperWhite, "inside of it", 14);
}

TEST_F(QuiltMediaCompositionsTest, TheBadgeThrowsAShadow) {
  addPicture(kPaperWhite);
  montage();
  const Pixel beside = at(110, 256);
  EXPECT_LT(beside[0], 235);
  EXPECT_GT(beside[0], 20);
  expectNear(at(8, 504), kPaperWhite, "not into the corners", 14);
}

TEST_F(QuiltMediaCompositionsTest, ADualSourceShowsTheFirstInALowerCornerOfTheSecond) {
  addPicture(400, 400, kLeafGreen, kYellow);
  addPicture(1920, 1080, kBrickRed, kInkBlue);
  dualSource();
  EXPECT_EQ(item->posterImage()->size(), (Size{512, 288}));
  expectNear(at(250, 280), kBrickRed, "the ground's left half");
  expectNear(at(500, 12), kInkBlue, "its right half");
  // The inset: 170.67 wide and, the first being square, high, from (20, 20).
  expectNear(at(24, 100), kLeafGreen, "its left half");
  expectNear(at(186, 100), kYellow, "its right half");
  expectNear(at(100, 186), kLeafGreen, "its upper edge");
  expectNear(at(100, 205), kBrickRed, "above it", 40);
  expectNear(at(256, 287.5), kBlack, "the frame", 10);
}

TEST_F(QuiltMediaCompositionsTest, TheInsetHasRoundedCornersAndAShadow) {
  addPicture(kPaperWhite);
  addPicture(1920, 1080, kPaperWhite, kPaperWhite);
  dualSource();
  expectNear(at(100, 100), kPaperWhite, "the inset");
  EXPECT_LT(at(100, 17)[0], 230) << "below it";
  EXPECT_LT(at(20.5, 20.5)[0], 230) << "its corner is cut, and shadowed";
  expectNear(at(400, 200), kPaperWhite, "far from it");
}

TEST_F(QuiltMediaCompositionsTest, APortraitSourceGivesAPortraitPoster) {
  addPicture(kBrickRed);
  addPicture(300, 600, kInkBlue, kInkBlue);
  dualSource();
  EXPECT_EQ(item->posterImage()->size(), (Size{240, 480})) << "256 × 512 in standard definition";
}

TEST_F(QuiltMediaCompositionsTest, WithoutASecondPictureADualSourceHasNoPoster) {
  addPicture(kBrickRed);
  dualSource();
  takeLines();
  EXPECT_EQ(item->posterImage(), nullptr);
  EXPECT_EQ(takeProblems(), support::Lines{support::warning("Media poster image cannot be previewed")});
  EXPECT_FALSE(std::filesystem::exists(item->posterImagePath()));
}

TEST_F(QuiltMediaCompositionsTest, WithoutAFirstPictureADualSourceShowsTheSecondAlone) {
  item->addSource(QuiltMediaSource::init());
  addPicture(1920, 1080, kBrickRed, kInkBlue);
  dualSource();
  expectNear(at(100, 100), kBrickRed, "no inset");
}

TEST_F(QuiltMediaCompositionsTest, ASourceWithoutAPictureLeavesItsPlaceBlack) {
  addPicture(kBrickRed);
  item->addSource(QuiltMediaSource::init());
  montage();
  expectNear(at(12, 500), kBrickRed, "left");
  expectNear(at(500, 500), kBlack, "right");
}

TEST_F(QuiltMediaCompositionsTest, ACompositionIsSavedAndReadBack) {
  addPicture(kBrickRed);
  montage();
  ASSERT_NE(item->posterImage(), nullptr);
  EXPECT_EQ(item->posterImageVersion(), 2u);
  item->invalidateCaches();
  expectNear(at(12, 500), kBrickRed, "from the file", 12);
  EXPECT_EQ(item->posterImageVersion(), 2u);
}

// ---- Stored references

/// The poster beside a picture of it that someone has looked at. QUILT_WRITE_REFERENCES=1 stores what is drawn now, to
/// be looked at before it is committed.
class QuiltMediaCompositionReferencesTest : public QuiltMediaCompositionsTest {
 protected:
  void expectLike(const std::string& name) const {
    const Path reference = Path(QUILT_SOURCE_FOLDER) / "tests/media/references" / (name + ".png");
    const auto drawn = item->posterImage();
    ASSERT_NE(drawn, nullptr);
    if (std::getenv("QUILT_WRITE_REFERENCES")) {
      ASSERT_TRUE(drawn->saveAsPNGAtURL(platform::Url::fileUrl(reference)));
    }
    const auto stored = ImageWrapper::imageWithPath(reference);
    ASSERT_NE(stored, nullptr) << reference;
    const auto seen = drawn->bitmap();
    const auto expected = stored->bitmap();
    ASSERT_TRUE(seen && expected);
    ASSERT_EQ(seen->width, expected->width);
    ASSERT_EQ(seen->height, expected->height);
    double total = 0;
    int most = 0;
    for (std::size_t i = 0; i < seen->pixels.size(); ++i) {
      const int difference = std::abs(seen->pixels[i] - expected->pixels[i]);
      total += difference;
      most = std::max(most, difference);
    }
    // Roundings of another version of the drawing library, and no more.
    EXPECT_LT(total / static_cast<double>(seen->pixels.size()), 0.5) << "mean difference";
    EXPECT_LE(most, 24) << "largest difference";
  }
};

TEST_F(QuiltMediaCompositionReferencesTest, AMontageOfFourLooksAsItDid) {
  addPicture(640, 360, kBrickRed, kInkBlue);
  addPicture(300, 600, kLeafGreen, kPaperWhite);
  addPicture(400, 400, kYellow, kLeafGreen);
  addPicture(800, 200, kInkBlue, kYellow);
  montage();
  expectLike("montage-of-four");
}

TEST_F(QuiltMediaCompositionReferencesTest, AnEmptyMontageLooksAsItDid) {
  montage();
  expectLike("montage-of-none");
}

TEST_F(QuiltMediaCompositionReferencesTest, TwoSourcesLookAsTheyDid) {
  addPicture(400, 300, kBrickRed, kYellow);
  addPicture(1920, 1080, kPaperWhite, kInkBlue);
  dualSource();
  expectLike("dual-source");
}

}  // namespace
}  // namespace quilt
