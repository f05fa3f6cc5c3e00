// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/LocalizedResources.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "quilt/platform/plist/XmlText.h"
#include "quilt/resources/EmbeddedFiles.h"
#include "tests/support/Environment.h"

namespace quilt::platform {
namespace {

using support::Environment;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Pair;

std::string titleIn(std::string_view language) {
  return LocalizedResources(language).localizedString("Untitled Episode", "none");
}

TEST(LocalizedResourcesTest, ATextComesInTheLanguageAsked) {
  EXPECT_EQ("Untitled Episode", titleIn("en"));
  EXPECT_EQ("Episode ohne Titel", titleIn("de"));
  EXPECT_EQ("\xC3\x89pisode sans titre", titleIn("fr"));
}

TEST(LocalizedResourcesTest, ALocaleReadsItsLanguageAndAnUnknownOneEnglish) {
  EXPECT_EQ("Episode ohne Titel", titleIn("de_AT.UTF-8@euro"));
  EXPECT_EQ("Episode ohne Titel", titleIn("de.UTF-8"));
  for (const char* language : {"C", "C.UTF-8", "POSIX", "", "xx", "../en", "e", "deutsch"})
    EXPECT_EQ("Untitled Episode", titleIn(language)) << language;
}

TEST(LocalizedResourcesTest, AnUnknownKeyAnswersTheFallback) {
  EXPECT_EQ("fallback", LocalizedResources("de").localizedString("no such key", "fallback"));
  EXPECT_EQ("", LocalizedResources("de").localizedString("", ""));
}

TEST(LocalizedResourcesTest, TheEnvironmentSaysTheLanguageInItsOrder) {
  const auto title = [] { return LocalizedResources().localizedString("Untitled Episode", "none"); };
  const Environment all("LC_ALL", nullptr), messages("LC_MESSAGES", nullptr), lang("LANG", nullptr);
  EXPECT_EQ("Untitled Episode", title());
  const Environment german("LANG", "de_DE.UTF-8");
  EXPECT_EQ("Episode ohne Titel", title());
  const Environment french("LC_MESSAGES", "fr_FR.UTF-8");
  EXPECT_EQ("\xC3\x89pisode sans titre", title());
  const Environment spanish("LC_ALL", "es_ES.UTF-8");
  EXPECT_EQ("Episodio sin t\xC3\xADtulo", title());
  const Environment empty("LC_ALL", "");
  EXPECT_EQ("\xC3\x89pisode sans titre", title());
}

TEST(LocalizedResourcesTest, EveryTableHasEveryKeyOfTheEnglishOne) {
  const auto textOf = [](const resources::EmbeddedFile& file) {
    return std::string_view(reinterpret_cast<const char*>(file.bytes.data()), file.bytes.size());
  };
  std::map<std::string, std::string, std::less<>> english;
  for (const auto& file : resources::embeddedFiles())
    if (file.path == "strings/en.strings") english = parseStrings(textOf(file));
  ASSERT_FALSE(english.empty());
  int tables = 0;
  for (const auto& file : resources::embeddedFiles()) {
    if (!file.path.starts_with("strings/")) continue;
    ++tables;
    EXPECT_TRUE(isXmlText(textOf(file))) << file.path;
    const auto strings = parseStrings(textOf(file));
    EXPECT_EQ(english.size(), strings.size()) << file.path;
    for (const auto& [key, value] : english) {
      const auto found = strings.find(key);
      ASSERT_NE(strings.end(), found) << file.path << ": " << key;
      EXPECT_FALSE(found->second.empty()) << file.path << ": " << key;
    }
  }
  EXPECT_GE(tables, 2);
}

TEST(LocalizedResourcesTest, ArtworkIsTheCompiledInFile) {
  const LocalizedResources resources("en");
  const auto isPng = [](std::span<const unsigned char> bytes) {
    return bytes.size() > 8 && bytes[0] == 0x89 && bytes[1] == 'P' && bytes[2] == 'N' && bytes[3] == 'G';
  };
  EXPECT_TRUE(isPng(resources.artwork("AudioPreview", "png")));
  EXPECT_TRUE(isPng(resources.artwork("PlaceholderPoster", "png")));
  const auto icon = resources.artwork("WebPreview", "icns");
  EXPECT_EQ("icns", std::string(icon.begin(), icon.begin() + std::min<long>(4, static_cast<long>(icon.size()))));
  EXPECT_EQ(icon.data(), LocalizedResources("de").artwork("WebPreview", "icns").data());
  EXPECT_THAT(resources.artwork("AudioPreview", "jpg"), IsEmpty());
  EXPECT_THAT(resources.artwork("none", "png"), IsEmpty());
  EXPECT_THAT(resources.artwork("../strings/en", "strings"), IsEmpty());
}

TEST(ParseStringsTest, LinesCommentsAndEscapes) {
  EXPECT_THAT(parseStrings("/* a\n\"no\" = \"no\"; */\n// \"no\" = \"no\";\n"
                           "\"k\" = \"v\";\n  \"a \\\"b\\\"\"=\"c\\nd\\\\\" ;  \"x\" = \"y\";"),
              ElementsAre(Pair("a \"b\"", "c\nd\\"), Pair("k", "v"), Pair("x", "y")));
}

TEST(ParseStringsTest, TheLastValueOfAKeyCounts) {
  EXPECT_THAT(parseStrings("\"k\" = \"1\";\n\"k\" = \"2\";\n"), ElementsAre(Pair("k", "2")));
}

TEST(ParseStringsTest, LinesOfAnotherFormArePassedOver) {
  EXPECT_THAT(parseStrings("nonsense\n\"k\" \"v\";\nx = y;\n\"a\" = \"b\";\n\"open = \n\"c\" = \"d\""),
              ElementsAre(Pair("a", "b")));
  for (const char* text : {"", "\n", "/*", "//", "\"", "\"\\", "\"k\"", "\"k\" =", "\"k\" = \"v"})
    EXPECT_THAT(parseStrings(text), IsEmpty()) << text;
}

}  // namespace
}  // namespace quilt::platform
