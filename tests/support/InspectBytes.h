// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace quilt::support {

/// Does with the bytes what is done with a movie or sound file from a stranger: inspects it, takes its chapters, cover
/// and two frames, extracts its sound. Whatever they are, it returns. For the fuzzer and its replay.
void inspectBytes(std::span<const std::uint8_t> bytes);

}  // namespace quilt::support
