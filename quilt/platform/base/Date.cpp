// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Date.h"

#include <algorithm>

namespace quilt::platform {

namespace {

using namespace std::chrono;

void appendPadded(std::string& out, int value, std::size_t digits) {
  const std::string text = std::to_string(value);
  out.append(digits > text.size() ? digits - text.size() : 0, '0').append(text);
}

std::optional<int> digits(std::string_view text, std::size_t at, std::size_t count) {
  int value = 0;
  for (std::size_t i = at; i < at + count; ++i) {
    if (text[i] < '0' || text[i] > '9') return std::nullopt;
    value = value * 10 + (text[i] - '0');
  }
  return value;
}

}  // namespace

std::string formatIso8601(Date date) {
  const auto seconds_ = floor<seconds>(date);
  const auto day = floor<days>(seconds_);
  const year_month_day calendar{day};
  const hh_mm_ss time{seconds_ - day};
  std::string out;
  out.reserve(20);
  appendPadded(out, static_cast<int>(calendar.year()), 4);
  out += '-';
  appendPadded(out, static_cast<int>(static_cast<unsigned>(calendar.month())), 2);
  out += '-';
  appendPadded(out, static_cast<int>(static_cast<unsigned>(calendar.day())), 2);
  out += 'T';
  appendPadded(out, static_cast<int>(time.hours().count()), 2);
  out += ':';
  appendPadded(out, static_cast<int>(time.minutes().count()), 2);
  out += ':';
  appendPadded(out, static_cast<int>(time.seconds().count()), 2);
  out += 'Z';
  return out;
}

std::optional<Date> parseIso8601(std::string_view text) {
  constexpr std::string_view shape = "....-..-..T..:..:..Z";
  if (text.size() != shape.size()) return std::nullopt;
  for (std::size_t i = 0; i < shape.size(); ++i)
    if (shape[i] != '.' && text[i] != shape[i]) return std::nullopt;
  const auto y = digits(text, 0, 4), mo = digits(text, 5, 2), d = digits(text, 8, 2), h = digits(text, 11, 2),
             mi = digits(text, 14, 2), s = digits(text, 17, 2);
  if (!y || !mo || !d || !h || !mi || !s) return std::nullopt;
  const year_month_day calendar{year{*y}, month{static_cast<unsigned>(*mo)}, day{static_cast<unsigned>(*d)}};
  if (!calendar.ok() || *h > 23 || *mi > 59 || *s > 60) return std::nullopt;
  const sys_days day = std::clamp(sys_days{calendar}, kEarliestDay, kLatestDay);
  const sys_seconds time = day + hours{*h} + minutes{*mi} + seconds{*s};
  return Date{std::min<sys_seconds>(time, kLatestDay + days{1} - seconds{1})};  // a leap second would lead out
}

}  // namespace quilt::platform
