// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/BinaryReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <cmath>

#include "quilt/platform/plist/Limits.h"
#include "quilt/platform/plist/XmlWriter.h"
#include "tests/support/PlainFiles.h"
#include "tests/support/PlistByPython.h"
#include "tests/support/ScratchFolder.h"

namespace quilt::platform {
namespace {

using namespace std::string_literals;

std::string bigEndian(std::uint64_t number, std::size_t size) {
  std::string bytes;
  for (std::size_t i = 0; i < size; ++i)
    bytes += static_cast<char>(static_cast<unsigned char>(number >> (8 * (size - 1 - i))));
  return bytes;
}

/// The file that holds these objects, the first of them the root. References take two bytes, offsets four.
std::string fileOf(const std::vector<std::string>& objects) {
  std::string file(kBinaryMagic);
  std::string table;
  for (const std::string& object : objects) {
    table += bigEndian(file.size(), 4);
    file += object;
  }
  const std::size_t start = file.size();
  return file + table + std::string(6, '\0') + "\x04\x02" + bigEndian(objects.size(), 8) + bigEndian(0, 8) +
         bigEndian(start, 8);
}

/// An array or, with twice as many references, a dictionary.
std::string container(char kind, std::size_t count, const std::vector<std::uint64_t>& references) {
  std::string object = static_cast<char>(kind | 15) + "\x12"s + bigEndian(count, 4);
  for (const std::uint64_t reference : references) object += bigEndian(reference, 2);
  return object;
}
std::string array(const std::vector<std::uint64_t>& references) {
  return container('\xA0', references.size(), references);
}
std::string dictionary(const std::vector<std::uint64_t>& references) {
  return container('\xD0', references.size() / 2, references);
}

PropertyList valueOf(const std::string& object) {
  const auto value = readBinary(fileOf({object}));
  return value ? *value : PropertyList("error: " + value.error().text);
}

std::string errorOf(std::string_view file) {
  const auto value = readBinary(file);
  if (value) return "no error";
  EXPECT_EQ(ErrorKind::Damaged, value.error().kind);
  return value.error().text;
}

PropertyList dateAfter2001(double seconds) {
  return valueOf("\x33" + bigEndian(std::bit_cast<std::uint64_t>(seconds), 8));
}

TEST(BinaryReaderTest, WhatAnotherWriterWroteReadsAsItsXmlForm) {
  Array many;
  for (int i = 0; i < 300; ++i) many.emplace_back("item " + std::to_string(i));
  const Dictionary values{{"zText", "plain"},
                          {"aText", "\xC3\xBC\xE2\x82\xAC\xF0\x9F\x8E\xAC"},
                          {"long", std::string(5000, 'x')},
                          {"yes", true},
                          {"no", false},
                          {"wholes", Array{0, 255, 256, 65536, std::int64_t{1} << 40, -1, INT64_MIN, INT64_MAX}},
                          {"real", 0.1},
                          {"date", *parseIso8601("2010-05-01T12:00:00Z")},
                          {"early", *parseIso8601("1900-01-01T00:00:01Z")},
                          {"data", Data{0, 1, 2, 255}},
                          {"many", many},
                          {"empty", Array{Array{}, Dictionary{}, "", Data{}}},
                          {"dictionary", Dictionary{{"b", 1}, {"a", 2}}}};
  const support::ScratchFolder scratch;
  support::writePlainly(scratch / "xml", writeXml(values));
  ASSERT_TRUE(support::writeBinaryByPython(scratch / "xml", scratch / "binary"));
  const std::string binary = support::readPlainly(scratch / "binary");
  ASSERT_TRUE(binary.starts_with(kBinaryMagic));
  const auto read = readBinary(binary);
  ASSERT_TRUE(read) << read.error().text;
  EXPECT_EQ(PropertyList(values), *read);
}

TEST(BinaryReaderTest, WholeNumbersOfEveryWidth) {
  EXPECT_EQ(PropertyList(255), valueOf("\x10\xFF"));
  EXPECT_EQ(PropertyList(65535), valueOf("\x11\xFF\xFF"));
  EXPECT_EQ(PropertyList(std::int64_t{4294967295}), valueOf("\x12\xFF\xFF\xFF\xFF"));
  EXPECT_EQ(PropertyList(-1), valueOf("\x13" + std::string(8, '\xFF')));
  EXPECT_EQ(PropertyList(7), valueOf("\x14" + bigEndian(0, 8) + bigEndian(7, 8)));
  EXPECT_EQ(PropertyList(-7), valueOf("\x14" + bigEndian(~0ULL, 8) + bigEndian(static_cast<std::uint64_t>(-7), 8)));
  EXPECT_EQ(PropertyList(18446744073709551615.0), valueOf("\x14" + bigEndian(0, 8) + bigEndian(~0ULL, 8)));
  EXPECT_EQ(PropertyList(std::ldexp(5, 64)), valueOf("\x14" + bigEndian(5, 8) + bigEndian(0, 8)));
  EXPECT_EQ(PropertyList(-std::ldexp(1, 64)), valueOf("\x14" + bigEndian(~0ULL, 8) + bigEndian(0, 8)));
}

TEST(BinaryReaderTest, RealsOfBothWidths) {
  EXPECT_EQ(PropertyList(1.5), valueOf("\x22" + bigEndian(std::bit_cast<std::uint32_t>(1.5F), 4)));
  EXPECT_EQ(PropertyList(0.1), valueOf("\x23" + bigEndian(std::bit_cast<std::uint64_t>(0.1), 8)));
}

TEST(BinaryReaderTest, DatesBeyondTheClockAreClampedAndNoTimeIsRefused) {
  EXPECT_EQ(PropertyList(*parseIso8601("2001-01-01T00:00:01Z")), dateAfter2001(1));
  EXPECT_EQ(PropertyList(Date{kLatestDay}), dateAfter2001(1e300));
  EXPECT_EQ(PropertyList(Date{kLatestDay}), dateAfter2001(INFINITY));
  EXPECT_EQ(PropertyList(Date{kEarliestDay}), dateAfter2001(-6.3e10));
  EXPECT_EQ(PropertyList("error: A date of the binary property list is no time"), dateAfter2001(NAN));
}

TEST(BinaryReaderTest, TextsAreMadeSuchThatTheyCanBeWritten) {
  EXPECT_EQ(PropertyList("a\xEF\xBF\xBD"), valueOf("\x52\x61\xFF"));
  EXPECT_EQ(PropertyList("a\xEF\xBF\xBD"), valueOf("\x52\x61\x01"));
  EXPECT_EQ(PropertyList("\xF0\x9F\x8E\xAC"), valueOf("\x62\xD8\x3C\xDF\xAC"));
  EXPECT_EQ(PropertyList("\xEF\xBF\xBDx"), valueOf("\x62\xD8\x3C\x00x"s));
  EXPECT_EQ(PropertyList("\xEF\xBF\xBD\xEF\xBF\xBD"), valueOf("\x62\xDF\xAC\xD8\x3C"));
}

TEST(BinaryReaderTest, TheLastOfTheValuesOfAKeyCounts) {
  const auto value = readBinary(fileOf({dictionary({1, 1, 2, 3}), "\x51k", "\x10\x01", "\x10\x02"}));
  ASSERT_TRUE(value) << value.error().text;
  EXPECT_EQ(PropertyList(Dictionary{{"k", 2}}), *value);
}

TEST(BinaryReaderTest, SharedObjectsAreReadAtEveryPlace) {
  const auto value = readBinary(fileOf({array({1, 1}), "\x51k"}));
  ASSERT_TRUE(value) << value.error().text;
  EXPECT_EQ(PropertyList(Array{"k", "k"}), *value);
}

TEST(BinaryReaderTest, WhatLeadsNowhereIsRefused) {
  EXPECT_EQ("The binary property list is cut short", errorOf("bplist00"));
  EXPECT_EQ("The binary property list has no usable table", errorOf("bplist00" + std::string(40, '\0')));
  EXPECT_EQ("An object of the binary property list is missing", errorOf(fileOf({})));
  EXPECT_EQ("An object of the binary property list is missing", errorOf(fileOf({array({7})})));
  std::string outside = fileOf({"\x09"});
  outside[9] = '\xFF';  // the first byte of the only offset
  EXPECT_EQ("An object of the binary property list lies outside", errorOf(outside));
  EXPECT_EQ("An object of the binary property list is of no known kind", errorOf(fileOf({"\x70"})));
  EXPECT_EQ("An object of the binary property list is of no known kind", errorOf(fileOf({"\x5F\x09"})));
  EXPECT_EQ("An integer of the binary property list is cut short", errorOf(fileOf({"\x13\x01"})));
  EXPECT_EQ("An integer of the binary property list is cut short", errorOf(fileOf({"\x1F\x01"})));
  EXPECT_EQ("A real of the binary property list is cut short", errorOf(fileOf({"\x23\x01"})));
  EXPECT_EQ("A date of the binary property list is cut short", errorOf(fileOf({"\x33\x01"})));
  EXPECT_EQ("A text of the binary property list is cut short", errorOf(fileOf({"\x59\x61"})));
  EXPECT_EQ("A text of the binary property list is cut short", errorOf(fileOf({"\x6F\x13" + bigEndian(~0ULL, 8)})));
  EXPECT_EQ("An array of the binary property list is cut short", errorOf(fileOf({"\xAF\x13" + bigEndian(~0ULL, 8)})));
  EXPECT_EQ("A dictionary of the binary property list is cut short", errorOf(fileOf({"\xD5"})));
  EXPECT_EQ("A key of the binary property list is no text", errorOf(fileOf({dictionary({1, 1}), "\x10\x01"})));
}

TEST(BinaryReaderTest, AnObjectThatHoldsItselfIsRefused) {
  EXPECT_EQ("The binary property list nests too deeply", errorOf(fileOf({array({0})})));
  EXPECT_EQ("The binary property list nests too deeply", errorOf(fileOf({dictionary({1, 0}), "\x51k"})));
  EXPECT_EQ("The binary property list nests too deeply", errorOf(fileOf({array({1}), array({0})})));
}

TEST(BinaryReaderTest, NestingIsReadToItsLimit) {
  std::vector<std::string> objects;
  for (std::size_t level = 1; level < kDeepestNesting; ++level) objects.push_back(array({level}));
  objects.push_back("\x09");
  EXPECT_TRUE(readBinary(fileOf(objects)));
  objects.back() = array({kDeepestNesting});
  objects.push_back("\x09");
  EXPECT_EQ("The binary property list nests too deeply", errorOf(fileOf(objects)));
}

TEST(BinaryReaderTest, ASmallFileThatUnfoldsWithoutEndIsRefused) {
  std::vector<std::string> values;
  for (std::size_t level = 1; level <= 60; ++level) values.push_back(array({level, level}));
  values.push_back("\x09");
  EXPECT_EQ("The binary property list unfolds to too many values", errorOf(fileOf(values)));

  const std::size_t length = 1U << 20U;
  const std::string text = "\x4F\x12" + bigEndian(length, 4) + std::string(length, 'x');
  EXPECT_EQ("The binary property list unfolds to too many bytes",
            errorOf(fileOf({array(std::vector<std::uint64_t>(kMostUnfolded / length + 1, 1)), text})));
}

}  // namespace
}  // namespace quilt::platform
