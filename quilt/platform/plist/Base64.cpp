// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/Base64.h"

namespace quilt::platform {

namespace {

constexpr std::string_view kAlphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

}  // namespace

std::string encodeBase64(const Data& data) {
  std::string out;
  out.reserve((data.size() + 2) / 3 * 4);
  for (std::size_t i = 0; i < data.size(); i += 3) {
    const std::size_t count = std::min<std::size_t>(3, data.size() - i);
    unsigned bits = 0;
    for (std::size_t j = 0; j < 3; ++j) bits = (bits << 8U) | (j < count ? data[i + j] : 0U);
    for (std::size_t j = 0; j < 4; ++j) out += j <= count ? kAlphabet[(bits >> (18U - 6U * j)) & 63U] : '=';
  }
  return out;
}

std::optional<Data> decodeBase64(std::string_view text) {
  Data out;
  unsigned bits = 0;
  std::size_t digits = 0;
  std::size_t padding = 0;
  for (const char c : text) {
    if (c == ' ' || c == '\t' || c == '\n' || c == '\r') continue;
    if (c == '=') {
      ++padding;
      continue;
    }
    const std::size_t value = kAlphabet.find(c);
    if (value == std::string_view::npos || padding > 0) return std::nullopt;
    bits = (bits << 6U) | static_cast<unsigned>(value);
    if (++digits % 4 != 0) continue;
    out.push_back(static_cast<std::uint8_t>(bits >> 16U));
    out.push_back(static_cast<std::uint8_t>(bits >> 8U));
    out.push_back(static_cast<std::uint8_t>(bits));
    bits = 0;
  }
  const std::size_t rest = digits % 4;
  if (rest == 1 || padding > 2 || (padding > 0 && (rest + padding) % 4 != 0)) return std::nullopt;
  if (rest == 2) out.push_back(static_cast<std::uint8_t>(bits >> 4U));
  if (rest == 3) {
    out.push_back(static_cast<std::uint8_t>(bits >> 10U));
    out.push_back(static_cast<std::uint8_t>(bits >> 2U));
  }
  return out;
}

}  // namespace quilt::platform
