// SPDX-License-Identifier: Apache-2.0
// Edits that are made while a long operation runs are saved, however it ends.
#include <gtest/gtest.h>

#include <stdexcept>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

class EditsMeanwhileTest : public support::DocumentFixture {
 protected:
  EditsMeanwhileTest() { addPictureItem(*document, 800, 600); }

  /// A block that edits the document at the first report and then answers as it is told.
  ProgressionBlock editing(std::function<bool()> answer) {
    return [this, answer = std::move(answer)](double) {
      if (++_reports != 2) return true;  // the first comes before the document is busy
      document->setTitle("Meanwhile");
      addWebItem(*document, "Late");
      return answer();
    };
  }

  void expectSaved() {
    EXPECT_FALSE(document->isProcessing());
    EXPECT_EQ(saved(*document).string("Title"), "Meanwhile");
    const auto again = reopened(*document);
    ASSERT_NE(again, nullptr);
    EXPECT_EQ(again->mediaCount(), 2u);
  }

  const std::shared_ptr<QuiltDocument> document = made();

 private:
  int _reports = 0;
};

TEST_F(EditsMeanwhileTest, WhenTheOperationSucceeds) {
  EXPECT_TRUE(document->flattenWithProgressionBlock(editing([] { return true; })));
  expectSaved();
}

TEST_F(EditsMeanwhileTest, WhenItIsCancelled) {
  EXPECT_FALSE(document->flattenWithProgressionBlock(editing([] { return false; })));
  expectSaved();
}

TEST_F(EditsMeanwhileTest, WhenItFails) {
  EXPECT_FALSE(document->flattenWithProgressionBlock(editing([this] {
    std::filesystem::remove(folder() / "800x600.png");
    std::filesystem::remove(folder() / "picture.png");
    return true;
  })));
  expectSaved();
}

TEST_F(EditsMeanwhileTest, WhenTheHostThrows) {
  EXPECT_THROW(document->flattenWithProgressionBlock(editing([]() -> bool { throw std::runtime_error("host"); })),
               std::runtime_error);
  expectSaved();
}

TEST_F(EditsMeanwhileTest, WhenFinalizeIsCancelled) {
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  EXPECT_FALSE(document->finalizeWithProgressionBlock(editing([] { return false; })));
  expectSaved();
}

TEST_F(EditsMeanwhileTest, WhenTheyAreMadeAtTheLastReport) {
  EXPECT_TRUE(document->flattenWithProgressionBlock([this](double percentage) {
    if (percentage == 100) document->setTitle("Last");
    return true;
  }));
  EXPECT_EQ(saved(*document).string("Title"), "Last");
}

TEST_F(EditsMeanwhileTest, AnOperationWithoutEditsSavesOnce) {
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  const auto modified = document->modifiedDate();
  clock().advance(std::chrono::hours(1));
  ASSERT_TRUE(document->flattenWithProgressionBlock({}));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_EQ(document->modifiedDate(), modified) << "neither stamps the document";
}

TEST_F(EditsMeanwhileTest, ALoadIsNoEdit) {
  ASSERT_TRUE(document->update());
  const std::string before = readFile(document->propertiesPath());
  clock().advance(std::chrono::hours(1));
  ASSERT_NE(reopened(*document), nullptr);
  EXPECT_EQ(readFile(document->propertiesPath()), before);
}

}  // namespace
}  // namespace quilt
