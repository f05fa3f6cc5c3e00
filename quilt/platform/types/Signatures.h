// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

namespace quilt::platform {

/// The type that the first bytes of a file show, or none. Wants the first kSignatureLength bytes, as far as there are.
const char* typeOfContent(std::string_view start);

inline constexpr std::size_t kSignatureLength = 4096;

/// Whether a zip archive that starts so may be a packed document: its first file is called as these begin, or not named
/// as far as can be seen.
bool mayBePackedDocument(std::string_view start);

/// Whether the bytes are text and nothing else: no signature, no NUL and no other control characters.
bool isPlainText(std::string_view start);

}  // namespace quilt::platform
