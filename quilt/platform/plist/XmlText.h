// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "quilt/platform/base/Utf8.h"

namespace quilt::platform {

/// Whether XML 1.0 can hold the character: not most control characters, nor U+FFFE and U+FFFF.
bool isXmlCharacter(const Utf8Character& character);

/// Whether the text is UTF-8 and XML can hold each of its characters.
bool isXmlText(std::string_view text);

/// The text with U+FFFD in place of each byte that is no UTF-8 and each character that XML cannot hold.
std::string xmlTextFrom(std::string_view text);

}  // namespace quilt::platform
