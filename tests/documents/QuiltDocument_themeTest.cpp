// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <sys/stat.h>

#include "quilt/documents/QuiltDocument.h"
#include "tests/support/DocumentFixture.h"
#include "tests/support/FaultyServices.h"

namespace quilt {
namespace {

using platform::ErrorKind;
using platform::ScopedService;
using platform::Services;
using support::critical;
using support::debug;
using support::Installed;
using support::Line;
using support::Lines;
using support::Progress;
using support::warning;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

/// Lists folders sorted, so that a test knows the order, and fails the operations that it names.
class SortedThemeFiles final : public platform::ForwardingFileManager {
 public:
  SortedThemeFiles() : ForwardingFileManager(platform::services().files) {}

  support::FailsAt failList, failCopy, failRemove;
  ErrorKind removal = ErrorKind::PermissionDenied;

  platform::Result<std::vector<std::string>> contentsOfDirectoryAtPath(const Path& path) const override {
    if (support::fails(failList, path)) return support::kFault;
    auto names = ForwardingFileManager::contentsOfDirectoryAtPath(path);
    if (names) std::sort(names->begin(), names->end());
    return names;
  }
  platform::Result<void> copyItem(const Path& source, const Path& destination) override {
    if (support::fails(failCopy, destination)) return support::kFault;
    return ForwardingFileManager::copyItem(source, destination);
  }
  platform::Result<void> removeItem(const Path& path, const Path& within) override {
    if (support::fails(failRemove, path)) return platform::Error{removal, "Permission was refused.", path};
    return ForwardingFileManager::removeItem(path, within);
  }
};

class QuiltDocumentThemeTest : public support::DocumentFixture {
 protected:
  /// A theme with these files in its template.
  std::shared_ptr<QuiltTheme> themeWith(const std::vector<std::string>& files) const {
    const Path bundle = themeBundle("Plain");
    std::filesystem::remove_all(bundle / "Resources/Template");
    std::filesystem::create_directories(bundle / "Resources/Template");
    for (const std::string& file : files) writeFile(bundle / "Resources/Template" / file, file);
    return QuiltTheme::initWithPath(bundle);
  }
  Path templateFolder() const { return folder() / "Plain.qth/Resources/Template"; }

  /// Applies the theme and keeps the values that its block got.
  bool apply(const std::shared_ptr<QuiltTheme>& theme) {
    takeLines();
    return document->applyTheme(theme, progress.block());
  }
  std::vector<std::string> entries() const { return treeOf(document->path()); }

  Line failed(const std::string& error) const {
    return critical("Failed to apply theme \"Plain\" on document at path \"" + document->path().native() + "\": \"" +
                    error + "\"");
  }
  Line notCopied(const std::string& name, const std::string& error) const {
    return debug("Failed to copy \"" + (templateFolder() / name).native() + "\" to \"" +
                 (document->path() / name).native() + "\": \"" + error + "\"");
  }

  const Installed<SortedThemeFiles> files{&Services::files};
  const std::shared_ptr<QuiltDocument> document = made();
  Progress progress;
};

// What is copied

TEST_F(QuiltDocumentThemeTest, TheTemplatesEntriesLieBesideTheDocumentsOwn) {
  writeFile(document->path() / "properties.plist", "mine");
  EXPECT_TRUE(apply(themeWith({"index.html", "css/a.css", "css/deep/b.css", ".hidden"})));
  EXPECT_THAT(entries(), ElementsAre(".hidden", "css/", "css/a.css", "css/deep/", "css/deep/b.css", "index.html",
                                     "properties.plist"));
  EXPECT_EQ(readFile(document->path() / "css/deep/b.css"), "css/deep/b.css");
  EXPECT_THAT(takeLines(), IsEmpty());
  EXPECT_FALSE(document->isProcessing());
}

TEST_F(QuiltDocumentThemeTest, NeitherThemeNorPropertiesOfTheDocumentAreTouched) {
  const auto theme = themeWith({"index.html"});
  EXPECT_TRUE(apply(theme));
  EXPECT_EQ(document->theme(), nullptr);
  EXPECT_FALSE(std::filesystem::exists(document->propertiesPath()));
}

TEST_F(QuiltDocumentThemeTest, AnotherThemeReplacesTheFirstOnesFiles) {
  EXPECT_TRUE(apply(themeWith({"index.html", "old/a.js", "shared.css"})));
  EXPECT_TRUE(apply(themeWith({"index.html", "new.js"})));
  EXPECT_THAT(entries(), ElementsAre("index.html", "new.js"));
}

TEST_F(QuiltDocumentThemeTest, TheDataScriptsFolderGoesBeforeTheCopy) {
  writeFile(document->dataControllerPath(), "var appData = {};");
  writeFile(document->localizationControllerPath(), "old");
  EXPECT_TRUE(apply(themeWith({"controllers/player.js", "index.html"})));
  EXPECT_THAT(entries(), ElementsAre("controllers/", "controllers/player.js", "index.html"));
}

TEST_F(QuiltDocumentThemeTest, TheLocalizationHookSucceedsAndWritesNothing) {
  const auto theme = themeWith({"index.html"});
  EXPECT_TRUE(document->generateLocalizationControllerFromTheme(theme));
  EXPECT_TRUE(document->generateLocalizationControllerFromTheme(nullptr));
  EXPECT_THAT(entries(), IsEmpty());
}

// What removal keeps

TEST_F(QuiltDocumentThemeTest, TheDocumentsOwnEntriesAreNeverRemoved) {
  for (const char* kept : {"properties.plist", "media/a", "poster.png", "JukeboxMetadata.plist", "JukeboxArtwork",
                           "data.js", "Glance/Thumbnail.png"})
    writeFile(document->path() / kept, "mine");
  for (const char* removed : {"index.html", "controllers/data.js", "Properties.plist", "media2/a", "poster.png.bak",
                              ".hidden", "glance", "Media/x"})
    writeFile(document->path() / removed, "the theme's");
  EXPECT_TRUE(document->removeTheme());
  EXPECT_THAT(entries(), ElementsAre("Glance/", "Glance/Thumbnail.png", "JukeboxArtwork", "JukeboxMetadata.plist",
                                     "data.js", "media/", "media/a", "poster.png", "properties.plist"));
}

TEST_F(QuiltDocumentThemeTest, RemovingFromAnEmptyPackageSucceeds) {
  takeLines();
  EXPECT_TRUE(document->removeTheme());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, RemovalFollowsNoLink) {
  writeFile(folder() / "outside/a", "precious");
  std::filesystem::create_directory_symlink(folder() / "outside", document->path() / "link");
  std::filesystem::create_symlink("nowhere", document->path() / "dangling");
  EXPECT_TRUE(document->removeTheme());
  EXPECT_THAT(entries(), IsEmpty());
  EXPECT_EQ(readFile(folder() / "outside/a"), "precious");
}

TEST_F(QuiltDocumentThemeTest, AnEntryThatGoesAwayByItselfIsNoTrouble) {
  writeFile(document->path() / "index.html", "x");
  files->failRemove = support::anyPath();
  files->removal = ErrorKind::NotFound;
  takeLines();
  EXPECT_TRUE(document->removeTheme());
  EXPECT_THAT(takeLines(), IsEmpty());
}

// Progress

TEST_F(QuiltDocumentThemeTest, FourEntriesAreReportedByQuarters) {
  EXPECT_TRUE(apply(themeWith({"a", "b/x", "c", "d"})));
  EXPECT_THAT(progress.values, ElementsAre(0, 25, 50, 75, 100));
}

TEST_F(QuiltDocumentThemeTest, ThreeEntriesAreReportedByIntegerQuotients) {
  EXPECT_TRUE(apply(themeWith({"a", "b", "c"})));
  EXPECT_THAT(progress.values, ElementsAre(0, 33, 66, 100));
}

TEST_F(QuiltDocumentThemeTest, AnEmptyTemplateReportsItsEndOnly) {
  writeFile(document->path() / "index.html", "of the theme before");
  EXPECT_TRUE(apply(themeWith({})));
  EXPECT_THAT(progress.values, ElementsAre(100));
  EXPECT_THAT(entries(), IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, TheAnswerToTheLastCallHasNoEffect) {
  progress.cancelFrom = 1;
  EXPECT_TRUE(apply(themeWith({"a"})));
  EXPECT_THAT(progress.values, ElementsAre(0, 100));
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, AnEmptyBlockGoesOn) { EXPECT_TRUE(document->applyTheme(themeWith({"a"}), {})); }

// Cancelling

TEST_F(QuiltDocumentThemeTest, ACancellationAtTheSecondEntryLeavesTheFirstInThePackage) {
  writeFile(document->path() / "old.html", "of the theme before");
  progress.cancelFrom = 1;
  EXPECT_FALSE(apply(themeWith({"a", "b", "c"})));
  EXPECT_THAT(progress.values, ElementsAre(0, 33));
  EXPECT_THAT(entries(), ElementsAre("a"));
  EXPECT_EQ(takeLines(), Lines{critical("Theme \"Plain\" appliance on document at path \"" + document->path().native() +
                                        "\" has been cancelled")});
}

TEST_F(QuiltDocumentThemeTest, ACancellationAtTheFirstEntryLeavesNoTheme) {
  writeFile(document->path() / "old.html", "of the theme before");
  progress.cancelFrom = 0;
  EXPECT_FALSE(apply(themeWith({"a", "b"})));
  EXPECT_THAT(progress.values, ElementsAre(0));
  EXPECT_THAT(entries(), IsEmpty());
}

// Failures

TEST_F(QuiltDocumentThemeTest, APackageThatCannotBeListedFails) {
  const auto theme = themeWith({"a"});
  files->failList = [&](const Path& path) { return path == document->path(); };
  const Line unlisted = critical("Failed to get content of document at path \"" + document->path().native() +
                                 "\": \"The disk is full.\"");
  takeLines();
  EXPECT_FALSE(document->removeTheme());
  EXPECT_EQ(takeLines(), Lines{unlisted});
  EXPECT_FALSE(apply(theme));
  EXPECT_EQ(takeLines(), (Lines{unlisted, failed("(null)"), unlisted}));
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, AnOldEntryThatCannotBeRemovedIsAWarningAndStays) {
  writeFile(document->path() / "a", "old");
  writeFile(document->path() / "b", "old");
  files->failRemove = support::named("a");
  takeLines();
  EXPECT_TRUE(document->removeTheme());
  EXPECT_EQ(takeLines(), Lines{warning("Failed to remove current theme element \"@\": \"" +
                                       (document->path() / "a").native() + "\"")});
  EXPECT_THAT(entries(), ElementsAre("a"));
}

TEST_F(QuiltDocumentThemeTest, ACopyOntoAnEntryThatCouldNotBeRemovedFails) {
  writeFile(document->path() / "b", "old");
  files->failRemove = support::named("b");
  EXPECT_FALSE(apply(themeWith({"a", "b"})));
  const Line stuck =
      warning("Failed to remove current theme element \"@\": \"" + (document->path() / "b").native() + "\"");
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 4u);
  EXPECT_EQ(lines[0], stuck);
  EXPECT_THAT(lines[1].text, StartsWith("Failed to copy \"" + (templateFolder() / "b").native() + "\""));
  EXPECT_EQ(lines[3], stuck);
  EXPECT_THAT(entries(), ElementsAre("b"));
  EXPECT_EQ(readFile(document->path() / "b"), "old");
}

TEST_F(QuiltDocumentThemeTest, ATemplateThatCannotBeListedFailsAndLeavesNoTheme) {
  const auto theme = themeWith({"a"});
  writeFile(document->path() / "old.html", "of the theme before");
  files->failList = [&](const Path& path) { return path == templateFolder(); };
  EXPECT_FALSE(apply(theme));
  EXPECT_EQ(takeLines(), (Lines{debug("Failed to get content of theme at path \"" + templateFolder().native() +
                                      "\": \"The disk is full.\""),
                                failed("The disk is full.")}));
  EXPECT_THAT(entries(), IsEmpty());
  EXPECT_THAT(progress.values, IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, AThemeWithoutATemplateFails) {
  const auto theme = themeWith({});
  std::filesystem::remove(templateFolder());
  EXPECT_FALSE(apply(theme));
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 2u);
  EXPECT_THAT(lines[0].text, StartsWith("Failed to get content of theme at path \"(null)\": \""));
  EXPECT_EQ(lines[0].level, platform::LogLevel::Debug);
}

TEST_F(QuiltDocumentThemeTest, NoThemeAtAllFails) {
  EXPECT_FALSE(apply(nullptr));
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 2u);
  EXPECT_THAT(lines[1].text, StartsWith("Failed to apply theme \"(null)\" on document at path \""));
}

TEST_F(QuiltDocumentThemeTest, AnEntryThatCannotBeCopiedTakesTheOthersAway) {
  files->failCopy = support::named("b");
  EXPECT_FALSE(apply(themeWith({"a", "b", "c"})));
  EXPECT_EQ(takeLines(), (Lines{notCopied("b", "The disk is full."), failed("The disk is full.")}));
  EXPECT_THAT(entries(), IsEmpty());
  EXPECT_THAT(progress.values, ElementsAre(0, 33));
}

TEST_F(QuiltDocumentThemeTest, TheDocumentsOwnEntriesAreNoPlaceForATemplates) {
  for (const char* name : {"Glance", "poster.png"}) {
    writeFile(document->path() / name, "mine");
    EXPECT_FALSE(apply(themeWith({name, "index.html"}))) << name;
    const Lines lines = takeLines();
    ASSERT_EQ(lines.size(), 2u) << name;
    EXPECT_THAT(lines[0].text, StartsWith("Failed to copy \"" + (templateFolder() / name).native() + "\" to \""));
    EXPECT_THAT(entries(), ElementsAre(name));
    EXPECT_EQ(readFile(document->path() / name), "mine");
    std::filesystem::remove(document->path() / name);
  }
}

// What a template must not hold

TEST_F(QuiltDocumentThemeTest, LinksAreRefusedByName) {
  writeFile(folder() / "outside/secret", "secret");
  for (const char* place : {"link", "deep/er/link"}) {
    const auto theme = themeWith({"deep/er/file"});
    std::filesystem::create_symlink(folder() / "outside/secret", templateFolder() / place);
    EXPECT_FALSE(apply(theme)) << place;
    const std::string top = *Path(place).begin();
    EXPECT_EQ(takeLines(), (Lines{notCopied(top, "A theme may not hold symbolic links."),
                                  failed("A theme may not hold symbolic links.")}));
    EXPECT_THAT(entries(), IsEmpty()) << place;
  }
}

TEST_F(QuiltDocumentThemeTest, ATemplateThatIsItselfALinkIsRefused) {
  const auto theme = themeWith({});
  writeFile(folder() / "outside/secret", "secret");
  std::filesystem::remove(templateFolder());
  std::filesystem::create_directory_symlink(folder() / "outside", templateFolder());
  EXPECT_FALSE(apply(theme));
  EXPECT_THAT(takeLines(), Contains(notCopied("secret", "A theme may not hold symbolic links.")));
  EXPECT_THAT(entries(), IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, ABundleThatIsReachedThroughALinkIsAnOrdinaryTheme) {
  themeWith({"index.html"});
  std::filesystem::create_directory_symlink(folder() / "Plain.qth", folder() / "Linked.qth");
  EXPECT_TRUE(apply(QuiltTheme::initWithPath(folder() / "Linked.qth")));
  EXPECT_THAT(entries(), ElementsAre("index.html"));
}

TEST_F(QuiltDocumentThemeTest, PipesAreRefused) {
  const auto theme = themeWith({"deep/file"});
  ASSERT_EQ(0, mkfifo((templateFolder() / "deep/pipe").c_str(), 0600));
  EXPECT_FALSE(apply(theme));
  const Lines lines = takeLines();
  ASSERT_EQ(lines.size(), 2u);
  EXPECT_THAT(lines[0].text, StartsWith("Failed to copy \"" + (templateFolder() / "deep").native() + "\" to \""));
  EXPECT_THAT(entries(), IsEmpty());
}

TEST_F(QuiltDocumentThemeTest, ADeepTreeIsCopiedWhole) {
  std::string deep;
  for (int i = 0; i < 100; ++i) deep += "d/";
  EXPECT_TRUE(apply(themeWith({deep + "leaf"})));
  EXPECT_EQ(readFile(document->path() / deep / "leaf"), deep + "leaf");
}

TEST_F(QuiltDocumentThemeTest, ATreeTooDeepToCopyIsRefused) {
  const auto theme = themeWith({});
  Path deep = templateFolder();
  for (int i = 0; i < 300; ++i) deep /= "d";
  std::filesystem::create_directories(deep);
  EXPECT_FALSE(apply(theme));
  EXPECT_THAT(entries(), IsEmpty());
}

}  // namespace
}  // namespace quilt
