// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/platform/base/Geometry.h"

namespace quilt::platform {
namespace {

TEST(GeometryTest, FitKeepsTheAspectRatioAndTouchesTheNearerSides) {
  EXPECT_EQ(FDYFitSizeToSize({1920, 1080}, {512, 512}), (Size{512, 288}));
  EXPECT_EQ(FDYFitSizeToSize({100, 400}, {512, 512}), (Size{128, 512}));
}

TEST(GeometryTest, FillIsTheLargestCentredPart) {
  EXPECT_EQ(FDYFillSizeToSize({1920, 1080}, {256, 256}), (Rect{420, 0, 1080, 1080}));
  EXPECT_EQ(FDYFillSizeToSize({100, 400}, {512, 256}), (Rect{0, 175, 100, 50}));
}

TEST(GeometryTest, AnEmptySizeGivesAnEmptyAnswer) {
  EXPECT_EQ(FDYFitSizeToSize({0, 10}, {512, 512}), (Size{}));
  EXPECT_EQ(FDYFillSizeToSize({10, 0}, {512, 512}), (Rect{}));
}

}  // namespace
}  // namespace quilt::platform
