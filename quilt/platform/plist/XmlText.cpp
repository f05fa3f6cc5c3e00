// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlText.h"

#include <cstdint>
#include <cstring>

namespace quilt::platform {

namespace {

bool isPlain(unsigned char c) { return (c >= 0x20 && c < 0x80) || c == '\n' || c == '\t' || c == '\r'; }

/// How many bytes at the front are ASCII that XML can hold.
std::size_t plainPrefix(std::string_view text) {
  constexpr std::uint64_t ones = 0x0101010101010101U;
  std::size_t length = 0;
  while (length < text.size()) {
    // Eight at a time, as long as none has its high bit set or is below a space.
    if (std::uint64_t word = 0; length + sizeof word <= text.size()) {
      std::memcpy(&word, text.data() + length, sizeof word);
      const std::uint64_t odd = (word | ((word - 0x20 * ones) & ~word)) & (0x80 * ones);
      if (odd == 0) {
        length += sizeof word;
        continue;
      }
    }
    if (!isPlain(static_cast<unsigned char>(text[length]))) break;
    ++length;
  }
  return length;
}

}  // namespace

bool isXmlCharacter(const Utf8Character& character) {
  const char32_t code = character.code;
  const bool isWhite = code == '\t' || code == '\n' || code == '\r';
  return character.isValid && (code >= 0x20 || isWhite) && code != 0xFFFE && code != 0xFFFF;
}

bool isXmlText(std::string_view text) {
  for (;;) {
    text.remove_prefix(plainPrefix(text));
    if (text.empty()) return true;
    const Utf8Character character = firstUtf8Character(text);
    if (!isXmlCharacter(character)) return false;
    text.remove_prefix(character.length);
  }
}

std::string xmlTextFrom(std::string_view text) {
  std::string out;
  out.reserve(text.size());
  while (!text.empty()) {
    const Utf8Character character = firstUtf8Character(text);
    out += isXmlCharacter(character) ? text.substr(0, character.length) : kReplacementText;
    text.remove_prefix(character.length);
  }
  return out;
}

}  // namespace quilt::platform
