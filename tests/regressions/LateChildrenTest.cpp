// SPDX-License-Identifier: Apache-2.0
// Children that arrive while their owner is flattened, finalized or converted, after its operation has counted them.
// The first one used to divide by zero and end the host.
#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using ::testing::AllOf;
using ::testing::Each;
using ::testing::Ge;
using ::testing::Le;

class LateChildrenTest : public support::DocumentFixture {
 protected:
  /// A block that calls `act` at its first report, and keeps what it was told.
  ProgressionBlock actingFirst(std::function<void()> act) {
    return [this, act = std::move(act)](double percentage) {
      values.push_back(percentage);
      if (values.size() == 1) act();
      return true;
    };
  }

  std::shared_ptr<QuiltMediaSource> pictureSource() const {
    return QuiltMediaSource::initWithPath(pictureFile(800, 600));
  }
  std::shared_ptr<QuiltMediaExtra> pictureExtra() const { return QuiltMediaExtra::initWithPath(pictureFile(800, 600)); }

  void expectWithinBounds() const { EXPECT_THAT(values, Each(AllOf(Ge(0), Le(100)))); }

  std::vector<double> values;
  const std::shared_ptr<QuiltDocument> document = made();
  const std::shared_ptr<QuiltMedia> item = addItem(*document);
};

TEST_F(LateChildrenTest, TheFirstSourceMayArriveWhileItsItemIsFlattened) {
  EXPECT_TRUE(item->flattenWithProgressionBlock(actingFirst([&] { item->addSource(pictureSource()); })));
  ASSERT_EQ(item->sourcesCount(), 1u);
  EXPECT_TRUE(item->sourceAtIndex(0)->mainDerivative()->isFlattened());
  expectWithinBounds();
}

TEST_F(LateChildrenTest, TheFirstSourceMayArriveWhileItsItemIsFinalized) {
  EXPECT_TRUE(item->finalizeWithProgressionBlock(actingFirst([&] { item->addSource(pictureSource()); })));
  EXPECT_TRUE(item->sourceAtIndex(0)->isPreviewed());
  expectWithinBounds();
}

TEST_F(LateChildrenTest, TheFirstExtraMayArriveWhileItsItemIsFlattenedOrFinalized) {
  EXPECT_TRUE(item->flattenWithProgressionBlock(actingFirst([&] { item->addExtra(pictureExtra()); })));
  EXPECT_TRUE(item->extraAtIndex(0)->mainDerivative()->isFlattened());
  expectWithinBounds();
  item->removeAllExtras();
  values.clear();
  EXPECT_TRUE(item->finalizeWithProgressionBlock(actingFirst([&] { item->addExtra(pictureExtra()); })));
  EXPECT_TRUE(item->extraAtIndex(0)->isPreviewed());
  expectWithinBounds();
}

TEST_F(LateChildrenTest, MoreSourcesAndExtrasMayArrive) {
  item->addSource(pictureSource());
  const auto more = [&] {
    for (int i = 0; i < 3; ++i) {
      item->addSource(pictureSource());
      item->addExtra(pictureExtra());
    }
  };
  EXPECT_TRUE(item->flattenWithProgressionBlock(actingFirst(more)));
  EXPECT_TRUE(item->isFlattened() || item->sourcesCount() == 4u);
  values.clear();
  EXPECT_TRUE(item->finalizeWithProgressionBlock(actingFirst(more)));
  values.clear();
  EXPECT_TRUE(item->convertToFormat(kQuiltMediaDerivativeCompatibilityTag480p, actingFirst(more)));
  expectWithinBounds();
}

TEST_F(LateChildrenTest, ADerivativeMayArriveWhileItsSourceIsFlattened) {
  const auto source = pictureSource();
  item->addSource(source);
  EXPECT_TRUE(source->flattenCopy(true, actingFirst([&] {
                                    source->addDerivative(
                                        QuiltMediaDerivative::initWithPath(pictureFile(640, 480, "late.png")));
                                  })));
  EXPECT_EQ(source->derivativeCount(), 2u);
  source->performBlockOnDerivatives([](const auto& derivative) {
    EXPECT_TRUE(derivative->isFlattened());
    return true;
  });
  expectWithinBounds();
}

TEST_F(LateChildrenTest, TheFirstItemMayArriveWhileItsDocumentIsWorkedOn) {
  const std::string lower = kQuiltMediaDerivativeCompatibilityTag480p;
  const auto empty = made("empty");
  const auto add = [&] { addPictureItem(*empty, 800, 600); };
  EXPECT_TRUE(empty->flattenWithProgressionBlock(actingFirst(add)));
  EXPECT_TRUE(empty->mediaAtIndex(0)->sourceAtIndex(0)->mainDerivative()->isFlattened());
  expectWithinBounds();
  empty->removeAllMedia();
  values.clear();
  EXPECT_TRUE(empty->finalizeWithProgressionBlock(actingFirst(add)));
  expectWithinBounds();
  values.clear();
  EXPECT_TRUE(empty->convertToFormat(lower, actingFirst(add)));
  EXPECT_EQ(empty->mediaCount(), 2u);
  expectWithinBounds();
}

TEST_F(LateChildrenTest, SourcesMayArriveWhileTheItemIsExported) {
  item->addSource(pictureSource());
  const Path exports = folder() / "exports";
  std::filesystem::create_directories(exports);
  const std::string whole = kQuiltMediaDerivativeCompatibilityTagDesktop;
  EXPECT_TRUE(item->exportToPath(exports, whole, actingFirst([&] { item->addSource(pictureSource()); })));
  EXPECT_EQ(namesIn(exports).size(), 2u);
  expectWithinBounds();
}

}  // namespace
}  // namespace quilt
