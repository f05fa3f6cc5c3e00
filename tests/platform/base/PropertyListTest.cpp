// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cmath>
#include <limits>

#include "quilt/platform/base/PropertyList.h"

namespace quilt::platform {
namespace {

using ::testing::ElementsAre;

std::vector<std::string> keys(const Dictionary& dictionary) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : dictionary) keys.push_back(key);
  return keys;
}

TEST(PropertyListTest, KeysStayInTheOrderInWhichTheyWereFirstSet) {
  Dictionary dictionary{{"b", 1}, {"a", 2}, {"c", 3}};
  dictionary.set("a", "new");
  dictionary.set("d", 4);
  dictionary.remove("b");
  dictionary.remove("none");
  EXPECT_THAT(keys(dictionary), ElementsAre("a", "c", "d"));
  EXPECT_EQ("new", dictionary.string("a"));
  EXPECT_EQ(3U, dictionary.size());
}

TEST(PropertyListTest, AKeyIsHeldOnce) {
  const Dictionary dictionary{{"a", 1}, {"a", 2}};
  EXPECT_EQ(1U, dictionary.size());
  EXPECT_EQ(2, dictionary.integer("a"));
}

TEST(PropertyListTest, AWrongKindCountsAsMissing) {
  const Dictionary dictionary{{"string", "7"},  {"true", true},         {"whole", 7},
                              {"real", 2.5},    {"array", Array{1}},    {"dictionary", Dictionary{{"k", 1}}},
                              {"date", Date{}}, {"data", Data{1, 2, 3}}};
  EXPECT_EQ("7", dictionary.string("string"));
  EXPECT_FALSE(dictionary.string("whole"));
  EXPECT_FALSE(dictionary.integer("string"));
  EXPECT_FALSE(dictionary.integer("true"));
  EXPECT_EQ(true, dictionary.boolean("true"));
  EXPECT_FALSE(dictionary.boolean("string"));
  EXPECT_FALSE(dictionary.real("true"));
  EXPECT_EQ(Date{}, dictionary.date("date"));
  EXPECT_FALSE(dictionary.date("string"));
  ASSERT_TRUE(dictionary.array("array"));
  EXPECT_FALSE(dictionary.array("dictionary"));
  ASSERT_TRUE(dictionary.dictionary("dictionary"));
  EXPECT_EQ(1, dictionary.dictionary("dictionary")->integer("k"));
  EXPECT_FALSE(dictionary.dictionary("none"));
  EXPECT_EQ(nullptr, dictionary.find("none"));
  EXPECT_FALSE(dictionary.contains("none"));
}

TEST(PropertyListTest, NumbersAnswerAsEachOther) {
  constexpr double large = 9223372036854775808.0;
  const Dictionary dictionary{{"whole", 7},          {"real", -2.9},
                              {"large", large},      {"small", -large},
                              {"nan", std::nan("")}, {"most", std::numeric_limits<std::int64_t>::max()}};
  EXPECT_EQ(7, dictionary.integer("whole"));
  EXPECT_EQ(7.0, dictionary.real("whole"));
  EXPECT_EQ(-2, dictionary.integer("real"));
  EXPECT_EQ(-2.9, dictionary.real("real"));
  EXPECT_FALSE(dictionary.integer("large"));
  EXPECT_EQ(std::numeric_limits<std::int64_t>::min(), dictionary.integer("small"));
  EXPECT_FALSE(dictionary.integer("nan"));
  EXPECT_EQ(std::numeric_limits<std::int64_t>::max(), dictionary.integer("most"));
}

TEST(PropertyListTest, KindsStayApart) {
  EXPECT_FALSE(PropertyList(true) == PropertyList(1));
  EXPECT_FALSE(PropertyList(1) == PropertyList(1.0));
  EXPECT_FALSE(PropertyList("1") == PropertyList(1));
  EXPECT_TRUE(PropertyList(Array{1, "a", true}) == PropertyList(Array{1, "a", true}));
}

TEST(PropertyListTest, EqualityMindsTheOrderOfKeys) {
  const Dictionary first{{"a", 1}, {"b", 2}};
  const Dictionary second{{"b", 2}, {"a", 1}};
  EXPECT_FALSE(first == second);
  EXPECT_TRUE(first == (Dictionary{{"a", 1}, {"b", 2}}));
}

TEST(PropertyListTest, ACopyIsItsOwn) {
  Dictionary first{{"a", Dictionary{{"deep", 1}}}};
  Dictionary second = first;
  second.set("a", 2);
  ASSERT_TRUE(first.dictionary("a"));
  EXPECT_EQ(1, first.dictionary("a")->integer("deep"));
  const Dictionary third = std::move(second);
  EXPECT_EQ(2, third.integer("a"));
}

TEST(PropertyListTest, AValueIsFilledInItsPlace) {
  Dictionary dictionary;
  dictionary.append("a").become<Array>().emplace_back(1);
  dictionary.append("b", 2);
  dictionary.append("c");
  EXPECT_EQ(dictionary, (Dictionary{{"a", Array{1}}, {"b", 2}, {"c", false}}));
  dictionary.array("a")->emplace_back("two");
  dictionary.find("b")->become<Dictionary>();
  dictionary.dictionary("b")->append("deep", true);
  EXPECT_EQ(dictionary, (Dictionary{{"a", Array{1, "two"}}, {"b", Dictionary{{"deep", true}}}, {"c", false}}));
  EXPECT_EQ(dictionary.array("b"), nullptr);
  EXPECT_EQ(dictionary.dictionary("a"), nullptr);
}

TEST(PropertyListTest, ATextIsTakenOnceAndItsKeyStays) {
  Dictionary dictionary{{"text", "longer than what fits into a text itself"}, {"whole", 7}};
  EXPECT_EQ(dictionary.takeString("text"), "longer than what fits into a text itself");
  EXPECT_EQ(dictionary.takeString("whole"), std::nullopt);
  EXPECT_EQ(dictionary.takeString("none"), std::nullopt);
  EXPECT_EQ(dictionary, (Dictionary{{"text", ""}, {"whole", 7}}));
}

}  // namespace
}  // namespace quilt::platform
