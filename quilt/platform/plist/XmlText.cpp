// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/plist/XmlText.h"

#include <cstdint>
#include <cstring>

namespace quilt::platform {

namespace {

bool isPlain(unsigned char c) { return (c >= 0x20 && c < 0x80) || c == '\n' || c == '\t' || c == '\r'; }

constexpr std::uint64_t kOnes = 0x0101010101010101U;
constexpr std::uint64_t kHighBits = 0x80 * kOnes;

/// The high bit of each byte that is zero, and no other bit.
std::uint64_t zeroBytes(std::uint64_t word) { return ~(((word & ~kHighBits) + ~kHighBits) | word) & kHighBits; }

/// Whether none of the eight bytes but tabs and line ends has its high bit set or is below a space.
bool isPlain(std::uint64_t word) {
  if (((word | ((word - 0x20 * kOnes) & ~word)) & kHighBits) == 0) return true;  // as most are, without white space
  const std::uint64_t white =
      zeroBytes(word ^ '\t' * kOnes) | zeroBytes(word ^ '\n' * kOnes) | zeroBytes(word ^ '\r' * kOnes);
  return (((word & kHighBits) | zeroBytes(word & 0xE0 * kOnes)) & ~white) == 0;
}

/// How many bytes at the front are ASCII that XML can hold.
std::size_t plainPrefix(std::string_view text) {
  std::size_t length = 0;
  while (length < text.size()) {
    if (std::uint64_t word = 0; length + sizeof word <= text.size()) {
      std::memcpy(&word, text.data() + length, sizeof word);
      if (isPlain(word)) {
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
