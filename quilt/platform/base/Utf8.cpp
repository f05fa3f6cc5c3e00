// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/base/Utf8.h"

#include <cstdint>
#include <cstring>

namespace quilt::platform {

namespace {

/// How many bytes at the front are ASCII; may answer fewer than there are.
std::size_t asciiPrefix(std::string_view text) {
  constexpr std::uint64_t highBits = 0x8080808080808080U;
  std::size_t length = 0;
  for (std::uint64_t word = 0; length + sizeof word <= text.size(); length += sizeof word) {
    std::memcpy(&word, text.data() + length, sizeof word);
    if (word & highBits) break;
  }
  return length;
}

}  // namespace

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

bool isUtf8(std::string_view text) {
  for (;;) {
    text.remove_prefix(asciiPrefix(text));
    if (text.empty()) return true;
    const Utf8Character character = firstUtf8Character(text);
    if (!character.isValid) return false;
    text.remove_prefix(character.length);
  }
}

std::string repairedUtf8(std::string_view text) {
  std::string repaired;
  repaired.reserve(text.size());
  while (!text.empty()) {
    const Utf8Character character = firstUtf8Character(text);
    repaired += character.isValid ? text.substr(0, character.length) : kReplacementText;
    text.remove_prefix(character.length);
  }
  return repaired;
}

}  // namespace quilt::platform
