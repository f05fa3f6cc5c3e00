// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"
#include "tests/support/QuiltProgram.h"

namespace quilt {
namespace {

using support::FaultyFiles;
using support::Installed;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

/// Finalizing clears the top of a package for the theme: what a user put there is named first.
class ForeignEntriesTest : public support::DocumentFixture {
 protected:
  ForeignEntriesTest() {
    document->setType(kQuiltDocumentTypeInteractive);
    document->setTheme(QuiltTheme::initWithPath(themeBundle()));
    EXPECT_TRUE(document->finalizeWithProgressionBlock({}));
    takeLines();
  }

  const std::shared_ptr<QuiltDocument> document = made();
};

TEST_F(ForeignEntriesTest, ATwiceFinalizedDocumentHoldsNone) {
  EXPECT_THAT(document->entriesNoThemeBrought(), IsEmpty());
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  EXPECT_THAT(takeProblems(), IsEmpty());
  EXPECT_THAT(QuiltDocument::entriesNoThemeBrought(document->path()), IsEmpty());
}

TEST_F(ForeignEntriesTest, FilesOfAUserAreNamedBeforeTheyGo) {
  writeFile(document->path() / "notes.txt", "mine");
  writeFile(document->path() / ".git/HEAD", "ref");
  EXPECT_THAT(document->entriesNoThemeBrought(), ElementsAre(".git", "notes.txt"));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  const std::string line = "Finalizing document at path \"" + document->path().native() + "\" deletes \"";
  EXPECT_EQ(takeProblems(), (support::Lines{support::warning(line + ".git\", which no theme brought"),
                                            support::warning(line + "notes.txt\", which no theme brought")}));
}

TEST_F(ForeignEntriesTest, TheFilesOfAThemeBeforeAreATheme) {
  writeFile(themeBundle("Second") / "Resources/Template/second.css", "p {}");
  document->setTheme(QuiltTheme::initWithPath(folder() / "Second.qth"));
  ASSERT_TRUE(document->finalizeWithProgressionBlock({}));
  std::filesystem::remove_all(folder() / "Second.qth");
  const auto again = reopened(*document);
  again->setTheme(QuiltTheme::initWithPath(themeBundle()));
  EXPECT_THAT(again->entriesNoThemeBrought(), IsEmpty());
}

TEST_F(ForeignEntriesTest, TheDataScriptDoesNotTellTheThemesEntries) {
  EXPECT_TRUE(saved(*document).contains("ThemeEntries"));
  EXPECT_THAT(readFile(document->dataControllerPath()), Not(HasSubstr("ThemeEntries")));
}

TEST_F(ForeignEntriesTest, AThemeWhoseTemplateIsGoneLeavesThePlayerThatIsThere) {
  std::filesystem::remove_all(themeBundle() / "Resources/Template");
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  EXPECT_TRUE(std::filesystem::exists(document->path() / "index.html"));
  EXPECT_TRUE(std::filesystem::exists(document->dataControllerPath()));
}

TEST_F(ForeignEntriesTest, AThemeThatHoldsALinkLeavesThePlayerThatIsThere) {
  std::filesystem::create_symlink("/etc/passwd", themeBundle() / "Resources/Template/link");
  EXPECT_FALSE(document->finalizeWithProgressionBlock({}));
  EXPECT_TRUE(std::filesystem::exists(document->path() / "index.html"));
}

using ForeignEntriesProgramTest = support::QuiltProgramTest;

TEST_F(ForeignEntriesProgramTest, TheProgramRefusesToDeleteThemWithoutForce) {
  const std::string theme = std::string(QUILT_SOURCE_FOLDER) + "/quilt/resources/themes/olive.qth";
  const std::filesystem::path package = quiltJson({"new", "document", "Talk"})["result"]["path"].get<std::string>();
  ASSERT_EQ(0, quilt({"set", "Talk", "theme=" + theme}).exit);
  ASSERT_EQ(0, quilt({"finalize", "Talk"}).exit);
  write(package / "notes.txt", "mine");
  EXPECT_THAT(quilt({"check"}).out, HasSubstr("notes.txt"));
  const std::filesystem::path output = folder() / "output";
  for (const Arguments& arguments : {Arguments{"finalize", "Talk"}, Arguments{"export", "Talk", output}}) {
    const support::Ended run = quilt(arguments);
    EXPECT_EQ(2, run.exit);
    EXPECT_THAT(run.err, HasSubstr("\"notes.txt\""));
    EXPECT_EQ("mine", read(package / "notes.txt"));
  }
  EXPECT_EQ(0, quilt({"finalize", "Talk", "--force"}).exit);
  EXPECT_FALSE(std::filesystem::exists(package / "notes.txt"));
  EXPECT_EQ(0, quilt({"export", "Talk", output}).exit);
}

}  // namespace
}  // namespace quilt
