// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "quilt/platform/plist/Limits.h"
#include "tests/support/DecimalComma.h"
#include "tests/support/PropertyListChecks.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::StartsWith;

Result<PropertyList> read(std::string buffer) { return readXml(buffer); }

Result<PropertyList> readElement(const std::string& element) {
  return read("<plist version=\"1.0\">" + element + "</plist>");
}

/// The value of an element; a text that says why when it cannot be read.
PropertyList valueOfElement(const std::string& element) {
  const auto value = readElement(element);
  return value ? *value : PropertyList("error: " + value.error().text);
}

std::string errorOfElement(const std::string& element) {
  const auto value = readElement(element);
  EXPECT_FALSE(value) << element;
  if (value) return "no error";
  EXPECT_EQ(ErrorKind::Damaged, value.error().kind);
  return value.error().text;
}

std::string repeated(std::string_view text, std::size_t count) {
  std::string all;
  all.reserve(text.size() * count);
  for (std::size_t i = 0; i < count; ++i) all += text;
  return all;
}

TEST(XmlReaderTest, EveryKindOfElementIsAValue) {
  EXPECT_EQ(PropertyList(true), valueOfElement("<true/>"));
  EXPECT_EQ(PropertyList(false), valueOfElement("<false></false>"));
  EXPECT_EQ(PropertyList(-7), valueOfElement("<integer>-7</integer>"));
  EXPECT_EQ(PropertyList(0.5), valueOfElement("<real>0.5</real>"));
  EXPECT_EQ(PropertyList("a text"), valueOfElement("<string>a text</string>"));
  EXPECT_EQ(PropertyList(*parseIso8601("2010-05-01T12:00:00Z")), valueOfElement("<date>2010-05-01T12:00:00Z</date>"));
  EXPECT_EQ(PropertyList(Data{0, 1, 255}), valueOfElement("<data>\n\tAAH/\n\t</data>"));
  EXPECT_EQ(PropertyList(Array{1, "b"}), valueOfElement("<array><integer>1</integer><string>b</string></array>"));
  EXPECT_EQ(PropertyList(Dictionary{{"k", 1}}), valueOfElement("<dict><key>k</key><integer>1</integer></dict>"));
}

TEST(XmlReaderTest, EmptyElementsAreEmptyValues) {
  EXPECT_EQ(PropertyList(""), valueOfElement("<string/>"));
  EXPECT_EQ(PropertyList(""), valueOfElement("<string></string>"));
  EXPECT_EQ(PropertyList(Data{}), valueOfElement("<data/>"));
  EXPECT_EQ(PropertyList(Array{}), valueOfElement("<array/>"));
  EXPECT_EQ(PropertyList(Dictionary{}), valueOfElement("<dict> </dict>"));
  EXPECT_EQ(PropertyList(Dictionary{{"", ""}}), valueOfElement("<dict><key/><string/></dict>"));
}

TEST(XmlReaderTest, WholeNumbersMayHaveSignsSpaceAndHexadecimalDigits) {
  EXPECT_EQ(PropertyList(12), valueOfElement("<integer> +12\n</integer>"));
  EXPECT_EQ(PropertyList(255), valueOfElement("<integer>0xFf</integer>"));
  EXPECT_EQ(PropertyList(INT64_MAX), valueOfElement("<integer>9223372036854775807</integer>"));
  EXPECT_EQ(PropertyList(INT64_MIN), valueOfElement("<integer>-9223372036854775808</integer>"));
}

TEST(XmlReaderTest, WholeNumbersBeyondSixtyFourBitsAreTheNearestReal) {
  EXPECT_EQ(PropertyList(9223372036854775808.0), valueOfElement("<integer>9223372036854775808</integer>"));
  EXPECT_EQ(PropertyList(-9223372036854775808.0), valueOfElement("<integer>-9223372036854775809</integer>"));
  EXPECT_EQ(PropertyList(1e30), valueOfElement("<integer>1000000000000000000000000000000</integer>"));
  EXPECT_EQ(PropertyList(18446744073709551615.0), valueOfElement("<integer>0xFFFFFFFFFFFFFFFF</integer>"));
  EXPECT_EQ(PropertyList(std::numeric_limits<double>::infinity()),
            valueOfElement("<integer>" + std::string(400, '9') + "</integer>"));
}

TEST(XmlReaderTest, RealsBeyondTheirRangeAreInfinityOrNothing) {
  EXPECT_EQ(PropertyList(std::numeric_limits<double>::infinity()), valueOfElement("<real>1e999</real>"));
  EXPECT_EQ(PropertyList(-std::numeric_limits<double>::infinity()), valueOfElement("<real>-1e999</real>"));
  EXPECT_EQ(PropertyList(0.0), valueOfElement("<real>1e-999</real>"));
  EXPECT_EQ(PropertyList(std::numeric_limits<double>::infinity()), valueOfElement("<real>inf</real>"));
  const PropertyList nan = valueOfElement("<real>nan</real>");
  ASSERT_TRUE(nan.as<double>());
  EXPECT_TRUE(std::isnan(*nan.as<double>()));
  EXPECT_EQ(PropertyList(3.4028234663852886e38),
            valueOfElement("<real>+340282346638528859811704183484516925440</real>"));
}

TEST(XmlReaderTest, WhatIsNoNumberIsRefused) {
  for (const char* text : {"", " ", "x", "1x", "1 2", "--1", "+-1", "0x", "0x-1", "0x1g", "1.5", "1,000", "nan"})
    EXPECT_THAT(errorOfElement("<integer>" + std::string(text) + "</integer>"), StartsWith("<integer> cannot be read"));
  EXPECT_THAT(errorOfElement("<integer>0x1FFFFFFFFFFFFFFFF</integer>"), StartsWith("<integer> cannot be read"));
  for (const char* text : {"", "x", "1,5", "1.5.5", "0x10", "1e", "+-1", "++1"})
    EXPECT_THAT(errorOfElement("<real>" + std::string(text) + "</real>"), StartsWith("<real> cannot be read"));
}

TEST(XmlReaderTest, NumbersDoNotFollowTheLanguageOfTheHost) {
  const support::DecimalComma comma;
  if (!comma.isInForce()) GTEST_SKIP() << "no language with a decimal comma can be made here";
  EXPECT_EQ(PropertyList(1.5), valueOfElement("<real>1.5</real>"));
  EXPECT_THAT(errorOfElement("<real>1,5</real>"), StartsWith("<real> cannot be read"));
  EXPECT_EQ(PropertyList(std::numeric_limits<double>::infinity()), valueOfElement("<real>1.5e999</real>"));
  EXPECT_EQ(PropertyList(0.0), valueOfElement("<real>1.5e-999</real>"));
}

TEST(XmlReaderTest, DatesAreOfOneFormAndClampedToTheClock) {
  EXPECT_EQ(PropertyList(*parseIso8601("2024-02-29T23:59:59Z")), valueOfElement("<date> 2024-02-29T23:59:59Z </date>"));
  EXPECT_EQ(PropertyList(Date{kEarliestDay}), valueOfElement("<date>0001-01-01T00:00:00Z</date>"));
  EXPECT_EQ(PropertyList(Date{kLatestDay}), valueOfElement("<date>9999-01-01T00:00:00Z</date>"));
  for (const char* text :
       {"", "2023-02-29T00:00:00Z", "2023-01-01", "2023-01-01T00:00:00+01:00", "2023-01-01T24:00:00Z"})
    EXPECT_THAT(errorOfElement("<date>" + std::string(text) + "</date>"), StartsWith("<date> cannot be read"));
}

TEST(XmlReaderTest, TextKeepsItsSpaceAndLines) {
  EXPECT_EQ(PropertyList("  two  "), valueOfElement("<string>  two  </string>"));
  EXPECT_EQ(PropertyList(" "), valueOfElement("<string> </string>"));
  EXPECT_EQ(PropertyList("a\nb\nc\td"), valueOfElement("<string>a\r\nb\rc\td</string>"));
  EXPECT_EQ(PropertyList("a\rb"), valueOfElement("<string>a&#13;b</string>"));
}

TEST(XmlReaderTest, EntitiesSectionsAndCommentsMakeOneText) {
  EXPECT_EQ(PropertyList("<&>\"'"), valueOfElement("<string>&lt;&amp;&gt;&quot;&apos;</string>"));
  EXPECT_EQ(PropertyList("\xC3\xBC\xE2\x82\xAC\xF0\x9F\x8E\xAC"),
            valueOfElement("<string>&#252;&#x20AC;&#x1f3ac;</string>"));
  EXPECT_EQ(PropertyList("a<b>&amp;c"), valueOfElement("<string>a<![CDATA[<b>&amp;]]>c</string>"));
  EXPECT_EQ(PropertyList(" a  b "), valueOfElement("<string> a <!-- not this --> b </string>"));
  EXPECT_EQ(PropertyList("   "), valueOfElement("<string> <!-- --> <!-- --> </string>"));
  EXPECT_EQ(PropertyList(12), valueOfElement("<integer>1<!-- -->2</integer>"));
  EXPECT_EQ(PropertyList(Array{1}), valueOfElement("<array><!-- a --> <integer>1</integer> <!-- b --></array>"));
  EXPECT_EQ(PropertyList(Dictionary{{"k", 1}}),
            valueOfElement("<dict><!-- --><key>k</key><!-- --><integer>1</integer><?x y?></dict>"));
}

TEST(XmlReaderTest, KeysKeepTheOrderOfTheFile) {
  const PropertyList value = valueOfElement("<dict><key>z</key><true/><key>a</key><true/><key>m</key><true/></dict>");
  std::vector<std::string> keys;
  for (const auto& [key, item] : *value.as<Dictionary>()) keys.push_back(key);
  EXPECT_THAT(keys, ElementsAre("z", "a", "m"));
}

TEST(XmlReaderTest, TheLastOfTheValuesOfAKeyCountsInTheFirstPlace) {
  EXPECT_EQ(PropertyList(Dictionary{{"a", 3}, {"b", 2}}),
            valueOfElement("<dict><key>a</key><integer>1</integer><key>b</key><integer>2</integer><key>a</key>"
                           "<integer>3</integer></dict>"));
  std::string many = "<dict>";
  for (int i = 0; i < 100; ++i)
    many += "<key>k" + std::to_string(i % 50) + "</key><integer>" + std::to_string(i) + "</integer>";
  const PropertyList value = valueOfElement(many + "</dict>");
  const auto& dictionary = *value.as<Dictionary>();
  EXPECT_EQ(50U, dictionary.size());
  EXPECT_EQ("k0", dictionary.begin()->first);
  EXPECT_EQ(50, dictionary.integer("k0"));
  EXPECT_EQ(99, dictionary.integer("k49"));
}

TEST(XmlReaderTest, ADocumentTypeAndADeclarationAreReadOver) {
  const auto value = read(
      "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
      "<!DOCTYPE plist PUBLIC \"-//SOMEONE//DTD PLIST 1.0//EN\" \"http://127.0.0.1:9/PropertyList-1.0.dtd\">\n"
      "<!-- a comment -->\n<plist version=\"1.0\">\n<dict>\n<key>k</key>\n<string>v</string>\n</dict>\n</plist>\n");
  ASSERT_TRUE(value) << value.error().text;
  EXPECT_EQ(PropertyList(Dictionary{{"k", "v"}}), *value);
}

TEST(XmlReaderTest, WideEncodingsAreRead) {
  const std::u16string text =
      u"<?xml version=\"1.0\" encoding=\"UTF-16\"?><plist><string>\u00fc\u20ac</string></plist>";
  for (const bool hasMark : {true, false}) {
    for (const bool isBigEndian : {true, false}) {
      std::string bytes;
      for (const char16_t unit : (hasMark ? u"\ufeff" : u"") + text) {
        const char high = static_cast<char>(unit >> 8);
        const char low = static_cast<char>(unit & 0xFF);
        bytes += {isBigEndian ? high : low, isBigEndian ? low : high};
      }
      const auto value = read(bytes);
      ASSERT_TRUE(value) << value.error().text;
      EXPECT_EQ(PropertyList("\xC3\xBC\xE2\x82\xAC"), *value);
    }
  }
  EXPECT_EQ(PropertyList("x"), *read("\xEF\xBB\xBF<plist><string>x</string></plist>"));
  EXPECT_EQ(PropertyList("\xC3\xBC"),
            *read("<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?><plist><string>\xFC</string></plist>"));
}

TEST(XmlReaderTest, BytesThatAreNoUtf8AreReplaced) {
  const std::string mark = "\xEF\xBF\xBD";
  EXPECT_EQ(PropertyList("a" + mark + "b"), valueOfElement("<string>a\xFF\x62</string>"));
  EXPECT_EQ(PropertyList("a" + mark), valueOfElement("<string>a\xC3</string>"));
  EXPECT_EQ(PropertyList(mark + mark + mark), valueOfElement("<string>&#xD800;</string>"));
  EXPECT_EQ(PropertyList(mark + mark), valueOfElement("<string>\xC0\x80</string>"));
  EXPECT_EQ(PropertyList(Dictionary{{mark, true}}), valueOfElement("<dict><key>\x80</key><true/></dict>"));
  // Keys that become one by it are one.
  EXPECT_EQ(PropertyList(Dictionary{{mark, 2}}),
            valueOfElement("<dict><key>\x80</key><integer>1</integer><key>\x81</key><integer>2</integer></dict>"));
}

TEST(XmlReaderTest, CharactersThatXmlCannotHoldAreReplaced) {
  const std::string mark = "\xEF\xBF\xBD";
  EXPECT_EQ(PropertyList("a" + mark + "b"), valueOfElement("<string>a\x01\x62</string>"));
  EXPECT_EQ(PropertyList("a" + mark + "b"), valueOfElement("<string>a&#x1F;b</string>"));
  EXPECT_EQ(PropertyList(mark), valueOfElement("<string>\xEF\xBF\xBF</string>"));
  EXPECT_EQ(PropertyList("\x7F\xC2\x80"), valueOfElement("<string>\x7F\xC2\x80</string>"));
}

TEST(XmlReaderTest, HalvesOfWideCharactersAreReplaced) {
  std::string bytes;
  for (const char c : std::string("<plist><string>&#xDC00;</string></plist>")) bytes += {c, '\0'};
  const auto value = read(bytes);
  ASSERT_TRUE(value) << value.error().text;
  EXPECT_EQ("", support::problemWith(*value));
}

TEST(XmlReaderTest, WhatIsNoPropertyListIsRefused) {
  for (const char* text : {"", " ", "x", "<", "<plist>", "<dict/>", "<html><dict/></html>", "<plist><dict></plist>",
                           "<plist><dict/>", "<plist><string>a</plist>", "bplist"}) {
    const auto value = read(text);
    ASSERT_FALSE(value) << text;
    EXPECT_EQ(ErrorKind::Damaged, value.error().kind);
    EXPECT_THAT(value.error().text, HasSubstr("(at byte ")) << text;
  }
  EXPECT_THAT(errorOfElement(""), StartsWith("The property list holds no value"));
  EXPECT_THAT(errorOfElement("<true/><true/>"), StartsWith("The property list holds more than one value"));
  EXPECT_THAT(read("<plist><true/></plist><plist><true/></plist>").error().text,
              StartsWith("Something follows the property list"));
  EXPECT_THAT(read("<other/>").error().text, StartsWith("This is no property list"));
}

TEST(XmlReaderTest, MisplacedElementsAreRefusedByNameAndPlace) {
  EXPECT_EQ("<other> is no kind of value (at byte 8)", read("<plist><other/></plist>").error().text);
  EXPECT_THAT(errorOfElement("<dict><true/></dict>"), StartsWith("<true> has no key"));
  EXPECT_THAT(errorOfElement("<dict><key>a</key></dict>"), StartsWith("<key> has no value"));
  EXPECT_THAT(errorOfElement("<dict><key>a</key><key>b</key></dict>"), StartsWith("<key> follows another key"));
  EXPECT_THAT(errorOfElement("<array><key>a</key></array>"), StartsWith("<key> is no kind of value"));
  EXPECT_THAT(errorOfElement("<array>text<true/></array>"), StartsWith("<array> holds text between its values"));
  EXPECT_THAT(errorOfElement("<array><true/>text</array>"), StartsWith("A text is no kind of value"));
  EXPECT_THAT(errorOfElement("<dict><key>a</key>text<true/></dict>"), StartsWith("A text is no kind of value"));
  EXPECT_THAT(errorOfElement("<string>a<b/></string>"), StartsWith("<b> stands inside a text"));
  EXPECT_THAT(errorOfElement("<true>yes</true>"), StartsWith("<true> holds text"));
  EXPECT_THAT(errorOfElement("<data>A</data>"), StartsWith("<data> cannot be read"));
}

TEST(XmlReaderTest, ALongNameIsCutInTheMessage) {
  EXPECT_LT(errorOfElement("<" + std::string(100'000, 'n') + "/>").size(), 100U);
  EXPECT_THAT(errorOfElement("<n\xFF/>"), StartsWith("<n\xEF\xBF\xBD> is no kind of value"));
}

TEST(XmlReaderTest, NestingIsReadToItsLimitAndRefusedBeyond) {
  const auto nested = [](std::size_t levels) {
    return "<plist>" + repeated("<array>", levels) + repeated("</array>", levels) + "</plist>";
  };
  EXPECT_TRUE(read(nested(kDeepestNesting)));
  const auto beyond = read(nested(kDeepestNesting + 1));
  ASSERT_FALSE(beyond);
  EXPECT_THAT(beyond.error().text, StartsWith("<array> nests too deeply (at byte "));
  EXPECT_FALSE(read(nested(1'000'000)));
  EXPECT_FALSE(read("<plist>" + repeated("<dict><key>k</key>", 500'000)));
}

TEST(XmlReaderTest, EntitiesOfTheFileItselfAreNotExpanded) {
  std::string bomb = "<?xml version=\"1.0\"?><!DOCTYPE plist [<!ENTITY a0 \"ha\">";
  for (int i = 1; i < 40; ++i) {
    const std::string before = "&a" + std::to_string(i - 1) + ";";
    bomb += "<!ENTITY a" + std::to_string(i) + " \"" + before + before + "\">";
  }
  bomb +=
      "<!ENTITY f SYSTEM "
      "\"file:///etc/passwd\">]><plist><array><string>&a39;</string><string>&f;</string></array></plist>";
  const auto value = read(bomb);
  ASSERT_TRUE(value) << value.error().text;
  EXPECT_EQ(PropertyList(Array{"&a39;", "&f;"}), *value);
}

TEST(XmlReaderTest, MoreTagsAndAttributesThanTheLimitAreRefusedBeforeTheyAreRead) {
  for (const char mark : {'<', '='}) {
    const auto value = read("<plist><string>" + std::string(kMostTags, mark) + "</string></plist>");
    ASSERT_FALSE(value);
    EXPECT_THAT(value.error().text, StartsWith("The property list holds too many values"));
  }
}

}  // namespace
}  // namespace quilt::platform
