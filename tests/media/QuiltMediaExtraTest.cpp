// SPDX-License-Identifier: Apache-2.0
#include "quilt/media/QuiltMediaExtra.h"

#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using ::testing::IsEmpty;

class QuiltMediaExtraTest : public support::DocumentFixture {};

TEST_F(QuiltMediaExtraTest, ItsPlaceIsInTheExtrasFolder) {
  const auto document = made();
  const auto item = addItem(*document);
  const auto extra = QuiltMediaExtra::init();
  EXPECT_EQ(extra->path(), Path()) << "no item";
  item->addExtra(extra);
  EXPECT_EQ(extra->path(), item->extrasFolderPath() / extra->uuid());
  EXPECT_EQ(extra->derivativesFolderPath().parent_path(), extra->path());
}

TEST_F(QuiltMediaExtraTest, WithoutADocumentItHasNoPlaceAlthoughItHasAnItem) {
  const auto document = made();
  const auto item = addItem(*document);
  const auto extra = QuiltMediaExtra::init();
  item->addExtra(extra);
  item->setDocumentOwner(nullptr);
  EXPECT_EQ(extra->mediaOwner(), item);
  EXPECT_EQ(extra->path(), Path());
}

TEST_F(QuiltMediaExtraTest, ItIsMadeOfAFileAndOfARecordLikeASource) {
  const Path file = pictureFile(32, 24);
  const auto extra = QuiltMediaExtra::initWithPath(file);
  ASSERT_NE(extra, nullptr);
  EXPECT_EQ(extra->contentCategory(), "Image");
  EXPECT_EQ(extra->derivativeCount(), 1u);
  EXPECT_EQ(QuiltMediaExtra::initWithURL(platform::Url::fileUrl(file))->contentCategory(), "Image");

  const auto item = QuiltMedia::init();
  const auto again = QuiltMediaExtra::initWithDictionary(extra->dictionary(), item);
  ASSERT_NE(again, nullptr);
  EXPECT_EQ(again->uuid(), extra->uuid());
  EXPECT_EQ(again->derivativeCount(), 1u);
}

TEST_F(QuiltMediaExtraTest, ItIsFlattenedIntoItsOwnFolder) {
  const auto document = made();
  const auto item = addItem(*document);
  const auto extra = QuiltMediaExtra::initWithPath(pictureFile(32, 24));
  item->addExtra(extra);
  takeLines();
  EXPECT_TRUE(item->flattenWithProgressionBlock([](double) { return true; }));
  EXPECT_TRUE(extra->derivativeAtIndex(0)->url()->relativePath().native().starts_with(extra->path().native() + "/"));
  EXPECT_THAT(takeProblems(), IsEmpty());
}

}  // namespace
}  // namespace quilt
