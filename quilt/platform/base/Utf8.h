// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <string_view>

#include "quilt/platform/base/Export.h"

namespace quilt::platform {

/// @{
/// What stands for bytes that are no character: the code point, and its UTF-8.
inline constexpr char32_t kReplacementCharacter = 0xFFFD;
inline constexpr std::string_view kReplacementText = "\xEF\xBF\xBD";
/// @}

/// One character of a text that claims to be UTF-8.
struct Utf8Character {
  char32_t code;       ///< kReplacementCharacter for bytes that are none
  std::size_t length;  ///< bytes, 1 for each that is none
  bool isValid;        ///< whether these bytes are UTF-8
};

/// The first character of a text that is not empty: shortest form only, no surrogates, up to U+10FFFF.
QUILT_EXPORT Utf8Character firstUtf8Character(std::string_view text);

}  // namespace quilt::platform
