// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <string>
#include <string_view>

#include "quilt/platform/base/Utf8.h"

namespace quilt::platform {

/// What a test answers for each byte, to be had at one look: the loops over every byte of a file are most of its cost.
template <class Test>
constexpr std::array<bool, 256> tableOf(Test test) {
  std::array<bool, 256> table{};
  for (std::size_t c = 0; c < table.size(); ++c) table[c] = test(c);
  return table;
}

/// How many bytes at the front of the text are in the table.
inline std::size_t lengthOf(const std::array<bool, 256>& table, std::string_view text) {
  std::size_t length = 0;
  while (length < text.size() && table[static_cast<unsigned char>(text[length])]) ++length;
  return length;
}

/// Whether XML 1.0 can hold the character: not most control characters, nor U+FFFE and U+FFFF.
bool isXmlCharacter(const Utf8Character& character);

/// Whether the text is UTF-8 and XML can hold each of its characters.
bool isXmlText(std::string_view text);

/// The text with U+FFFD in place of each byte that is no UTF-8 and each character that XML cannot hold.
std::string xmlTextFrom(std::string_view text);

}  // namespace quilt::platform
