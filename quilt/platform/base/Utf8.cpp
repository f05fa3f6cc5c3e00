// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Utf8.h"

namespace quilt::platform {

Utf8Character firstUtf8Character(std::string_view text) {
  constexpr Utf8Character invalid{kReplacementCharacter, 1, false};
  const auto lead = static_cast<unsigned char>(text.front());
  if (lead < 0x80) return {lead, 1, true};
  const std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
  if (lead < 0xC2 || lead > 0xF4 || text.size() < length) return invalid;
  char32_t code = lead & (0x7FU >> length);
  for (std::size_t i = 1; i < length; ++i) {
    const auto byte = static_cast<unsigned char>(text[i]);
    if ((byte & 0xC0U) != 0x80U) return invalid;
    code = (code << 6U) | (byte & 0x3FU);
  }
  const char32_t smallest = length == 4 ? 0x10000 : length == 3 ? 0x800 : 0x80;
  const bool isSurrogate = code >= 0xD800 && code <= 0xDFFF;
  if (code < smallest || code > 0x10FFFF || isSurrogate) return invalid;
  return {code, length, true};
}

}  // namespace quilt::platform
