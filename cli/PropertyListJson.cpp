// SPDX-License-Identifier: Apache-2.0
#include "cli/PropertyListJson.h"

#include <type_traits>

namespace quilt::cli {

namespace {

std::string base64(const platform::Data& data) {
  constexpr const char* kDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  std::string text;
  for (std::size_t at = 0; at < data.size(); at += 3) {
    const std::size_t count = std::min<std::size_t>(3, data.size() - at);
    unsigned group = 0;
    for (std::size_t i = 0; i < 3; ++i) group = group << 8U | (i < count ? data[at + i] : 0U);
    for (std::size_t i = 0; i < 4; ++i) text += i <= count ? kDigits[group >> (18 - 6 * i) & 0x3fU] : '=';
  }
  return text;
}

}  // namespace

Json toJson(const platform::PropertyList& value) {
  return std::visit(
      [](const auto& kind) -> Json {
        using Kind = std::decay_t<decltype(kind)>;
        if constexpr (std::is_same_v<Kind, platform::Date>) {
          return platform::formatIso8601(kind);
        } else if constexpr (std::is_same_v<Kind, platform::Data>) {
          return base64(kind);
        } else if constexpr (std::is_same_v<Kind, platform::Array>) {
          Json array = Json::array();
          for (const platform::PropertyList& element : kind) array.push_back(toJson(element));
          return array;
        } else if constexpr (std::is_same_v<Kind, platform::Dictionary>) {
          return toJson(kind);
        } else {
          return kind;
        }
      },
      value.value());
}

Json toJson(const platform::Dictionary& dictionary) {
  Json object = Json::object();
  for (const auto& [key, value] : dictionary) object[key] = toJson(value);
  return object;
}

}  // namespace quilt::cli
