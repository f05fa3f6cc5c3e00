// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlScalars.h"

#include <locale.h>
#include <stdlib.h>

#include <charconv>
#include <cstdint>
#include <string>
#include <utility>

#include "quilt/platform/plist/Base64.h"

namespace quilt::platform {

namespace {

std::string_view withoutPlus(std::string_view text) {
  const bool isMarked = text.size() > 1 && text[0] == '+' && text[1] != '-' && text[1] != '+';
  return isMarked ? text.substr(1) : text;
}

/// Reads the whole text as a number; invalid_argument when it is none.
template <class Number, class... Base>
std::errc numberFrom(std::string_view text, Number& number, Base... base) {
  const auto [stop, problem] = std::from_chars(text.data(), text.data() + text.size(), number, base...);
  return stop == text.data() + text.size() && !text.empty() ? problem : std::errc::invalid_argument;
}

std::optional<double> realFrom(std::string_view text) {
  text = withoutPlus(trimmed(text));
  double number = 0;
  const std::errc problem = numberFrom(text, number);
  if (problem == std::errc()) return number;
  if (problem != std::errc::result_out_of_range) return std::nullopt;
  // Beyond the range of reals: strtod tells whether that is infinity or nothing, here in no one's language.
  static const locale_t plain = newlocale(LC_ALL_MASK, "C", nullptr);
  return strtod_l(std::string(text).c_str(), nullptr, plain);
}

std::optional<PropertyList> integerFrom(std::string_view text) {
  text = withoutPlus(trimmed(text));
  if (text.starts_with("0x") || text.starts_with("0X")) {
    std::uint64_t number = 0;
    if (numberFrom(text.substr(2), number, 16) != std::errc()) return std::nullopt;
    return std::in_range<std::int64_t>(number) ? PropertyList(static_cast<std::int64_t>(number))
                                               : PropertyList(static_cast<double>(number));
  }
  std::int64_t number = 0;
  const std::errc problem = numberFrom(text, number);
  if (problem == std::errc()) return PropertyList(number);
  if (problem != std::errc::result_out_of_range) return std::nullopt;
  // The nearest real is closer to it than any integer that fits.
  const auto real = realFrom(text);
  return real ? std::optional<PropertyList>(*real) : std::nullopt;
}

}  // namespace

std::string_view trimmed(std::string_view text) {
  constexpr std::string_view space = " \t\r\n";
  const std::size_t first = text.find_first_not_of(space);
  return first == std::string_view::npos ? std::string_view()
                                         : text.substr(first, text.find_last_not_of(space) - first + 1);
}

bool isScalarElement(std::string_view name) {
  return name == "integer" || name == "real" || name == "date" || name == "data";
}

std::optional<PropertyList> scalarFrom(std::string_view name, std::string_view text) {
  if (name == "integer") return integerFrom(text);
  if (name == "real") return realFrom(text);
  if (name == "date") return parseIso8601(trimmed(text));
  if (name == "data") return decodeBase64(text);
  return std::nullopt;
}

}  // namespace quilt::platform
