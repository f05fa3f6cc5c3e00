// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/PlainXmlReader.h"

#include <gtest/gtest.h>
#include <malloc.h>

#include <string>

#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/XmlReader.h"
#include "quilt/platform/plist/XmlWriter.h"

namespace quilt::platform {
namespace {

constexpr const char* kHead = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";

std::string list(const std::string& content) { return "<plist version=\"1.0\">" + content + "</plist>\n"; }

/// What the full parser makes of the text: a comment keeps it from being read plainly.
Result<PropertyList> readFully(const std::string& text) {
  std::string buffer = text + "<!-- not plain -->";
  EXPECT_FALSE(readPlainXml(buffer)) << text;
  return readXml(buffer);
}

const char* const kPlainElements[] = {
    "<string></string>",
    "<string> a \t&amp;\n&lt;b&gt; &quot;c&quot; &apos;d&apos; > ]]></string>",
    "<string>\xC3\xA9\xE2\x82\xAC\xF0\x9F\x8E\xAC</string>",
    "<string>twelve to a piece, so that it is longer than what a text holds in itself</string>",
    "<true/>",
    "<false/>",
    "<integer> +12\n</integer>",
    "<integer>0xFFFFFFFFFFFFFFFF</integer>",
    "<real>-0.0</real>",
    "<real>1e999</real>",
    "<date> 2010-05-01T12:00:00Z </date>",
    "<data>\n\tAAH/\n\t</data>",
    "<data></data>",
    "<array></array>",
    "<array/>",
    "<dict></dict>",
    "<dict/>",
    "<array>\n\t<dict>\r\n<key>a</key> <array><true/></array>\t<key>&amp;</key><dict/></dict>\n <false/></array>",
    "<dict><key>a</key><true/><key>b</key><true/><key>a</key><false/></dict>",
    "<dict><key></key><string>of no name</string></dict>",
};

const char* const kOtherElements[] = {
    "<string>a<!-- comment -->b</string>",
    "<string><![CDATA[<]]></string>",
    "<string>&#65;</string>",
    "<string>&unknown;</string>",
    "<string>& alone</string>",
    "<string>line\r\nline\rline</string>",
    "<string >space</string>",
    "<string>space</string >",
    "<string kind=\"x\">attribute</string>",
    "<string>\xFFno UTF-8</string>",
    "<string>\x01</string>",
    "<string><true/></string>",
    "<string>open",
    "<string>a</key>",
    "<string>a</string",
    "<string>a",
    "<string",
    "<",
    "",
    "text",
    "<true></true>",
    "<true/>false",
    "<true/><false/>",
    "<integer>12a</integer>",
    "<real></real>",
    "<date>2010-13-01T12:00:00Z</date>",
    "<data>A</data>",
    "<text>a</text>",
    "<array><true/>",
    "<array>text</array>",
    "<array><key>a</key></array>",
    "<array><true/></dict>",
    "<dict><true/></dict>",
    "<dict><key>a</key></dict>",
    "<dict><key>a</key><key>b</key></dict>",
    "<dict><key>a</key><true/>text</dict>",
    "<dict><key>a</key><true/>",
    "<dict><key>a<true/></key></dict>",
};

TEST(PlainXmlReaderTest, PlainElementsAreReadAsTheFullParserReadsThem) {
  for (const std::string element : kPlainElements) {
    for (const std::string& text : {kHead + list(element), list("\n" + element + "\n")}) {
      const auto value = readPlainXml(text);
      const auto expected = readFully(text);
      ASSERT_TRUE(value) << text;
      ASSERT_TRUE(expected) << text;
      EXPECT_EQ(*expected, *value) << text;
    }
  }
}

TEST(PlainXmlReaderTest, WhatIsWrittenInAnotherWayIsLeftToTheFullParser) {
  for (const std::string element : kOtherElements) EXPECT_FALSE(readPlainXml(kHead + list(element))) << element;
}

TEST(PlainXmlReaderTest, OnlyTheUsualFirstAndLastLinesArePlain) {
  const std::string type = "<!DOCTYPE plist PUBLIC \"-//A//B\" \"http://a.b/c.dtd\">";
  for (const std::string head : {"", kHead, "<?xml version=\"1.0\" encoding=\"UTF-8\"?>", " \n"})
    EXPECT_TRUE(readPlainXml(head + type + "\n<plist><true/></plist>\n \n")) << head;

  for (const std::string head :
       {"\xEF\xBB\xBF", "<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?>", "<?xml version=\"1.0\"?>", "<!-- a -->", "a",
        "<!DOCTYPE plist", "<!DOCTYPE plist [<!ENTITY a \"b\">]>", "<!DOCTYPE \">\" a>", "<!DOCTYPEplist>",
        "<!DOCTYPE a\x01>", "<!DOCTYPE 'a\" \"'>"})
    EXPECT_FALSE(readPlainXml(head + list("<true/>"))) << head;
  EXPECT_FALSE(readPlainXml("<plist version=\"2.0\"><true/></plist>"));
  EXPECT_FALSE(readPlainXml("<dict/>"));
  EXPECT_FALSE(readPlainXml(list("<true/>") + "<dict/>"));
  EXPECT_FALSE(readPlainXml(list("<true/>") + std::string(1, '\0')));
}

TEST(PlainXmlReaderTest, NestsAsDeeplyAsTheFullParser) {
  for (const std::size_t depth : {kDeepestNesting, kDeepestNesting + 1}) {
    std::string text = "<true/>";
    for (std::size_t i = 1; i < depth; ++i) text = "<array>" + text + "</array>";
    const auto value = readPlainXml(list(text));
    EXPECT_EQ(depth <= kDeepestNesting, value.has_value());
    EXPECT_EQ(value.has_value(), readFully(list(text)).hasValue());
  }
}

TEST(PlainXmlReaderTest, DictionariesInsideEachOtherMakeNoMoreRoomThanTheyNeed) {
  std::string large;
  for (int i = 0; i < 100'000; ++i) large += "<key>" + std::to_string(i) + "</key><true/>";
  std::string nested = "<true/>";
  for (std::size_t i = 2; i < kDeepestNesting; ++i) nested = "<dict><key>a</key>" + nested + "</dict>";
  const std::string text = list("<array><dict>" + large + "</dict>" + nested + "</array>");
  const std::size_t before = mallinfo2().uordblks + mallinfo2().hblkhd;
  const auto value = readPlainXml(text);
  const std::size_t taken = mallinfo2().uordblks + mallinfo2().hblkhd - before;
  ASSERT_TRUE(value);
  EXPECT_LT(taken, 3 * 131'072 * sizeof(Dictionary::Entry));  // the large one, grown by doubling, and one more guess
}

TEST(PlainXmlReaderTest, WhatTheWriterWritesIsPlain) {
  const PropertyList value = Dictionary{{"Text & \"marks\"", "<a> 'b' \xE2\x82\xAC"},
                                        {"Flags", Array{true, false}},
                                        {"Numbers", Array{1, -0.5, 1e300}},
                                        {"Date", *parseIso8601("2010-05-01T12:00:00Z")},
                                        {"Data", Data{1, 2, 3}},
                                        {"Nothing", Array{Dictionary{}, Array{}, "", Data{}}}};
  EXPECT_EQ(value, readPlainXml(writeXml(value)));
}

TEST(PlainXmlReaderTest, EveryCutAndEveryChangedByteIsReadAsByTheFullParserOrLeftToIt) {
  const std::string text =
      kHead + list("<dict><key>a</key><array><string>b&amp;</string><integer>1</integer></array></dict>");
  const auto check = [](const std::string& changed) {
    const auto value = readPlainXml(changed);
    if (!value) return;
    const auto expected = readFully(changed);
    ASSERT_TRUE(expected) << changed;
    EXPECT_EQ(*expected, *value) << changed;
  };
  std::size_t plain = 0;
  for (std::size_t i = 0; i < text.size(); ++i) {
    check(text.substr(0, i));
    for (const char c : {'<', '>', '/', '&', ' ', 'x', '"', '\r', '\0', '\x80'}) {
      std::string changed = text;
      changed[i] = c;
      check(changed);
      plain += readPlainXml(changed) ? 1U : 0U;
    }
  }
  EXPECT_GT(plain, 10U);  // a byte of a text stands for another text
}

}  // namespace
}  // namespace quilt::platform
