// SPDX-License-Identifier: Apache-2.0
// The theme that docs/theme-bundle.md builds.
#include <gmock/gmock.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/Program.h"

namespace quilt {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

class PlainThemeTest : public support::DocumentFixture {
 protected:
  static Path bundle() { return Path(QUILT_SOURCE_FOLDER) / "examples/themes/plain.qth"; }
};

TEST_F(PlainThemeTest, ItIsAValidTheme) {
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->identifier(), "org.quilt.theme.plain");
  EXPECT_EQ(theme->localizedName(), "Plain");
  EXPECT_EQ(theme->previewImage()->size(), (platform::Size{320, 200}));
  EXPECT_TRUE(std::filesystem::exists(theme->indexPath()));
}

TEST_F(PlainThemeTest, ItsTemplateLandsInThePackageByteByByte) {
  const auto document = made();
  ASSERT_TRUE(document->applyTheme(QuiltTheme::initWithPath(bundle()), {}));
  EXPECT_THAT(treeOf(document->path()), ElementsAre("index.html", "plain.css", "plain.js"));
  for (const char* name : {"index.html", "plain.css", "plain.js"})
    EXPECT_EQ(readFile(document->path() / name), readFile(bundle() / "Resources/Template" / name));
}

TEST_F(PlainThemeTest, ItsPageReadsTheDataThatFinalizingWrites) {
  const auto document = made();
  document->setIsProcessing(true);
  document->setType(kQuiltDocumentTypeInteractive);
  document->setTheme(QuiltTheme::initWithPath(bundle()));
  document->setIsProcessing(false);
  addWebItem(*document);
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(readFile(document->path() / "index.html"), HasSubstr("<script src=\"controllers/data.js\"></script>"));
  EXPECT_TRUE(std::filesystem::exists(document->path() / "controllers/data.js"));
}

TEST_F(PlainThemeTest, TheTutorialHasEveryFileAsItIs) {
  const std::string tutorial = readFile(Path(QUILT_SOURCE_FOLDER) / "docs/theme-bundle.md");
  for (const char* name :
       {"Info.plist", "Resources/Template/index.html", "Resources/Template/plain.css", "Resources/Template/plain.js"})
    EXPECT_THAT(tutorial, HasSubstr("\n" + readFile(bundle() / name) + "```")) << name;
}

}  // namespace
}  // namespace quilt
