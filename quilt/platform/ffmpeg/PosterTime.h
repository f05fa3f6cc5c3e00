// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "quilt/platform/ffmpeg/Input.h"

namespace quilt::platform::ffmpeg {

/// The poster time in the movie header of a QuickTime file, in seconds, which the media library does not pass on. None
/// for other files and where it is zero. Reads a few box headers only.
std::optional<double> posterTime(const Input& input);

}  // namespace quilt::platform::ffmpeg
