// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace quilt::scripting {

/// 128 random bits from the system, as 32 letters and digits.
std::string makeSecret();

/// Whether the texts are the same, told in a time that does not depend on where they differ.
bool isSameSecret(std::string_view given, std::string_view secret);

}  // namespace quilt::scripting
