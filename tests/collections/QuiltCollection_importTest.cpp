// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include "quilt/collections/QuiltCollection.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/MediaFixtures.h"

namespace quilt {
namespace {

class QuiltCollectionImportTest : public support::DocumentFixture {
 protected:
  /// A sound that says what it is.
  static Path describedSound() {
    support::MediaSpec spec = support::m4aSound();
    spec.tags = {{"title", "Waves"}, {"artist", "Ann"}, {"description", "The sea at night"}};
    return support::makeMedia(spec);
  }

  const std::shared_ptr<QuiltCollection> collection = QuiltCollection::initWithPath(folder() / "collection");
};

TEST_F(QuiltCollectionImportTest, WhatAFileSaysOfItselfIsTakenOver) {
  const auto document = collection->importDocumentFromPath(describedSound(), {});
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(document->title(), "Waves");
  EXPECT_EQ(document->author(), "Ann");
  EXPECT_EQ(document->description(), "The sea at night");
  const auto again = reopened(*document);
  ASSERT_NE(again, nullptr);
  EXPECT_EQ(again->description(), "The sea at night");
  const auto item = again->mediaAtIndex(0);
  ASSERT_NE(item, nullptr);
  EXPECT_EQ(item->title(), "Waves");
  EXPECT_EQ(item->description(), "The sea at night");
}

/// A package lies where the import is to make one: whatever becomes of the import, it is not its to delete.
class QuiltCollectionImportOverPackageTest : public QuiltCollectionImportTest,
                                             public ::testing::WithParamInterface<double> {};

TEST_P(QuiltCollectionImportOverPackageTest, ACancelledImportLeavesThePackageThatWasThere) {
  const Path package = collection->path() / "given.qpk";
  {
    const auto before = QuiltDocument::initWithPath(package);
    ASSERT_NE(before, nullptr);
    before->setUuid("given");
    before->setTitle("Mine");
    addPictureItem(*before);
    ASSERT_TRUE(before->flattenWithProgressionBlock({}));
  }
  const auto cancel = [](double percentage) { return percentage < GetParam(); };
  EXPECT_EQ(collection->importDocumentFromPath(describedSound(), "given", cancel), nullptr);
  EXPECT_EQ(collection->documentsCount(), 0u);
  const auto after = QuiltDocument::initWithPath(package);
  ASSERT_NE(after, nullptr);
  const auto item = after->mediaAtIndex(0);
  ASSERT_NE(item, nullptr);
  const auto main = item->sourceAtIndex(0)->mainDerivative();
  ASSERT_NE(main, nullptr);
  EXPECT_TRUE(std::filesystem::exists(main->url()->relativePath()));
}

INSTANTIATE_TEST_SUITE_P(At, QuiltCollectionImportOverPackageTest, ::testing::Values(10, 11),
                         [](const auto& info) { return std::to_string(static_cast<int>(info.param)); });

}  // namespace
}  // namespace quilt
