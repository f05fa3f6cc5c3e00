// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/bundles/FolderBundles.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "quilt/platform/files/PosixFileManager.h"
#include "quilt/platform/interfaces/Services.h"
#include "quilt/platform/plist/XmlPropertyLists.h"
#include "tests/support/Environment.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using support::Environment;
using support::writePlainly;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
namespace fs = std::filesystem;

class FolderBundlesTest : public ::testing::Test {
 protected:
  /// A bundle whose metadata lies in `inside` of its folder.
  std::shared_ptr<Bundle> bundle(const fs::path& inside = {}, const std::string& title = "Plain") const {
    writePlainly(scratch / "a.qth" / inside / "Info.plist",
                 XmlPropertyLists().serialize(Dictionary{{kBundleDisplayNameKey, title}, {"Number", 7}}));
    return bundles.bundleWithPath(scratch / "a.qth");
  }

  fs::path addFolder(const fs::path& path) const {
    fs::create_directories(scratch / path);
    return scratch / path;
  }

  std::vector<fs::path> found(bool includingApplication = false, std::string_view extension = "qth") const {
    return bundles.findAllLibraryBundlePaths("Themes", extension, includingApplication);
  }

  const support::ScratchFolder scratch;
  const FolderBundles bundles{scratch / "app"};
  const ScopedService<FileManager> files{&Services::files, std::make_shared<PosixFileManager>()};
  const ScopedService<PropertyLists> lists{&Services::propertyLists, std::make_shared<XmlPropertyLists>()};
  const Environment home{"XDG_DATA_HOME", (scratch / "user").c_str()};
  const Environment shared{"XDG_DATA_DIRS",
                           ((scratch / "local").native() + "::" + (scratch / "system").native()).c_str()};
};

TEST_F(FolderBundlesTest, ABundleIsAFolder) {
  EXPECT_EQ(scratch / "a.qth", bundle()->path());
  writePlainly(scratch / "file.qth", "x");
  EXPECT_EQ(nullptr, bundles.bundleWithPath(scratch / "file.qth"));
  EXPECT_EQ(nullptr, bundles.bundleWithPath(scratch / "missing.qth"));
  EXPECT_EQ(nullptr, bundles.bundleWithPath({}));
}

TEST_F(FolderBundlesTest, MetadataLieInTheFolderOrInItsContents) {
  EXPECT_EQ(PropertyList("Plain"), bundle()->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
  const auto other = bundle("Contents", "Inner");
  EXPECT_EQ(PropertyList("Inner"), other->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
  EXPECT_EQ(PropertyList(7), other->infoDictionaryNoCacheValueForKey("Number"));
  EXPECT_EQ(std::nullopt, other->infoDictionaryNoCacheValueForKey("none"));
}

TEST_F(FolderBundlesTest, MetadataAreReadFromDiskEachTime) {
  const auto first = bundle({}, "Before");
  EXPECT_EQ(PropertyList("Before"), first->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
  bundle({}, "After");
  EXPECT_EQ(PropertyList("After"), first->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
  writePlainly(scratch / "a.qth/Info.plist", "damaged");
  EXPECT_EQ(std::nullopt, first->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
  fs::remove_all(scratch / "a.qth");
  EXPECT_EQ(std::nullopt, first->infoDictionaryNoCacheValueForKey(kBundleDisplayNameKey));
}

TEST_F(FolderBundlesTest, ResourcesLieInTheirFolderElseBesideTheMetadata) {
  for (const fs::path& inside : {fs::path(), fs::path("Contents")}) {
    const auto theme = bundle(inside);
    const fs::path folder = scratch / "a.qth" / inside;
    writePlainly(folder / "Preview.png", "x");
    EXPECT_EQ(folder / "Preview.png", theme->pathForResource("Preview", "png"));
    writePlainly(folder / "Resources/Preview.png", "x");
    EXPECT_EQ(folder / "Resources/Preview.png", theme->pathForResource("Preview", "png"));
    fs::create_directories(folder / "Resources/Template");
    EXPECT_EQ(folder / "Resources/Template", theme->pathForResource("Template", ""));
    EXPECT_EQ(fs::path(), theme->pathForResource("Preview", "jpg"));
  }
}

TEST_F(FolderBundlesTest, NoResourceLiesOutside) {
  const auto theme = bundle();
  writePlainly(scratch / "secret.txt", "x");
  writePlainly(scratch / "a.qth/sub/inner.txt", "x");
  for (const char* name : {"../secret", "..", ".", "", "sub/inner", "/etc/passwd"}) {
    EXPECT_EQ(fs::path(), theme->pathForResource(name, "txt")) << name;
    EXPECT_EQ(fs::path(), theme->pathForResource(name, "")) << name;
  }
  EXPECT_EQ(fs::path(), theme->pathForResource((scratch / "secret").native(), "txt"));
}

TEST_F(FolderBundlesTest, TheUsersBundlesComeBeforeTheSystemsSortedByName) {
  const auto b = addFolder("user/quilt/Themes/b.qth"), a = addFolder("user/quilt/Themes/a.qth");
  const auto local = addFolder("local/quilt/Themes/a.qth"), system = addFolder("system/quilt/Themes/0.qth");
  addFolder("app/Themes/a.qth");
  addFolder("user/quilt/Other/x.qth");
  addFolder("user/quilt/Themes/plain");
  addFolder("user/quilt/Themes/.hidden.qth");
  EXPECT_THAT(found(), ElementsAre(a, b, local, system));
  EXPECT_THAT(found(false, "other"), IsEmpty());
}

TEST_F(FolderBundlesTest, TheApplicationsOwnComeLastWhenAsked) {
  const auto user = addFolder("user/quilt/Themes/z.qth"), own = addFolder("app/Themes/a.qth");
  EXPECT_EQ(scratch / "app", bundles.mainBundleResourcePath());
  EXPECT_THAT(found(true), ElementsAre(user, own));
  EXPECT_THAT(FolderBundles(fs::path()).findAllLibraryBundlePaths("Themes", "qth", true), ElementsAre(user));
}

TEST_F(FolderBundlesTest, AFolderNamedTwiceIsListedOnce) {
  const auto user = addFolder("user/quilt/Themes/a.qth");
  const Environment twice("XDG_DATA_DIRS", ((scratch / "user").native() + ":" + (scratch / "user").native()).c_str());
  EXPECT_THAT(found(), ElementsAre(user));
  EXPECT_THAT(FolderBundles(scratch / "user/quilt").findAllLibraryBundlePaths("Themes", "qth", true),
              ElementsAre(user));
}

TEST_F(FolderBundlesTest, WithoutAnEnvironmentTheUsualFoldersAreSearched) {
  const Environment noDataHome("XDG_DATA_HOME", nullptr), noDirs("XDG_DATA_DIRS", nullptr);
  const Environment user("HOME", scratch.path().c_str());
  const auto theme = addFolder(".local/share/quilt/Themes/a.qth");
  EXPECT_THAT(found(), ::testing::Contains(theme));
  const Environment nobody("HOME", nullptr);
  EXPECT_THAT(found(), ::testing::Not(::testing::Contains(theme)));
}

TEST_F(FolderBundlesTest, MissingFoldersHoldNothing) {
  EXPECT_THAT(found(true), IsEmpty());
  const Environment unset("XDG_DATA_HOME", "");
  EXPECT_THAT(found(true), IsEmpty());
}

}  // namespace
}  // namespace quilt::platform
