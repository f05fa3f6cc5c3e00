// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

using MergeIntoItselfTest = support::DocumentFixture;

// The walk over the items never ended, because each copy lay ahead of it.
TEST_F(MergeIntoItselfTest, ADocumentIsLeftAsItIs) {
  const auto document = made();
  document->setTitle("Tales");
  addWebItem(*document);
  const std::string before = readFile(document->propertiesPath());
  clock().advance(std::chrono::hours(1));
  takeLines();

  EXPECT_TRUE(document->mergeIntoDocument(document, {}, {}));

  EXPECT_EQ(document->mediaCount(), 1u);
  EXPECT_FALSE(document->isProcessing());
  EXPECT_EQ(readFile(document->propertiesPath()), before);
  EXPECT_EQ(takeLines(), support::Lines{support::critical(
                             "Failed to import document \"Tales\": \"There is no other document to import it "
                             "into\"")});
}

TEST_F(MergeIntoItselfTest, NoDocumentIsNoCrash) {
  const auto document = made();
  addWebItem(*document);
  takeLines();
  EXPECT_TRUE(document->mergeIntoDocument(nullptr, {}, {}));
  EXPECT_EQ(takeProblems().size(), 1u);
}

}  // namespace
}  // namespace quilt
