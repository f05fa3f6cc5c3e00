// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/cairo/CairoDrawing.h"

#include <gmock/gmock.h>

#include <array>
#include <cmath>
#include <limits>

#include "quilt/platform/cairo/Blur.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;
using Pixel = std::array<int, 4>;

/// The pixel whose centre lies half a pixel right and above the point, counted from the lower left.
Pixel at(const Bitmap& bitmap, std::size_t x, std::size_t y) {
  const std::uint8_t* pixel = bitmap.pixels.data() + ((bitmap.height - 1 - y) * bitmap.width + x) * 4;
  return {pixel[0], pixel[1], pixel[2], pixel[3]};
}

constexpr Pixel kRedPixel{255, 0, 0, 255};
constexpr Pixel kBluePixel{0, 0, 255, 255};
constexpr Pixel kBlackPixel{0, 0, 0, 255};
constexpr Pixel kNothing{0, 0, 0, 0};
constexpr Color kWhiteColor{1, 1, 1, 1};

std::unique_ptr<Canvas> canvas(double width, double height) {
  auto made = CairoDrawing().makeCanvas({width, height});
  EXPECT_TRUE(made.hasValue());
  return *std::move(made);
}

/// Red above, blue below.
Bitmap twoColours(std::size_t width, std::size_t height) {
  Bitmap image{width, height, {}};
  for (std::size_t y = 0; y < height; ++y)
    for (std::size_t x = 0; x < width; ++x)
      for (const int part : y < height / 2 ? kRedPixel : kBluePixel)
        image.pixels.push_back(static_cast<std::uint8_t>(part));
  return image;
}

TEST(CairoDrawingTest, ACanvasBeginsTransparentAndCanBeFilled) {
  const auto made = canvas(3, 2);
  EXPECT_EQ(at(made->bitmap(), 0, 0), kNothing);
  made->fill({1, 0, 0, 1});
  EXPECT_EQ(made->bitmap().width, 3u);
  EXPECT_EQ(made->bitmap().height, 2u);
  EXPECT_EQ(at(made->bitmap(), 2, 1), kRedPixel);
}

TEST(CairoDrawingTest, SizesAreRoundedAndAbsurdOnesRefused) {
  EXPECT_EQ(canvas(9.6, 4.4)->bitmap().width, 10u);
  for (const Size size : {Size{0, 5}, Size{5, 0}, Size{-3, 5}, Size{20000, 5}, Size{std::nan(""), 5},
                          Size{std::numeric_limits<double>::infinity(), 5}})
    EXPECT_FALSE(CairoDrawing().makeCanvas(size).hasValue()) << size.width << " x " << size.height;
}

TEST(CairoDrawingTest, AnImageIsDrawnUpright) {
  const auto made = canvas(8, 8);
  made->drawImage(twoColours(4, 4), {0, 0, 4, 4}, {0, 0, 8, 8});
  EXPECT_EQ(at(made->bitmap(), 4, 7), kRedPixel) << "its upper half is above";
  EXPECT_EQ(at(made->bitmap(), 4, 0), kBluePixel);
}

TEST(CairoDrawingTest, APartIsCountedFromTheLowerLeft) {
  const auto made = canvas(8, 8);
  made->drawImage(twoColours(4, 4), {0, 0, 4, 2}, {2, 4, 4, 4});
  EXPECT_EQ(at(made->bitmap(), 2, 4), kBluePixel) << "the lower half alone";
  EXPECT_EQ(at(made->bitmap(), 5, 7), kBluePixel);
  EXPECT_EQ(at(made->bitmap(), 1, 4), kNothing);
  EXPECT_EQ(at(made->bitmap(), 2, 3), kNothing);
}

TEST(CairoDrawingTest, EdgesOfAScaledImageAreOpaque) {
  const auto made = canvas(100, 100);
  made->drawImage(twoColours(7, 7), {0, 0, 7, 7}, {0, 0, 100, 100});
  for (const std::size_t edge : {std::size_t{0}, std::size_t{99}}) {
    EXPECT_EQ(at(made->bitmap(), edge, 50)[3], 255);
    EXPECT_EQ(at(made->bitmap(), 50, edge)[3], 255);
  }
}

TEST(CairoDrawingTest, TransparencyIsKeptAndComposed) {
  Bitmap half{1, 1, {255, 0, 0, 128}};
  const auto bare = canvas(1, 1);
  bare->drawImage(half, {0, 0, 1, 1}, {0, 0, 1, 1});
  EXPECT_EQ(at(bare->bitmap(), 0, 0), (Pixel{255, 0, 0, 128}));
  const auto onBlue = canvas(1, 1);
  onBlue->fill({0, 0, 1, 1});
  onBlue->drawImage(half, {0, 0, 1, 1}, {0, 0, 1, 1});
  EXPECT_EQ(at(onBlue->bitmap(), 0, 0), (Pixel{128, 0, 127, 255}));
}

TEST(CairoDrawingTest, AnOutlineLiesHalfInside) {
  const auto made = canvas(10, 10);
  made->fill(kWhiteColor);
  made->strokeRect({0, 0, 10, 10}, kBlack, 2);
  const Bitmap drawn = made->bitmap();
  EXPECT_EQ(at(drawn, 0, 5), kBlackPixel);
  EXPECT_EQ(at(drawn, 1, 5), (Pixel{255, 255, 255, 255}));
  EXPECT_EQ(at(drawn, 9, 9), kBlackPixel);
}

TEST(CairoDrawingTest, CornersAreRounded) {
  const auto made = canvas(40, 40);
  made->fillRoundedRect({10, 10, 20, 20}, 8, kBlack, 1);
  const Bitmap drawn = made->bitmap();
  EXPECT_EQ(at(drawn, 20, 20), kBlackPixel);
  EXPECT_EQ(at(drawn, 10, 10)[3], 0) << "the corner";
  EXPECT_EQ(at(drawn, 20, 10), kBlackPixel) << "the edge";
  EXPECT_NEAR(at(drawn, 20, 9)[3], 128, 12) << "half of the outline";
  made->drawImage(twoColours(4, 4), {0, 0, 4, 4}, {10, 10, 20, 20}, std::nullopt, 8);
  EXPECT_EQ(at(made->bitmap(), 10, 10)[3], 0) << "an image is cut to them";
  EXPECT_EQ(at(made->bitmap(), 20, 12), kBluePixel);
}

TEST(CairoDrawingTest, AShadowSurroundsTheShapeEvenlyAndFades) {
  const auto made = canvas(100, 100);
  made->fillRoundedRect({30, 30, 40, 40}, 0, {1, 0, 0, 1}, 0.001, Shadow{20, kBlack});
  const Bitmap drawn = made->bitmap();
  EXPECT_EQ(at(drawn, 50, 50), kRedPixel);
  const int near = at(drawn, 50, 28)[3];
  const int far = at(drawn, 50, 20)[3];
  EXPECT_NEAR(near, 107, 12) << "just outside of a long edge not quite half of it is left";
  EXPECT_GT(far, 5);
  EXPECT_LT(far, near / 2);
  EXPECT_EQ(at(drawn, 50, 71)[3], near) << "the same above";
  EXPECT_EQ(at(drawn, 28, 50)[3], near) << "and at the left";
  EXPECT_EQ(at(drawn, 71, 50)[3], near);
  EXPECT_EQ(at(drawn, 50, 2)[3], 0);
}

TEST(CairoDrawingTest, AnImagesShadowHasItsShape) {
  Bitmap image{2, 1, {255, 255, 255, 255, 0, 0, 0, 0}};
  const auto made = canvas(100, 50);
  made->drawImage(image, {0, 0, 2, 1}, {20, 15, 60, 20}, Shadow{6, kBlack});
  EXPECT_GT(at(made->bitmap(), 30, 12)[3], 20) << "below the opaque half";
  EXPECT_EQ(at(made->bitmap(), 70, 12)[3], 0) << "not below the other";
}

TEST(CairoDrawingTest, AnEmptyImageDrawsNothing) {
  const auto made = canvas(4, 4);
  made->drawImage({}, {0, 0, 4, 4}, {0, 0, 4, 4});
  made->drawImage(twoColours(4, 4), {0, 0, 0, 0}, {0, 0, 4, 4});
  made->drawImage(twoColours(4, 4), {0, 0, 4, 4}, {0, 0, 0, 4});
  EXPECT_EQ(at(made->bitmap(), 2, 2), kNothing);
}

// ---- Blur

TEST(BlurTest, APointBecomesAGaussian) {
  constexpr std::size_t side = 61;
  constexpr double deviation = 5;
  std::vector<std::uint8_t> plane(side * side, 0);
  // A block of 11 × 11, so that eight bits are enough to see the tails.
  for (std::size_t y = 25; y <= 35; ++y)
    for (std::size_t x = 25; x <= 35; ++x) plane[y * side + x] = 255;
  cairo::blur(plane.data(), side, side, side, deviation);
  const auto expected = [](double distance) {
    const double scale = deviation * std::sqrt(2.0);
    const double along = 0.5 * (std::erf((distance + 5.5) / scale) - std::erf((distance - 5.5) / scale));
    const double across = std::erf(5.5 / scale);
    return 255 * along * across;
  };
  for (const int distance : {0, 3, 6, 9, 12, 15})
    EXPECT_NEAR(plane[30 * side + 30 + static_cast<std::size_t>(distance)], expected(distance), 5) << distance;
}

TEST(BlurTest, ItIsSymmetricAndLeavesAFullPlaneFullInTheMiddle) {
  constexpr std::size_t side = 40;
  std::vector<std::uint8_t> plane(side * side, 255);
  cairo::blur(plane.data(), side, side, side, 3);
  EXPECT_EQ(plane[20 * side + 20], 255);
  EXPECT_EQ(plane[20 * side], plane[20 * side + side - 1]);
  EXPECT_EQ(plane[20], plane[20 * side]);
}

TEST(BlurTest, ATinyDeviationChangesNothingAndALargeOneIsSafe) {
  std::vector<std::uint8_t> plane{0, 255, 0, 0};
  cairo::blur(plane.data(), 4, 1, 4, 0.3);
  EXPECT_THAT(plane, ElementsAre(0, 255, 0, 0));
  cairo::blur(plane.data(), 4, 1, 4, 1000);
  EXPECT_THAT(plane, ElementsAre(0, 0, 0, 0));
}

}  // namespace
}  // namespace quilt::platform
