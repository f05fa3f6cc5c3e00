// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include <cstdlib>
#include <map>

#include "quilt/themes/QuiltTheme.h"
#include "tests/support/ModelFixture.h"

namespace quilt {
namespace {

using platform::PropertyList;
using platform::ScopedService;
using platform::Services;
using support::Lines;
using support::warning;
using ::testing::IsEmpty;

/// A bundle that needs no folder.
class FakeBundle final : public platform::Bundle {
 public:
  Path where;
  Dictionary metadata;
  std::map<std::string, Path> resources;  ///< by "name.type"

  const Path& path() const override { return where; }
  std::optional<PropertyList> infoDictionaryNoCacheValueForKey(std::string_view key) const override {
    const PropertyList* value = metadata.find(key);
    return value ? std::optional(*value) : std::nullopt;
  }
  Path pathForResource(std::string_view name, std::string_view ofType) const override {
    const auto found = resources.find(std::string(name) + "." + std::string(ofType));
    return found == resources.end() ? Path() : found->second;
  }
};

/// Opens the same bundle at every path.
class FakeBundles final : public platform::Bundles {
 public:
  std::shared_ptr<FakeBundle> bundle = std::make_shared<FakeBundle>();
  Path resourcePath;

  std::shared_ptr<platform::Bundle> bundleWithPath(const Path& path) const override {
    if (bundle) bundle->where = path;
    return bundle;
  }
  Path mainBundleResourcePath() const override { return resourcePath; }
  std::vector<Path> findAllLibraryBundlePaths(std::string_view, std::string_view, bool) const override { return {}; }
};

class QuiltThemeTest : public support::ModelFixture {
 protected:
  Path bundle() const { return folder() / "plain.qth"; }
  static Dictionary metadata() {
    return {{"CFBundleIdentifier", "org.quilt.theme.plain"},
            {"CFBundleDisplayName", "Plain"},
            {"CFBundleShortVersionString", "1.0"}};
  }
  void writeMetadata(const Dictionary& record) { writeRecord(bundle() / "Info.plist", record); }
  void writePreview() {
    std::filesystem::create_directories(bundle() / "Resources");
    EXPECT_TRUE(picture(40, 30)->saveAsPNGAtURL(Url::fileUrl(bundle() / "Resources/Preview.png")));
  }
  void makeTheme() {
    writeMetadata(metadata());
    writePreview();
  }
  /// A bundle service whose bundles are valid themes wherever they are.
  std::shared_ptr<FakeBundles> fakeBundles() {
    auto bundles = std::make_shared<FakeBundles>();
    bundles->bundle->metadata = metadata();
    EXPECT_TRUE(picture(40, 30)->saveAsPNGAtURL(Url::fileUrl(folder() / "any.png")));
    bundles->bundle->resources = {{"Preview.png", folder() / "any.png"}};
    return bundles;
  }
  std::string text(const std::string& before, const std::string& after) const {
    return before + "\"" + bundle().native() + "\"" + after;
  }
  Lines missingProperties() const { return {warning(text("Theme bundle ", " is missing Info.plist properties."))}; }
  Lines unsupported() const { return {warning(text("Theme bundle ", " version is unsupported."))}; }
};

TEST_F(QuiltThemeTest, AVersionOneThemeLoads) {
  makeTheme();
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->path(), bundle());
  EXPECT_EQ(theme->identifier(), "org.quilt.theme.plain");
  EXPECT_EQ(theme->localizedName(), "Plain");
  EXPECT_EQ(theme->version(), "1.0");
  ASSERT_TRUE(theme->bundle());
  EXPECT_EQ(theme->bundle()->path(), bundle());
  ASSERT_TRUE(theme->previewImage());
  EXPECT_EQ(theme->previewImage()->size(), (platform::Size{40, 30}));
  EXPECT_FALSE(theme->isKestrel());
  EXPECT_THAT(takeLines(), IsEmpty());
}

TEST_F(QuiltThemeTest, AnyOtherVersionIsUnsupported) {
  makeTheme();
  for (const char* version : {"1.1", "1.0.0", "1", "", " 1.0", "2.0"}) {
    Dictionary record = metadata();
    record.set("CFBundleShortVersionString", version);
    writeMetadata(record);
    EXPECT_FALSE(QuiltTheme::initWithPath(bundle())) << version;
    EXPECT_EQ(takeLines(), unsupported()) << version;
  }
}

TEST_F(QuiltThemeTest, AMissingDisplayNameIsReportedBeforeAWrongVersion) {
  makeTheme();
  Dictionary record = metadata();
  record.set("CFBundleShortVersionString", "1.1");
  record.remove("CFBundleDisplayName");
  writeMetadata(record);
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), missingProperties());
}

TEST_F(QuiltThemeTest, EachMetadataValueIsRequiredAndMustBeAText) {
  makeTheme();
  for (const char* key : {"CFBundleIdentifier", "CFBundleDisplayName", "CFBundleShortVersionString"}) {
    Dictionary record = metadata();
    record.remove(key);
    writeMetadata(record);
    EXPECT_FALSE(QuiltTheme::initWithPath(bundle())) << key;
    EXPECT_EQ(takeLines(), missingProperties()) << key;

    record = metadata();
    record.set(key, 1.0);
    writeMetadata(record);
    EXPECT_FALSE(QuiltTheme::initWithPath(bundle())) << key;
    EXPECT_EQ(takeLines(), missingProperties()) << key;
  }
}

TEST_F(QuiltThemeTest, AnEmptyIdentifierCountsAsMissing) {
  makeTheme();
  Dictionary record = metadata();
  record.set("CFBundleIdentifier", "");
  writeMetadata(record);
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), missingProperties());
}

TEST_F(QuiltThemeTest, NothingAtThePathIsAnInvalidBundle) {
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), Lines{warning(text("Theme bundle ", " is an invalid bundle."))});
}

TEST_F(QuiltThemeTest, AFileIsAnInvalidBundle) {
  writeFile(bundle(), "text");
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), Lines{warning(text("Theme bundle ", " is an invalid bundle."))});
}

TEST_F(QuiltThemeTest, AFolderWithoutMetadataIsMissingItsProperties) {
  std::filesystem::create_directories(bundle());
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), missingProperties());
}

TEST_F(QuiltThemeTest, ABundleWithoutAPreviewIsReportedByItsName) {
  writeMetadata(metadata());
  writeFile(bundle() / "Resources/Preview.jpg", "no png");
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), Lines{warning(text("Theme bundle ", " preview path \"Preview.png\" is missing."))});
}

TEST_F(QuiltThemeTest, APreviewThatIsNoImageIsReportedByItsName) {
  writeMetadata(metadata());
  writeFile(bundle() / "Resources/Preview.png", "no image");
  EXPECT_FALSE(QuiltTheme::initWithPath(bundle()));
  EXPECT_EQ(takeLines(), Lines{warning(text("Theme bundle ", " preview \"Preview.png\" is invalid."))});
}

TEST_F(QuiltThemeTest, MetadataIsReadAfreshFromDisk) {
  makeTheme();
  ASSERT_TRUE(QuiltTheme::initWithPath(bundle()));
  Dictionary record = metadata();
  record.set("CFBundleDisplayName", "Plainer");
  writeMetadata(record);
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->localizedName(), "Plainer");
}

TEST_F(QuiltThemeTest, ThePathIsStandardized) {
  makeTheme();
  const auto theme = QuiltTheme::initWithPath(folder() / "x/.." / "." / "plain.qth/");
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->path(), bundle());
}

TEST_F(QuiltThemeTest, ALeadingTildeIsTheHomeFolder) {
  const ScopedService scoped(&Services::bundles, fakeBundles());
  const auto theme = QuiltTheme::initWithPath("~/plain.qth");
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->path(), Path(std::getenv("HOME")) / "plain.qth");
}

TEST_F(QuiltThemeTest, ThemesOfTheSystemAndOfTheApplicationAreKestrel) {
  const auto bundles = fakeBundles();
  bundles->resourcePath = "/opt/app/Resources";
  const ScopedService scoped(&Services::bundles, bundles);
  const auto isKestrel = [](const char* path) { return QuiltTheme::initWithPath(path)->isKestrel(); };
  EXPECT_TRUE(isKestrel("/System/Library/Themes/a.qth"));
  EXPECT_TRUE(isKestrel("/opt/app/Resources/Themes/a.qth"));
  EXPECT_TRUE(isKestrel("/opt/app/Resources/x/../Themes/a.qth"));
  EXPECT_FALSE(isKestrel("/home/ann/Library/Themes/a.qth"));
  EXPECT_FALSE(isKestrel("/opt/app/a.qth"));
  EXPECT_FALSE(isKestrel("/home/System/Library/a.qth"));
  EXPECT_FALSE(isKestrel("/System/Library/../a.qth"));
}

TEST_F(QuiltThemeTest, TheSystemAndApplicationPathsAreComparedAsTextNotByComponent) {
  const auto bundles = fakeBundles();
  bundles->resourcePath = "/opt/app/Resources";
  const ScopedService scoped(&Services::bundles, bundles);
  EXPECT_TRUE(QuiltTheme::initWithPath("/System/LibraryOfMine/a.qth")->isKestrel());
  EXPECT_TRUE(QuiltTheme::initWithPath("/opt/app/ResourcesOfMine/a.qth")->isKestrel());
}

TEST_F(QuiltThemeTest, AnApplicationWithoutResourcesShipsNoThemes) {
  const ScopedService scoped(&Services::bundles, fakeBundles());
  EXPECT_FALSE(QuiltTheme::initWithPath("/home/ann/a.qth")->isKestrel());
}

TEST_F(QuiltThemeTest, TheTemplateAndItsPageAreFoundAmongTheResources) {
  makeTheme();
  writeFile(bundle() / "Resources/Template/index.html", "<html></html>");
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->templatePath(), bundle() / "Resources/Template");
  EXPECT_EQ(theme->indexPath(), bundle() / "Resources/Template/index.html");
}

TEST_F(QuiltThemeTest, ATemplateWithoutAPageStillNamesOne) {
  makeTheme();
  std::filesystem::create_directories(bundle() / "Resources/Template");
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->indexPath(), bundle() / "Resources/Template/index.html");
}

TEST_F(QuiltThemeTest, AThemeWithoutATemplateLoadsAndNamesNoPage) {
  makeTheme();
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->templatePath(), Path());
  EXPECT_FALSE(std::filesystem::exists(theme->indexPath()));
  EXPECT_THAT(takeLines(), IsEmpty());
}

// ---- Image browser

TEST_F(QuiltThemeTest, IsShownByItsPreviewUnderItsIdentifierAndNeverAnew) {
  makeTheme();
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  EXPECT_EQ(theme->imageUID(), "org.quilt.theme.plain");
  EXPECT_EQ(theme->imageVersion(), 1u);
  EXPECT_EQ(theme->imageRepresentationType(), kImageBrowserPathRepresentationType);
  EXPECT_EQ(theme->imageRepresentation(), ImageRepresentation(bundle() / "Resources/Preview.png"));
}

TEST_F(QuiltThemeTest, ItsPreviewIsLookedUpEachTime) {
  makeTheme();
  const auto theme = QuiltTheme::initWithPath(bundle());
  ASSERT_TRUE(theme);
  std::filesystem::remove(bundle() / "Resources/Preview.png");
  EXPECT_EQ(theme->imageRepresentation(), ImageRepresentation());
}

}  // namespace
}  // namespace quilt
