// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>

#include "quilt/platform/base/Error.h"

namespace quilt::platform::ffmpeg {

/// The library's error code in this system's words. The one place where that happens.
Error failure(int code, const std::filesystem::path& file);

/// The same for filters and encoders, to which an argument is invalid when they cannot work with what was decoded.
Error conversionFailure(int code, const std::filesystem::path& file);

}  // namespace quilt::platform::ffmpeg
