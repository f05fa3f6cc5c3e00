// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <string_view>

namespace quilt::platform {

/// Which bytes are of a kind, each to be had at one look: readers and writers ask of every byte of a file.
using ByteTable = std::array<bool, 256>;

/// The bytes for which the test holds.
template <class Test>
constexpr ByteTable tableOf(Test test) {
  ByteTable table{};
  for (std::size_t c = 0; c < table.size(); ++c) table[c] = test(c);
  return table;
}

/// How many bytes at the front of the text are of the kind.
constexpr std::size_t lengthOf(const ByteTable& table, std::string_view text) {
  std::size_t length = 0;
  while (length < text.size() && table[static_cast<unsigned char>(text[length])]) ++length;
  return length;
}

}  // namespace quilt::platform
