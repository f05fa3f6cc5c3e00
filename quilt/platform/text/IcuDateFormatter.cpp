// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/IcuDateFormatter.h"

#include <unicode/datefmt.h>
#include <unicode/gregocal.h>
#include <unicode/smpdtfmt.h>

#include <cstdlib>
#include <memory>
#include <string_view>

namespace quilt::platform {

namespace {

UDate icuDate(Date date) { return std::chrono::duration<double, std::milli>(date.time_since_epoch()).count(); }

std::string formatted(const icu::DateFormat& format, Date date) {
  icu::UnicodeString text;
  format.format(icuDate(date), text);
  std::string out;
  text.toUTF8String(out);
  return out;
}

constexpr const char* kPlainLocale = "en_US_POSIX";

bool isKnown(const std::string& language) {
  std::int32_t count = 0;
  const icu::Locale* known = icu::Locale::getAvailableLocales(count);
  for (std::int32_t i = 0; i < count; ++i)
    if (language == known[i].getLanguage()) return true;
  return false;
}

std::string userLocale() {
  for (const char* name : {"LC_ALL", "LC_TIME", "LANG"}) {
    const char* value = std::getenv(name);
    const std::string_view text = value ? value : "";
    const std::string locale(text.substr(0, text.find_first_of(".@")));
    if (locale == "C" || locale == "POSIX") break;
    if (isKnown(locale.substr(0, locale.find('_')))) return locale;
  }
  return kPlainLocale;
}

}  // namespace

IcuDateFormatter::IcuDateFormatter() : IcuDateFormatter(userLocale()) {}

std::string IcuDateFormatter::format(Date date, std::string_view pattern) const {
  UErrorCode status = U_ZERO_ERROR;
  const auto text = icu::UnicodeString::fromUTF8({pattern.data(), static_cast<std::int32_t>(pattern.size())});
  const icu::SimpleDateFormat format(text, icu::Locale(_locale.c_str()), status);
  return U_SUCCESS(status) ? formatted(format, date) : formatIso8601(date);
}

std::string IcuDateFormatter::shortDescription(Date date) const {
  const std::unique_ptr<icu::DateFormat> format(
      icu::DateFormat::createDateInstance(icu::DateFormat::kShort, icu::Locale(_locale.c_str())));
  return format ? formatted(*format, date) : formatIso8601(date);
}

std::string IcuDateFormatter::description(Date date) const {
  std::string text = formatIso8601(date);  // 2010-05-01T12:00:00Z
  text[10] = ' ';
  text.replace(19, 1, " +0000");
  return text;
}

std::int64_t IcuDateFormatter::gregorianYear(Date date) const {
  UErrorCode status = U_ZERO_ERROR;
  icu::GregorianCalendar calendar(status);
  calendar.setTime(icuDate(date), status);
  const std::int32_t year = calendar.get(UCAL_EXTENDED_YEAR, status);
  return U_SUCCESS(status) ? year : DateFormatter::gregorianYear(date);
}

}  // namespace quilt::platform
