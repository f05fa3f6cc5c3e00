// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/ScriptJsonWriter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>
#include <nlohmann/json.hpp>
#include <random>

#include "quilt/platform/base/Utf8.h"
#include "tests/support/DecimalComma.h"

namespace quilt::platform {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

std::string json(const Dictionary& dictionary) { return ScriptJsonWriter().toJSON(dictionary); }
std::string jsonOf(const PropertyList& value) { return json({{"v", value}}); }

std::string withoutForeignBytes(std::string_view text) {
  std::string out;
  while (!text.empty()) {
    const Utf8Character character = firstUtf8Character(text);
    out += character.isValid ? text.substr(0, character.length) : kReplacementText;
    text.remove_prefix(character.length);
  }
  return out;
}

/// The value as another reader sees it.
nlohmann::json readBack(const PropertyList& value) { return nlohmann::json::parse(jsonOf(value)).at("v"); }

TEST(ScriptJsonWriterTest, EveryKindIsOnOneLineInTheOrderOfItsKeys) {
  EXPECT_EQ(R"({"z":"text","a":[1,-2.5,true,false,{}],"d":{"date":"2010-05-01T12:00:00Z","data":[0,255]},"e":[]})",
            json({{"z", "text"},
                  {"a", Array{1, -2.5, true, false, Dictionary{}}},
                  {"d", Dictionary{{"date", *parseIso8601("2010-05-01T12:00:00Z")}, {"data", Data{0, 255}}}},
                  {"e", Array{}}}));
  EXPECT_EQ("{}", json({}));
}

TEST(ScriptJsonWriterTest, NoTextEndsTheScriptOrItsString) {
  for (const std::string text :
       {"</script>", "</ScRiPt >", "<!--", "<script>", "-->", "\"", "\\", "\\\"", "a\nb\rc\td", "'", "`${x}`", "]]>",
        "\xE2\x80\xA8\xE2\x80\xA9", "\x7F\x1B\x01", "&lt;", "\\u003c/script>"}) {
    for (const std::string& out : {jsonOf(text), json({{text, 1}})}) {
      EXPECT_THAT(out, Not(HasSubstr("<"))) << out;
      EXPECT_THAT(out, Not(HasSubstr("\n"))) << out;
      EXPECT_THAT(out, Not(HasSubstr("\xE2\x80\xA8"))) << out;
      EXPECT_THAT(out, Not(HasSubstr("\xE2\x80\xA9"))) << out;
      for (const char c : out) EXPECT_TRUE(static_cast<unsigned char>(c) >= 0x20 && c != 0x7F) << out;
    }
    EXPECT_EQ(text, readBack(text).get<std::string>());
    EXPECT_TRUE(nlohmann::json::parse(json({{text, 1}})).contains(text));
  }
}

TEST(ScriptJsonWriterTest, EveryByteGivesTextThatCanBeRead) {
  std::string text;
  for (int c = 0; c < 256; ++c) text += static_cast<char>(c);
  EXPECT_EQ(text.substr(0, 128), readBack(text).get<std::string>().substr(0, 128));
  EXPECT_EQ("a\xEF\xBF\xBD\x62", readBack("a\xFF\x62").get<std::string>());
  EXPECT_EQ("\xC3\xBC\xF0\x9F\x8E\xAC", readBack("\xC3\xBC\xF0\x9F\x8E\xAC").get<std::string>());
  std::mt19937 random(1);
  for (int round = 0; round < 2000; ++round) {
    std::string bytes(20, '\0');
    for (char& c : bytes) c = static_cast<char>(static_cast<unsigned char>(random() & 0xFFU));
    EXPECT_EQ(withoutForeignBytes(bytes), readBack(bytes).get<std::string>());
  }
}

TEST(ScriptJsonWriterTest, NumbersReadBackToTheSameValue) {
  for (const std::int64_t number : {std::int64_t{0}, std::int64_t{-1}, INT64_MAX, INT64_MIN})
    EXPECT_EQ(number, readBack(number).get<std::int64_t>());
  std::mt19937_64 random(1);
  for (int i = 0; i < 10'000; ++i) {
    const auto number = std::bit_cast<double>(random());
    if (!std::isfinite(number)) continue;
    ASSERT_EQ(std::bit_cast<std::uint64_t>(number), std::bit_cast<std::uint64_t>(readBack(number).get<double>()));
  }
  EXPECT_EQ(R"({"v":0.1})", jsonOf(0.1));
  EXPECT_EQ(R"({"v":3.4028234663852886e+38})", jsonOf(3.4028234663852886e38));
}

TEST(ScriptJsonWriterTest, WhatIsNoNumberInJsonIsNull) {
  using Limits = std::numeric_limits<double>;
  for (const double number : {Limits::infinity(), -Limits::infinity(), Limits::quiet_NaN()})
    EXPECT_EQ(R"({"v":null})", jsonOf(number));
}

TEST(ScriptJsonWriterTest, NumbersDoNotFollowTheLanguageOfTheHost) {
  const support::DecimalComma comma;
  if (!comma.isInForce()) GTEST_SKIP() << "no language with a decimal comma can be made here";
  EXPECT_EQ(R"({"v":[1234567,1234567.5]})", jsonOf(Array{1234567, 1234567.5}));
}

}  // namespace
}  // namespace quilt::platform
