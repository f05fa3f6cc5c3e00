// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/text/IcuDateFormatter.h"

#include <unicode/datefmt.h>
#include <unicode/smpdtfmt.h>

#include <memory>

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

}  // namespace

std::string IcuDateFormatter::format(Date date, std::string_view pattern) const {
  UErrorCode status = U_ZERO_ERROR;
  const auto text = icu::UnicodeString::fromUTF8({pattern.data(), static_cast<std::int32_t>(pattern.size())});
  const icu::SimpleDateFormat format(text, icu::Locale::getDefault(), status);
  return U_SUCCESS(status) ? formatted(format, date) : formatIso8601(date);
}

std::string IcuDateFormatter::shortDescription(Date date) const {
  const std::unique_ptr<icu::DateFormat> format(icu::DateFormat::createDateInstance(icu::DateFormat::kShort));
  return format ? formatted(*format, date) : formatIso8601(date);
}

std::string IcuDateFormatter::description(Date date) const {
  std::string text = formatIso8601(date);  // 2010-05-01T12:00:00Z
  text[10] = ' ';
  text.replace(19, 1, " +0000");
  return text;
}

}  // namespace quilt::platform
