// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/IcuDateFormatter.h"

#include <gtest/gtest.h>
#include <unicode/locid.h>
#include <unicode/timezone.h>

#include <memory>

namespace quilt::platform {
namespace {

/// A user with a language and a time zone.
class IcuDateFormatterTest : public ::testing::Test {
 protected:
  IcuDateFormatterTest() { become("en_US", "UTC"); }
  ~IcuDateFormatterTest() override {
    UErrorCode status = U_ZERO_ERROR;
    icu::Locale::setDefault(_locale, status);
    icu::TimeZone::adoptDefault(_zone.release());
  }

  static void become(const char* language, const char* zone) {
    UErrorCode status = U_ZERO_ERROR;
    icu::Locale::setDefault(icu::Locale(language), status);
    icu::TimeZone::adoptDefault(icu::TimeZone::createTimeZone(zone));
  }

  const IcuDateFormatter dates;
  const Date noon = *parseIso8601("2010-05-01T12:00:00Z");

 private:
  const icu::Locale _locale = icu::Locale::getDefault();
  std::unique_ptr<icu::TimeZone> _zone{icu::TimeZone::createDefault()};
};

TEST_F(IcuDateFormatterTest, APatternSpeaksTheUsersLanguage) {
  EXPECT_EQ("May 1, 2010", dates.format(noon, "MMMM d, yyyy"));
  become("de_DE", "UTC");
  EXPECT_EQ("Mai 1, 2010", dates.format(noon, "MMMM d, yyyy"));
  become("fr_FR", "UTC");
  EXPECT_EQ("1 ao\xC3\xBBt 2010", dates.format(*parseIso8601("2010-08-01T12:00:00Z"), "d MMMM yyyy"));
}

TEST_F(IcuDateFormatterTest, APatternIsInTheUsersTimeZone) {
  EXPECT_EQ("2010-05-01 12:00", dates.format(noon, "yyyy-MM-dd HH:mm"));
  become("en_US", "Asia/Tokyo");
  EXPECT_EQ("2010-05-01 21:00", dates.format(noon, "yyyy-MM-dd HH:mm"));
  become("en_US", "Pacific/Auckland");
  EXPECT_EQ("2010-05-02", dates.format(noon, "yyyy-MM-dd"));
}

TEST_F(IcuDateFormatterTest, APatternKeepsItsOwnText) {
  EXPECT_EQ("", dates.format(noon, ""));
  EXPECT_EQ("at 12 \xE2\x80\x93 o'clock", dates.format(noon, "'at' HH \xE2\x80\x93 'o''clock'"));
  EXPECT_EQ("Dec 31, 1969", dates.format(*parseIso8601("1969-12-31T23:59:59Z"), "MMM d, yyyy"));
}

TEST_F(IcuDateFormatterTest, TheShortFormHasNoTime) {
  EXPECT_EQ("5/1/10", dates.shortDescription(noon));
  become("de_DE", "UTC");
  EXPECT_EQ("01.05.10", dates.shortDescription(noon));
  become("de_DE", "Pacific/Auckland");
  EXPECT_EQ("02.05.10", dates.shortDescription(noon));
}

TEST_F(IcuDateFormatterTest, TheDescriptionIsTheSameForEveryUser) {
  for (const char* language : {"en_US", "de_DE", "ar_EG"}) {
    become(language, "Asia/Tokyo");
    EXPECT_EQ("2010-05-01 12:00:00 +0000", dates.description(noon)) << language;
  }
  EXPECT_EQ("2010-05-01 12:00:00 +0000", dates.description(noon + std::chrono::milliseconds(999)));
  EXPECT_EQ("1678-01-01 00:00:00 +0000", dates.description(Date{kEarliestDay}));
}

}  // namespace
}  // namespace quilt::platform
