// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"
#include "tests/support/MediaFixtures.h"

namespace quilt {
namespace {

using ::testing::HasSubstr;
using ::testing::NotNull;

/// A source's reload takes nothing away before the new file is in its place.
class ReloadedSourceTest : public support::DocumentFixture {
 protected:
  ReloadedSourceTest() {
    addPictureItem(*document, 8, 8);
    EXPECT_TRUE(document->flattenWithProgressionBlock({}));
    takeLines();
  }
  std::shared_ptr<QuiltMediaSource> source() const { return document->mediaAtIndex(0)->sourceAtIndex(0); }
  Path file() const { return source()->mainDerivative()->url()->relativePath(); }

  const std::shared_ptr<QuiltDocument> document = made();
};

TEST_F(ReloadedSourceTest, AFileThatCannotServeLeavesTheOldOneOnDiskAndSaysSo) {
  const Path old = file();
  source()->reloadWithFileAtPath(writeFile(folder() / "notes.txt", "text"), {});
  EXPECT_EQ(source()->derivativeCount(), 0u);
  EXPECT_TRUE(std::filesystem::exists(old));
  const support::Lines problems = takeProblems();
  ASSERT_EQ(problems.size(), 1u);
  EXPECT_THAT(problems[0].text, HasSubstr(old.native()));
}

TEST_F(ReloadedSourceTest, ACopyThatIsCancelledLeavesTheOldOneOnDisk) {
  const Path old = file();
  source()->reloadWithFileAtPath(pictureFile(16, 16), [](double percentage) { return percentage < 20; });
  EXPECT_TRUE(std::filesystem::exists(old));
  EXPECT_FALSE(source()->mainDerivative()->isFlattened());
}

TEST_F(ReloadedSourceTest, ItsOwnFileCanBeReloaded) {
  const Path old = file();
  source()->reloadWithFileAtPath(old, {});
  ASSERT_THAT(source()->mainDerivative(), NotNull());
  EXPECT_TRUE(std::filesystem::exists(file()));
  EXPECT_NE(file(), old);
  EXPECT_FALSE(std::filesystem::exists(old));
}

TEST_F(ReloadedSourceTest, TheOldFileIsThereUntilTheNewOneIs) {
  const Path old = file();
  bool wasThere = true;
  source()->reloadWithFileAtPath(pictureFile(16, 16), [&](double percentage) {
    if (percentage < 100) wasThere = wasThere && std::filesystem::exists(old);
    return true;
  });
  EXPECT_TRUE(wasThere);
  EXPECT_FALSE(std::filesystem::exists(old));
  EXPECT_EQ(source()->derivativeCount(), 1u);
}

TEST_F(ReloadedSourceTest, TheItemsPosterIsDrawnAnew) {
  const auto item = document->mediaAtIndex(0);
  ASSERT_EQ(item->posterImage()->size().width, 8);
  source()->reloadWithFileAtPath(pictureFile(16, 16), {});
  EXPECT_EQ(item->posterImage()->size().width, 16);
}

}  // namespace
}  // namespace quilt
