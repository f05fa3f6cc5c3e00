// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/IcuDateFormatter.h"

#include <gtest/gtest.h>
#include <unicode/timezone.h>

#include <memory>

#include "tests/support/Environment.h"

namespace quilt::platform {
namespace {

/// Users with a language and a time zone.
class IcuDateFormatterTest : public ::testing::Test {
 protected:
  IcuDateFormatterTest() { travelTo("UTC"); }
  ~IcuDateFormatterTest() override { icu::TimeZone::adoptDefault(_zone.release()); }

  static void travelTo(const char* zone) { icu::TimeZone::adoptDefault(icu::TimeZone::createTimeZone(zone)); }

  /// The formatter of a user with these three variables; null: not set.
  static IcuDateFormatter userWith(const char* all, const char* time, const char* lang) {
    const support::Environment first("LC_ALL", all), second("LC_TIME", time), third("LANG", lang);
    return IcuDateFormatter();
  }

  const IcuDateFormatter american{"en_US.UTF-8"};
  const IcuDateFormatter german{"de_DE.UTF-8"};
  const Date noon = *parseIso8601("2010-05-01T12:00:00Z");

 private:
  std::unique_ptr<icu::TimeZone> _zone{icu::TimeZone::createDefault()};
};

TEST_F(IcuDateFormatterTest, APatternSpeaksTheUsersLanguage) {
  EXPECT_EQ("May 1, 2010", american.format(noon, "MMMM d, yyyy"));
  EXPECT_EQ("Mai 1, 2010", german.format(noon, "MMMM d, yyyy"));
  const IcuDateFormatter french("fr_FR");
  EXPECT_EQ("1 ao\xC3\xBBt 2010", french.format(*parseIso8601("2010-08-01T12:00:00Z"), "d MMMM yyyy"));
}

TEST_F(IcuDateFormatterTest, TheLanguageForDatesComesFirstAfterTheOneForEverything) {
  EXPECT_EQ("01.05.10", userWith("de_DE.UTF-8", "fr_FR.UTF-8", "en_US.UTF-8").shortDescription(noon));
  EXPECT_EQ("01/05/2010", userWith(nullptr, "fr_FR.UTF-8", "en_US.UTF-8").shortDescription(noon));
  EXPECT_EQ("01.05.10", userWith(nullptr, nullptr, "de_DE.UTF-8").shortDescription(noon));
}

TEST_F(IcuDateFormatterTest, AVariableThatIsEmptyOrUnknownIsPassedOver) {
  for (const char* nothing : {"", "xx_YY", "klingon.UTF-8", ".UTF-8", "@euro"}) {
    EXPECT_EQ("01.05.10", userWith(nothing, nothing, "de_DE.UTF-8").shortDescription(noon)) << nothing;
    EXPECT_EQ("Mai 1, 2010", userWith(nothing, "de_DE.UTF-8", nothing).format(noon, "MMMM d, yyyy")) << nothing;
    EXPECT_EQ("May 1, 2010", userWith(nothing, nothing, nothing).format(noon, "MMMM d, yyyy")) << nothing;
  }
}

TEST_F(IcuDateFormatterTest, ThePlainLanguageIsALanguage) {
  for (const char* plain : {"C", "POSIX", "C.UTF-8"})
    EXPECT_EQ("May 1, 2010", userWith(plain, "de_DE.UTF-8", "de_DE.UTF-8").format(noon, "MMMM d, yyyy")) << plain;
  EXPECT_EQ("5/1/10", userWith(nullptr, nullptr, nullptr).shortDescription(noon));
}

TEST_F(IcuDateFormatterTest, APatternIsInTheUsersTimeZone) {
  EXPECT_EQ("2010-05-01 12:00", american.format(noon, "yyyy-MM-dd HH:mm"));
  travelTo("Asia/Tokyo");
  EXPECT_EQ("2010-05-01 21:00", american.format(noon, "yyyy-MM-dd HH:mm"));
  travelTo("Pacific/Auckland");
  EXPECT_EQ("2010-05-02", american.format(noon, "yyyy-MM-dd"));
}

TEST_F(IcuDateFormatterTest, APatternKeepsItsOwnText) {
  EXPECT_EQ("", american.format(noon, ""));
  EXPECT_EQ("at 12 \xE2\x80\x93 o'clock", american.format(noon, "'at' HH \xE2\x80\x93 'o''clock'"));
  EXPECT_EQ("Dec 31, 1969", american.format(*parseIso8601("1969-12-31T23:59:59Z"), "MMM d, yyyy"));
}

TEST_F(IcuDateFormatterTest, TheShortFormHasNoTime) {
  EXPECT_EQ("5/1/10", american.shortDescription(noon));
  EXPECT_EQ("01.05.10", german.shortDescription(noon));
  travelTo("Pacific/Auckland");
  EXPECT_EQ("02.05.10", german.shortDescription(noon));
}

TEST_F(IcuDateFormatterTest, TheDescriptionIsTheSameForEveryUser) {
  travelTo("Asia/Tokyo");
  for (const char* language : {"en_US", "de_DE", "ar_EG"})
    EXPECT_EQ("2010-05-01 12:00:00 +0000", IcuDateFormatter(language).description(noon)) << language;
  EXPECT_EQ("2010-05-01 12:00:00 +0000", american.description(noon + std::chrono::milliseconds(999)));
  EXPECT_EQ("1678-01-01 00:00:00 +0000", american.description(Date{kEarliestDay}));
}

TEST_F(IcuDateFormatterTest, TheGregorianYearIsTheSameInEveryLanguage) {
  for (const char* language : {"en_US", "th_TH", "fa_IR", "ar_EG", "ja_JP@calendar=japanese", "xx"})
    EXPECT_EQ(2010, IcuDateFormatter(language).gregorianYear(noon)) << language;
  EXPECT_EQ(1678, american.gregorianYear(Date{kEarliestDay}));
}

TEST_F(IcuDateFormatterTest, TheGregorianYearIsThatOfTheUsersTimeZone) {
  const Date newYearsEve = *parseIso8601("2010-12-31T23:00:00Z");
  EXPECT_EQ(2010, american.gregorianYear(newYearsEve));
  travelTo("Asia/Tokyo");
  EXPECT_EQ(2011, american.gregorianYear(newYearsEve));
}

}  // namespace
}  // namespace quilt::platform
