// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <vector>

#include "quilt/platform/interfaces/Diagnostics.h"

namespace quilt::platform {

/// The decoders, encoders and filters for movies and sound that this machine's media library has or lacks.
std::vector<Capability> ffmpegCapabilities();

}  // namespace quilt::platform
