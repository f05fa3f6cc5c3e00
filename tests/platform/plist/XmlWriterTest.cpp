// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlWriter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>
#include <random>

#include "quilt/platform/plist/XmlReader.h"
#include "tests/support/DecimalComma.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/PlistByPython.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using support::treeByPython;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

Date dateOf(std::string_view text) { return *parseIso8601(text); }

PropertyList throughXml(const PropertyList& value) {
  std::string text = writeXml(value);
  const auto read = readXml(text);
  return read ? *read : PropertyList("error: " + read.error().text);
}

Dictionary everyKind() {
  return {{"zText", "a <b> & \"c\" '\xC3\xBC' \xF0\x9F\x8E\xAC"},
          {"aText", ""},
          {"yes", true},
          {"no", false},
          {"whole", -42},
          {"large", INT64_MIN},
          {"real", 0.1},
          {"date", dateOf("2010-05-01T12:00:00Z")},
          {"data", Data{0, 1, 2, 253, 254, 255}},
          {"array", Array{1, "two", Array{}, Dictionary{}}},
          {"dictionary", Dictionary{{"k&y", Dictionary{{"deep", true}}}}}};
}

TEST(XmlWriterTest, TheFormIsTheStandardOneWithALineForEachValue) {
  EXPECT_EQ(
      "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
      "<plist version=\"1.0\">\n"
      "<dict>\n"
      "\t<key>b</key>\n"
      "\t<array>\n"
      "\t\t<integer>1</integer>\n"
      "\t\t<real>0.5</real>\n"
      "\t\t<true/>\n"
      "\t\t<date>2010-05-01T12:00:00Z</date>\n"
      "\t\t<data>AAEC</data>\n"
      "\t\t<dict/>\n"
      "\t\t<array/>\n"
      "\t</array>\n"
      "\t<key>a&amp;</key>\n"
      "\t<string>&lt;</string>\n"
      "</dict>\n"
      "</plist>\n",
      writeXml(
          Dictionary{{"b", Array{1, 0.5, true, dateOf("2010-05-01T12:00:00Z"), Data{0, 1, 2}, Dictionary{}, Array{}}},
                     {"a&", "<"}}));
}

TEST(XmlWriterTest, EveryKindReadsBackAsItself) { EXPECT_EQ(PropertyList(everyKind()), throughXml(everyKind())); }

TEST(XmlWriterTest, AnotherReaderSeesTheSameValuesInTheSameOrder) {
  const support::ScratchFolder scratch;
  support::writePlainly(scratch / "list", writeXml(everyKind()));
  EXPECT_THAT(treeByPython(scratch / "list"),
              ElementsAre("zText str a <b> & \"c\" '\xC3\xBC' \xF0\x9F\x8E\xAC", "aText str ", "yes bool True",
                          "no bool False", "whole int -42", "large int -9223372036854775808", "real float 0.1",
                          "date datetime 2010-05-01T12:00:00Z", "data bytes b'\\x00\\x01\\x02\\xfd\\xfe\\xff'",
                          "array list 4", "array.0 int 1", "array.1 str two", "array.2 list 0", "array.3 dict 0",
                          "dictionary dict 1", "dictionary.k&y dict 1", "dictionary.k&y.deep bool True"));
}

TEST(XmlWriterTest, RealsReadBackBitForBitInTheirShortestForm) {
  EXPECT_THAT(writeXml(PropertyList(0.1)), HasSubstr("<real>0.1</real>"));
  EXPECT_THAT(writeXml(PropertyList(3.4028234663852886e38)), HasSubstr("<real>3.4028234663852886e+38</real>"));
  std::mt19937_64 random(1);
  for (int i = 0; i < 10'000; ++i) {
    const auto number = std::bit_cast<double>(random());
    if (std::isnan(number)) continue;
    const PropertyList read = throughXml(number);
    ASSERT_TRUE(read.as<double>()) << number;
    ASSERT_EQ(std::bit_cast<std::uint64_t>(number), std::bit_cast<std::uint64_t>(*read.as<double>())) << number;
  }
  using Limits = std::numeric_limits<double>;
  for (const double number : {0.0, -0.0, Limits::min(), Limits::denorm_min(), Limits::max(), Limits::lowest(),
                              Limits::infinity(), -Limits::infinity()})
    EXPECT_EQ(PropertyList(number), throughXml(number)) << number;
  EXPECT_TRUE(std::isnan(*throughXml(Limits::quiet_NaN()).as<double>()));
}

TEST(XmlWriterTest, AWholeRealStaysAReal) {
  EXPECT_THAT(writeXml(PropertyList(2.0)), HasSubstr("<real>2</real>"));
  EXPECT_EQ(PropertyList(2.0), throughXml(2.0));
}

TEST(XmlWriterTest, NumbersDoNotFollowTheLanguageOfTheHost) {
  const support::DecimalComma comma;
  if (!comma.isInForce()) GTEST_SKIP() << "no language with a decimal comma can be made here";
  EXPECT_THAT(writeXml(PropertyList(1234567.5)), HasSubstr("<real>1234567.5</real>"));
  EXPECT_THAT(writeXml(PropertyList(1234567)), HasSubstr("<integer>1234567</integer>"));
}

TEST(XmlWriterTest, TextsReadBackWithTheirSpaceAndLines) {
  for (const char* text : {"", " ", "  a  ", "\n", "a\r\nb\rc\nd\te", "]]>", "&amp;", "<![CDATA[x]]>", "<!-- x -->",
                           "\xEF\xBF\xBD", "\xEF\xBB\xBFx", "\x7F"})
    EXPECT_EQ(PropertyList(text), throughXml(text)) << text;
  EXPECT_EQ(PropertyList(Dictionary{{" a\nb ", 1}, {"<k>", 2}}), throughXml(Dictionary{{" a\nb ", 1}, {"<k>", 2}}));
}

TEST(XmlWriterTest, EveryCharacterThatXmlHasReadsBack) {
  std::string all;
  for (char32_t code = 0x20; code < 0x110000; code += code < 0x3000 ? 1 : 97) {
    if (code >= 0xD800 && code < 0xE000) continue;
    if (code == 0xFFFE || code == 0xFFFF) continue;
    const auto add = [&all](char32_t byte) { all += static_cast<char>(static_cast<unsigned char>(byte)); };
    if (code < 0x80) {
      add(code);
    } else if (code < 0x800) {
      add(0xC0 | (code >> 6)), add(0x80 | (code & 63));
    } else if (code < 0x10000) {
      add(0xE0 | (code >> 12)), add(0x80 | ((code >> 6) & 63)), add(0x80 | (code & 63));
    } else {
      add(0xF0 | (code >> 18)), add(0x80 | ((code >> 12) & 63)), add(0x80 | ((code >> 6) & 63)),
          add(0x80 | (code & 63));
    }
  }
  EXPECT_EQ(PropertyList(all), throughXml(all));
}

TEST(XmlWriterTest, WhatXmlCannotHoldIsReplacedSoThatTheFileCanBeRead) {
  const std::string mark = "\xEF\xBF\xBD";
  EXPECT_EQ(PropertyList(mark + "a" + mark), throughXml(std::string("\0a\x1F", 3)));
  EXPECT_EQ(PropertyList("a" + mark + "b"), throughXml("a\xFF\x62"));
  EXPECT_EQ(PropertyList(mark), throughXml("\xEF\xBF\xBF"));  // U+FFFF
  const support::ScratchFolder scratch;
  std::string bytes;
  for (int c = 0; c < 256; ++c) bytes += static_cast<char>(c);
  support::writePlainly(scratch / "list", writeXml(Dictionary{{"bytes", bytes}}));
  EXPECT_THAT(support::keysByPython(scratch / "list").front(), "bytes");
}

TEST(XmlWriterTest, DatesAreUtcInWholeSeconds) {
  const Date date = dateOf("2010-05-01T12:00:00Z") + std::chrono::milliseconds(999);
  EXPECT_THAT(writeXml(PropertyList(date)), HasSubstr("<date>2010-05-01T12:00:00Z</date>"));
  for (const char* text :
       {"1678-01-01T00:00:00Z", "1969-12-31T23:59:59Z", "2024-02-29T00:00:00Z", "2262-01-01T00:00:00Z"})
    EXPECT_EQ(PropertyList(dateOf(text)), throughXml(dateOf(text)));
}

TEST(XmlWriterTest, DataOfEveryLengthReadsBack) {
  Data data;
  for (int length = 0; length < 70; ++length) {
    EXPECT_EQ(PropertyList(data), throughXml(data)) << length;
    data.push_back(static_cast<std::uint8_t>(length * 37));
  }
}

}  // namespace
}  // namespace quilt::platform
