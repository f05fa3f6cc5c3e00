// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "tests/support/ImageFixtures.h"
#include "tests/support/QuiltProgram.h"

namespace quilt::support {
namespace {

namespace fs = std::filesystem;
using nlohmann::json;
using ::testing::Contains;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

/// themes, finalize, and themes of documents.
class ThemeCommandsTest : public QuiltProgramTest {
 protected:
  ThemeCommandsTest() {
    environment["XDG_DATA_HOME"] = folder() / "data";
    environment["XDG_DATA_DIRS"] = folder() / "shared";
  }

  /// A theme bundle in a library folder.
  fs::path theme(const std::string& identifier, const std::string& in = "data", const std::string& name = "Plain",
                 const std::string& version = "1.0") const {
    const fs::path bundle = folder() / in / "quilt/Themes" / (identifier + ".qth");
    write(bundle / "Info.plist",
          "<?xml version=\"1.0\" encoding=\"UTF-8\"?><plist version=\"1.0\"><dict>"
          "<key>CFBundleIdentifier</key><string>" +
              identifier + "</string><key>CFBundleDisplayName</key><string>" + name +
              "</string><key>CFBundleShortVersionString</key><string>" + version + "</string></dict></plist>");
    writeFile(bundle / "Preview.png", encode(quadrants(64, 48), {.suffix = ".png"}));
    write(bundle / "Template/index.html", "<title>" + identifier);
    return bundle;
  }
  fs::path talk() const {
    const fs::path path = quiltJson({"new", "document", "Talk"})["result"]["path"].get<std::string>();
    quiltJson({"add", "Talk", "https://example.org/"});
    return path;
  }
};

TEST_F(ThemeCommandsTest, ThemesAreListedWithIdentifierNameAndPath) {
  const fs::path b = theme("org.example.b"), a = theme("org.example.a", "shared", "Ann's");
  const Ended run = quilt({"themes"});
  EXPECT_EQ(0, run.exit);
  EXPECT_THAT(run.out, ::testing::StartsWith("org.example.b\tPlain\t" + b.native() + "\norg.example.a\tAnn's\t" +
                                             a.native() + "\n"));
  const json themes = quiltJson({"themes"})["result"];
  EXPECT_EQ("org.example.b", themes[0]["identifier"]);
  EXPECT_EQ("Plain", themes[0]["name"]);
  EXPECT_EQ("1.0", themes[0]["version"]);
  EXPECT_EQ(b.string(), themes[0]["path"]);
  EXPECT_FALSE(fs::exists(library())) << "it needs no library";
}

TEST_F(ThemeCommandsTest, OliveIsTheDefaultTheme) {
  theme("org.example.a");
  theme("org.quilt.theme.olive");
  std::vector<std::string> defaults;
  const json themes = quiltJson({"themes"})["result"];
  for (const json& one : themes)
    if (one["isDefault"]) defaults.push_back(one["path"]);
  EXPECT_THAT(defaults, ::testing::ElementsAre((folder() / "data/quilt/Themes/org.quilt.theme.olive.qth").string()));
}

TEST_F(ThemeCommandsTest, AnInstalledThemeThatIsWrongIsAWarning) {
  const fs::path wrong = theme("org.example.wrong", "data", "Wrong", "2.0");
  theme("org.example.a");
  const Ended run = quilt({"themes"});
  EXPECT_EQ(0, run.exit);
  EXPECT_THAT(run.out, HasSubstr("org.example.a\t"));
  EXPECT_EQ(run.out.find("org.example.wrong"), std::string::npos);
  EXPECT_THAT(run.err, HasSubstr("version is unsupported"));
}

TEST_F(ThemeCommandsTest, TheThemesOfTheProgramAreThoseOfItsShare) {
  // A build tree shows those of the source.
  const fs::path own = fs::path(QUILT_PROGRAM).parent_path().parent_path() / "share/quilt/Themes";
  ASSERT_TRUE(fs::is_symlink(own));
  EXPECT_EQ(fs::path(QUILT_SOURCE_FOLDER) / "quilt/resources/themes", fs::read_symlink(own));
  if (!fs::exists(own / "olive.qth")) GTEST_SKIP() << "the program has no theme of its own";
  EXPECT_THAT(quilt({"themes"}).out, HasSubstr("org.quilt.theme.olive\tOlive\t" + (own / "olive.qth").native() + "\n"));
}

TEST_F(ThemeCommandsTest, AThemeIsSetByItsIdentifierOrItsPath) {
  const fs::path a = theme("org.example.a"), b = theme("org.example.b", "elsewhere");
  talk();
  EXPECT_EQ(0, quilt({"set", "Talk", "theme=org.example.a"}).exit);
  EXPECT_EQ(a.string(), quiltJson({"show", "Talk"})["result"]["ThemePath"]);
  EXPECT_EQ(0, quilt({"set", "Talk", "theme=" + b.string()}).exit);
  EXPECT_EQ(b.string(), quiltJson({"show", "Talk"})["result"]["ThemePath"]);
  EXPECT_EQ(3, quilt({"set", "Talk", "theme=org.example.nowhere"}).exit);
  EXPECT_EQ(4, quilt({"set", "Talk", "theme=" + folder().string()}).exit);
  EXPECT_EQ(b.string(), quiltJson({"show", "Talk"})["result"]["ThemePath"]);
  EXPECT_EQ(0, quilt({"set", "Talk", "theme="}).exit);
  EXPECT_FALSE(quiltJson({"show", "Talk"})["result"].contains("ThemePath"));
}

TEST_F(ThemeCommandsTest, FinalizingMakesTheDocumentReadyInPlace) {
  theme("org.example.a");
  const fs::path package = talk();
  EXPECT_EQ(0, quilt({"set", "Talk", "theme=org.example.a"}).exit);
  const Ended run = quilt({"finalize", "Talk"});
  EXPECT_EQ(0, run.exit) << run.err;
  EXPECT_EQ("", run.out);
  EXPECT_EQ("<title>org.example.a", read(package / "index.html"));
  EXPECT_THAT(read(package / "controllers/data.js"), ::testing::StartsWith("var appData = {"));
  EXPECT_TRUE(fs::exists(package / "JukeboxMetadata.plist"));
  EXPECT_TRUE(fs::exists(package / "JukeboxArtwork"));
  EXPECT_TRUE(fs::exists(package / "Glance/Thumbnail.png"));
  EXPECT_EQ(package.string(), quiltJson({"finalize", "Talk"})["result"]["path"]);
}

TEST_F(ThemeCommandsTest, FinalizingAnotherThemeReplacesTheFirst) {
  write(theme("org.example.a") / "Template/only-a.css", "a");
  theme("org.example.b");
  const fs::path package = talk();
  for (const char* name : {"org.example.a", "org.example.b"}) {
    EXPECT_EQ(0, quilt({"set", "Talk", std::string("theme=") + name}).exit);
    EXPECT_EQ(0, quilt({"finalize", "Talk"}).exit);
  }
  EXPECT_FALSE(fs::exists(package / "only-a.css"));
  EXPECT_EQ("<title>org.example.b", read(package / "index.html"));
}

TEST_F(ThemeCommandsTest, AnInteractiveDocumentIsNotFinalizedWithoutItsTheme) {
  const fs::path bundle = theme("org.example.a");
  talk();
  const auto before = snapshot(library());
  const Ended run = quilt({"finalize", "Talk"});
  EXPECT_EQ(2, run.exit);
  EXPECT_THAT(run.err, HasSubstr("It has no theme; set one with \"quilt set\""));
  EXPECT_EQ(before, snapshot(library()));
  EXPECT_EQ(0, quilt({"set", "Talk", "theme=org.example.a"}).exit);
  fs::remove_all(bundle);
  EXPECT_EQ(3, quilt({"finalize", "Talk"}).exit);
  EXPECT_EQ(3, quilt({"finalize", "Nothing"}).exit);
}

TEST_F(ThemeCommandsTest, ADryRunOfFinalizeChangesNothing) {
  theme("org.example.a");
  talk();
  EXPECT_EQ(0, quilt({"set", "Talk", "theme=org.example.a"}).exit);
  const auto before = snapshot(library());
  EXPECT_THAT(quilt({"finalize", "Talk", "--dry-run"}).out, HasSubstr("Would finalize the document \"Talk\""));
  EXPECT_EQ(before, snapshot(library()));
}

}  // namespace
}  // namespace quilt::support
