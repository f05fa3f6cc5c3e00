// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <thread>

#include "tests/support/DocumentFixture.h"

namespace quilt {
namespace {

/// What is edited while a long operation runs is saved at its end, however it ends.
class EditsDuringOperationsTest : public support::DocumentFixture {
 protected:
  EditsDuringOperationsTest() {
    addPictureItem(*document);
    EXPECT_TRUE(document->update());
  }
  /// Edits the title at the first value that is not below `from`, and answers `goesOn` then.
  ProgressionBlock editing(double from, bool goesOn) const {
    return [this, from, goesOn](double percentage) {
      if (percentage < from) return true;
      document->setTitle("Edited meanwhile");
      return goesOn;
    };
  }

  const std::shared_ptr<QuiltDocument> document = made();
};

TEST_F(EditsDuringOperationsTest, ACancelledFlattenSavesThem) {
  EXPECT_FALSE(document->flattenWithProgressionBlock(editing(0, false)));
  EXPECT_EQ(saved(*document).string("Title"), "Edited meanwhile");
}

TEST_F(EditsDuringOperationsTest, ACancelledFinalizeSavesThem) {
  EXPECT_FALSE(document->finalizeWithProgressionBlock(editing(0, false)));
  EXPECT_EQ(saved(*document).string("Title"), "Edited meanwhile");
}

TEST_F(EditsDuringOperationsTest, AFailedFinalizeSavesThem) {
  document->setType(kQuiltDocumentTypeInteractive);  // without a theme
  EXPECT_FALSE(document->finalizeWithProgressionBlock(editing(0, true)));
  EXPECT_EQ(saved(*document).string("Title"), "Edited meanwhile");
}

TEST_F(EditsDuringOperationsTest, AnEditAtTheLastReportIsSavedToo) {
  EXPECT_TRUE(document->flattenWithProgressionBlock(editing(100, true)));
  EXPECT_EQ(saved(*document).string("Title"), "Edited meanwhile");
}

TEST_F(EditsDuringOperationsTest, AnOperationThatFailsWithoutEditsWritesNothing) {
  const std::string before = readFile(document->propertiesPath());
  clock().advance(std::chrono::hours(1));
  EXPECT_FALSE(document->flattenWithProgressionBlock([](double percentage) { return percentage > 0; }));
  EXPECT_EQ(readFile(document->propertiesPath()), before);
}

}  // namespace
}  // namespace quilt
