// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

namespace quilt::platform {

/// The type that the first bytes of a file show, or none. Wants the first kSignatureLength bytes, as far as there are.
const char* typeOfContent(std::string_view start);

inline constexpr std::size_t kSignatureLength = 4096;

/// Whether the bytes are text and nothing else: no signature, no NUL and no other control characters.
bool isPlainText(std::string_view start);

}  // namespace quilt::platform
